// The index walk: finding the current adapter in its ring of 120 slots,
// bringing its copies up to date with the disk, and reading list entries,
// data block headers, index entries and frame payloads with their bounds and
// XOR-sum checks. Nothing here writes to the disk: the refresh changes the
// adapter in memory only.
#include <algorithm>
#include <cinttypes>
#include <climits>
#include <cstdio>
#include <vector>

#include "dvrfs/dvr_disk_reader.h"
#include "dvrfs/error_places.h"
#include "dvrfs/record_math.h"

using namespace dvrfs;

int DvrDiskReader::BlockOpe(wxFile* /*file*/, char op, void* buffer, wxInt64 position, int count)
{
    switch (op) {
    case 2: return FindAdapter();
    case 5: return DumpAdapter();
    case 33: return ReadListEntries(static_cast<std::int32_t>(position), count, Bytes(buffer));
    case 35: return RefreshAdapter(position, count);
    case 65: return ReadBlockHeaders(position, count, Bytes(buffer));
    default: return 1;
    }
}

int DvrDiskReader::DataBlockOpe(wxFile* /*file*/, char op, void* buffer, wxInt64 block, int a, int b)
{
    switch (op) {
    case 'Q': return ReadIndexEntries(block, a, b, Bytes(buffer));
    case 'a': return ReadPayload(block, a, b, Bytes(buffer));
    default: return 1;
    }
}

bool DvrDiskReader::RecordSumMatches(const char* record, int size)
{
    const int sum = Checksum(const_cast<char*>(record), size);
    return static_cast<std::uint8_t>(sum) == m_volume->adapter->RecordSum;
}

bool DvrDiskReader::AdapterSlotIsValid(const _HisiAdapter_t& slot, int number)
{
    return slot.Idx == number &&
           Checksum(const_cast<char*>(reinterpret_cast<const char*>(&slot)), kAdapterSize) == 0;
}

// Ring sizes the reader accepts: enough for any recorder, small enough that
// no adapter makes a walk or an allocation unbounded. Where the rings lie is
// not judged here: a read beyond the block space is refused on its own.
bool DvrDiskReader::AdapterRingsWithinLimits(const _HisiAdapter_t& adapter) const
{
    return adapter.ListMax <= kMaxListMax && adapter.DataBlockMax <= kMaxDataBlockMax;
}

// The current adapter is the end of the first run of valid slots, scanning
// the ring twice from slot 0 so that a run across slot 119 is seen whole.
int DvrDiskReader::FindAdapter()
{
    if (!HasVolume())
        return -1;
    auto candidate = std::make_unique<_HisiAdapter_t>();
    const wxInt64 slotStride = m_volume->superBlock.BlockSize;

    int chosen = -1;
    for (int i = 0; i < 2 * kAdapterSlotCount; ++i) {
        const int slot = i % kAdapterSlotCount;
        if (ReadLogical(slot * slotStride, Bytes(candidate.get()), kAdapterSize) < 0)
            return -1;
        if (AdapterSlotIsValid(*candidate, slot))
            chosen = slot;
        else if (chosen != -1)
            break;
    }

    // With no valid slot the position is negative and the read refuses it.
    if (ReadLogical(chosen * slotStride, Bytes(candidate.get()), kAdapterSize) < 0)
        return -1;
    if (!AdapterSlotIsValid(*candidate, chosen))
        return Refuse(kErrAdapter, kAtAdapter);
    if (!AdapterRingsWithinLimits(*candidate))
        return Refuse(kErrAdapterRings, kAtAdapterRings);
    m_volume->adapter = std::move(candidate);
    m_volume->unreadableListPositions.clear();
    m_volume->unwrittenListPositions.clear();
    m_volume->newestBlockUnreadable = false;
    m_status.listRingSize = m_volume->adapter->ListMax;

    const _HisiAdapter_t& adapter = *m_volume->adapter;
    if (adapter.LastList.Idx < 0)
        return 1;  // the volume holds no recording
    const wxInt64 first = adapter.FirstList.Idx;
    wxInt64 last = adapter.LastList.Idx;
    if (last < first)
        last += adapter.ListMax;
    return RefreshAdapter(first, last - first + 1) < 0 ? -1 : 1;
}

// Rebuilds the adapter's summary from list entries first .. first + count - 1
// (around the ring): oldest and newest readable entry, earliest start, latest
// end, then the newest readable data block header and index entry. A newest
// block that cannot be read leaves the span and times as found: the other
// recordings, and the readable frames of that one, are still there.
int DvrDiskReader::RefreshAdapter(wxInt64 first, wxInt64 count)
{
    if (!HasAdapter())
        return -1;
    _HisiAdapter_t& adapter = *m_volume->adapter;
    SummariseListSpan(first, count);
    m_status.damagedEntries = m_volume->unreadableListPositions.size();
    m_status.unwrittenEntries = m_volume->unwrittenListPositions.size();
    // With no readable entry the oldest is -1, and reading it fails.
    if (ReadListEntries(adapter.FirstList.Idx, 1, Bytes(&adapter.FirstList)) < 0 ||
        ReadListEntries(adapter.LastList.Idx, 1, Bytes(&adapter.LastList)) < 0)
        return -1;

    m_volume->newestBlockUnreadable = false;
    if (RefreshNewestBlockHeader() < 0 || (adapter.LastFrame.FrameInfo >= 0 && RefreshNewestFrame() < 0))
        m_volume->newestBlockUnreadable = true;
    m_status.newestBlockUnreadable = m_volume->newestBlockUnreadable;
    return 1;
}

// Walks the span's list positions and sets the adapter's oldest and newest
// readable position and its earliest start and latest end. An entry that
// cannot be read in either copy is passed over and remembered, so one
// damaged entry costs one recording, not the span. Negative positions are
// refused without a read, so the walk starts at the first one that is not.
// Positions repeat around the ring: a span longer than the ring is walked
// one turn, and its newest readable position is the last readable one of the
// span's final turn, known from that one turn without reading again.
void DvrDiskReader::SummariseListSpan(wxInt64 first, wxInt64 count)
{
    _HisiAdapter_t& adapter = *m_volume->adapter;
    std::vector<std::int32_t>& unreadable = m_volume->unreadableListPositions;
    std::vector<std::int32_t>& unwritten = m_volume->unwrittenListPositions;
    unreadable.clear();
    unwritten.clear();
    const wxInt64 ringSize = adapter.ListMax;
    wxInt64 oldest = -1;
    wxInt64 newest = -1;
    wxInt64 last = 0;
    const wxInt64 start = std::max<wxInt64>(first, 0);
    if (count > 0 && !__builtin_add_overflow(first, count - 1, &last) && last >= start) {
        const wxInt64 positions = last - start + 1;
        // An empty ring refuses every position the same way: one try says so.
        const wxInt64 turn = std::min<wxInt64>(positions, ringSize > 0 ? ringSize : 1);
        const bool severalTurns = ringSize > 0 && positions > ringSize;
        std::vector<bool> readable(severalTurns ? static_cast<std::size_t>(ringSize) : 0);
        _HisiList_t entry{};
        for (wxInt64 k = 0; k < turn; ++k) {
            const wxInt64 position = ReduceInRing(start + k, ringSize);
            const ListEntryState state = ReadListEntry(position, &entry);
            if (state != ListEntryState::kSound && state != ListEntryState::kRepaired) {
                if (position <= INT32_MAX)  // only a caller's stray position is larger
                    (state == ListEntryState::kUnwritten ? unwritten : unreadable)
                        .push_back(static_cast<std::int32_t>(position));
                continue;
            }
            if (oldest == -1) {
                oldest = position;
                adapter.StartTime = entry.StartTime;
                adapter.EndTime = entry.EndTime;
            }
            newest = position;
            adapter.StartTime = std::min(adapter.StartTime, entry.StartTime);
            adapter.EndTime = std::max(adapter.EndTime, entry.EndTime);
            if (severalTurns)
                readable[static_cast<std::size_t>(position)] = true;
        }
        if (severalTurns) {
            newest = -1;
            for (wxInt64 k = last; k > last - ringSize && newest == -1; --k) {
                if (readable[static_cast<std::size_t>(k % ringSize)])
                    newest = k % ringSize;
            }
        }
    }
    adapter.FirstList.Idx = static_cast<std::int32_t>(oldest);
    adapter.LastList.Idx = static_cast<std::int32_t>(newest);
}

// Reads the header of the newest recording's last block; when that is
// damaged, walks back through the recording for the newest readable header.
// A header that fails its sum is never kept in the adapter.
int DvrDiskReader::RefreshNewestBlockHeader()
{
    _HisiAdapter_t& adapter = *m_volume->adapter;
    _HisiBlockHeader_t header{};
    if (ReadBlockHeaders(adapter.LastList.EndBlock, 1, Bytes(&header)) >= 0) {
        adapter.CurBlockHeader = header;
        return 1;
    }

    const wxInt64 lowest = adapter.LastList.StartBlock;
    wxInt64 candidate = adapter.LastList.EndBlock;
    if (lowest > candidate)
        candidate += adapter.DataBlockMax;
    if (lowest > candidate)
        return -1;
    // After one whole turn of the ring every block has been tried once; the
    // candidates beyond it would only repeat failed reads.
    const wxInt64 tries = std::min<wxInt64>(candidate - lowest + 1, std::max(adapter.DataBlockMax, 1));
    for (wxInt64 t = 0; t < tries; ++t) {
        const wxInt64 block = ReduceInRing(candidate - t, adapter.DataBlockMax);
        if (ReadBlockHeaders(block, 1, Bytes(&header)) >= 0) {
            adapter.CurBlockHeader = header;
            adapter.LastList.EndBlock = static_cast<std::int32_t>(block);
            return 1;
        }
    }
    return -1;
}

// Reads the newest index entry of the newest block; when that is damaged,
// the newest readable one before it, and shortens the block's frame count.
int DvrDiskReader::RefreshNewestFrame()
{
    _HisiAdapter_t& adapter = *m_volume->adapter;
    _HisiHeader_t frame{};
    const wxInt64 block = adapter.CurBlockHeader.BlockIdx;
    const wxInt64 frameCount = adapter.CurBlockHeader.FrameCount;
    if (ReadIndexEntries(block, frameCount - 1, 1, Bytes(&frame)) >= 0) {
        adapter.LastFrame = frame;
        return 1;
    }
    // Entries past the last one that fits are refused without a read.
    for (wxInt64 k = std::min<wxInt64>(frameCount - 2, kLastIndexEntry); k >= 0; --k) {
        if (ReadIndexEntries(block, k, 1, Bytes(&frame)) >= 0) {
            adapter.LastFrame = frame;
            adapter.CurBlockHeader.FrameCount = static_cast<std::int32_t>(k + 1);
            return 1;
        }
    }
    return -1;
}

// Whether entries index .. index + count - 1 lie in the list ring; refused
// with the register's code when not.
bool DvrDiskReader::ListRunInRing(wxInt64 index, wxInt64 count)
{
    if (!HasAdapter())
        return false;
    if (index < 0)
        SetError(kErrListNegative, kAtListNegative);
    else if (index + count > m_volume->adapter->ListMax)
        SetError(kErrListBeyond, kAtListBeyond);
    else
        return true;
    return false;
}

// The entries index .. index + count - 1 in one read of the list ring; each
// damaged one is taken from the mirror. -1 when one is damaged in both.
int DvrDiskReader::ReadListEntries(wxInt64 index, int count, char* buffer)
{
    if (!ListRunInRing(index, count))
        return -1;
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    const int bytes = RecordBytes(count, kListEntrySize);
    if (ReadLogical(RecordPosition(adapter.ListOffset, index, kListEntrySize, 0), buffer, bytes) < 0)
        return -1;
    const bool ringWhole = LastReadWhole();
    for (int j = 0; j < count; ++j) {
        char* entry = buffer + static_cast<wxInt64>(j) * kListEntrySize;
        if (RecordSumMatches(entry, kListEntrySize))
            continue;
        if (RepairFromMirror(index + j, entry, ringWhole) != ListEntryState::kRepaired)
            return -1;
    }
    return 1;
}

ListEntryState DvrDiskReader::ReadListEntry(wxInt64 position, _HisiList_t* entry)
{
    if (!ListRunInRing(position, 1))
        return ListEntryState::kRefused;
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    char* bytes = Bytes(entry);
    if (ReadLogical(RecordPosition(adapter.ListOffset, position, kListEntrySize, 0), bytes, kListEntrySize) < 0)
        return ListEntryState::kRefused;
    if (RecordSumMatches(bytes, kListEntrySize))
        return ListEntryState::kSound;
    return RepairFromMirror(position, bytes, LastReadWhole());
}

namespace {

bool AllZero(const char* bytes, int size)
{
    return std::all_of(bytes, bytes + size, [](char b) { return b == 0; });
}

}  // namespace

// The ring copy of `entry` failed its sum: code 50 is recorded and stays,
// and the mirror copy is read over it. Both copies of nothing but zero bytes,
// each read whole from the disk, are an entry never written.
ListEntryState DvrDiskReader::RepairFromMirror(wxInt64 position, char* entry, bool ringWhole)
{
    SetError(kErrListEntry, kAtListEntry);
    const bool ringBlank = ringWhole && AllZero(entry, kListEntrySize);
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    if (ReadLogical(RecordPosition(adapter.ListOffsetBackup, position, kListEntrySize, 0), entry, kListEntrySize) < 0)
        return ListEntryState::kDamaged;
    if (RecordSumMatches(entry, kListEntrySize))
        return ListEntryState::kRepaired;
    if (ringBlank && LastReadWhole() && AllZero(entry, kListEntrySize))
        return ListEntryState::kUnwritten;
    return ListEntryState::kDamaged;
}

int DvrDiskReader::ReadBlockHeaders(wxInt64 block, int count, char* buffer)
{
    if (!HasAdapter())
        return -1;
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    if (block < 0)
        return Refuse(kErrBlockNegative, kAtBlockNegative);
    wxInt64 end = 0;
    if (__builtin_add_overflow(block, static_cast<wxInt64>(count), &end) || end > adapter.DataBlockMax)
        return Refuse(kErrBlockBeyond, kAtBlockBeyond);
    for (int j = 0; j < count; ++j) {
        char* header = buffer + static_cast<wxInt64>(j) * kBlockHeaderSize;
        if (ReadLogical(RecordPosition(adapter.DataBlockOffset, block + j, kDataBlockSize, 0), header,
                      kBlockHeaderSize) < 0)
            return -1;
        if (!RecordSumMatches(header, kBlockHeaderSize))
            return Refuse(kErrBlockHeader, kAtBlockHeader);
    }
    return 1;
}

// Index entries grow down from the end of the block: entries first ..
// first + count - 1 are one range in which the last of them comes first.
int DvrDiskReader::ReadIndexEntries(wxInt64 block, wxInt64 first, wxInt64 count, char* buffer)
{
    if (!HasAdapter())
        return -1;
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    if (first < 0)
        return Refuse(kErrIndexNegative, kAtIndexNegative);
    if (first > kLastIndexEntry)
        return Refuse(kErrIndexBeyond, kAtIndexBeyond);
    wxInt64 nextBlock = 0;
    const wxInt64 position =
        __builtin_add_overflow(block, 1, &nextBlock)
            ? -1
            : RecordPosition(adapter.DataBlockOffset, nextBlock, kDataBlockSize, -(first + count) * kIndexEntrySize);
    const int bytes = RecordBytes(count, kIndexEntrySize);
    if (ReadLogical(position, buffer, bytes) < 0)
        return -1;
    for (wxInt64 j = 0; j < count; ++j) {
        if (!RecordSumMatches(buffer + j * kIndexEntrySize, kIndexEntrySize))
            return Refuse(kErrIndexEntry, kAtIndexEntry);
    }
    return 1;
}

int DvrDiskReader::ReadPayload(wxInt64 block, int offset, int length, char* buffer)
{
    if (!HasAdapter())
        return -1;
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    if (offset < 0)
        return Refuse(kErrPayloadNegative, kAtPayloadNegative);
    // Taken as unsigned 32 bits, so that a negative length is refused too.
    if (static_cast<std::uint32_t>(static_cast<wxInt64>(offset) + length) > kPayloadAreaSize)
        return Refuse(kErrPayloadBeyond, kAtPayloadBeyond);
    return ReadLogical(RecordPosition(adapter.DataBlockOffset, block, kDataBlockSize, kBlockHeaderSize + offset),
                     buffer, length);
}

int DvrDiskReader::DumpAdapter()
{
    if (!HasAdapter())
        return -1;
    const _HisiAdapter_t& a = *m_volume->adapter;
    std::printf("\tAdapter: Version=%d, TimeStamp=%d, Idx=%d, Magic=0x%.2X\n", a.Version, a.TimeStamp, a.Idx,
                a.Magic);
    std::printf("\tList: Offset=%" PRId64 ", OffsetBackup=%" PRId64 ", Max=%d\n",
                static_cast<std::int64_t>(a.ListOffset), static_cast<std::int64_t>(a.ListOffsetBackup), a.ListMax);
    std::printf("\tDataBlock: Offset=%" PRId64 ", Max=%" PRId64 "\n", static_cast<std::int64_t>(a.DataBlockOffset),
                static_cast<std::int64_t>(a.DataBlockMax));
    auto hour = [](std::uint32_t t) { return static_cast<int>(t % 86400 / 3600); };
    auto minute = [](std::uint32_t t) { return static_cast<int>(t % 3600 / 60); };
    auto second = [](std::uint32_t t) { return static_cast<int>(t % 60); };
    std::printf("\tStartTime=%d:%d:%d(%d), EndTime=%d:%d:%d(%d)\n", hour(a.StartTime), minute(a.StartTime),
                second(a.StartTime), static_cast<int>(a.StartTime), hour(a.EndTime), minute(a.EndTime),
                second(a.EndTime), static_cast<int>(a.EndTime));
    std::fflush(stdout);
    return 1;
}
