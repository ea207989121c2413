// The plugin side of the host SDK: manager, plugin base, panel and toolbar
// bases, translation and the address helpers.
#include <chrono>

#include <wx/filename.h>
#include <wx/log.h>
#include <wx/stdpaths.h>
#include <wx/tokenzr.h>

#include "host/sdk_plugin.h"

Manager::Manager(wxEvtHandler* app, wxWindow* appWindow) : m_app(app), m_appWindow(appWindow) {}

wxEvtHandler* Manager::GetApp() const
{
    return m_app;
}

wxWindow* Manager::GetAppWindow() const
{
    return m_appWindow;
}

bool Manager::LoadResource(const wxString& name)
{
    return wxFileName(wxStandardPaths::Get().GetDataDir(), name).FileExists();
}

Plugin::Plugin(Manager* manager) : m_manager(manager), m_toolBar(nullptr) {}

Plugin::~Plugin() = default;

int Plugin::GetType() const
{
    return 0;
}

int Plugin::Configure()
{
    return 0;
}

int Plugin::GetConfigurationPriority() const
{
    return 50;
}

int Plugin::GetConfigurationGroup() const
{
    return 0;
}

ConfigurationPanel* Plugin::GetConfigurationPanel(wxWindow*)
{
    return nullptr;
}

void Plugin::CreatePluginMenu(wxMenu*) {}

CPlugToolBar* Plugin::CreateToolBar(wxWindow*)
{
    return nullptr;
}

bool Plugin::CanDetach() const
{
    return true;
}

void Plugin::OnAttach() {}

void Plugin::OnRelease(bool) {}

void Plugin::NotImplemented(const wxString& what) const
{
    wxLogWarning("%s is not implemented", what);
}

ConfigurationPanel::ConfigurationPanel() = default;

CPlugToolBar::CPlugToolBar(wxWindow* parent, wxWindowID id, const wxPoint& pos, const wxSize& size, long style)
    : wxAuiToolBar(parent, id, pos, size, style)
{
}

wxLanguageEngine* wxLanguageEngine::Get()
{
    static wxLanguageEngine engine;
    return &engine;
}

// The stand-in host ships in one language: every text shows as it is.
wxString wxLanguageEngine::Translation(const wxString& text) const
{
    return text;
}

bool IsGoodIP(unsigned int address, bool allowBroadcast)
{
    if (address == 0)
        return false;
    return allowBroadcast || address != 0xFFFFFFFFu;
}

bool StringIPtoUint32(const wxString& text, unsigned int& address)
{
    wxStringTokenizer parts(text, ".", wxTOKEN_RET_EMPTY_ALL);
    if (parts.CountTokens() != 4)
        return false;
    unsigned int value = 0;
    while (parts.HasMoreTokens()) {
        unsigned long part = 0;
        const wxString token = parts.GetNextToken();
        if (token.empty() || token.length() > 3 || !token.ToULong(&part) || part > 255)
            return false;
        value = value << 8 | static_cast<unsigned int>(part);
    }
    address = value;
    return true;
}

long long getCPUTickCount()
{
    return std::chrono::duration_cast<std::chrono::nanoseconds>(
               std::chrono::steady_clock::now().time_since_epoch())
        .count();
}
