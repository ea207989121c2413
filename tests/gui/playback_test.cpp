// Playing a recording and the transport buttons, as the host hears them:
// events in the event manager's record, frame manager and canvas calls.
#include "tests/gui/panel_fixture.h"

namespace {

int g_channels = 1;

void AnswerChannels(QrixFileEvent& event)
{
    if (event.GetEventType() == iEVT_HDD_CONNECTED) {
        event.channelCount = g_channels;
        DvrManager::Get()->Register(0x7F000001, 3, event.panelId);
    }
}

using Lines = std::vector<std::string>;
using K = BasicGLPane::Call::Kind;

class PlaybackTest : public PanelTest {
protected:
    void SetUp() override
    {
        PanelTest::SetUp();
        g_channels = 1;
        EventManager::Get()->SetFileEventHandler(AnswerChannels);
        WriteDisk(0, {{100, 200}, {300, 400}, {500, 600}});
        panel_ = OpenPanel();
        panel_->SendHddList(0);
        EventManager::Get()->ClearHistory();
    }
    void TearDown() override
    {
        EventManager::Get()->SetFileEventHandler(nullptr);
        DvrManager::Get()->Unregister(0x7F000001);
        PanelTest::TearDown();
    }

    // Presses the buttons in turn; what the host heard from them.
    Lines Press(std::initializer_list<void (MorvanePlugConfig::*)(wxCommandEvent&)> handlers)
    {
        EventManager::Get()->ClearHistory();
        for (auto handler : handlers) {
            wxCommandEvent click(wxEVT_BUTTON);
            (panel_->*handler)(click);
        }
        return Transcript();
    }
    Lines Play(int row)
    {
        EventManager::Get()->ClearHistory();
        panel_->SendMorvaneCommand(row);
        return Transcript();
    }
    std::vector<K> CanvasCalls() const
    {
        std::vector<K> kinds;
        for (const BasicGLPane::Call& c : panel_->m_glPane->Calls())
            kinds.push_back(c.kind);
        return kinds;
    }

    MorvanePlugConfig* panel_ = nullptr;
};

const auto kPlay = &MorvanePlugConfig::OnPlayVideo;
const auto kPause = &MorvanePlugConfig::OnPauseVideo;
const auto kStop = &MorvanePlugConfig::OnStopVideo;
const auto kForward = &MorvanePlugConfig::OnForwardVideo;
const auto kBack = &MorvanePlugConfig::OnBackVideo;
const auto kSwitch = &MorvanePlugConfig::OnSwitchToFilePlay;

TEST_F(PlaybackTest, FirstPlayConnectsAndStartsADecoderForTheAnsweredChannels)
{
    EXPECT_EQ(Play(1), (Lines{"connect 127.0.0.1 #1"}));
    EXPECT_EQ(Events(iEVT_HDD_CONNECTED)[0].id, iEVT_MORVANE_WINDOW);
    ASSERT_NE(panel_->m_decoder, nullptr);
    EXPECT_EQ(*panel_->m_decoder->m_filePath, panel_->m_diskPath);
    EXPECT_EQ(CanvasCalls(), (std::vector<K>{K::kReset, K::kOn}));
    EXPECT_EQ(panel_->m_glPane->Calls()[1].address, 0x7F000001u);
    EXPECT_EQ(CSoundout::Get()->Routes(), (std::vector<std::pair<int, int>>{{0, 0}}));

    panel_->MutableCatalog()->Entries[0].Idx = 70000;  // the record number is the low 16 bits of the list index
    EXPECT_EQ(Play(0), (Lines{"disconnect 127.0.0.1 #1", "connect 127.0.0.1 #4464"}));
}

// Four channels answered: the next play takes each down, picture then sound.
TEST_F(PlaybackTest, SecondPlayTakesDownTheFirstChannelByChannel)
{
    g_channels = 4;
    Play(0);
    EXPECT_EQ(Play(2), (Lines{"disconnect 127.0.0.1 #0", "connect 127.0.0.1 #2"}));
    const std::vector<FrameManager::Call>& calls = FrameManager::Get()->Calls();
    ASSERT_EQ(calls.size(), 8u);
    for (std::size_t k = 0; k < calls.size(); ++k) {
        EXPECT_EQ(calls[k].channel, static_cast<int>(k / 2));
        EXPECT_EQ(calls[k].sound, k % 2 == 1);
        EXPECT_EQ(calls[k].operation, 2);  // stop
    }
    EXPECT_EQ(CanvasCalls(), (std::vector<K>{K::kReset, K::kOn, K::kOff, K::kReset, K::kOn}));
    EXPECT_EQ(panel_->m_glPane->Calls()[2].count, 4);
}

TEST_F(PlaybackTest, MoreThan32ChannelsStartNothingButAreCleanedUpNextTime)
{
    g_channels = 33;
    Play(0);
    EXPECT_EQ(panel_->m_decoder, nullptr);
    EXPECT_TRUE(panel_->m_glPane->Calls().empty());
    EXPECT_TRUE(CSoundout::Get()->Routes().empty());
    g_channels = 1;
    EXPECT_EQ(Play(1), (Lines{"connect 127.0.0.1 #1"}));  // no decoder to take down
    EXPECT_EQ(FrameManager::Get()->Calls().size(), 66u);
}

// Forward and reverse double their own speed up to 16 times; pause sets both back.
TEST_F(PlaybackTest, ForwardAndReverseKeepTheirOwnSteps)
{
    EXPECT_EQ(Press({kForward, kForward, kForward, kForward, kForward}),
              (Lines{"speed 2048", "speed 4096", "speed 8192", "speed 16384", "speed 16384"}));
    EXPECT_EQ(panel_->m_playState, 3);
    EXPECT_EQ(Press({kBack, kBack, kBack, kBack, kBack, kBack}),
              (Lines{"speed -1024", "speed -2048", "speed -4096", "speed -8192", "speed -16384", "speed -16384"}));
    EXPECT_EQ(panel_->m_playState, 4);
    Press({kPause});
    EXPECT_EQ(Press({kForward, kForward, kBack, kForward}),
              (Lines{"speed 2048", "speed 4096", "speed -1024", "speed 8192"}));
    EXPECT_EQ(Events(iEVT_HDD_COMMAND)[0].mode, 2);
    EXPECT_EQ(Events(iEVT_HDD_COMMAND)[0].id, iEVT_MORVANE_WINDOW);
}

TEST_F(PlaybackTest, PlayRestartsOnlyWhenStopped)
{
    EXPECT_EQ(Press({kPlay}), Lines{});  // fresh panel: stopped, nothing to restart
    EXPECT_EQ(panel_->m_playState, 2);
    Play(2);
    EXPECT_EQ(Press({kForward, kPlay, kForward}), (Lines{"speed 2048", "speed 1024", "speed 2048"}));
    EXPECT_EQ(Press({kStop}), (Lines{"disconnect 127.0.0.1 #2"}));
    EXPECT_EQ(panel_->m_decoder, nullptr);
    EXPECT_EQ(panel_->m_playState, 2);
    EXPECT_EQ(Press({kPause, kPlay}), (Lines{"speed 0", "speed 1024"}));  // paused, not stopped: a speed
    EXPECT_EQ(Press({kStop}), Lines{});                                   // no decoder: nothing sent
    FrameManager::Get()->ClearCalls();
    EXPECT_EQ(Press({kPlay}), (Lines{"connect 127.0.0.1 #2"}));  // stopped: the last recording again
    EXPECT_EQ(FrameManager::Get()->Calls().size(), 2u);          // the old channel's clean-up

    // Another drive chosen while stopped: row 2 was a row of the drive before,
    // so Play waits for a row of this one.
    EXPECT_EQ(Press({kStop}), (Lines{"disconnect 127.0.0.1 #2"}));
    WriteDisk(1, {{700, 800}, {900, 1000}, {1100, 1200}});
    panel_->SendHddList(1);
    EXPECT_EQ(Press({kPlay}), Lines{});
}

TEST_F(PlaybackTest, SwitchToFilePlayHandsOverOnceAndFindsNoCanvasTheSecondTime)
{
    Play(0);
    EXPECT_EQ(Press({kSwitch}), (Lines{"disconnect 127.0.0.1 #0", "file play"}));
    EXPECT_EQ(Events(iEVT_HDD_DISCONNECTED)[0].id, 0);
    EXPECT_EQ(panel_->m_glPane, nullptr);
    EXPECT_FALSE(panel_->m_dialog->IsShown());
    EXPECT_EQ(panel_->m_playState, 0);
    EXPECT_EQ(Press({kSwitch}), (Lines{"file play"}));
    wxSizeEvent resize(wxSize(1024, 768));
    panel_->OnSize(resize);  // a layout without a canvas
}

// Closing the dialog while playing disconnects once and closes all; deleting
// the panel later sends nothing more. Deleting while playing disconnects
// without closing all.
TEST_F(PlaybackTest, ClosingOrDeletingDuringPlaybackDisconnectsOnce)
{
    g_channels = 2;
    Play(1);
    EventManager::Get()->ClearHistory();
    panel_->m_dialog->Close();
    gui::Pump();
    EXPECT_EQ(Transcript(), (Lines{"remote disconnect 127.0.0.1 #1", "close all"}));
    EXPECT_EQ(Events(iEVT_REMOTE_DISCONNECTED)[0].panelId, panel_->m_panelId);
    EXPECT_EQ(panel_->m_glPane, nullptr);
    EXPECT_EQ(panel_->m_decoder, nullptr);
    EventManager::Get()->ClearHistory();
    plugin_->OnRelease(false);
    EXPECT_EQ(Transcript(), Lines{});

    panel_ = OpenPanel();
    panel_->SendHddList(0);
    Play(1);
    EventManager::Get()->ClearHistory();
    plugin_->OnRelease(false);
    EXPECT_EQ(Transcript(), (Lines{"remote disconnect 127.0.0.1 #1"}));
}

}  // namespace
