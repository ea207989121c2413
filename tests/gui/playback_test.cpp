// Playing a recording and the transport buttons, as the host hears them:
// events in the event manager's record, frame manager and canvas calls.
#include <arpa/inet.h>

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

    void Press(void (MorvanePlugConfig::*handler)(wxCommandEvent&))
    {
        wxCommandEvent click(wxEVT_BUTTON);
        (panel_->*handler)(click);
    }
    std::vector<int> Commands() const
    {
        std::vector<int> speeds;
        for (const HostEventRecord& r : Events(iEVT_HDD_COMMAND))
            speeds.push_back(r.command);
        return speeds;
    }
    std::vector<BasicGLPane::Call::Kind> CanvasCalls() const
    {
        std::vector<BasicGLPane::Call::Kind> kinds;
        for (const BasicGLPane::Call& c : panel_->m_glPane->Calls())
            kinds.push_back(c.kind);
        return kinds;
    }

    MorvanePlugConfig* panel_ = nullptr;
};

using K = BasicGLPane::Call::Kind;

TEST_F(PlaybackTest, FirstPlayConnectsAndStartsADecoderForTheAnsweredChannels)
{
    panel_->SendMorvaneCommand(1);
    EXPECT_TRUE(Events(iEVT_HDD_DISCONNECTED).empty());
    EXPECT_TRUE(FrameManager::Get()->Calls().empty());
    const std::vector<HostEventRecord> connects = Events(iEVT_HDD_CONNECTED);
    ASSERT_EQ(connects.size(), 1u);
    EXPECT_EQ(connects[0].id, iEVT_MORVANE_WINDOW);
    EXPECT_EQ(connects[0].record, 1u);
    EXPECT_NE(panel_->m_decoder, nullptr);
    EXPECT_EQ(*panel_->m_decoder->m_filePath, panel_->m_diskPath);
    EXPECT_EQ(CanvasCalls(), (std::vector<K>{K::kReset, K::kOn}));
    EXPECT_EQ(panel_->m_glPane->Calls()[1].address, 0x7F000001u);
    EXPECT_EQ(CSoundout::Get()->Routes(), (std::vector<std::pair<int, int>>{{0, 0}}));
    EXPECT_EQ(panel_->m_connAddress, "127.0.0.1");
    EXPECT_EQ(panel_->m_playState, 0);

    panel_->m_catalog->Entries[0].Idx = 70000;  // the record number is the low 16 bits of the list index
    panel_->SendMorvaneCommand(0);
    EXPECT_EQ(Events(iEVT_HDD_CONNECTED)[1].record, 70000u & 0xFFFF);
}

TEST_F(PlaybackTest, SecondPlayTakesDownTheFirstChannelByChannel)
{
    g_channels = 4;
    panel_->SendMorvaneCommand(0);
    EventManager::Get()->ClearHistory();
    panel_->SendMorvaneCommand(2);

    const std::vector<HostEventRecord> history = EventManager::Get()->History();
    ASSERT_EQ(history.size(), 2u);
    EXPECT_EQ(history[0].type, iEVT_HDD_DISCONNECTED);
    EXPECT_EQ(history[0].address, "127.0.0.1");
    EXPECT_EQ(history[0].record, 0u);
    EXPECT_EQ(history[1].type, iEVT_HDD_CONNECTED);
    const std::vector<FrameManager::Call>& calls = FrameManager::Get()->Calls();
    ASSERT_EQ(calls.size(), 8u);
    for (int channel = 0; channel < 4; ++channel) {
        EXPECT_FALSE(calls[2 * channel].sound);
        EXPECT_TRUE(calls[2 * channel + 1].sound);
        EXPECT_EQ(calls[2 * channel].channel, channel);
        EXPECT_EQ(calls[2 * channel].operation, 2);
        EXPECT_EQ(calls[2 * channel].address, static_cast<std::uint32_t>(inet_addr("127.0.0.1")));
    }
    EXPECT_EQ(CanvasCalls(), (std::vector<K>{K::kReset, K::kOn, K::kOff, K::kReset, K::kOn}));
    EXPECT_EQ(panel_->m_glPane->Calls()[2].count, 4);
}

TEST_F(PlaybackTest, MoreThan32ChannelsStartNothingButAreCleanedUpNextTime)
{
    g_channels = 33;
    panel_->SendMorvaneCommand(0);
    EXPECT_EQ(panel_->m_decoder, nullptr);
    EXPECT_TRUE(panel_->m_glPane->Calls().empty());
    EXPECT_TRUE(CSoundout::Get()->Routes().empty());
    EXPECT_EQ(panel_->m_playState, 0);
    g_channels = 1;
    panel_->SendMorvaneCommand(1);
    EXPECT_EQ(FrameManager::Get()->Calls().size(), 66u);
    EXPECT_TRUE(Events(iEVT_HDD_DISCONNECTED).empty());  // no decoder to take down
}

TEST_F(PlaybackTest, ForwardAndReverseKeepTheirOwnSteps)
{
    for (int i = 0; i < 5; ++i)
        Press(&MorvanePlugConfig::OnForwardVideo);
    EXPECT_EQ(Commands(), (std::vector<int>{2048, 4096, 8192, 16384, 16384}));
    EXPECT_EQ(panel_->m_forwardStep, 3);
    EXPECT_EQ(panel_->m_playState, 3);
    EventManager::Get()->ClearHistory();
    for (int i = 0; i < 6; ++i)
        Press(&MorvanePlugConfig::OnBackVideo);
    EXPECT_EQ(Commands(), (std::vector<int>{-1024, -2048, -4096, -8192, -16384, -16384}));
    EXPECT_EQ(panel_->m_playState, 4);

    Press(&MorvanePlugConfig::OnPauseVideo);  // both steps back to 0
    EventManager::Get()->ClearHistory();
    Press(&MorvanePlugConfig::OnForwardVideo);
    Press(&MorvanePlugConfig::OnForwardVideo);
    Press(&MorvanePlugConfig::OnBackVideo);
    Press(&MorvanePlugConfig::OnForwardVideo);
    EXPECT_EQ(Commands(), (std::vector<int>{2048, 4096, -1024, 8192}));
    const HostEventRecord command = Events(iEVT_HDD_COMMAND)[0];
    EXPECT_EQ(command.mode, 2);
    EXPECT_EQ(command.id, iEVT_MORVANE_WINDOW);
}

TEST_F(PlaybackTest, PlayRestartsOnlyWhenStopped)
{
    Press(&MorvanePlugConfig::OnPlayVideo);  // fresh panel: stopped, nothing to restart
    EXPECT_TRUE(EventManager::Get()->History().empty());
    EXPECT_EQ(panel_->m_playState, 2);

    panel_->SendMorvaneCommand(2);
    EventManager::Get()->ClearHistory();
    Press(&MorvanePlugConfig::OnForwardVideo);
    Press(&MorvanePlugConfig::OnPlayVideo);
    Press(&MorvanePlugConfig::OnForwardVideo);
    EXPECT_EQ(Commands(), (std::vector<int>{2048, 1024, 2048}));

    Press(&MorvanePlugConfig::OnStopVideo);
    EXPECT_EQ(panel_->m_decoder, nullptr);
    EXPECT_EQ(panel_->m_playState, 2);
    EXPECT_EQ(Events(iEVT_HDD_DISCONNECTED).size(), 1u);
    Press(&MorvanePlugConfig::OnPauseVideo);
    Press(&MorvanePlugConfig::OnPlayVideo);  // paused, not stopped: a speed command
    EXPECT_EQ(Commands().back(), 1024);
    EXPECT_EQ(Events(iEVT_HDD_CONNECTED).size(), 0u);

    Press(&MorvanePlugConfig::OnStopVideo);  // no decoder: nothing sent
    EventManager::Get()->ClearHistory();
    FrameManager::Get()->ClearCalls();
    Press(&MorvanePlugConfig::OnPlayVideo);  // stopped: the last recording again
    EXPECT_TRUE(Events(iEVT_HDD_DISCONNECTED).empty());
    EXPECT_EQ(FrameManager::Get()->Calls().size(), 2u);  // the old channel's clean-up
    ASSERT_EQ(Events(iEVT_HDD_CONNECTED).size(), 1u);
    EXPECT_EQ(Events(iEVT_HDD_CONNECTED)[0].record, 2u);
}

TEST_F(PlaybackTest, SwitchToFilePlayHandsOverOnceAndFindsNoCanvasTheSecondTime)
{
    panel_->SendMorvaneCommand(0);
    EventManager::Get()->ClearHistory();
    Press(&MorvanePlugConfig::OnSwitchToFilePlay);
    const std::vector<HostEventRecord> history = EventManager::Get()->History();
    ASSERT_EQ(history.size(), 2u);
    EXPECT_EQ(history[0].type, iEVT_HDD_DISCONNECTED);
    EXPECT_EQ(history[1].type, QRIX_START_FILEPLAY);
    EXPECT_EQ(panel_->m_glPane, nullptr);
    EXPECT_FALSE(panel_->m_dialog->IsShown());
    EXPECT_EQ(panel_->m_playState, 0);

    Press(&MorvanePlugConfig::OnSwitchToFilePlay);
    EXPECT_EQ(Events(QRIX_START_FILEPLAY).size(), 2u);
    wxSizeEvent resize(wxSize(1024, 768));
    panel_->OnSize(resize);  // a layout without a canvas
}

TEST_F(PlaybackTest, DeletingDuringPlaybackDisconnectsWithoutClosingAll)
{
    panel_->SendMorvaneCommand(1);
    EventManager::Get()->ClearHistory();
    plugin_->OnRelease(false);
    EXPECT_EQ(Events(iEVT_REMOTE_DISCONNECTED).size(), 1u);
    EXPECT_TRUE(Events(QRIX_CLOSE_ALL).empty());
}

TEST_F(PlaybackTest, ClosingDuringPlaybackDisconnectsOnceAndSwitchesTheChannelsOff)
{
    g_channels = 2;
    panel_->SendMorvaneCommand(1);
    EventManager::Get()->ClearHistory();
    panel_->m_dialog->Close();
    gui::Pump();
    const std::vector<HostEventRecord> history = EventManager::Get()->History();
    ASSERT_EQ(history.size(), 2u);
    EXPECT_EQ(history[0].type, iEVT_REMOTE_DISCONNECTED);
    EXPECT_EQ(history[0].address, "127.0.0.1");
    EXPECT_EQ(history[0].record, 1u);
    EXPECT_EQ(history[0].panelId, panel_->m_panelId);
    EXPECT_EQ(history[1].type, QRIX_CLOSE_ALL);
    EXPECT_EQ(panel_->m_glPane, nullptr);
    EXPECT_EQ(panel_->m_decoder, nullptr);

    EventManager::Get()->ClearHistory();
    plugin_->OnRelease(false);  // deleting the closed panel: no second disconnect
    EXPECT_TRUE(EventManager::Get()->History().empty());
}

}  // namespace
