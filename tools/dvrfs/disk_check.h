// What the dvrfs command does with a disk, as library functions: the
// verification walk over every structure and the extraction of a
// recording's stream. The command, the benchmarks and the fuzzers use them.
#ifndef TOOLS_DVRFS_DISK_CHECK_H
#define TOOLS_DVRFS_DISK_CHECK_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "catalog/catalog_reader.h"

namespace dvrfstool {

// How far a verification got before it had to stop.
enum class VerifyStage {
    kNotOpened,      // no volume: the disk or its primary superblock or table failed
    kNotConfigured,  // no recorder configured on the disk
    kNoAdapter,      // no current adapter
    kComplete,       // every structure the adapter leads to was read
};

struct VerifyResult {
    VerifyStage stage = VerifyStage::kNotOpened;
    long long checked = 0;   // records read and checked
    long long damaged = 0;   // records that failed their checks
    long long repaired = 0;  // list entries whose ring copy failed and whose mirror copy holds
    long long unwritten = 0;  // list entries of the span never written: not damage
    dvrfs::VolumeStatus status;  // how far the open got
};

// Reads every structure of the disk once and reports each damaged or
// repaired record as one line ("damaged: ...", "repaired: ...").
VerifyResult VerifyDisk(CatalogReader& reader, const std::string& path,
                        const std::function<void(const std::string&)>& report);

// A stretch of a recording that extraction left out: frames whose index
// entry or payload is damaged, or a whole data block whose header is.
struct LeftOut {
    long long firstFrame = 0;  // place among the recording's frames of the first one left out
    long long frames = 0;      // how many (0: a block whose frames are unknown)
    long long block = -1;      // the data block, for a block left out whole
};

struct ExtractResult {
    long long frames = 0;
    long long bytes = 0;
    long long skippedFrames = 0;  // frames whose index entry or payload could not be read, or lies outside
    long long skippedBlocks = 0;  // blocks whose header could not be read
    std::vector<LeftOut> leftOut;  // in order; at most kMaxLeftOutKept, the rest only counted
    bool written = true;           // false when the sink refused a frame
};

constexpr std::size_t kMaxLeftOutKept = 1000;

// One frame as extraction hands it on.
struct ExtractedFrame {
    const unsigned char* data;
    std::size_t size;
    long long place;  // among the recording's frames, damaged ones counted
};

// The data blocks of a recording as numbers to walk, first and last (last
// beyond the ring when the recording wraps), at most one turn of a ring of
// `ringSize` blocks: a recording never holds a block twice. Each number is
// reduced to the ring before it is read.
std::pair<std::int64_t, std::int64_t> RecordingBlockSpan(const _HisiList_t& recording, std::int64_t ringSize);

// The list entry of catalogue row `row` of a built catalogue, read again from
// the disk; false when there is no such row or it cannot be read.
bool RecordingOfRow(CatalogReader& reader, int row, _HisiList_t* recording);

// Hands every frame of the recording to `sink`, in order, from frame 0 of its
// first data block to the last frame of its last one, across the end of the
// data ring when it wraps, at most one turn of the ring. Per block: its
// header, its index entries in one read, and the payload of consecutive
// frames in large reads. A frame whose entry is damaged, or whose payload
// lies outside the payload area or over bytes an earlier frame of the block
// delivered, is left out, as is a block whose header is damaged: so no block
// gives more than its payload area. `progress` hears the fraction of blocks
// done.
ExtractResult ExtractRecording(CatalogReader& reader, const _HisiList_t& recording,
                               const std::function<bool(const ExtractedFrame&)>& sink,
                               const std::function<void(double)>& progress = {});

}  // namespace dvrfstool

#endif
