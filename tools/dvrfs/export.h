// Handing a recording on: its frames remuxed, without re-encoding, into a
// file a colleague's video player opens (MP4, Matroska, or the raw H.264
// stream), with the recording's real time in it and a SHA-256 beside it.
#ifndef TOOLS_DVRFS_EXPORT_H
#define TOOLS_DVRFS_EXPORT_H

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "tools/dvrfs/disk_check.h"

namespace dvrfstool {

enum class ExportFormat { kMp4, kMkv, kH264 };

// "mp4", "mkv", "h264"; false for any other name.
bool ParseExportFormat(const std::string& name, ExportFormat* format);
const char* Extension(ExportFormat format);

struct ExportRequest {
    ExportFormat format = ExportFormat::kMp4;
    std::string output;  // a file, or "-" for standard output
    // A time range (seconds since 1970, UTC): the file begins at the key
    // frame at or before `from` and ends with the last frame before `to`.
    std::optional<std::uint32_t> from;
    std::optional<std::uint32_t> to;
};

struct ExportOutcome {
    ExtractResult extracted;
    long long framesWritten = 0;
    long long framesBeforeAKeyFrame = 0;  // left out: nothing decodes them
    double framesPerSecond = 0;
    bool timingFromStream = false;  // the stream's own timing, else the recording's frames over its duration
    std::uint32_t firstTime = 0;    // of the first frame written, seconds since 1970, UTC
    double seconds = 0;             // the file's duration
    std::string error;              // why the output could not be written; empty when it was
};

// Remuxes the recording's frames into `request.output`. Each frame's time is
// its place among the recording's frames over the frame rate, so frames left
// out for damage leave their time empty; the container's creation time is the
// first frame's time.
ExportOutcome ExportRecording(CatalogReader& reader, const _HisiList_t& recording, const ExportRequest& request,
                              const std::function<void(double)>& progress = {});

// Several recordings into one file, in the order given, on one timeline:
// each frame at its recording's own time, so the pauses between recordings
// stay gaps in the file. One outcome each; an error that stopped the file is
// in the outcome of the recording it stopped at (or the last).
std::vector<ExportOutcome> ExportRecordings(CatalogReader& reader, const std::vector<_HisiList_t>& recordings,
                                            const ExportRequest& request,
                                            const std::function<void(double)>& progress = {});

// Whether an H.264 access unit holds an IDR slice (a frame that needs no other).
bool IsKeyFrame(const unsigned char* data, std::size_t size);

// A frame that starts a stream, decoded and scaled to `width` pixels (its
// shape kept), as a PNG picture; empty when it does not decode.
std::string Thumbnail(const std::string& accessUnit, int width);

// Seconds since 1970 as "2023-11-14T22:13:20Z".
std::string IsoUtc(double seconds);

// The SHA-256 of a whole file or device, read once from start to end, as 64
// hexadecimal digits; empty when it cannot be read. `progress` hears the
// bytes read so far.
std::string Sha256OfFile(const std::string& path, const std::function<void(std::uint64_t)>& progress = {});

}  // namespace dvrfstool

#endif
