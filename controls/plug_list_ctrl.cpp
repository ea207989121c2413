#include "controls/plug_list_ctrl.h"

#include "panel/morvane_plug_config.h"

wxBEGIN_EVENT_TABLE(CPlugListCtrl, wxListCtrl)
    EVT_LIST_BEGIN_DRAG(wxID_ANY, CPlugListCtrl::OnBeginDrag)
    EVT_LIST_BEGIN_RDRAG(wxID_ANY, CPlugListCtrl::OnBeginRDrag)
    EVT_LIST_BEGIN_LABEL_EDIT(wxID_ANY, CPlugListCtrl::OnBeginLabelEdit)
    EVT_LIST_END_LABEL_EDIT(wxID_ANY, CPlugListCtrl::OnEndLabelEdit)
    EVT_LIST_DELETE_ITEM(wxID_ANY, CPlugListCtrl::OnDeleteItem)
    EVT_LIST_DELETE_ALL_ITEMS(wxID_ANY, CPlugListCtrl::OnDeleteAllItems)
    EVT_LIST_ITEM_SELECTED(wxID_ANY, CPlugListCtrl::OnSelected)
    EVT_LIST_ITEM_DESELECTED(wxID_ANY, CPlugListCtrl::OnDeselected)
    EVT_LIST_KEY_DOWN(wxID_ANY, CPlugListCtrl::OnListKeyDown)
    EVT_LIST_ITEM_ACTIVATED(wxID_ANY, CPlugListCtrl::OnActivated)
    EVT_LIST_ITEM_FOCUSED(wxID_ANY, CPlugListCtrl::OnFocused)
    EVT_LIST_COL_CLICK(wxID_ANY, CPlugListCtrl::OnColClick)
    EVT_LIST_COL_RIGHT_CLICK(wxID_ANY, CPlugListCtrl::OnColRightClick)
    EVT_LIST_COL_BEGIN_DRAG(wxID_ANY, CPlugListCtrl::OnColBeginDrag)
    EVT_LIST_COL_DRAGGING(wxID_ANY, CPlugListCtrl::OnColDragging)
    EVT_LIST_COL_END_DRAG(wxID_ANY, CPlugListCtrl::OnColEndDrag)
    EVT_LIST_CACHE_HINT(wxID_ANY, CPlugListCtrl::OnCacheHint)
    EVT_RIGHT_DOWN(CPlugListCtrl::OnRightClick)
wxEND_EVENT_TABLE()

CPlugListCtrl::CPlugListCtrl(wxWindow* parent, int id, wxPoint pos, wxSize size, long style)
    : wxListCtrl(parent, id, pos, size, style, wxDefaultValidator, wxListCtrlNameStr)
{
}

CPlugListCtrl::~CPlugListCtrl() = default;

void CPlugListCtrl::SetparentInstance(void* panel)
{
    m_parentInstance = panel;
}

// Consumed here so that the panel never sees them.
void CPlugListCtrl::OnBeginDrag(wxListEvent&) {}
void CPlugListCtrl::OnBeginRDrag(wxListEvent&) {}
void CPlugListCtrl::OnBeginLabelEdit(wxListEvent&) {}
void CPlugListCtrl::OnEndLabelEdit(wxListEvent&) {}
void CPlugListCtrl::OnDeleteItem(wxListEvent&) {}
void CPlugListCtrl::OnDeleteAllItems(wxListEvent&) {}
void CPlugListCtrl::OnSelected(wxListEvent&) {}
void CPlugListCtrl::OnDeselected(wxListEvent&) {}
// The toolkit's own list does its keyboard work (moving through the rows,
// Enter to activate one) only for a key the handler leaves unhandled; the
// event still goes no further than this control.
void CPlugListCtrl::OnListKeyDown(wxListEvent& event)
{
    event.StopPropagation();
    event.Skip();
}
void CPlugListCtrl::OnFocused(wxListEvent&) {}
void CPlugListCtrl::OnColClick(wxListEvent&) {}
void CPlugListCtrl::OnColRightClick(wxListEvent&) {}
void CPlugListCtrl::OnColBeginDrag(wxListEvent&) {}
void CPlugListCtrl::OnColDragging(wxListEvent&) {}
void CPlugListCtrl::OnColEndDrag(wxListEvent&) {}
void CPlugListCtrl::OnCacheHint(wxListEvent&) {}
void CPlugListCtrl::OnRightClick(wxMouseEvent&) {}

void CPlugListCtrl::OnActivated(wxListEvent& event)
{
    if (m_parentInstance)
        static_cast<MorvanePlugConfig*>(m_parentInstance)->SendMorvaneCommand(static_cast<int>(event.GetIndex()));
}
