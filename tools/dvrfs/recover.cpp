#include "tools/dvrfs/recover.h"

#include <algorithm>

#include "dvrfs/record_math.h"

namespace dvrfstool {
namespace {

constexpr std::int32_t kNoRow = -1;

// For each block of the ring, the row whose recording covers it: the newest
// such row, as the recorder writes a block again for a newer recording.
// Rows are painted newest first, each block once (a chain to the next block
// not yet painted skips the painted ones), so however many rows claim the
// whole ring the work is rows plus ring, not their product.
std::vector<std::int32_t> RowOfEachBlock(CatalogReader& reader, std::int64_t ringSize,
                                         std::vector<_HisiList_t>* entries)
{
    for (std::int32_t position : reader.m_rowPositions) {
        _HisiList_t entry{};
        if (reader.ReadListEntries(position, 1, reinterpret_cast<char*>(&entry)) < 0)
            entry = _HisiList_t{};
        entries->push_back(entry);
    }
    std::vector<std::int32_t> owner(static_cast<std::size_t>(ringSize), kNoRow);
    std::vector<std::int64_t> next(static_cast<std::size_t>(ringSize) + 1);
    for (std::size_t b = 0; b < next.size(); ++b)
        next[b] = static_cast<std::int64_t>(b);
    auto unpainted = [&next](std::int64_t b) {
        while (next[static_cast<std::size_t>(b)] != b) {
            next[static_cast<std::size_t>(b)] = next[static_cast<std::size_t>(next[static_cast<std::size_t>(b)])];
            b = next[static_cast<std::size_t>(b)];
        }
        return b;
    };
    auto paint = [&](std::int64_t first, std::int64_t last, std::int32_t row) {
        for (std::int64_t b = unpainted(first); b <= last; b = unpainted(b)) {
            owner[static_cast<std::size_t>(b)] = row;
            next[static_cast<std::size_t>(b)] = b + 1;
        }
    };
    for (std::int32_t row = static_cast<std::int32_t>(entries->size()) - 1; row >= 0; --row) {
        const _HisiList_t& entry = (*entries)[static_cast<std::size_t>(row)];
        const std::int64_t start = entry.StartBlock;
        std::int64_t end = entry.EndBlock;
        if (end < start)
            end += ringSize;
        if (start < 0 || start >= ringSize || end >= start + ringSize)
            continue;  // an entry whose blocks lie outside the ring covers none
        paint(start, std::min(end, ringSize - 1), row);
        if (end >= ringSize)
            paint(0, end - ringSize, row);
    }
    return owner;
}

}  // namespace

RecoverResult FindUnlistedRuns(CatalogReader& reader)
{
    RecoverResult result;
    if (!reader.Adapter() || reader.Adapter()->DataBlockMax <= 0)
        return result;
    const _HisiAdapter_t& adapter = *reader.Adapter();
    const std::int64_t ringSize = adapter.DataBlockMax;
    std::vector<_HisiList_t> entries;
    const std::vector<std::int32_t> owner = RowOfEachBlock(reader, ringSize, &entries);

    // The scan starts after the newest recording's end. That end is a number
    // from a list entry whose block may not have been readable: any int.
    std::int64_t head = 0;
    if (adapter.LastList.Idx >= 0) {
        head = (static_cast<std::int64_t>(adapter.LastList.EndBlock) + 1) % ringSize;
        if (head < 0)
            head += ringSize;
    }
    std::optional<std::uint32_t> lastEnd;  // of the listed recording met last
    UnlistedRun run;
    bool inRun = false;
    std::size_t waiting = 0;  // runs from here on wait for the next listed recording's start
    auto closeRun = [&]() {
        if (inRun)
            result.runs.push_back(run);
        inRun = false;
    };
    for (std::int64_t k = 0; k < ringSize; ++k) {
        const std::int64_t block = dvrfs::ReduceInRing(head + k, ringSize);
        ++result.blocksScanned;
        const std::int32_t row = owner[static_cast<std::size_t>(block)];
        if (row != kNoRow) {
            closeRun();
            for (; waiting < result.runs.size(); ++waiting)
                result.runs[waiting].before = entries[static_cast<std::size_t>(row)].StartTime;
            lastEnd = entries[static_cast<std::size_t>(row)].EndTime;
            continue;
        }
        _HisiBlockHeader_t header{};
        ++result.headersRead;
        const bool sound = reader.ReadBlockHeaders(block, 1, reinterpret_cast<char*>(&header)) > 0 && header.BlockIdx == block;
        if (!sound) {
            closeRun();
            continue;
        }
        if (!inRun) {
            run = UnlistedRun{};
            run.firstBlock = block;
            run.after = lastEnd;
            inRun = true;
        }
        run.lastBlock = block;
        ++run.blocks;
        run.frames += std::clamp(header.FrameCount, 0, 262142);
    }
    closeRun();
    return result;
}

_HisiList_t RecordingOfBlocks(std::int32_t first, std::int32_t last)
{
    _HisiList_t recording{};
    recording.Idx = -1;
    recording.StartBlock = first;
    recording.EndBlock = last;
    return recording;
}

}  // namespace dvrfstool
