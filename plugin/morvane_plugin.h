// The plugin object the host talks to: it opens the playback panel on the
// host's toolbar command or Configure, and refreshes the panel's canvas on
// every host timer tick.
#ifndef PLUGIN_MORVANE_PLUGIN_H
#define PLUGIN_MORVANE_PLUGIN_H

#include "host/qrix_sdk.h"

class MorvanePlugConfig;

class MorvanePlugin : public Plugin {
public:
    explicit MorvanePlugin(Manager* manager);
    ~MorvanePlugin() override;

    int Configure() override;
    int GetConfigurationPriority() const override;
    int GetConfigurationGroup() const override;
    ConfigurationPanel* GetConfigurationPanel(wxWindow* parent) override;
    void CreatePluginMenu(wxMenu* menu) override;
    CPlugToolBar* CreateToolBar(wxWindow* parent) override;
    void OnAttach() override;
    void OnRelease(bool appShutDown) override;

    void OnMenuSelect(wxCommandEvent& event);
    void OnTimer(QrixEvent& event);

    wxEvtHandler* m_appHandler;
    MorvanePlugConfig* m_configPanel;

private:
    void OpenPanel();
    void DeletePanel();

    wxDECLARE_EVENT_TABLE();
};

#endif
