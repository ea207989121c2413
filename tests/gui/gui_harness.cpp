#include "tests/gui/gui_harness.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstring>
#include <thread>

#include <wx/app.h>
#include <wx/dialog.h>
#include <wx/evtloop.h>
#include <wx/image.h>
#include <wx/log.h>
#include <wx/modalhook.h>
#include <wx/msgdlg.h>
#include <wx/stdpaths.h>
#include <wx/treectrl.h>
#include <wx/uiaction.h>

namespace {

std::vector<wxString> g_modalMessages;

// Every modal dialog is answered with OK at once and its message kept.
class AnswerModalDialogs : public wxModalDialogHook {
protected:
    int Enter(wxDialog* dialog) override
    {
        auto* box = dynamic_cast<wxMessageDialog*>(dialog);
        g_modalMessages.push_back(box ? box->GetMessage() : dialog->GetTitle());
        return wxID_OK;
    }
    void Exit(wxDialog*) override {}
};

class TestApp : public wxApp {
public:
    bool OnInit() override
    {
        SetAppName("qrix-host");
        delete wxLog::SetActiveTarget(new wxLogStderr);
        wxInitAllImageHandlers();
        gui::UseDataPrefix(gui::BuildPrefix());
        return true;
    }
    void OnAssertFailure(const wxChar* file, int line, const wxChar* func, const wxChar* cond,
                         const wxChar* msg) override
    {
        ADD_FAILURE_AT(wxString(file).utf8_str(), line)
            << "toolkit assertion in " << wxString(func) << ": " << wxString(cond) << " " << wxString(msg ? msg : wxT(""));
    }
};

}  // namespace

namespace gui {

void Pump(int milliseconds)
{
    const auto until = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
    do {
        wxEventLoopBase* loop = wxEventLoopBase::GetActive();
        while (loop && loop->Pending())
            loop->Dispatch();
        wxTheApp->ProcessPendingEvents();
        wxTheApp->ProcessIdle();
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    } while (std::chrono::steady_clock::now() < until);
}

std::vector<wxString> TakeModalMessages()
{
    std::vector<wxString> messages;
    messages.swap(g_modalMessages);
    return messages;
}

void ClickAt(wxWindow* window, const wxPoint& point)
{
    wxUIActionSimulator mouse;
    mouse.MouseMove(window->ClientToScreen(point));
    Pump(100);
    mouse.MouseClick();
    Pump(300);
}

wxPoint LabelCentre(wxTreeCtrl* tree, const wxString& text)
{
    const wxTreeItemId root = tree->GetRootItem();
    wxTreeItemId item = root;
    wxTreeItemIdValue cookie;
    for (wxTreeItemId c = tree->GetFirstChild(root, cookie); c.IsOk(); c = tree->GetNextChild(root, cookie))
        if (tree->GetItemText(c) == text)
            item = c;
    wxRect label;
    tree->GetBoundingRect(item, label, true);
    return label.GetPosition() + label.GetSize() / 2;
}

void UseDataPrefix(const wxString& prefix)
{
    static_cast<wxStandardPaths&>(wxStandardPaths::Get()).SetInstallPrefix(prefix);
}

wxString BuildPrefix()
{
    return MORVANE_BUILD_DIR;
}

}  // namespace gui

int main(int argc, char** argv)
{
    // Listing the tests needs no display (and may happen where there is none).
    bool listing = false;
    for (int i = 1; i < argc; ++i)
        listing = listing || !std::strcmp(argv[i], "--gtest_list_tests");
    ::testing::InitGoogleTest(&argc, argv);
    if (listing)
        return RUN_ALL_TESTS();
    wxApp::SetInstance(new TestApp);
    if (!wxEntryStart(argc, argv) || !wxTheApp->CallOnInit())
        return 1;
    AnswerModalDialogs hook;
    hook.Register();
    int result = 0;
    {
        wxEventLoop loop;
        wxEventLoopActivator active(&loop);
        result = RUN_ALL_TESTS();
        gui::Pump(50);
    }
    wxTheApp->OnExit();
    wxEntryCleanup();
    return result;
}
