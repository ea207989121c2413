// The host SDK's plugin side: the base class of a plugin, the manager that
// hands out the application, its information record, the configuration panel
// base, the toolbar class, the translation engine and the free helpers.
#ifndef HOST_SDK_PLUGIN_H
#define HOST_SDK_PLUGIN_H

#include <wx/aui/auibar.h>
#include <wx/event.h>
#include <wx/panel.h>
#include <wx/string.h>

#include "host/sdk_api.h"

class wxMenu;
class wxWindow;
class ConfigurationPanel;
class CPlugToolBar;

// What a plugin says of itself.
struct QRIX_SDK_API PluginInfo {
    wxString name;
    wxString title;
    wxString version;
    wxString description;
    wxString author;
};

// The host application as a plugin sees it.
class QRIX_SDK_API Manager {
public:
    Manager(wxEvtHandler* app, wxWindow* appWindow);
    wxEvtHandler* GetApp() const;
    wxWindow* GetAppWindow() const;
    // Makes a plugin's resource archive (a file in the host's data
    // directory) known to the host; false when there is no such file.
    static bool LoadResource(const wxString& name);

private:
    wxEvtHandler* m_app;
    wxWindow* m_appWindow;
};

class QRIX_SDK_API Plugin : public wxEvtHandler {
public:
    explicit Plugin(Manager* manager);
    virtual ~Plugin();

    virtual int GetType() const;
    virtual int Configure();
    virtual int GetConfigurationPriority() const;
    virtual int GetConfigurationGroup() const;
    virtual ConfigurationPanel* GetConfigurationPanel(wxWindow* parent);
    virtual void CreatePluginMenu(wxMenu* menu);
    virtual CPlugToolBar* CreateToolBar(wxWindow* parent);
    virtual bool CanDetach() const;
    virtual void OnAttach();
    virtual void OnRelease(bool appShutDown);
    virtual void NotImplemented(const wxString& what) const;

protected:
    Manager* m_manager;
    CPlugToolBar* m_toolBar;
};

// The base of a plugin's settings or playback panel.
class QRIX_SDK_API ConfigurationPanel : public wxPanel {
public:
    ConfigurationPanel();
    virtual wxString GetTitle() const = 0;
    virtual wxString GetBitmapBaseName() const = 0;
    virtual void OnApply() = 0;
    virtual void OnCancel() = 0;
};

// The toolbar a plugin hands to the host, which places and owns it.
class QRIX_SDK_API CPlugToolBar : public wxAuiToolBar {
public:
    CPlugToolBar(wxWindow* parent, wxWindowID id, const wxPoint& pos, const wxSize& size, long style);
};

// The host's translation of user-visible texts.
class QRIX_SDK_API wxLanguageEngine {
public:
    static wxLanguageEngine* Get();
    wxString Translation(const wxString& text) const;
};

// Whether a 32-bit address (host byte order) is a usable unicast address.
QRIX_SDK_API bool IsGoodIP(unsigned int address, bool allowBroadcast);
// "a.b.c.d" to a 32-bit address in host byte order (a in the top byte); false,
// leaving `address` as it was, when the text is no such address.
QRIX_SDK_API bool StringIPtoUint32(const wxString& text, unsigned int& address);
// A monotonic tick count, unique enough to tell objects apart.
QRIX_SDK_API long long getCPUTickCount();

#endif
