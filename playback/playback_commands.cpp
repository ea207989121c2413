// Playing a catalogue entry through the host: the previous playback is taken
// down, the host hears of the new connection and answers with its channel
// count, and a host decoder thread draws into the panel's canvas.
#include <arpa/inet.h>

#include "panel/morvane_plug_config.h"

namespace {

constexpr char kLoopback[] = "127.0.0.1";
constexpr int kMaxChannels = 32;

}  // namespace

void MorvanePlugConfig::SendFileEvent(int type, int id, int mode, int command)
{
    QrixFileEvent event(type, id);
    FillFromConnection(event);
    event.mode = mode;
    event.command = command;
    EventManager::Get()->ProcessEvent(event);
}

void MorvanePlugConfig::TakeDownDecoder(int eventId)
{
    SendFileEvent(iEVT_HDD_DISCONNECTED, eventId, 0, 0);
    ReleaseDecoder();
}

void MorvanePlugConfig::SendMorvaneCommand(int index)
{
    // Only a row of the list can be played: a slot the build did not fill
    // names no recording.
    if (!Catalog() || index < 0 || index >= m_recordCount)
        return;

    unsigned int oldAddress = 0;
    StringIPtoUint32(m_connAddress, oldAddress);
    if (m_decoder)
        TakeDownDecoder(iEVT_MORVANE_WINDOW);

    // The host ends the frame and sound processing of every old channel.
    const unsigned long long loopback = static_cast<std::uint32_t>(inet_addr(kLoopback));
    for (int channel = 0; channel < m_channelCount; ++channel) {
        _sDvrFrame frame{};
        frame.address = loopback;
        frame.panelId = m_panelId;
        frame.channel = channel;
        FrameManager::Get()->RemoteProcess(2, loopback, channel, m_panelId, &frame);
        FrameManager::Get()->SoundProcess(2, frame.address, frame.channel, frame.panelId, &frame);
    }
    if (oldAddress != 0 && m_channelCount > 0 && m_glPane)
        m_glPane->SetOffAllChannels(oldAddress, m_channelCount, 3);

    QrixFileEvent connect(iEVT_HDD_CONNECTED, iEVT_MORVANE_WINDOW);
    connect.address = kLoopback;
    connect.record = static_cast<std::uint16_t>(Catalog()->Entries[index].Idx);
    connect.path = m_diskPath;
    connect.panelId = m_panelId;
    connect.channelCount = 0;
    connect.mode = 0;
    EventManager::Get()->ProcessEvent(connect);
    m_channelCount = connect.channelCount;

    if (m_channelCount >= 1 && m_channelCount <= kMaxChannels) {
        unsigned int address = 0;
        StringIPtoUint32(kLoopback, address);
        m_decoder = new ChannelDecoder(nullptr);
        m_decoder->SetCanvas(m_glPane);
        m_decoder->SetConnectType(3);
        *m_decoder->m_filePath = m_diskPath;
        m_decoder->SetIpAndChannel(address, m_channelCount);
        m_decoder->m_dvrId = m_panelId;
        m_decoder->Create(0);
        m_decoder->Run();
        if (m_glPane) {
            m_glPane->Reset(-1, 3);
            m_glPane->SetOnAllChannels(address, m_channelCount, 3);
        }
        for (int channel = 0; channel < m_channelCount; ++channel)
            CSoundout::Get()->SetAudioCh(channel, 0);
    }

    m_connText1.clear();
    m_connText2.clear();
    m_connAddress = kLoopback;
    m_connRecord = connect.record;
    m_connPath = m_diskPath;
    m_playState = 0;
    m_currentRecord = index;
}
