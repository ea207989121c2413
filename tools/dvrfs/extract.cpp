// Taking a recording off the disk: its frames, in order, through the
// reader's stream extraction.
#include <algorithm>
#include <vector>

#include "tools/dvrfs/disk_check.h"

namespace dvrfstool {
namespace {

constexpr std::int32_t kMaxFramesInBlock = 262142;

}  // namespace

bool RecordingOfRow(CatalogReader& reader, int row, _HisiList_t* recording)
{
    if (row < 0 || row >= reader.m_recordCount || static_cast<std::size_t>(row) >= reader.m_rowPositions.size())
        return false;
    return reader.BlockOpe(reader.m_diskFile, 33, recording, reader.m_rowPositions[static_cast<std::size_t>(row)],
                           1) > 0;
}

ExtractResult ExtractRecording(CatalogReader& reader, const _HisiList_t& recording,
                               const std::function<bool(const unsigned char*, std::size_t)>& sink,
                               const std::function<void(double)>& progress)
{
    ExtractResult result;
    if (!reader.m_volume || !reader.m_volume->adapter || reader.m_volume->adapter->DataBlockMax <= 0)
        return result;
    const std::int64_t ringSize = reader.m_volume->adapter->DataBlockMax;
    const std::int64_t start = recording.StartBlock;
    std::int64_t last = recording.EndBlock;
    if (start > last)
        last += ringSize;
    last = std::min(last, start + ringSize - 1);  // a recording never holds a block twice

    std::vector<unsigned char> payload(static_cast<std::size_t>(kPayloadAreaSize));
    reader.m_streamBlock = start;
    reader.m_streamFrame = 0;
    // Frames of the block under the cursor, read once per block; get_stream
    // then delivers them one by one without leaving the block.
    std::int64_t headerOf = -1;
    std::int32_t framesInBlock = 0;
    while (reader.m_streamBlock <= last) {
        if (progress)
            progress(static_cast<double>(reader.m_streamBlock - start) / static_cast<double>(last - start + 1));
        if (headerOf != reader.m_streamBlock) {
            _HisiBlockHeader_t header{};
            headerOf = reader.m_streamBlock;
            const std::int64_t block = reader.m_streamBlock % ringSize;
            if (reader.BlockOpe(reader.m_diskFile, 65, &header, block, 1) < 0) {
                ++result.skippedBlocks;
                ++reader.m_streamBlock;
                continue;
            }
            framesInBlock = std::clamp(header.FrameCount, 0, kMaxFramesInBlock);
            reader.m_streamFrame = 0;
        }
        if (reader.m_streamFrame >= framesInBlock) {
            ++reader.m_streamBlock;
            continue;
        }
        _HisiHeader_t frame{};
        const int size = reader.get_stream(reader.m_diskFile, payload.data(), &frame, recording, recording, 1);
        if (size < 0) {
            ++result.skippedFrames;
            ++reader.m_streamFrame;
            continue;
        }
        if (!sink(payload.data(), static_cast<std::size_t>(size))) {
            result.written = false;
            break;
        }
        ++result.frames;
        result.bytes += size;
    }
    if (progress)
        progress(1.0);
    return result;
}

}  // namespace dvrfstool
