// A host window, a manager and the plugin object (linked into the test), and
// disk images presented as attached disks through MORVANE_DISK_PATTERN.
#ifndef TESTS_GUI_PANEL_FIXTURE_H
#define TESTS_GUI_PANEL_FIXTURE_H

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include <wx/frame.h>

#include "controls/plug_combo_ctrl.h"
#include "controls/plug_list_ctrl.h"
#include "panel/morvane_plug_config.h"
#include "plugin/morvane_plugin.h"
#include "tests/gui/gui_harness.h"
#include "tools/dvrimage/dvr_image.h"

class PanelTest : public ::testing::Test {
protected:
    void SetUp() override;
    void TearDown() override;

    // Writes disk<N>.img with recordings of these start and end times (list
    // positions 0, 1, ...) into the folder the drive pattern points at.
    void WriteDisk(int drive, const std::vector<std::pair<std::uint32_t, std::uint32_t>>& times);
    // An openable file that is no recorder disk.
    void WriteNonDisk(int drive);

    MorvanePlugConfig* OpenPanel();
    MorvanePlugConfig* panel() const { return plugin_->m_configPanel; }
    std::vector<HostEventRecord> Events(int type) const;
    // The events the host heard since its history was last cleared, a line
    // each: "connect 127.0.0.1 #1", "disconnect 127.0.0.1 #0", "speed 2048",
    // "file play", "remote disconnect 127.0.0.1 #1", "close all".
    std::vector<std::string> Transcript() const;

    std::string dir_;
    wxFrame* frame_ = nullptr;
    std::unique_ptr<Manager> manager_;
    MorvanePlugin* plugin_ = nullptr;
};

#endif
