// GUI tests run in real windows (under Xvfb when there is no display): the
// toolkit is started once for the whole test binary, modal dialogs are
// intercepted and remembered instead of shown, and the event loop can be
// pumped until windows have settled.
#ifndef TESTS_GUI_GUI_HARNESS_H
#define TESTS_GUI_GUI_HARNESS_H

#include <string>
#include <vector>

#include <wx/string.h>

namespace gui {

// Processes pending events and idle work for about `milliseconds`.
void Pump(int milliseconds = 30);

// The messages of the modal dialogs that would have been shown since the
// last call, which forgets them.
std::vector<wxString> TakeModalMessages();

// Points the toolkit's data directory at `prefix`/share/qrix-host, as the
// installed host does; the build tree's prefix by default.
void UseDataPrefix(const wxString& prefix);
wxString BuildPrefix();

}  // namespace gui

#endif
