#include "tools/dvrfs/export.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <memory>
#include <utility>
#include <vector>

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavformat/avformat.h>
#include <libavutil/sha.h>
#include <libswscale/swscale.h>
}

#include "catalog/time_text.h"
#include "dvrfs/record_math.h"

namespace dvrfstool {
namespace {

constexpr AVRational kTimeBase = {1, 90000};

// The NAL units of an Annex B access unit: type and the unit with its start code.
template <typename Visit>
void ForEachUnit(const unsigned char* data, std::size_t size, Visit visit)
{
    std::size_t start = size;
    for (std::size_t i = 0; i + 3 <= size; ++i) {
        if (data[i] != 0 || data[i + 1] != 0 || data[i + 2] != 1)
            continue;
        const std::size_t codeStart = i > 0 && data[i - 1] == 0 ? i - 1 : i;
        if (start < size)
            visit(data[start + (data[start + 2] == 1 ? 3 : 4)] & 0x1F, data + start, codeStart - start);
        start = codeStart;
        i += 2;
    }
    if (start + 4 < size)
        visit(data[start + (data[start + 2] == 1 ? 3 : 4)] & 0x1F, data + start, size - start);
}

// The sequence and picture parameter sets of an access unit, with their
// start codes: what the container carries as the stream's set-up.
std::vector<std::uint8_t> ParameterSets(const unsigned char* data, std::size_t size)
{
    std::vector<std::uint8_t> sets;
    ForEachUnit(data, size, [&sets](int type, const unsigned char* unit, std::size_t length) {
        if (type == 7 || type == 8)
            sets.insert(sets.end(), unit, unit + length);
    });
    return sets;
}

}  // namespace

bool IsKeyFrame(const unsigned char* data, std::size_t size)
{
    bool key = false;
    ForEachUnit(data, size, [&key](int type, const unsigned char*, std::size_t) { key = key || type == 5; });
    return key;
}

namespace {

struct StreamFacts {
    int width = 0;
    int height = 0;
    AVRational framerate = {0, 1};  // from the stream's timing information, 0 when it carries none
};

// Decodes a frame that starts a stream and hands its picture on.
template <typename Use>
bool DecodeFirstPicture(const unsigned char* data, std::size_t size, Use use)
{
    const AVCodec* codec = avcodec_find_decoder(AV_CODEC_ID_H264);
    AVCodecContext* context = codec ? avcodec_alloc_context3(codec) : nullptr;
    AVPacket* packet = av_packet_alloc();
    AVFrame* frame = av_frame_alloc();
    bool ok = false;
    if (context && packet && frame) {
        context->thread_count = 1;
        std::vector<std::uint8_t> padded(data, data + size);
        padded.resize(size + AV_INPUT_BUFFER_PADDING_SIZE, 0);
        packet->data = padded.data();
        packet->size = static_cast<int>(size);
        if (avcodec_open2(context, codec, nullptr) == 0 && avcodec_send_packet(context, packet) == 0) {
            avcodec_send_packet(context, nullptr);
            ok = avcodec_receive_frame(context, frame) == 0 && context->width > 0 && context->height > 0 &&
                 use(context, frame);
        }
    }
    av_frame_free(&frame);
    av_packet_free(&packet);
    avcodec_free_context(&context);
    return ok;
}

// Decodes a frame that starts a stream, for its size and its timing.
bool Probe(const unsigned char* data, std::size_t size, StreamFacts* facts)
{
    return DecodeFirstPicture(data, size, [facts](AVCodecContext* context, AVFrame*) {
        facts->width = context->width;
        facts->height = context->height;
        facts->framerate = context->framerate;
        return true;
    });
}

// A decoded picture scaled to `width` (keeping its shape) and encoded as PNG.
std::string EncodePng(const AVFrame* frame, int width)
{
    const int height = std::max(1, frame->height * width / std::max(frame->width, 1));
    SwsContext* scaler = sws_getContext(frame->width, frame->height, static_cast<AVPixelFormat>(frame->format), width,
                                        height, AV_PIX_FMT_RGB24, SWS_BILINEAR, nullptr, nullptr, nullptr);
    const AVCodec* codec = avcodec_find_encoder(AV_CODEC_ID_PNG);
    AVCodecContext* encoder = codec ? avcodec_alloc_context3(codec) : nullptr;
    AVFrame* rgb = av_frame_alloc();
    AVPacket* packet = av_packet_alloc();
    std::string png;
    if (scaler && encoder && rgb && packet) {
        encoder->width = width;
        encoder->height = height;
        encoder->pix_fmt = AV_PIX_FMT_RGB24;
        encoder->time_base = {1, 25};
        rgb->format = AV_PIX_FMT_RGB24;
        rgb->width = width;
        rgb->height = height;
        if (avcodec_open2(encoder, codec, nullptr) == 0 && av_frame_get_buffer(rgb, 0) == 0) {
            sws_scale(scaler, frame->data, frame->linesize, 0, frame->height, rgb->data, rgb->linesize);
            if (avcodec_send_frame(encoder, rgb) == 0 && avcodec_receive_packet(encoder, packet) == 0)
                png.assign(reinterpret_cast<const char*>(packet->data), static_cast<std::size_t>(packet->size));
        }
    }
    av_packet_free(&packet);
    av_frame_free(&rgb);
    avcodec_free_context(&encoder);
    sws_freeContext(scaler);
    return png;
}

// The frames the recording's block headers count: its length in frames,
// damaged frames included, one header read per block.
long long CountFrames(CatalogReader& reader, const _HisiList_t& recording)
{
    const std::int64_t ringSize = reader.Adapter()->DataBlockMax;
    const auto [start, last] = RecordingBlockSpan(recording, ringSize);
    long long frames = 0;
    for (std::int64_t n = start; n <= last; ++n) {
        _HisiBlockHeader_t header{};
        if (reader.ReadBlockHeaders(dvrfs::ReduceInRing(n, ringSize), 1, reinterpret_cast<char*>(&header)) > 0)
            frames += std::clamp(header.FrameCount, 0, 262142);
    }
    return frames;
}

std::string AvError(int code)
{
    char text[AV_ERROR_MAX_STRING_SIZE] = {};
    av_strerror(code, text, sizeof text);
    return text;
}

// One output file (or standard output), its one video stream, and the
// packets written to it.
class Muxer {
public:
    ~Muxer() { Close(); }

    std::string Open(const ExportRequest& request, const StreamFacts& facts, const std::vector<std::uint8_t>& sets,
                     std::uint32_t creationTime)
    {
        static const char* const kFormats[] = {"mp4", "matroska", "h264"};
        const bool toPipe = request.output == "-";
        const std::string target = toPipe ? "pipe:1" : request.output;
        int status = avformat_alloc_output_context2(&output_, nullptr, kFormats[static_cast<int>(request.format)],
                                                    target.c_str());
        if (status < 0)
            return AvError(status);
        stream_ = avformat_new_stream(output_, nullptr);
        if (!stream_)
            return "cannot add a stream";
        AVCodecParameters* parameters = stream_->codecpar;
        parameters->codec_type = AVMEDIA_TYPE_VIDEO;
        parameters->codec_id = AV_CODEC_ID_H264;
        parameters->width = facts.width;
        parameters->height = facts.height;
        parameters->extradata = static_cast<std::uint8_t*>(av_mallocz(sets.size() + AV_INPUT_BUFFER_PADDING_SIZE));
        if (!parameters->extradata)
            return "out of memory";
        std::copy(sets.begin(), sets.end(), parameters->extradata);
        parameters->extradata_size = static_cast<int>(sets.size());
        stream_->time_base = kTimeBase;
        if (creationTime != 0)  // 0: a run of blocks whose time no list entry gives
            av_dict_set(&output_->metadata, "creation_time", IsoUtc(creationTime).c_str(), 0);
        if ((status = avio_open(&output_->pb, target.c_str(), AVIO_FLAG_WRITE)) < 0)
            return AvError(status);
        AVDictionary* options = nullptr;
        if (toPipe && request.format == ExportFormat::kMp4)
            av_dict_set(&options, "movflags", "frag_keyframe+empty_moov", 0);  // a pipe cannot seek back
        status = avformat_write_header(output_, &options);
        av_dict_free(&options);
        if (status < 0)
            return AvError(status);
        opened_ = true;
        return "";
    }

    std::string Write(const unsigned char* data, std::size_t size, std::int64_t pts, std::int64_t duration, bool key)
    {
        AVPacket* packet = av_packet_alloc();
        if (!packet)
            return "out of memory";
        packet->data = const_cast<unsigned char*>(data);
        packet->size = static_cast<int>(size);
        packet->stream_index = stream_->index;
        packet->pts = packet->dts = av_rescale_q(pts, kTimeBase, stream_->time_base);
        packet->duration = av_rescale_q(duration, kTimeBase, stream_->time_base);
        packet->flags = key ? AV_PKT_FLAG_KEY : 0;
        const int status = av_write_frame(output_, packet);
        av_packet_free(&packet);
        return status < 0 ? AvError(status) : "";
    }

    std::string Close()
    {
        std::string error;
        if (opened_) {
            const int status = av_write_trailer(output_);
            if (status < 0)
                error = AvError(status);
            opened_ = false;
        }
        if (output_) {
            if (output_->pb && avio_closep(&output_->pb) < 0 && error.empty())
                error = "the output could not be closed";
            avformat_free_context(output_);
            output_ = nullptr;
        }
        return error;
    }

    bool IsOpen() const { return opened_; }

private:
    AVFormatContext* output_ = nullptr;
    AVStream* stream_ = nullptr;
    bool opened_ = false;
};

// The file the recordings go into and where on its timeline they are: the
// clock time of its first frame, and the last time stamp written.
struct OutputFile {
    Muxer muxer;
    double origin = 0;
    std::int64_t lastPts = -1;
};

// Frames on their way from the extraction to the file: those before the
// first frame that starts a stream, before the time range's key frame or
// after its end stay out; the rest are written with the time of their place.
class ExportSink {
public:
    // `countFrames` gives the recording's length in frames, asked only when
    // the stream carries no timing of its own.
    ExportSink(const _HisiList_t& recording, const ExportRequest& request, std::function<long long()> countFrames,
               OutputFile& file, ExportOutcome& outcome)
        : recording_(recording),
          request_(request),
          countFrames_(std::move(countFrames)),
          file_(file),
          outcome_(outcome)
    {
    }

    bool Take(const ExtractedFrame& frame)
    {
        const bool key = IsKeyFrame(frame.data, frame.size);
        if (!started_ && !(key && Start(frame)))
            return Skip();
        const double time = TimeOf(frame.place);
        if (request_.to && time >= *request_.to) {
            finished_ = true;
            return false;
        }
        if (request_.from && time < *request_.from) {
            if (key)
                gop_.clear();
            gop_.push_back({std::vector<unsigned char>(frame.data, frame.data + frame.size), frame.place, key});
            return true;
        }
        if (key)
            gop_.clear();  // the range begins at this key frame itself
        for (const Held& held : gop_)
            if (!Write(held.bytes.data(), held.bytes.size(), held.place, held.key))
                return false;
        gop_.clear();
        return Write(frame.data, frame.size, frame.place, key);
    }

    void Finish()
    {
        for (const Held& held : gop_)  // a range that ends before the next key frame
            if (!Write(held.bytes.data(), held.bytes.size(), held.place, held.key))
                break;
        gop_.clear();
    }

    bool Finished() const { return finished_; }

private:
    struct Held {
        std::vector<unsigned char> bytes;
        long long place;
        bool key;
    };

    bool Skip()
    {
        ++outcome_.framesBeforeAKeyFrame;
        return true;
    }

    // The stream's set-up and timing, from the first frame that carries them.
    bool Start(const ExtractedFrame& frame)
    {
        sets_ = ParameterSets(frame.data, frame.size);
        StreamFacts& facts = facts_;
        if (sets_.empty() || !Probe(frame.data, frame.size, &facts))
            return false;
        started_ = true;
        const double duration = recording_.EndTime > recording_.StartTime
                                    ? static_cast<double>(recording_.EndTime - recording_.StartTime)
                                    : 0.0;
        const double fromStream =
            facts.framerate.num > 0 && facts.framerate.den > 0 ? av_q2d(facts.framerate) : 0.0;
        outcome_.timingFromStream = fromStream >= 0.5 && fromStream <= 240;
        outcome_.framesPerSecond = fromStream;
        if (!outcome_.timingFromStream) {
            const long long frames = duration > 0 ? countFrames_() : 0;
            outcome_.framesPerSecond = frames > 0 ? static_cast<double>(frames) / duration : 25.0;
        }
        return true;
    }

    // A frame's time: the recording's start and the frame's place over the
    // frame rate (counted from 0 for a run of blocks whose time no entry gives).
    double TimeOf(long long place) const
    {
        return recording_.StartTime + (outcome_.framesPerSecond > 0 ? place / outcome_.framesPerSecond : 0.0);
    }

    bool Write(const unsigned char* data, std::size_t size, long long place, bool key)
    {
        if (!file_.muxer.IsOpen()) {
            // The file's creation time is its first frame's; none is claimed
            // for a run of blocks.
            outcome_.firstTime =
                recording_.StartTime == 0 ? 0 : static_cast<std::uint32_t>(std::max(TimeOf(place), 0.0));
            outcome_.error = file_.muxer.Open(request_, facts_, sets_, outcome_.firstTime);
            if (!outcome_.error.empty())
                return false;
            file_.origin = TimeOf(place);
        } else if (outcome_.framesWritten == 0) {
            outcome_.firstTime = static_cast<std::uint32_t>(std::max(TimeOf(place), 0.0));
        }
        const double tick = kTimeBase.den / outcome_.framesPerSecond;
        // A later recording never steps back on the file's timeline, even
        // where a damaged disk says it began before the previous one ended.
        const std::int64_t pts =
            std::max<std::int64_t>(std::llround((TimeOf(place) - file_.origin) * kTimeBase.den), file_.lastPts + 1);
        const std::string error = file_.muxer.Write(data, size, pts, std::llround(tick), key);
        if (!error.empty()) {
            outcome_.error = error;
            return false;
        }
        file_.lastPts = pts;
        ++outcome_.framesWritten;
        outcome_.seconds = (static_cast<double>(pts) + tick) / kTimeBase.den;
        return true;
    }

    const _HisiList_t& recording_;
    const ExportRequest& request_;
    std::function<long long()> countFrames_;
    OutputFile& file_;
    ExportOutcome& outcome_;
    bool started_ = false;
    StreamFacts facts_;
    std::vector<std::uint8_t> sets_;
    std::vector<Held> gop_;  // while before the range: the frames since the last key frame
    bool finished_ = false;
};

}  // namespace

std::string Thumbnail(const std::string& accessUnit, int width)
{
    std::string png;
    DecodeFirstPicture(reinterpret_cast<const unsigned char*>(accessUnit.data()), accessUnit.size(),
                       [&png, width](AVCodecContext*, AVFrame* frame) {
                           png = EncodePng(frame, width);
                           return !png.empty();
                       });
    return png;
}

bool ParseExportFormat(const std::string& name, ExportFormat* format)
{
    if (name == "mp4")
        *format = ExportFormat::kMp4;
    else if (name == "mkv")
        *format = ExportFormat::kMkv;
    else if (name == "h264")
        *format = ExportFormat::kH264;
    else
        return false;
    return true;
}

const char* Extension(ExportFormat format)
{
    switch (format) {
    case ExportFormat::kMp4: return "mp4";
    case ExportFormat::kMkv: return "mkv";
    case ExportFormat::kH264: return "h264";
    }
    return "";
}

std::string IsoUtc(double seconds)
{
    return TimeText(static_cast<std::time_t>(seconds), "%Y-%m-%dT%H:%M:%SZ", Zone::kUtc);
}

ExportOutcome ExportRecording(CatalogReader& reader, const _HisiList_t& recording, const ExportRequest& request,
                              const std::function<void(double)>& progress)
{
    return ExportRecordings(reader, {recording}, request, progress).front();
}

std::vector<ExportOutcome> ExportRecordings(CatalogReader& reader, const std::vector<_HisiList_t>& recordings,
                                            const ExportRequest& request,
                                            const std::function<void(double)>& progress)
{
    std::vector<ExportOutcome> outcomes(recordings.size());
    if (recordings.empty())
        return outcomes;
    if (!reader.Adapter() || reader.Adapter()->DataBlockMax <= 0) {
        for (ExportOutcome& outcome : outcomes)
            outcome.error = "the disk has no data ring";
        return outcomes;
    }
    OutputFile file;
    for (std::size_t i = 0; i < recordings.size(); ++i) {
        const _HisiList_t& recording = recordings[i];
        ExportOutcome& outcome = outcomes[i];
        ExportSink sink(recording, request, [&reader, &recording] { return CountFrames(reader, recording); }, file,
                        outcome);
        const double share = 1.0 / static_cast<double>(recordings.size());
        outcome.extracted = ExtractRecording(
            reader, recording, [&sink](const ExtractedFrame& frame) { return sink.Take(frame); },
            [&](double fraction) {
                if (progress)
                    progress((static_cast<double>(i) + fraction) * share);
            });
        if (sink.Finished())
            outcome.extracted.written = true;  // the range ended, or the error says why
        sink.Finish();
        if (!outcome.error.empty())
            return outcomes;
    }
    const std::string closed = file.muxer.Close();
    if (outcomes.back().error.empty())
        outcomes.back().error = closed;
    return outcomes;
}

std::string Sha256OfFile(const std::string& path, const std::function<void(std::uint64_t)>& progress)
{
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return "";
    std::unique_ptr<AVSHA, decltype(&av_free)> sha(av_sha_alloc(), &av_free);
    std::vector<std::uint8_t> buffer(4 << 20);
    std::uint64_t total = 0;
    bool ok = sha && av_sha_init(sha.get(), 256) == 0;
    while (ok) {
        const ssize_t got = ::read(fd, buffer.data(), buffer.size());
        if (got < 0 && errno == EINTR)
            continue;
        if (got <= 0) {
            ok = got == 0;
            break;
        }
        av_sha_update(sha.get(), buffer.data(), static_cast<unsigned>(got));
        total += static_cast<std::uint64_t>(got);
        if (progress)
            progress(total);
    }
    ::close(fd);
    if (!ok)
        return "";
    std::uint8_t digest[32];
    av_sha_final(sha.get(), digest);
    std::string hex;
    for (std::uint8_t byte : digest) {
        char two[3];
        std::snprintf(two, sizeof two, "%02x", byte);
        hex += two;
    }
    return hex;
}

}  // namespace dvrfstool
