// The host's decoder thread for a disk playback: it opens the disk with its
// own read-only handle, reads the recording's frames with the reader's
// stream extraction, decodes them with libavcodec and hands the newest
// picture to its canvas, paced by the speed of the latest transport command.
#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <memory>
#include <vector>

#include <cstdio>
#include <string>

#include "catalog/catalog_reader.h"
#include "host/h264_decoder.h"
#include "host/playback_control.h"
#include "host/recording_timeline.h"
#include "host/sdk_video.h"

namespace {

constexpr int kFrameMilliseconds = 40;  // the recorders write 25 frames a second
constexpr int kIdleMilliseconds = 20;

// How long a frame stays on screen at a speed (1024 = normal).
int FrameInterval(int speed, int frames)
{
    const long long interval = static_cast<long long>(kFrameMilliseconds) * frames * PlaybackControl::kNormalSpeed /
                               std::max(1, std::abs(speed));
    return static_cast<int>(std::clamp<long long>(interval, 1, 10000));
}

std::string SpeedText(int speed)
{
    if (speed == 0)
        return "paused";
    char text[32];
    std::snprintf(text, sizeof text, "%s%gx", speed < 0 ? "reverse " : "",
                  std::abs(static_cast<double>(speed)) / PlaybackControl::kNormalSpeed);
    return text;
}

}  // namespace

// The playback itself, run by the decoder thread.
class DecoderLoop {
public:
    DecoderLoop(ChannelDecoder& thread, long long dvrId) : m_thread(thread), m_dvrId(dvrId) {}

    // Opens the disk of the session and places the cursor on the first frame
    // of its recording; false when there is nothing to play.
    bool Open(const PlaybackControl::Session& session)
    {
        _HisiList_t recording{};
        if (!OpenRecording(m_reader, session.path, session.record, &recording))
            return false;
        const _HisiAdapter_t& adapter = *m_reader.Adapter();
        if (adapter.DataBlockMax <= 0)
            return false;
        m_oldest = adapter.FirstList;
        m_newest = adapter.LastList;
        m_newestFrames = adapter.CurBlockHeader.FrameCount;
        // Block numbers as the forward walk counts them: once the data ring
        // has wrapped, the newer recordings lie below the oldest one's start
        // and are counted on from the end of the ring.
        const bool wrapped = m_oldest.StartBlock > m_newest.EndBlock;
        m_newestBlock = static_cast<long long>(m_newest.EndBlock) + (wrapped ? adapter.DataBlockMax : 0);
        long long start = recording.StartBlock;
        if (wrapped && start < m_oldest.StartBlock)
            start += adapter.DataBlockMax;
        m_timeline = std::make_unique<RecordingTimeline>(m_reader);
        m_reader.SetStreamCursor(start, 0);
        m_payload.resize(static_cast<std::size_t>(kPayloadAreaSize));
        return m_decoder.Ok();
    }

    // Plays until the decoder is asked to stop or to end.
    void Run(std::unique_lock<std::mutex>& lock)
    {
        while (!m_thread.Stopping()) {
            const int speed = PlaybackControl::Get()->Speed(m_dvrId);
            int wait = kIdleMilliseconds;
            if (speed > 0)
                wait = StepForward(lock, speed);
            else if (speed < 0)
                wait = StepBackward(lock, speed);
            ShowCaption(lock);
            if (!m_thread.Wait(lock, wait))
                return;
        }
    }

private:
    int StepForward(std::unique_lock<std::mutex>& lock, int speed)
    {
        if (m_lastDirection < 0) {
            // Back to forward: on from the key frame shown last, which the
            // decoder still holds.
            m_reader.SetStreamCursor(m_lastBlock, m_lastEntry + 1);
        }
        m_lastDirection = 1;
        if (PastTheNewestFrame())
            return End(1);
        const long long before = m_reader.StreamBlock();
        _HisiHeader_t frame{};
        const int size = m_reader.NextFrame(m_payload.data(), &frame, m_oldest, m_newest, 1);
        if (size < 0) {
            SkipDamaged(1);
            return 0;
        }
        if (m_reader.StreamBlock() < before)
            return End(1);  // the walk went round to the oldest recording
        m_damagedInARow = 0;
        m_lastBlock = m_reader.StreamBlock();
        m_lastEntry = m_reader.StreamFrame() - 1;
        Show(lock, size, PastTheNewestFrame());  // the newest frame must not stay in the parser
        return FrameInterval(speed, 1);
    }

    bool PastTheNewestFrame() const
    {
        const long long block = m_reader.StreamBlock();
        return block > m_newestBlock || (block == m_newestBlock && m_reader.StreamFrame() >= m_newestFrames);
    }

    bool BeforeTheOldestFrame() const
    {
        const long long block = m_reader.StreamBlock();
        return block < m_oldest.StartBlock || (block == m_oldest.StartBlock && m_reader.StreamFrame() < 0);
    }

    // Playback stops at either end of the disk's recordings, the last picture
    // held, instead of going round the ring again.
    int End(int end)
    {
        PlaybackControl::Get()->MarkEnd(m_dvrId, end);
        return 0;
    }

    void Show(std::unique_lock<std::mutex>& lock, int size, bool flush)
    {
        m_shownTime = m_timeline->Locate(m_lastBlock, m_lastEntry);
        m_shownAny = true;
        for (Picture& picture : m_decoder.Decode(m_payload.data(), static_cast<std::size_t>(size), m_lastBlock,
                                                 m_lastEntry, flush))
            m_thread.Publish(lock, std::move(picture));
    }

    // The line over the picture: which recording, the time of the frame
    // shown, and the speed or why playback stopped.
    void ShowCaption(std::unique_lock<std::mutex>& lock)
    {
        if (!m_shownAny)
            return;
        PlaybackControl::Session session;
        if (!PlaybackControl::Get()->Find(m_dvrId, &session))
            return;
        std::string caption = m_shownTime.row >= 0
                                  ? "row " + std::to_string(m_shownTime.row) + " \u00B7 " +
                                        RecordingTimeline::LocalText(m_shownTime.seconds)
                                  : std::string("a block outside the listed recordings");
        if (session.end > 0)
            caption += " \u00B7 end of the newest recording";
        else if (session.end < 0)
            caption += " \u00B7 start of the oldest recording";
        else
            caption += " \u00B7 " + SpeedText(session.speed);
        if (caption != m_caption) {
            m_caption = caption;
            m_thread.PublishCaption(lock, caption);
        }
    }

    // Backwards the key frames are shown in reverse order, each after the
    // time the frames between them would take.
    int StepBackward(std::unique_lock<std::mutex>& lock, int speed)
    {
        if (m_lastDirection >= 0) {
            m_reader.SetStreamCursor(m_lastBlock, m_lastEntry - 1);
        }
        m_lastDirection = -1;
        for (int passed = 1; passed <= kMaxFramesToAKeyFrame; ++passed) {
            if (BeforeTheOldestFrame())
                return End(-1);
            const long long before = m_reader.StreamBlock();
            _HisiHeader_t frame{};
            const int size = m_reader.NextFrame(m_payload.data(), &frame, m_oldest, m_newest, 0);
            if (size < 0) {
                SkipDamaged(-1);
                return 0;
            }
            if (m_reader.StreamBlock() > before || m_reader.StreamBlock() < m_oldest.StartBlock)
                return End(-1);  // the walk went round to the newest recording
            m_damagedInARow = 0;
            m_lastBlock = m_reader.StreamBlock();
            m_lastEntry = m_reader.StreamFrame() + 1;
            if (!H264Decoder::IsKeyFrame(m_payload.data(), static_cast<std::size_t>(size)))
                continue;
            m_decoder.Reset();
            Show(lock, size, true);
            return FrameInterval(speed, passed);
        }
        return FrameInterval(speed, kMaxFramesToAKeyFrame);
    }

    // A block whose header or index cannot be read is passed over, not
    // retried; a disk where nothing reads any more is left alone.
    void SkipDamaged(int direction)
    {
        if (++m_damagedInARow > static_cast<long long>(m_reader.Adapter()->DataBlockMax) + 2) {
            PlaybackControl::Get()->SetSpeed(m_dvrId, 0);
            return;
        }
        if (direction > 0)
            m_reader.SetStreamCursor(m_reader.StreamBlock() + 1, 0);
        else
            m_reader.SetStreamCursor(m_reader.StreamBlock() - 1, -1);
        m_decoder.Reset();
    }

    static constexpr int kMaxFramesToAKeyFrame = 600;

    ChannelDecoder& m_thread;
    long long m_dvrId;
    CatalogReader m_reader;
    H264Decoder m_decoder;
    std::vector<unsigned char> m_payload;
    _HisiList_t m_oldest{};
    _HisiList_t m_newest{};
    long long m_newestBlock = 0;  // the newest recording's last block, as the forward walk counts it
    int m_newestFrames = 0;       // the frames of that block
    std::unique_ptr<RecordingTimeline> m_timeline;
    FrameTime m_shownTime;
    bool m_shownAny = false;
    std::string m_caption;
    long long m_lastBlock = 0;
    int m_lastEntry = 0;
    int m_lastDirection = 0;
    int m_damagedInARow = 0;
};

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

bool ChannelDecoder::Stopping()
{
    return m_stopRequested || TestDestroy();
}

bool ChannelDecoder::Wait(std::unique_lock<std::mutex>& lock, int milliseconds)
{
    if (milliseconds > 0)
        m_changed.wait_for(lock, std::chrono::milliseconds(milliseconds), [this] { return m_stopRequested; });
    return !Stopping();
}

// Under the decoder's lock: once SetCanvas(nullptr) or StopDecoder has
// returned, no picture reaches the old canvas.
void ChannelDecoder::Publish(std::unique_lock<std::mutex>&, Picture picture)
{
    if (m_canvas)
        m_canvas->ShowPicture(0, std::move(picture));
}

void ChannelDecoder::PublishCaption(std::unique_lock<std::mutex>&, const std::string& caption)
{
    if (m_canvas)
        m_canvas->ShowCaption(caption);
}

// The thread ends only when it is deleted; until then it touches nothing.
void ChannelDecoder::IdleUntilDeleted(std::unique_lock<std::mutex>& lock)
{
    while (!TestDestroy()) {
        if (m_stopRequested && !m_idle) {
            m_idle = true;
            m_changed.notify_all();
        }
        m_changed.wait_for(lock, std::chrono::milliseconds(kIdleMilliseconds));
    }
    m_idle = true;
    m_changed.notify_all();
}

wxThread::ExitCode ChannelDecoder::Entry()
{
    PlaybackControl::Session session;
    auto loop = std::make_unique<DecoderLoop>(*this, m_dvrId);
    // The disk is opened outside the lock: a stop request need not wait for it.
    const bool playable = PlaybackControl::Get()->Find(m_dvrId, &session) && loop->Open(session);
    std::unique_lock<std::mutex> lock(m_mutex);
    if (playable)
        loop->Run(lock);
    loop.reset();  // closes the disk
    IdleUntilDeleted(lock);
    return nullptr;
}
