#include "qrixhost/plugin_host.h"

#include <dlfcn.h>

#include <wx/app.h>

PluginHost::~PluginHost()
{
    Unload();
}

bool PluginHost::Fail(const wxString& why)
{
    m_error = why;
    if (m_library)
        dlclose(m_library);
    m_library = nullptr;
    return false;
}

bool PluginHost::Load(const wxString& path, Manager* manager)
{
    m_library = dlopen(path.utf8_str(), RTLD_NOW | RTLD_LOCAL);
    if (!m_library)
        return Fail(wxString::FromUTF8(dlerror()));
    auto create = reinterpret_cast<Plugin* (*)(Manager*)>(dlsym(m_library, "CreatePlugin"));
    m_release = reinterpret_cast<void (*)(Plugin*)>(dlsym(m_library, "ReleasePlugin"));
    auto info = reinterpret_cast<void (*)(PluginInfo*)>(dlsym(m_library, "GetPluginInfo"));
    auto version = reinterpret_cast<int (*)()>(dlsym(m_library, "GetPluginInterfaceVersion"));
    if (!create || !m_release || !info || !version)
        return Fail(path + ": not a plugin (an entry point is missing)");
    if (version() != kInterfaceVersion)
        return Fail(wxString::Format("%s: plugin interface %d, this host speaks %d", path, version(), kInterfaceVersion));
    info(&m_info);
    m_plugin = create(manager);
    if (!m_plugin)
        return Fail(path + ": the plugin was not created");
    m_plugin->OnAttach();
    return true;
}

CPlugToolBar* PluginHost::CreateToolBar(wxWindow* parent)
{
    return m_plugin ? m_plugin->CreateToolBar(parent) : nullptr;
}

void PluginHost::CreateMenu(wxMenu* menu)
{
    if (m_plugin)
        m_plugin->CreatePluginMenu(menu);
}

void PluginHost::Unload()
{
    if (m_plugin) {
        m_plugin->OnRelease(true);
        m_release(m_plugin);
        m_plugin = nullptr;
    }
    if (m_library) {
        // Windows the plugin left for deletion still run its code.
        if (wxTheApp)
            wxTheApp->ProcessIdle();
        dlclose(m_library);
        m_library = nullptr;
    }
}
