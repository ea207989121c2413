// One run of the host application: its main window with the plugin's
// toolbar, the plugin, and the periodic tick delivered to the plugin.
#ifndef QRIXHOST_HOST_SESSION_H
#define QRIXHOST_HOST_SESSION_H

#include <memory>

#include <wx/frame.h>
#include <wx/timer.h>

#include "qrixhost/disk_playback_service.h"
#include "qrixhost/plugin_host.h"

class HostSession : public wxFrame {
public:
    static constexpr int kTickMilliseconds = 40;  // 25 ticks a second

    // Shows the main window and loads the plugin at `pluginPath`; Error() says
    // why when the plugin could not be loaded (the window still shows).
    explicit HostSession(const wxString& pluginPath);
    ~HostSession() override;

    bool PluginLoaded() const { return m_plugins.plugin() != nullptr; }
    const wxString& Error() const { return m_plugins.Error(); }
    PluginHost& plugins() { return m_plugins; }
    CPlugToolBar* toolBar() const { return m_toolBar; }
    // Lets the plugin go; the window stays until it is destroyed.
    void ReleasePlugin();

private:
    void BuildMenus();
    void PlaceToolBar();
    void OnTick(wxTimerEvent& event);
    void OnConfigure(wxCommandEvent& event);
    void OnQuit(wxCommandEvent& event);
    void OnClose(wxCloseEvent& event);

    std::unique_ptr<Manager> m_manager;
    PluginHost m_plugins;
    CPlugToolBar* m_toolBar = nullptr;
    wxTimer m_tick;
};

#endif
