// qrix-host: a small stand-in for the central-management application that
// loads the disk playback plugin and serves it.
//   qrix-host [--plugin PATH]
#include <cstdio>

#include <wx/app.h>
#include <wx/cmdline.h>
#include <wx/filename.h>
#include <wx/log.h>
#include <wx/stdpaths.h>

#include "qrixhost/host_session.h"

namespace {

wxString DefaultPluginPath()
{
    return wxStandardPaths::Get().GetInstallPrefix() + "/lib/qrix-host/plugins/libMorvanePlugin.so";
}

}  // namespace

class QrixHostApp : public wxApp {
public:
    bool OnInit() override
    {
        SetAppName("qrix-host");
        delete wxLog::SetActiveTarget(new wxLogStderr);
        wxCmdLineParser args(argc, argv);
        args.AddOption("p", "plugin", "the plugin library to load");
        args.AddSwitch("h", "help", "show this help", wxCMD_LINE_OPTION_HELP);
        if (args.Parse() != 0)
            return false;
        wxString plugin = DefaultPluginPath();
        args.Found("plugin", &plugin);
        InstallDiskPlaybackService();
        auto* session = new HostSession(wxFileName(plugin).GetAbsolutePath());
        if (!session->PluginLoaded())
            wxLogError("qrix-host: %s", session->Error());
        return true;
    }

    // A failed toolkit check is reported, never a modal prompt.
    void OnAssertFailure(const wxChar* file, int line, const wxChar* func, const wxChar* cond,
                         const wxChar* msg) override
    {
        const wxString text = wxString::Format("qrix-host: toolkit check failed at %s:%d in %s: %s %s\n", file, line,
                                               func, cond, msg ? msg : wxT(""));
        std::fputs(text.utf8_str(), stderr);
    }
};

wxIMPLEMENT_APP(QrixHostApp);
