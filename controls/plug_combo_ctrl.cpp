#include "controls/plug_combo_ctrl.h"

#include <algorithm>

#include "panel/drive_discovery.h"
#include "panel/morvane_plug_config.h"

namespace {

constexpr long kTreeStyle = wxTR_HAS_BUTTONS | wxTR_LINES_AT_ROOT | wxTR_SINGLE | wxBORDER_SIMPLE;  // 0x2000009

}  // namespace

wxBEGIN_EVENT_TABLE(CInTreeCombo, wxTreeCtrl)
    EVT_MOTION(CInTreeCombo::OnMouseMove)
    EVT_LEFT_DOWN(CInTreeCombo::OnMouseClick)
wxEND_EVENT_TABLE()

CInTreeCombo::CInTreeCombo() : m_parentInstance(nullptr) {}

CInTreeCombo::~CInTreeCombo() = default;

void CInTreeCombo::Init() {}

bool CInTreeCombo::Create(wxWindow* parent)
{
    return wxTreeCtrl::Create(parent, 1, wxPoint(0, 0), wxDefaultSize, kTreeStyle, wxDefaultValidator,
                              wxTreeCtrlNameStr);
}

void CInTreeCombo::OnShow()
{
    if (m_currentItem.IsOk())
        EnsureVisible(m_currentItem);
}

wxSize CInTreeCombo::GetAdjustedSize(int minWidth, int, int maxHeight)
{
    return wxSize(std::max(300, minWidth), std::min(250, maxHeight));
}

wxWindow* CInTreeCombo::GetControl()
{
    return this;
}

void CInTreeCombo::SetStringValue(const wxString& text)
{
    const wxTreeItemId root = GetRootItem();
    if (!root.IsOk())
        return;
    const wxTreeItemId found = FindItemByText(root, text);
    if (!found.IsOk())
        return;
    m_hotItem = found;
    m_currentItem = found;
    SelectItem(found);
}

wxString CInTreeCombo::GetStringValue() const
{
    return m_currentItem.IsOk() ? GetItemText(m_currentItem) : wxString();
}

// Depth first, each item before its children; `parent` itself is never compared.
wxTreeItemId CInTreeCombo::FindItemByText(wxTreeItemId parent, const wxString& text)
{
    wxTreeItemIdValue cookie;
    for (wxTreeItemId child = GetFirstChild(parent, cookie); child.IsOk(); child = GetNextChild(parent, cookie)) {
        if (GetItemText(child) == text)
            return child;
        if (ItemHasChildren(child)) {
            const wxTreeItemId below = FindItemByText(child, text);
            if (below.IsOk())
                return below;
        }
    }
    return wxTreeItemId();
}

void CInTreeCombo::OnMouseMove(wxMouseEvent& event)
{
    int flags = 0;
    const wxTreeItemId item = HitTest(event.GetPosition(), flags);
    if (item.IsOk() && (flags & wxTREE_HITTEST_ONITEMLABEL)) {
        SelectItem(item, true);
        m_hotItem = item;
    }
    event.Skip();
}

void CInTreeCombo::OnMouseClick(wxMouseEvent& event)
{
    int flags = 0;
    const wxTreeItemId item = HitTest(event.GetPosition(), flags);
    if (!item.IsOk() || !(flags & wxTREE_HITTEST_ONITEMLABEL)) {
        event.Skip();
        return;
    }
    m_hotItem = item;
    m_currentItem = item;
    const wxTreeItemId selection = GetSelection();
    if (selection.IsOk() && GetItemParent(selection).IsOk())
        ChooseDrive(selection);
    Dismiss();
    event.Skip();
}

void CInTreeCombo::SendList()
{
    const wxTreeItemId selection = GetSelection();
    if (selection.IsOk())
        ChooseDrive(selection);
}

int CInTreeCombo::DriveOf(const wxTreeItemId& item) const
{
    const auto* node = dynamic_cast<const CDriverTreeNode*>(GetItemData(item));
    return node ? node->m_driveIndex : -1;
}

void CInTreeCombo::ChooseDrive(const wxTreeItemId& item)
{
    const int drive = DriveOf(item);
    if (drive >= 0 && m_parentInstance)
        m_parentInstance->SendHddList(drive);
}

CPlugComboCtrl::CPlugComboCtrl(wxWindow* parent, int id, wxString value, wxPoint pos, wxSize size, long style)
    : wxComboCtrl(parent, id, value, pos, size, style, wxDefaultValidator, wxComboBoxNameStr),
      m_treePopup(new CInTreeCombo)
{
}

CPlugComboCtrl::~CPlugComboCtrl() = default;

void CPlugComboCtrl::SetparentInstance(void* panel)
{
    m_treePopup->m_parentInstance = static_cast<MorvanePlugConfig*>(panel);
}

void CPlugComboCtrl::SetControlRes()
{
    UseAltPopupWindow(true);
    SetPopupControl(m_treePopup);
    SetButtonPosition(-1, -1, wxLEFT, 0);
}
