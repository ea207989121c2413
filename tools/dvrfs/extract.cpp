// Taking a recording off the disk: its frames, in order, block by block,
// each block read as its header, its index entries in one read and the
// payload of consecutive frames in one read, never more than the block's
// payload area holds.
#include <algorithm>
#include <map>
#include <vector>

#include "dvrfs/record_math.h"
#include "tools/dvrfs/disk_check.h"

namespace dvrfstool {
namespace {

constexpr std::int64_t kDataBlockBytes = 1 << 24;
constexpr std::int32_t kMaxFramesInBlock = 262142;

struct FrameSpan {
    std::int64_t place;   // among the recording's frames
    std::int64_t offset;  // in the block's payload area
    std::int64_t size;
};

class Extraction {
public:
    Extraction(CatalogReader& reader, const std::function<bool(const ExtractedFrame&)>& sink)
        : reader_(reader), adapter_(*reader.Adapter()), sink_(sink),
          payload_(static_cast<std::size_t>(kPayloadAreaSize))
    {
    }

    // False once the sink refused a frame.
    bool Block(std::int64_t block)
    {
        _HisiBlockHeader_t header{};
        if (reader_.ReadBlockHeaders(block, 1, reinterpret_cast<char*>(&header)) < 0) {
            ++result_.skippedBlocks;
            LeaveOut(place_, 0, block);
            return true;
        }
        const std::int32_t count = std::clamp(header.FrameCount, 0, kMaxFramesInBlock);
        const std::vector<FrameSpan> frames = SoundFrames(block, count);
        place_ += count;
        return Deliver(block, frames);
    }

    ExtractResult Result() const { return result_; }

private:
    // The frames of the block whose index entry is sound and whose payload
    // lies inside the payload area, clear of every earlier frame's bytes.
    std::vector<FrameSpan> SoundFrames(std::int64_t block, std::int32_t count)
    {
        std::vector<FrameSpan> frames;
        if (count == 0)
            return frames;
        index_.resize(static_cast<std::size_t>(count));
        const std::int64_t position =
            dvrfs::RecordPosition(adapter_.DataBlockOffset, block + 1, kDataBlockBytes,
                                  -static_cast<std::int64_t>(count) * kIndexEntrySize);
        if (reader_.ReadLogical(position, reinterpret_cast<char*>(index_.data()), count * kIndexEntrySize) < 0) {
            LeaveOut(place_, count, -1);
            return frames;
        }
        std::map<std::int64_t, std::int64_t> taken;  // start -> end of the bytes delivered
        for (std::int32_t k = 0; k < count; ++k) {
            // The entries lie newest first: entry k is count - 1 - k places in.
            _HisiHeader_t& entry = index_[static_cast<std::size_t>(count - 1 - k)];
            const std::int64_t offset = entry.DataOffset;
            const std::int64_t size = entry.DataSize;
            if (!SumMatches(entry) || offset < 0 || size < 0 || offset + size > kPayloadAreaSize ||
                Overlaps(taken, offset, size)) {
                LeaveOut(place_ + k, 1, -1);
                continue;
            }
            if (size > 0)
                taken[offset] = offset + size;
            frames.push_back({place_ + k, offset, size});
        }
        return frames;
    }

    bool SumMatches(_HisiHeader_t& entry)
    {
        const int sum = reader_.Checksum(reinterpret_cast<char*>(&entry), kIndexEntrySize);
        return static_cast<std::uint8_t>(sum) == adapter_.RecordSum;
    }

    static bool Overlaps(const std::map<std::int64_t, std::int64_t>& taken, std::int64_t offset, std::int64_t size)
    {
        if (size == 0)
            return false;
        auto next = taken.lower_bound(offset);
        if (next != taken.end() && next->first < offset + size)
            return true;
        return next != taken.begin() && std::prev(next)->second > offset;
    }

    // Frames that follow each other in the payload area are read together.
    bool Deliver(std::int64_t block, const std::vector<FrameSpan>& frames)
    {
        for (std::size_t first = 0; first < frames.size();) {
            std::size_t last = first;
            while (last + 1 < frames.size() &&
                   frames[last + 1].offset == frames[last].offset + frames[last].size)
                ++last;
            const std::int64_t start = frames[first].offset;
            const std::int64_t bytes = frames[last].offset + frames[last].size - start;
            const bool read = bytes == 0 || reader_.ReadPayload(block, static_cast<int>(start), static_cast<int>(bytes),
                                                                reinterpret_cast<char*>(payload_.data())) > 0;
            for (std::size_t i = first; i <= last; ++i) {
                const FrameSpan& frame = frames[i];
                if (!read) {
                    LeaveOut(frame.place, 1, -1);
                    continue;
                }
                const ExtractedFrame out{payload_.data() + (frame.offset - start),
                                         static_cast<std::size_t>(frame.size), frame.place};
                if (!sink_(out)) {
                    result_.written = false;
                    return false;
                }
                ++result_.frames;
                result_.bytes += frame.size;
            }
            first = last + 1;
        }
        return true;
    }

    void LeaveOut(std::int64_t place, std::int64_t frames, std::int64_t block)
    {
        result_.skippedFrames += frames;
        std::vector<LeftOut>& leftOut = result_.leftOut;
        if (block < 0 && !leftOut.empty() && leftOut.back().block < 0 &&
            leftOut.back().firstFrame + leftOut.back().frames == place) {
            leftOut.back().frames += frames;
            return;
        }
        if (leftOut.size() < kMaxLeftOutKept)
            leftOut.push_back({place, frames, block});
    }

    CatalogReader& reader_;
    const _HisiAdapter_t& adapter_;
    const std::function<bool(const ExtractedFrame&)>& sink_;
    std::vector<unsigned char> payload_;
    std::vector<_HisiHeader_t> index_;
    std::int64_t place_ = 0;
    ExtractResult result_;
};

}  // namespace

bool RecordingOfRow(CatalogReader& reader, int row, _HisiList_t* recording)
{
    if (row < 0 || row >= reader.m_recordCount || static_cast<std::size_t>(row) >= reader.m_rowPositions.size())
        return false;
    return reader.ReadListEntries(reader.m_rowPositions[static_cast<std::size_t>(row)], 1,
                                  reinterpret_cast<char*>(recording)) > 0;
}

std::pair<std::int64_t, std::int64_t> RecordingBlockSpan(const _HisiList_t& recording, std::int64_t ringSize)
{
    const std::int64_t start = recording.StartBlock;
    std::int64_t last = recording.EndBlock;
    if (start > last)
        last += ringSize;
    return {start, std::min(last, start + ringSize - 1)};
}

ExtractResult ExtractRecording(CatalogReader& reader, const _HisiList_t& recording,
                               const std::function<bool(const ExtractedFrame&)>& sink,
                               const std::function<void(double)>& progress)
{
    if (!reader.Adapter() || reader.Adapter()->DataBlockMax <= 0)
        return ExtractResult{};
    const std::int64_t ringSize = reader.Adapter()->DataBlockMax;
    const auto [start, last] = RecordingBlockSpan(recording, ringSize);
    Extraction extraction(reader, sink);
    for (std::int64_t n = start; n <= last; ++n) {
        if (progress)
            progress(static_cast<double>(n - start) / static_cast<double>(last - start + 1));
        if (!extraction.Block(dvrfs::ReduceInRing(n, ringSize)))
            break;
    }
    if (progress)
        progress(1.0);
    return extraction.Result();
}

}  // namespace dvrfstool
