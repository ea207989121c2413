#include "tests/gui/panel_fixture.h"

#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include <wx/app.h>

void PanelTest::SetUp()
{
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    dir_ = (std::filesystem::temp_directory_path() /
            ("morvane-gui-" + std::to_string(::getpid()) + "-" + info->name()))
               .string();
    std::filesystem::remove_all(dir_);
    std::filesystem::create_directories(dir_);
    ::setenv("MORVANE_DISK_PATTERN", (dir_ + "/disk%d.img").c_str(), 1);
    EventManager::Get()->ClearHistory();
    FrameManager::Get()->ClearCalls();
    CSoundout::Get()->ClearRoutes();
    gui::TakeModalMessages();

    frame_ = new wxFrame(nullptr, wxID_ANY, "host window", wxDefaultPosition, wxSize(1000, 700));
    frame_->Show();
    manager_ = std::make_unique<Manager>(wxTheApp, frame_);
    plugin_ = new MorvanePlugin(manager_.get());
    plugin_->OnAttach();
}

void PanelTest::TearDown()
{
    delete plugin_;
    plugin_ = nullptr;
    frame_->Destroy();
    gui::Pump(20);
    ::unsetenv("MORVANE_DISK_PATTERN");
    std::filesystem::remove_all(dir_);
}

void PanelTest::WriteDisk(int drive, const std::vector<std::pair<std::uint32_t, std::uint32_t>>& times)
{
    dvrimage::Layout layout;
    layout.listMax = 64;
    layout.dataBlockMax = 8;
    dvrimage::DiskImage image(layout);
    for (std::size_t i = 0; i < times.size(); ++i) {
        dvrimage::Recording r = dvrimage::GeneratedRecording(static_cast<std::int32_t>(i), 0, 0, times[i].first,
                                                             times[i].second, 8, 1, 16);
        if (i + 1 < times.size())
            r.blocks.clear();
        image.Add(std::move(r));
    }
    image.Write(dir_ + "/disk" + std::to_string(drive) + ".img");
}

void PanelTest::WriteNonDisk(int drive)
{
    std::ofstream(dir_ + "/disk" + std::to_string(drive) + ".img") << "not a recorder disk";
}

MorvanePlugConfig* PanelTest::OpenPanel()
{
    plugin_->Configure();
    gui::Pump();
    return panel();
}

std::vector<HostEventRecord> PanelTest::Events(int type) const
{
    std::vector<HostEventRecord> found;
    for (const HostEventRecord& r : EventManager::Get()->History())
        if (r.type == type)
            found.push_back(r);
    return found;
}

std::vector<std::string> PanelTest::Transcript() const
{
    std::vector<std::string> lines;
    for (const HostEventRecord& r : EventManager::Get()->History()) {
        const std::string at = " " + r.address.utf8_string() + " #" + std::to_string(r.record);
        if (r.type == iEVT_HDD_CONNECTED)
            lines.push_back("connect" + at);
        else if (r.type == iEVT_HDD_DISCONNECTED)
            lines.push_back("disconnect" + at);
        else if (r.type == iEVT_HDD_COMMAND)
            lines.push_back("speed " + std::to_string(r.command));
        else if (r.type == QRIX_START_FILEPLAY)
            lines.push_back("file play");
        else if (r.type == iEVT_REMOTE_DISCONNECTED)
            lines.push_back("remote disconnect" + at);
        else if (r.type == QRIX_CLOSE_ALL)
            lines.push_back("close all");
        else
            lines.push_back("event " + std::to_string(r.type));
    }
    return lines;
}
