// Stream extraction: the recorded stream read back frame by frame, with a
// cursor (m_streamBlock, m_streamFrame) that moves forward or backward through
// the data ring, or as a run of consecutive frames of one block.
#include <algorithm>
#include <climits>

#include "dvrfs/dvr_disk_reader.h"
#include "dvrfs/error_places.h"
#include "dvrfs/record_math.h"

using namespace dvrfs;

namespace {

// A walk that passes over this many blocks without finding a frame has gone
// round the ring at least once with nothing to deliver: it would never end.
// However large the ring, one call passes at most kMaxEmptyBlocksInACall
// (64 GiB of data blocks without a frame, which no recorder writes): a disk
// of unwritten blocks that pass their sum, or a span of one empty block
// walked round and round, costs that many reads, not twice the ring's.
constexpr wxInt64 kMaxEmptyBlocksInACall = 4096;

wxInt64 MaxEmptyBlocks(wxInt64 ringSize)
{
    return std::min(2 * std::max<wxInt64>(ringSize, 0) + 2, kMaxEmptyBlocksInACall);
}

}  // namespace

int DvrDiskReader::DeliverFrame(const _HisiBlockHeader_t& block, unsigned char* payload, _HisiHeader_t* header)
{
    if (ReadIndexEntries(block.BlockIdx, m_streamFrame, 1, Bytes(header)) < 0)
        return -1;
    if (ReadPayload(block.BlockIdx, header->DataOffset, header->DataSize, Bytes(payload)) < 0)
        return -1;
    if (header->DataSize < 0)
        return -1;
    return header->DataSize;
}

void DvrDiskReader::SetStreamCursor(wxInt64 block, std::int32_t frame)
{
    m_streamBlock = block;
    m_streamFrame = frame;
}

int DvrDiskReader::get_stream(wxFile* /*file*/, unsigned char* payload, _HisiHeader_t* header, _HisiList_t first,
                              _HisiList_t last, int direction)
{
    return NextFrame(payload, header, first, last, direction);
}

int DvrDiskReader::StreamRead(wxFile* /*file*/, char flags, wxInt64 block, int first, int count,
                              _HisiHeader_t* entries, unsigned char* payload)
{
    return ReadFrameRun(flags, block, first, count, entries, payload);
}

int DvrDiskReader::NextFrame(unsigned char* payload, _HisiHeader_t* header, const _HisiList_t& first,
                             const _HisiList_t& last, int direction)
{
    if (!HasAdapter())
        return -1;
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    const wxInt64 ringSize = adapter.DataBlockMax;
    _HisiBlockHeader_t block{};

    if (direction != 0) {
        // The range runs to the last recording's end, across the end of the
        // ring when it has wrapped; past it play goes on from the oldest one.
        wxInt64 limit = last.EndBlock;
        if (first.StartBlock > last.EndBlock)
            limit += ringSize;
        for (wxInt64 passed = 0;; ++passed) {
            if (ReadBlockHeaders(ReduceInRing(m_streamBlock, ringSize), 1, Bytes(&block)) < 0)
                return -1;
            if (m_streamFrame < block.FrameCount) {
                const int size = DeliverFrame(block, payload, header);
                if (size < 0)
                    return -1;
                ++m_streamFrame;
                return size;
            }
            if (passed == MaxEmptyBlocks(ringSize))
                return Refuse(kErrNoFrame, kAtNoFrame);
            if (m_streamBlock < INT64_MAX)
                ++m_streamBlock;
            if (m_streamBlock > limit) {
                _HisiList_t oldest{};
                if (ReadListEntries(ReduceInRing(adapter.FirstList.Idx, adapter.ListMax), 1, Bytes(&oldest)) < 0)
                    return -1;
                m_streamBlock = oldest.StartBlock;
            }
            m_streamFrame = 0;
        }
    }

    // Backward: past the start of the oldest recording, play goes on from the
    // end of the newest one.
    _HisiList_t oldest{};
    if (ReadListEntries(ReduceInRing(adapter.FirstList.Idx, adapter.ListMax), 1, Bytes(&oldest)) < 0)
        return -1;
    const wxInt64 limit = oldest.StartBlock;
    for (wxInt64 passed = 0;; ++passed) {
        if (ReadBlockHeaders(ReduceInRing(m_streamBlock, ringSize), 1, Bytes(&block)) < 0)
            return -1;
        if (m_streamFrame >= 0) {
            const int size = DeliverFrame(block, payload, header);
            if (size < 0)
                return -1;
            --m_streamFrame;
            return size;
        }
        if (passed == MaxEmptyBlocks(ringSize))
            return Refuse(kErrNoFrame, kAtNoFrame);
        --m_streamBlock;  // not negative here: the header read above refuses negative blocks
        if (m_streamBlock < limit) {
            _HisiList_t newest{};
            if (ReadListEntries(ReduceInRing(adapter.LastList.Idx, adapter.ListMax), 1, Bytes(&newest)) < 0)
                return -1;
            m_streamBlock = newest.EndBlock;
        }
        if (ReadBlockHeaders(ReduceInRing(m_streamBlock, ringSize), 1, Bytes(&block)) < 0)
            return -1;
        m_streamFrame = block.FrameCount > INT32_MIN ? block.FrameCount - 1 : -1;
    }
}

int DvrDiskReader::ReadFrameRun(char flags, wxInt64 block, int first, int count, _HisiHeader_t* entries,
                               unsigned char* payload)
{
    if (count < 1 || !entries)
        return -1;
    if ((flags & 1) && ReadIndexEntries(block, first, count, Bytes(entries)) < 0)
        return -1;
    // From the start of the oldest frame of the run (last in the array) to
    // the end of the newest (first in the array).
    const _HisiHeader_t& newest = entries[0];
    const _HisiHeader_t& oldest = entries[count - 1];
    const wxInt64 length = static_cast<wxInt64>(newest.DataOffset) + newest.DataSize - oldest.DataOffset;
    if (length > INT_MAX || length < INT_MIN)
        return Refuse(kErrPayloadBeyond, kAtPayloadBeyond);
    if ((flags & 2) &&
        ReadPayload(block, oldest.DataOffset, static_cast<int>(length), Bytes(payload)) < 0)
        return -1;
    return static_cast<int>(length);
}
