// GUI tests run in real windows (under Xvfb when there is no display): the
// toolkit is started once for the whole test binary, modal dialogs are
// intercepted and remembered instead of shown, and the event loop can be
// pumped until windows have settled.
#ifndef TESTS_GUI_GUI_HARNESS_H
#define TESTS_GUI_GUI_HARNESS_H

#include <string>
#include <vector>

#include <wx/gdicmn.h>
#include <wx/string.h>

class wxTreeCtrl;
class wxWindow;

namespace gui {

// Processes pending events and idle work for about `milliseconds`.
void Pump(int milliseconds = 30);

// The messages of the modal dialogs that would have been shown since the
// last call, which forgets them.
std::vector<wxString> TakeModalMessages();

// A real left click (through the X server) at a point of a window.
void ClickAt(wxWindow* window, const wxPoint& point);

// The centre of the label of the tree's first-level item with this text, or
// of the root's when none has it.
wxPoint LabelCentre(wxTreeCtrl* tree, const wxString& text);

// Points the toolkit's data directory at `prefix`/share/qrix-host, as the
// installed host does; the build tree's prefix by default.
void UseDataPrefix(const wxString& prefix);
wxString BuildPrefix();

}  // namespace gui

#endif
