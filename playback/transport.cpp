// The transport buttons: speed commands on the current connection, stop, and
// the hand-over to the host's file player.
#include <algorithm>

#include "panel/morvane_plug_config.h"

namespace {

enum PlayState { kPlaying = 0, kPaused = 1, kStopped = 2, kFastForward = 3, kFastReverse = 4 };
enum : int { kCommandMode = 2, kNormalSpeed = 1024 };
// Speeds in 1/1024 of normal; forward starts at twice normal, reverse at normal.
constexpr int kForwardSpeeds[] = {2048, 4096, 8192, 16384};
constexpr int kReverseSpeeds[] = {-1024, -2048, -4096, -8192, -16384};

}  // namespace

void MorvanePlugConfig::OnPlayVideo(wxCommandEvent&)
{
    if (m_playState == kStopped) {
        if (m_currentRecord >= 0)
            SendMorvaneCommand(m_currentRecord);
        return;
    }
    SendFileEvent(iEVT_HDD_COMMAND, iEVT_MORVANE_WINDOW, kCommandMode, kNormalSpeed);
    m_forwardStep = 0;
    m_reverseStep = 0;
    m_playState = kPlaying;
}

void MorvanePlugConfig::OnPauseVideo(wxCommandEvent&)
{
    SendFileEvent(iEVT_HDD_COMMAND, iEVT_MORVANE_WINDOW, kCommandMode, 0);
    m_forwardStep = 0;
    m_reverseStep = 0;
    m_playState = kPaused;
}

void MorvanePlugConfig::OnForwardVideo(wxCommandEvent&)
{
    SendFileEvent(iEVT_HDD_COMMAND, iEVT_MORVANE_WINDOW, kCommandMode, kForwardSpeeds[m_forwardStep]);
    m_forwardStep = std::min(m_forwardStep + 1, 3);
    m_playState = kFastForward;
}

void MorvanePlugConfig::OnBackVideo(wxCommandEvent&)
{
    SendFileEvent(iEVT_HDD_COMMAND, iEVT_MORVANE_WINDOW, kCommandMode, kReverseSpeeds[m_reverseStep]);
    m_reverseStep = std::min(m_reverseStep + 1, 4);
    m_playState = kFastReverse;
}

void MorvanePlugConfig::OnStopVideo(wxCommandEvent&)
{
    if (m_decoder)
        TakeDownDecoder(iEVT_MORVANE_WINDOW);
    m_forwardStep = 0;
    m_reverseStep = 0;
    m_playState = kStopped;
}

void MorvanePlugConfig::OnSwitchToFilePlay(wxCommandEvent&)
{
    unsigned int oldAddress = 0;
    StringIPtoUint32(m_connAddress, oldAddress);
    if (m_decoder)
        TakeDownDecoder(0);
    if (oldAddress != 0 && m_channelCount > 0 && m_glPane)
        m_glPane->SetOffAllChannels(oldAddress, m_channelCount, 3);
    DeleteCanvas();
    m_dialog->Show(false);
    SendHostCommand(QRIX_START_FILEPLAY);
}
