// The host's decoder thread for the channels of one DVR.
#include <chrono>

#include "host/sdk_video.h"

ChannelDecoder::ChannelDecoder(wxEvtHandler*)
    : wxThread(wxTHREAD_DETACHED), m_dvrId(0), m_filePath(&m_filePathText)
{
}

ChannelDecoder::~ChannelDecoder() = default;

void ChannelDecoder::SetCanvas(BasicGLPane* canvas)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    m_canvas = canvas;
}

void ChannelDecoder::SetConnectType(int type)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    m_connectType = type;
}

void ChannelDecoder::SetIpAndChannel(unsigned long long address, int channelCount)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    m_address = address;
    m_channelCount = channelCount;
}

// Waits (a little while at most, for a thread that never got to run) until
// the worker has acknowledged: from then on it touches nothing of its owner.
void ChannelDecoder::StopDecoder()
{
    std::unique_lock<std::mutex> lock(m_mutex);
    m_stopRequested = true;
    m_canvas = nullptr;
    m_changed.notify_all();
    m_changed.wait_for(lock, std::chrono::seconds(2), [this] { return m_idle; });
}

wxThread::ExitCode ChannelDecoder::Entry()
{
    std::unique_lock<std::mutex> lock(m_mutex);
    while (!TestDestroy()) {
        if (m_stopRequested && !m_idle) {
            m_idle = true;
            m_changed.notify_all();
        }
        m_changed.wait_for(lock, std::chrono::milliseconds(20));
    }
    m_idle = true;
    m_changed.notify_all();
    return nullptr;
}
