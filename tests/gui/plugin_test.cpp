// The plugin object: its toolbar, menu, attachment and release.
#include <wx/menu.h>

#include "tests/gui/panel_fixture.h"

namespace {

TEST_F(PanelTest, AttachingConnectsTheToolbarCommandAndTheTick)
{
    EXPECT_EQ(EventManager::Get()->SinkCount(iEVT_TIMER_UPDATED), 1u);
    EXPECT_EQ(plugin_->GetConfigurationPanel(frame_), nullptr);

    // The toolbar command reaches the plugin through the application object.
    wxCommandEvent command(wxEVT_MENU, iEVT_REMOTEPLAY_TOOLBAR);
    wxTheApp->ProcessEvent(command);
    gui::Pump();
    ASSERT_NE(panel(), nullptr);
    EXPECT_TRUE(panel()->m_dialog->IsShown());
    EXPECT_EQ(panel()->m_dialog->GetParent(), frame_);
}

// Without the images of the data directory the toolbar says so once and
// keeps its tool; the panel keeps its buttons, in their places.
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
    MorvanePlugConfig* p = OpenPanel();
    gui::UseDataPrefix(gui::BuildPrefix());
    EXPECT_EQ(gui::TakeModalMessages(), (std::vector<wxString>{"Failed to load Images"}));
    EXPECT_EQ(imageless->GetToolCount(), 1u);
    EXPECT_FALSE(p->m_btnPlay->GetBitmapLabel().IsOk());
    EXPECT_EQ(p->m_btnPlay->GetPosition(), wxPoint(395, 530));
}

}  // namespace
