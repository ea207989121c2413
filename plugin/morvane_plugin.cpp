#include "plugin/morvane_plugin.h"

#include "panel/morvane_plug_config.h"

wxBEGIN_EVENT_TABLE(MorvanePlugin, wxEvtHandler)
    EVT_MENU(iEVT_REMOTEPLAY_TOOLBAR, MorvanePlugin::OnMenuSelect)
wxEND_EVENT_TABLE()

MorvanePlugin::MorvanePlugin(Manager* manager)
    : Plugin(manager), m_appHandler(manager->GetApp()), m_configPanel(nullptr)
{
}

MorvanePlugin::~MorvanePlugin()
{
    m_appHandler->Disconnect(iEVT_REMOTEPLAY_TOOLBAR, wxEVT_MENU, wxCommandEventHandler(MorvanePlugin::OnMenuSelect),
                             nullptr, this);
    DeletePanel();
    EventManager::Get()->RemoveAllEventSinksFor(this);
}

void MorvanePlugin::DeletePanel()
{
    delete m_configPanel;
    m_configPanel = nullptr;
}

// At most one panel: the old one is gone before the new one is built.
void MorvanePlugin::OpenPanel()
{
    DeletePanel();
    wxWindow* parent = m_manager->GetAppWindow();
    wxGLContext* context = FrameManager::Get()->GLRCProcess(1, nullptr);
    m_configPanel = new MorvanePlugConfig(parent, this, context);
}

int MorvanePlugin::Configure()
{
    OpenPanel();
    return 1;
}

void MorvanePlugin::OnMenuSelect(wxCommandEvent&)
{
    OpenPanel();
}

int MorvanePlugin::GetConfigurationPriority() const
{
    return 50;
}

int MorvanePlugin::GetConfigurationGroup() const
{
    return 32;
}

ConfigurationPanel* MorvanePlugin::GetConfigurationPanel(wxWindow*)
{
    return nullptr;
}

void MorvanePlugin::CreatePluginMenu(wxMenu*) {}

void MorvanePlugin::OnAttach()
{
    Manager::LoadResource("MorvanePlugin.zip");
    m_appHandler->Connect(iEVT_REMOTEPLAY_TOOLBAR, wxEVT_MENU, wxCommandEventHandler(MorvanePlugin::OnMenuSelect),
                          nullptr, this);
    EventManager::Get()->RegisterEventSink(iEVT_TIMER_UPDATED,
                                           new iEventFunctor<MorvanePlugin, QrixEvent>(this, &MorvanePlugin::OnTimer));
}

void MorvanePlugin::OnRelease(bool)
{
    DeletePanel();
}

void MorvanePlugin::OnTimer(QrixEvent&)
{
    if (!m_configPanel || !m_configPanel->IsShown() || !m_configPanel->m_glPane)
        return;
    m_configPanel->m_glPane->ProcessTexture(2, nullptr);
}
