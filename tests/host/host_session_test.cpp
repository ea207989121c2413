// End to end: the stand-in host application loads the built plugin library
// by its entry points; real mouse input presses the plugin's toolbar tool and
// chooses a drive; the recordings appear in the panel's list.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <set>
#include <filesystem>
#include <fstream>

#include <wx/combo.h>
#include <wx/dcmemory.h>
#include <wx/dcscreen.h>
#include <wx/listctrl.h>
#include <wx/stattext.h>
#include <wx/treectrl.h>
#include <wx/uiaction.h>

#include "qrixhost/file_player.h"
#include "qrixhost/host_session.h"
#include "tests/gui/gui_harness.h"
#include "tests/host/clip_disk.h"
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

    // The sample disk of scripts/sample: four recordings, the newest across
    // the end of the data ring, the first one's list entry repaired from
    // the mirror.
    static void WriteSampleDisk(const std::string& path)
    {
        dvrimage::DiskImage image = WriteClipDisk(
            path, {{0, 2, 4, 1700000000, 3}, {1, 5, 9, 1700007200, 5}, {2, 10, 11, 1700010800, 2},
                   {3, 13, 1, 1700014400, 5}});
        image.Damage(dvrimage::Target::ListEntry, 0);
    }

    // Opens the drive selector and clicks drive `n`'s label, for real.
    static void ChooseDrive(int n)
    {
        auto* combo = dynamic_cast<wxComboCtrl*>(wxWindow::FindWindowById(1011));
        ASSERT_NE(combo, nullptr);
        combo->Popup();
        gui::Pump(200);
        auto* tree = dynamic_cast<wxTreeCtrl*>(combo->GetPopupControl()->GetControl());
        ASSERT_NE(tree, nullptr);
        gui::ClickAt(tree, gui::LabelCentre(tree, wxString::Format("PHYSICALDRIVE%d", n)));
    }

    // A picture of a window as the screen shows it, for the README. A
    // second grab in one process may return the first again: one a run.
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
    std::ofstream(dir_ / "disk1.img") << std::string(4096, 'x');
    ASSERT_TRUE(session_->PluginLoaded()) << session_->Error();
    EXPECT_EQ(session_->plugins().info().title, "MorvanePlugin");
    CPlugToolBar* bar = session_->toolBar();
    ASSERT_NE(bar, nullptr);

    const wxRect tool = bar->GetToolRect(iEVT_REMOTEPLAY_TOOLBAR);
    gui::ClickAt(bar, tool.GetPosition() + tool.GetSize() / 2);
    auto* list = dynamic_cast<wxListCtrl*>(wxWindow::FindWindowById(1012));
    auto* combo = dynamic_cast<wxComboCtrl*>(wxWindow::FindWindowById(1011));
    ASSERT_NE(list, nullptr) << "the toolbar tool did not open the panel";
    ASSERT_NE(combo, nullptr);
    EXPECT_EQ(list->GetItemCount(), 0);

    ChooseDrive(0);
    ASSERT_EQ(list->GetItemCount(), 4);
    EXPECT_EQ(list->GetItemText(0, 0), "0.");
    EXPECT_EQ(list->GetItemText(3, 0), "3.");
    EXPECT_EQ(combo->GetValue(), "PHYSICALDRIVE0");
    if (const char* shot = std::getenv("MORVANE_SCREENSHOT"))
        SaveScreenshot(list->GetParent(), shot);

    // A drive that is no recorder disk, chosen after a good one: the list is
    // emptied and the line under the buttons says why.
    ChooseDrive(1);
    EXPECT_EQ(list->GetItemCount(), 0);
    bool said = false;
    for (wxWindow* child : list->GetParent()->GetChildren())
        if (auto* text = dynamic_cast<wxStaticText*>(child))
            said = said || text->GetToolTipText().EndsWith("disk1.img): not a recorder disk: no superblock at the start");
    EXPECT_TRUE(said);
    if (const char* shot = std::getenv("MORVANE_FAILED_SCREENSHOT"))
        SaveScreenshot(list->GetParent(), shot);
}

// How many colours a sample of a picture's pixels holds.
int ColourCount(const wxImage& image)
{
    std::set<unsigned> colours;
    const unsigned char* p = image.GetData();
    for (int i = 0; i < image.GetWidth() * image.GetHeight(); i += 7)
        colours.insert(p[3 * i] << 16 | p[3 * i + 1] << 8 | p[3 * i + 2]);
    return static_cast<int>(colours.size());
}

TEST_F(HostSessionTest, ActivatedRowPlaysInTheCanvasAndTheTransportCommandsReachTheHost)
{
    ASSERT_TRUE(session_->PluginLoaded()) << session_->Error();
    session_->plugins().plugin()->Configure();
    gui::Pump(200);
    auto* list = dynamic_cast<wxListCtrl*>(wxWindow::FindWindowById(1012));
    ASSERT_NE(list, nullptr);
    wxWindow* dialog = list->GetParent();
    BasicGLPane* canvas = nullptr;
    for (wxWindow* child : dialog->GetChildren())
        if (auto* pane = dynamic_cast<BasicGLPane*>(child))
            canvas = pane;
    ASSERT_NE(canvas, nullptr);

    // Choose the drive through the selector, then double-click row 1.
    ChooseDrive(0);
    ASSERT_EQ(list->GetItemCount(), 4);
    wxRect row;
    ASSERT_TRUE(list->GetItemRect(1, row));
    wxUIActionSimulator mouse;
    mouse.MouseMove(list->ClientToScreen(row.GetPosition() + wxPoint(20, row.height / 2)));
    gui::Pump(100);
    mouse.MouseDblClick();
    gui::Pump(1500);

    const Picture first = canvas->LastPicture();
    const int received = canvas->PicturesReceived();
    EXPECT_GT(received, 10) << "no pictures reached the canvas";
    EXPECT_EQ(first.width, 320);
    const wxImage shotA = canvas->Snapshot();
    gui::Pump(1300);  // the clip's counter turns every second
    const wxImage shotB = canvas->Snapshot();
    ASSERT_TRUE(shotA.IsOk() && shotB.IsOk());
    EXPECT_GT(canvas->PicturesReceived(), received);
    EXPECT_GT(ColourCount(shotA), 8) << "the canvas is blank";
    EXPECT_NE(0, memcmp(shotA.GetData(), shotB.GetData(), shotA.GetWidth() * shotA.GetHeight() * 3))
        << "the picture does not change";
    if (const char* shot = std::getenv("MORVANE_PLAYING_SCREENSHOT"))
        SaveScreenshot(dialog, shot);

    // Every transport button, pressed for real.
    const std::vector<std::pair<int, int>> buttons = {{1029, 0}, {1028, 1024}, {1032, 2048}, {1031, -1024}};
    for (const auto& [id, speed] : buttons) {
        wxWindow* button = wxWindow::FindWindowById(id, dialog);
        ASSERT_NE(button, nullptr);
        gui::ClickAt(button, wxPoint(15, 15));
        std::vector<int> commands;
        for (const HostEventRecord& r : EventManager::Get()->History())
            if (r.type == iEVT_HDD_COMMAND)
                commands.push_back(r.command);
        ASSERT_FALSE(commands.empty());
        EXPECT_EQ(commands.back(), speed) << "button " << id;
    }
    gui::ClickAt(wxWindow::FindWindowById(1030, dialog), wxPoint(15, 15));  // stop
    EXPECT_EQ(EventManager::Get()->History().back().type, iEVT_HDD_DISCONNECTED);
    gui::ClickAt(wxWindow::FindWindowById(1033, dialog), wxPoint(15, 15));  // to the file player
    EXPECT_FALSE(dialog->IsShown());
    EXPECT_EQ(EventManager::Get()->History().back().type, QRIX_START_FILEPLAY);
    // The host's file player plays the same recording in a window of its own.
    FilePlayer* player = nullptr;
    for (wxWindow* window : wxTopLevelWindows)
        if (auto* p = dynamic_cast<FilePlayer*>(window))
            player = p;
    ASSERT_NE(player, nullptr);
    EXPECT_TRUE(player->GetTitle().Contains("recording 1"));
    gui::Pump(600);
    EXPECT_GT(player->canvas()->PicturesReceived(), 3);
    EXPECT_TRUE(player->canvas()->Caption().rfind("row 1 \u00B7 ", 0) == 0) << player->canvas()->Caption();
    gui::ClickAt(player->playPause(), wxPoint(10, 10));  // pause: the picture holds
    const int held = player->canvas()->PicturesReceived();
    gui::Pump(400);
    EXPECT_EQ(player->canvas()->PicturesReceived(), held);
    EXPECT_EQ(player->playPause()->GetLabel(), "Play");
    gui::ClickAt(player->playPause(), wxPoint(10, 10));
    gui::Pump(400);
    EXPECT_GT(player->canvas()->PicturesReceived(), held);
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
