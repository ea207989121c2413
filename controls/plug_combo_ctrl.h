// The drive selector: a combo box whose drop-down is a tree of drives. A
// left press on a drive's label chooses it and tells the panel.
#ifndef CONTROLS_PLUG_COMBO_CTRL_H
#define CONTROLS_PLUG_COMBO_CTRL_H

#include <wx/combo.h>
#include <wx/treectrl.h>

class MorvanePlugConfig;

class CInTreeCombo : public wxTreeCtrl, public wxComboPopup {
public:
    CInTreeCombo();
    ~CInTreeCombo() override;

    void Init() override;
    bool Create(wxWindow* parent) override;
    // Scrolls the chosen item into view; the popup interface of wxWidgets 3
    // has no operation of this name, so nothing calls it.
    virtual void OnShow();
    wxSize GetAdjustedSize(int minWidth, int prefHeight, int maxHeight) override;
    wxWindow* GetControl() override;
    void SetStringValue(const wxString& text) override;
    wxString GetStringValue() const override;

    wxTreeItemId FindItemByText(wxTreeItemId parent, const wxString& text);
    void OnMouseMove(wxMouseEvent& event);
    void OnMouseClick(wxMouseEvent& event);
    void SendList();

    MorvanePlugConfig* m_parentInstance;
    wxTreeItemId m_currentItem;
    wxTreeItemId m_hotItem;

private:
    // The drive number of an item, or -1 for the root and items without one.
    int DriveOf(const wxTreeItemId& item) const;
    void ChooseDrive(const wxTreeItemId& item);

    wxDECLARE_EVENT_TABLE();
};

class CPlugComboCtrl : public wxComboCtrl {
public:
    CPlugComboCtrl(wxWindow* parent, int id, wxString value, wxPoint pos, wxSize size, long style);
    ~CPlugComboCtrl() override;

    void SetparentInstance(void* panel);
    void SetControlRes();

    CInTreeCombo* m_treePopup;
};

#endif
