// The host's decoder thread on disks of the sample clip: frames in order
// forward, key frames in reverse order backward, the pace of the speed codes,
// pause, stop, and damaged blocks passed over.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <thread>

#include <wx/frame.h>

#include "host/playback_control.h"
#include "host/qrix_sdk.h"
#include "tests/gui/gui_harness.h"
#include "tests/host/clip_disk.h"
#include "tests/support/time_zone.h"

namespace {

class DecoderTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        dir_ = std::filesystem::temp_directory_path() / ("decoder-test-" + std::to_string(::getpid()));
        std::filesystem::create_directories(dir_);
        disk_ = (dir_ / "disk.img").string();
        frame_ = new wxFrame(nullptr, wxID_ANY, "canvas", wxDefaultPosition, wxSize(400, 320));
        canvas_ = new BasicGLPane(frame_, BasicGLPane::HostAttributes(), FrameManager::Get()->GLRCProcess(1, nullptr),
                                  wxDefaultPosition, wxDefaultSize);
        canvas_->Init();
        frame_->Show();
    }

    void TearDown() override
    {
        Stop();
        PlaybackControl::Get()->Forget(kDvr);
        frame_->Destroy();
        gui::Pump(20);
        std::filesystem::remove_all(dir_);
    }

    void Start(int record, int speed = 1024)
    {
        PlaybackControl::Get()->Start(kDvr, disk_, record);
        PlaybackControl::Get()->SetSpeed(kDvr, speed);
        decoder_ = new ChannelDecoder(nullptr);
        decoder_->m_dvrId = kDvr;
        decoder_->SetCanvas(canvas_);
        decoder_->SetIpAndChannel(0x7F000001, 1);
        ASSERT_EQ(decoder_->Create(), wxTHREAD_NO_ERROR);
        ASSERT_EQ(decoder_->Run(), wxTHREAD_NO_ERROR);
    }

    void Stop()
    {
        if (!decoder_)
            return;
        decoder_->SetCanvas(nullptr);
        decoder_->StopDecoder();
        decoder_->Delete(nullptr);
        decoder_ = nullptr;
    }

    // The positions of the pictures the canvas received over a while, as
    // block * 100 + entry, one sample each time a new one arrived.
    std::vector<long long> Watch(int milliseconds)
    {
        std::vector<long long> seen;
        int received = canvas_->PicturesReceived();
        const auto until = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
        while (std::chrono::steady_clock::now() < until) {
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
            if (canvas_->PicturesReceived() != received) {
                received = canvas_->PicturesReceived();
                const Picture p = canvas_->LastPicture();
                seen.push_back(p.block * 100 + p.entry);
            }
        }
        return seen;
    }

    static bool Increasing(const std::vector<long long>& v)
    {
        return std::is_sorted(v.begin(), v.end()) && std::adjacent_find(v.begin(), v.end()) == v.end();
    }

    static constexpr long long kDvr = 424242;
    std::filesystem::path dir_;
    std::string disk_;
    wxFrame* frame_ = nullptr;
    BasicGLPane* canvas_ = nullptr;
    ChannelDecoder* decoder_ = nullptr;
};

TEST_F(DecoderTest, SpeedCodesSetThePaceAndPauseHoldsThePicture)
{
    WriteClipDisk(disk_, {{0, 0, 7, 100}});
    Start(0, 1024);
    const std::size_t normal = Watch(600).size();
    PlaybackControl::Get()->SetSpeed(kDvr, 4096);
    const std::size_t fast = Watch(600).size();
    EXPECT_GT(fast, normal * 2) << normal << " pictures at normal speed, " << fast << " at four times";

    PlaybackControl::Get()->SetSpeed(kDvr, 0);
    gui::Pump(100);
    const Picture held = canvas_->LastPicture();
    EXPECT_TRUE(Watch(400).empty());
    EXPECT_EQ(canvas_->LastPicture().entry, held.entry);
}

// Forward: the frames in order from the chosen recording's first; backward:
// the key frames in reverse order; stop ends the deliveries.
TEST_F(DecoderTest, ForwardShowsTheFramesInOrderAndBackwardTheKeyFramesInReverse)
{
    WriteClipDisk(disk_, {{0, 0, 3, 100}, {1, 4, 7, 200}});
    Start(1, 1024);
    const std::vector<long long> forward = Watch(700);
    ASSERT_GE(forward.size(), 8u);
    EXPECT_TRUE(Increasing(forward));
    EXPECT_EQ(forward.front() / 100, 4);  // the chosen recording begins at block 4
    EXPECT_EQ(canvas_->LastPicture().width, 320);
    // From block 4 or 5 back to block 0 are five key frames or more, one
    // every 250 ms at this speed: more than the watch can see.
    PlaybackControl::Get()->SetSpeed(kDvr, -4096);
    std::this_thread::sleep_for(std::chrono::milliseconds(60));  // a forward frame may still be on its way
    std::vector<long long> seen = Watch(700);
    ASSERT_GE(seen.size(), 2u);
    EXPECT_TRUE(std::is_sorted(seen.rbegin(), seen.rend()));
    for (long long position : seen)
        EXPECT_EQ(position % 100, 0) << "not a key frame: " << position;
    EXPECT_TRUE(canvas_->LastPicture().key);
    Stop();
    const int received = canvas_->PicturesReceived();
    gui::Pump(200);
    EXPECT_EQ(canvas_->PicturesReceived(), received);
}

// Playback stops at either end of the disk's recordings with the picture
// held, and the line over the picture says where playback stands: the row,
// the frame's time (spread over the recording's start and end) and the
// speed or the end reached.
TEST_F(DecoderTest, PlaybackStopsAtTheEndsOfTheDiskAndTheCaptionSaysWhere)
{
    TimeZone utc("UTC");
    WriteClipDisk(disk_, {{0, 0, 1, 100}, {1, 2, 3, 200}});  // each recording an hour long
    Start(1, 1024);
    ASSERT_FALSE(Watch(150).empty());
    EXPECT_EQ(canvas_->Caption().rfind("row 1 \u00B7 1970-01-01 00:0", 0), 0u) << canvas_->Caption();
    EXPECT_EQ(canvas_->Caption().substr(canvas_->Caption().size() - 6), " \u00B7 1x");
    PlaybackControl::Get()->SetSpeed(kDvr, 0);
    Watch(100);
    EXPECT_EQ(canvas_->Caption().substr(canvas_->Caption().size() - 6), "paused");

    PlaybackControl::Get()->SetSpeed(kDvr, 16384);
    Watch(1500);
    EXPECT_TRUE(Watch(300).empty());
    EXPECT_EQ(canvas_->LastPicture().block * 100 + canvas_->LastPicture().entry, 324);
    PlaybackControl::Session session;
    ASSERT_TRUE(PlaybackControl::Get()->Find(kDvr, &session));
    EXPECT_EQ(session.end, 1);
    EXPECT_EQ(canvas_->Caption(), "row 1 \u00B7 1970-01-01 01:03:20 (local time) \u00B7 end of the newest recording");

    PlaybackControl::Get()->SetSpeed(kDvr, -16384);  // back over the key frames to the oldest one
    Watch(1500);
    EXPECT_TRUE(Watch(300).empty());
    EXPECT_EQ(canvas_->LastPicture().block * 100 + canvas_->LastPicture().entry, 0);
    ASSERT_TRUE(PlaybackControl::Get()->Find(kDvr, &session));
    EXPECT_EQ(session.end, -1);
    EXPECT_EQ(canvas_->Caption(), "row 0 \u00B7 1970-01-01 00:01:40 (local time) \u00B7 start of the oldest recording");
}

TEST_F(DecoderTest, DamagedFrameAndDamagedBlockAreLeftOut)
{
    dvrimage::DiskImage image = WriteClipDisk(disk_, {{0, 0, 3, 100}});
    image.Damage(dvrimage::Target::IndexEntry, 0, 5);
    image.Damage(dvrimage::Target::BlockHeader, 1);
    Start(0, 8192);
    const std::vector<long long> seen = Watch(1200);
    ASSERT_FALSE(seen.empty());
    EXPECT_TRUE(std::find_if(seen.begin(), seen.end(), [](long long p) { return p / 100 >= 2; }) != seen.end())
        << "playback did not get past the damaged block";
    EXPECT_TRUE(std::none_of(seen.begin(), seen.end(), [](long long p) { return p / 100 == 1; }));
}

}  // namespace
