// Loads a plugin library the way the host application does: by its four
// exported functions, checking the interface version, and lets it go again.
#ifndef QRIXHOST_PLUGIN_HOST_H
#define QRIXHOST_PLUGIN_HOST_H

#include <wx/string.h>

#include "host/qrix_sdk.h"

class wxMenu;

class PluginHost {
public:
    static constexpr int kInterfaceVersion = 1;

    PluginHost() = default;
    ~PluginHost();
    PluginHost(const PluginHost&) = delete;
    PluginHost& operator=(const PluginHost&) = delete;

    // Opens the library, checks its interface version, reads its
    // information, creates and attaches the plugin. False, with the reason in
    // Error(), when the library is not a plugin of this host.
    bool Load(const wxString& path, Manager* manager);
    // Asks the plugin for its toolbar and its menu entries.
    CPlugToolBar* CreateToolBar(wxWindow* parent);
    void CreateMenu(wxMenu* menu);
    // Releases the plugin, lets every window it left behind go, and closes
    // the library.
    void Unload();

    Plugin* plugin() const { return m_plugin; }
    const PluginInfo& info() const { return m_info; }
    const wxString& Error() const { return m_error; }

private:
    bool Fail(const wxString& why);

    void* m_library = nullptr;
    Plugin* m_plugin = nullptr;
    void (*m_release)(Plugin*) = nullptr;
    PluginInfo m_info;
    wxString m_error;
};

#endif
