// The list of recordings: activating a row plays it; every other list
// notification and right press stops at the control.
#ifndef CONTROLS_PLUG_LIST_CTRL_H
#define CONTROLS_PLUG_LIST_CTRL_H

#include <wx/listctrl.h>

class CPlugListCtrl : public wxListCtrl {
public:
    CPlugListCtrl(wxWindow* parent, int id, wxPoint pos, wxSize size, long style);
    ~CPlugListCtrl() override;

    void SetparentInstance(void* panel);

    void OnBeginDrag(wxListEvent& event);
    void OnBeginRDrag(wxListEvent& event);
    void OnBeginLabelEdit(wxListEvent& event);
    void OnEndLabelEdit(wxListEvent& event);
    void OnDeleteItem(wxListEvent& event);
    void OnDeleteAllItems(wxListEvent& event);
    void OnSelected(wxListEvent& event);
    void OnDeselected(wxListEvent& event);
    void OnListKeyDown(wxListEvent& event);
    void OnActivated(wxListEvent& event);
    void OnFocused(wxListEvent& event);
    void OnColClick(wxListEvent& event);
    void OnColRightClick(wxListEvent& event);
    void OnColBeginDrag(wxListEvent& event);
    void OnColDragging(wxListEvent& event);
    void OnColEndDrag(wxListEvent& event);
    void OnCacheHint(wxListEvent& event);
    void OnRightClick(wxMouseEvent& event);

    void* m_parentInstance = nullptr;

private:
    wxDECLARE_EVENT_TABLE();
};

#endif
