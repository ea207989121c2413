// End to end: the stand-in host application loads the built plugin library
// by its entry points; real mouse input presses the plugin's toolbar tool and
// chooses a drive; the recordings appear in the panel's list.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>

#include <wx/combo.h>
#include <wx/dcmemory.h>
#include <wx/dcscreen.h>
#include <wx/listctrl.h>
#include <wx/treectrl.h>
#include <wx/uiaction.h>

#include "qrixhost/host_session.h"
#include "tests/gui/gui_harness.h"
#include "tools/dvrimage/dvr_image.h"

namespace {

class HostSessionTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        dir_ = std::filesystem::temp_directory_path() / ("qrix-host-test-" + std::to_string(::getpid()));
        std::filesystem::create_directories(dir_);
        ::setenv("MORVANE_DISK_PATTERN", (dir_ / "disk%d.img").c_str(), 1);
        WriteSampleDisk((dir_ / "disk0.img").string());
        InstallDiskPlaybackService();
        EventManager::Get()->ClearHistory();
        session_ = new HostSession(MORVANE_PLUGIN_PATH);
        gui::Pump(200);
    }

    void TearDown() override
    {
        session_->Close(true);
        gui::Pump(200);
        ::unsetenv("MORVANE_DISK_PATTERN");
        std::filesystem::remove_all(dir_);
    }

    static void WriteSampleDisk(const std::string& path)
    {
        dvrimage::Layout layout;
        layout.dataBlockMax = 16;
        dvrimage::DiskImage image(layout);
        image.Add(dvrimage::GeneratedRecording(0, 2, 4, 1700000000, 1700003600, 16));
        image.Add(dvrimage::GeneratedRecording(1, 5, 9, 1700007200, 1700010800, 16));
        image.Add(dvrimage::GeneratedRecording(2, 12, 1, 1700014400, 1700021600, 16));
        image.Write(path);
    }

    // A real click (through the X server) at a point of a window.
    static void ClickAt(wxWindow* window, const wxPoint& point)
    {
        wxUIActionSimulator mouse;
        mouse.MouseMove(window->ClientToScreen(point));
        gui::Pump(100);
        mouse.MouseClick();
        gui::Pump(300);
    }

    static void SaveScreenshot(wxWindow* window, const char* path)
    {
        const wxRect area = window->GetScreenRect();
        wxScreenDC screen;
        wxBitmap shot(area.width, area.height, 24);
        wxMemoryDC copy(shot);
        copy.Blit(0, 0, area.width, area.height, &screen, area.x, area.y);
        copy.SelectObject(wxNullBitmap);
        shot.SaveFile(path, wxBITMAP_TYPE_PNG);
    }

    std::filesystem::path dir_;
    HostSession* session_ = nullptr;
};

TEST_F(HostSessionTest, ToolbarOpensThePanelAndAChosenDriveListsItsRecordings)
{
    ASSERT_TRUE(session_->PluginLoaded()) << session_->Error();
    EXPECT_EQ(session_->plugins().info().title, "MorvanePlugin");
    CPlugToolBar* bar = session_->toolBar();
    ASSERT_NE(bar, nullptr);

    const wxRect tool = bar->GetToolRect(iEVT_REMOTEPLAY_TOOLBAR);
    ClickAt(bar, tool.GetPosition() + tool.GetSize() / 2);
    auto* list = dynamic_cast<wxListCtrl*>(wxWindow::FindWindowById(1012));
    auto* combo = dynamic_cast<wxComboCtrl*>(wxWindow::FindWindowById(1011));
    ASSERT_NE(list, nullptr) << "the toolbar tool did not open the panel";
    ASSERT_NE(combo, nullptr);
    EXPECT_EQ(list->GetItemCount(), 0);

    combo->Popup();
    gui::Pump(200);
    auto* tree = dynamic_cast<wxTreeCtrl*>(combo->GetPopupControl()->GetControl());
    ASSERT_NE(tree, nullptr);
    wxTreeItemIdValue cookie;
    const wxTreeItemId drive = tree->GetFirstChild(tree->GetRootItem(), cookie);
    ASSERT_TRUE(drive.IsOk());
    EXPECT_EQ(tree->GetItemText(drive), "PHYSICALDRIVE0");
    wxRect label;
    ASSERT_TRUE(tree->GetBoundingRect(drive, label, true));
    ClickAt(tree, label.GetPosition() + label.GetSize() / 2);

    ASSERT_EQ(list->GetItemCount(), 3);
    EXPECT_EQ(list->GetItemText(0, 0), "0.");
    EXPECT_EQ(list->GetItemText(2, 0), "2.");
    EXPECT_EQ(combo->GetValue(), "PHYSICALDRIVE0");
    if (const char* shot = std::getenv("MORVANE_SCREENSHOT"))
        SaveScreenshot(list->GetParent(), shot);
}

TEST_F(HostSessionTest, PluginsStaticTableTookTheHostsToolbarIdentifierWhenLoaded)
{
    ASSERT_TRUE(session_->PluginLoaded()) << session_->Error();
    wxCommandEvent command(wxEVT_MENU, iEVT_REMOTEPLAY_TOOLBAR);
    session_->plugins().plugin()->ProcessEvent(command);
    gui::Pump(100);
    EXPECT_NE(wxWindow::FindWindowById(1012), nullptr);
}

TEST(PluginHostTest, RefusesALibraryThatIsNoPlugin)
{
    PluginHost host;
    Manager manager(nullptr, nullptr);
    EXPECT_FALSE(host.Load("/no/such/library.so", &manager));
    EXPECT_FALSE(host.Error().empty());
    EXPECT_FALSE(host.Load("libm.so.6", &manager));
    EXPECT_TRUE(host.Error().Contains("not a plugin"));
}

}  // namespace
