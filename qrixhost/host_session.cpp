#include "qrixhost/host_session.h"

#include <wx/app.h>
#include <wx/menu.h>
#include <wx/sizer.h>
#include <wx/stattext.h>

#include "qrixhost/file_player.h"

namespace {

enum { kIdConfigure = wxID_HIGHEST + 1 };

}  // namespace

HostSession::HostSession(const wxString& pluginPath)
    : wxFrame(nullptr, wxID_ANY, "Qrix central management (stand-in host)", wxDefaultPosition, wxSize(1000, 700)),
      m_manager(std::make_unique<Manager>(wxTheApp, this)),
      m_tick(this)
{
    CreateStatusBar();
    SetSizer(new wxBoxSizer(wxVERTICAL));
    if (m_plugins.Load(pluginPath, m_manager.get())) {
        PlaceToolBar();
        SetStatusText(wxString::Format("%s %s loaded", m_plugins.info().title, m_plugins.info().version));
    }
    BuildMenus();
    if (!PluginLoaded())
        SetStatusText("no plugin: " + m_plugins.Error());
    GetSizer()->Add(new wxStaticText(this, wxID_ANY, "Disk playback opens from the toolbar or the Plugins menu."), 0,
                    wxALL, 8);
    Layout();
    Bind(wxEVT_TIMER, &HostSession::OnTick, this);
    Bind(wxEVT_CLOSE_WINDOW, &HostSession::OnClose, this);
    m_tick.Start(kTickMilliseconds);
    Show();
}

HostSession::~HostSession()
{
    m_tick.Stop();
    ReleasePlugin();
}

void HostSession::BuildMenus()
{
    auto* bar = new wxMenuBar;
    auto* file = new wxMenu;
    file->Append(wxID_EXIT);
    bar->Append(file, "&File");
    auto* plugins = new wxMenu;
    if (PluginLoaded()) {
        plugins->Append(kIdConfigure, "&Configure " + m_plugins.info().title);
        m_plugins.CreateMenu(plugins);
    }
    bar->Append(plugins, "&Plugins");
    SetMenuBar(bar);
    Bind(wxEVT_MENU, &HostSession::OnConfigure, this, kIdConfigure);
    Bind(wxEVT_MENU, &HostSession::OnQuit, this, wxID_EXIT);
}

void HostSession::PlaceToolBar()
{
    m_toolBar = m_plugins.CreateToolBar(this);
    if (m_toolBar)
        GetSizer()->Add(m_toolBar, 0, wxEXPAND);
}

// The host's tick reaches the plugin on the GUI thread.
void HostSession::OnTick(wxTimerEvent&)
{
    QrixEvent tick(iEVT_TIMER_UPDATED, 0);
    EventManager::Get()->ProcessEvent(tick);
}

void HostSession::OnConfigure(wxCommandEvent&)
{
    if (m_plugins.plugin())
        m_plugins.plugin()->Configure();
}

void HostSession::OnQuit(wxCommandEvent&)
{
    Close(true);
}

void HostSession::OnClose(wxCloseEvent& event)
{
    m_tick.Stop();
    ReleasePlugin();
    FilePlayer::CloseAll();
    FrameManager::Get()->Shutdown();  // its hidden window would keep the application running
    event.Skip();
}

void HostSession::ReleasePlugin()
{
    m_plugins.Unload();
}
