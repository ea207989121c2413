// The plugin object: its information, toolbar, menu, attachment and release.
#include <wx/menu.h>

#include "tests/gui/panel_fixture.h"

extern "C" void GetPluginInfo(PluginInfo* info);
extern "C" int GetPluginInterfaceVersion();

namespace {

TEST(PluginInfoTest, AppendsToWhatTheRecordHolds)
{
    PluginInfo info;
    info.name = "A:";
    GetPluginInfo(&info);
    EXPECT_EQ(info.name, "A:MorvanePlugin");
    EXPECT_EQ(info.version, "v1.0");
    EXPECT_EQ(info.description, "MorvanePlugin Plugin - a small plugin that test qrix plugin system");
    EXPECT_EQ(GetPluginInterfaceVersion(), 1);
}

TEST_F(PanelTest, AttachingConnectsTheToolbarCommandAndTheTick)
{
    EXPECT_EQ(EventManager::Get()->SinkCount(iEVT_TIMER_UPDATED), 1u);
    EXPECT_EQ(plugin_->GetConfigurationPriority(), 50);
    EXPECT_EQ(plugin_->GetConfigurationGroup(), 32);
    EXPECT_EQ(plugin_->GetConfigurationPanel(frame_), nullptr);

    // The toolbar command reaches the plugin through the application object.
    wxCommandEvent command(wxEVT_MENU, iEVT_REMOTEPLAY_TOOLBAR);
    wxTheApp->ProcessEvent(command);
    gui::Pump();
    ASSERT_NE(panel(), nullptr);
    EXPECT_TRUE(panel()->m_dialog->IsShown());
    EXPECT_EQ(panel()->m_dialog->GetParent(), frame_);
}

TEST_F(PanelTest, ToolbarHoldsOneToolWithTheImageOrSaysItHasNone)
{
    CPlugToolBar* bar = plugin_->CreateToolBar(frame_);
    ASSERT_NE(bar, nullptr);
    EXPECT_EQ(bar->GetToolCount(), 1u);
    wxAuiToolBarItem* tool = bar->FindToolByIndex(0);
    EXPECT_EQ(tool->GetId(), iEVT_REMOTEPLAY_TOOLBAR);
    EXPECT_EQ(tool->GetLabel(), "Remote Play");
    // wxAuiToolBar of wxWidgets 3.2 ignores SetToolBitmapSize: the tool's
    // bitmap carries the size itself.
    EXPECT_EQ(tool->GetBitmapBundle().GetDefaultSize(), wxSize(32, 32));
    EXPECT_TRUE(gui::TakeModalMessages().empty());
    EXPECT_NE(plugin_->CreateToolBar(frame_), bar);  // the first one is the host's to keep
    wxMenu menu;
    plugin_->CreatePluginMenu(&menu);
    EXPECT_EQ(menu.GetMenuItemCount(), 0u);

    gui::UseDataPrefix(wxString::FromUTF8(dir_.c_str()));
    CPlugToolBar* imageless = plugin_->CreateToolBar(frame_);
    gui::UseDataPrefix(gui::BuildPrefix());
    EXPECT_EQ(gui::TakeModalMessages(), (std::vector<wxString>{"Failed to load Images"}));
    EXPECT_EQ(imageless->GetToolCount(), 1u);
}

TEST_F(PanelTest, PanelWithoutItsImagesStillHasItsButtons)
{
    gui::UseDataPrefix(wxString::FromUTF8(dir_.c_str()));
    MorvanePlugConfig* p = OpenPanel();
    gui::UseDataPrefix(gui::BuildPrefix());
    EXPECT_TRUE(gui::TakeModalMessages().empty());
    EXPECT_FALSE(p->m_btnPlay->GetBitmapLabel().IsOk());
    EXPECT_EQ(p->m_btnPlay->GetPosition(), wxPoint(395, 530));
}

}  // namespace
