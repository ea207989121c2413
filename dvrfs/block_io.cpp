// The two read layers under every other read: whole-sector reads at physical
// offsets, and reads at logical positions of the block space, which skips one
// physical block after every 512 logical ones.
#include <cinttypes>
#include <climits>
#include <cstring>
#include <memory>

#include "dvrfs/dvr_disk_reader.h"
#include "dvrfs/error_places.h"
#include "dvrfs/record_math.h"

using namespace dvrfs;

namespace {

// Physical offset of the first byte of logical block `block`.
wxUint64 PhysicalBlockStart(const _H264SuperBlock_t& super, wxInt64 block)
{
    const wxInt64 physicalBlock = block + (block >> 9);  // one block skipped per 512
    return super.OffsetBlockSpace +
           static_cast<wxUint64>(physicalBlock) * static_cast<wxUint64>(super.BlockSize);
}

}  // namespace

int DvrDiskReader::ReadSectors(char* dest, wxUint64 offset, unsigned long length)
{
    if (length == 0)
        return -1;
    // No record of the disk is longer than an int; a longer request is refused
    // before it can size an allocation.
    if (!m_source || !dest || length > static_cast<unsigned long>(INT_MAX))
        return -1;
    wxUint64 lastByte = 0;
    if (__builtin_add_overflow(offset, length - 1, &lastByte))
        return -1;
    const wxUint64 firstSector = offset / kSectorSize;
    const wxUint64 lastSector = lastByte / kSectorSize;
    const wxUint64 start = firstSector * kSectorSize;
    if (start > static_cast<wxUint64>(INT64_MAX))
        return -1;

    const std::size_t span = (lastSector - firstSector + 1) * kSectorSize;
    std::unique_ptr<char[]> sectors(new char[span]);
    const long long got = m_source->Read(start, sectors.get(), span);
    if (got <= 0) {
        m_lastReadWhole = false;
        return -1;
    }
    // Whatever a short read did not reach arrives as zeros.
    if (static_cast<std::size_t>(got) < span) {
        m_lastReadWhole = false;
        std::memset(sectors.get() + got, 0, span - static_cast<std::size_t>(got));
    }
    std::memcpy(dest, sectors.get() + (offset - start), length);
    return 1;
}

int DvrDiskReader::ReadLogical(wxInt64 position, char* dest, int length)
{
    m_lastReadWhole = true;
    if (position < 0 || length < 0)
        return Refuse(kErrReadRange, kAtNegativeRead);
    if (length == 0)
        return 1;
    if (!dest)
        return Refuse(kErrReadRange, kAtNegativeRead);
    if (!HasVolume())
        return -1;
    if (!GeometryIsSound())
        return RefuseUnsoundGeometry();

    const _H264SuperBlock_t& super = m_volume->superBlock;
    wxInt64 lastByte = 0;
    const bool overflows = __builtin_add_overflow(position, static_cast<wxInt64>(length) - 1, &lastByte);
    const wxInt64 last = overflows ? INT64_MAX : lastByte >> super.BlockSizeShift;
    if (last >= super.BlockCount) {
        SetErrorText(kErrReadBeyond, kAtReadBeyond,
                     "%s[%d]Pos=%" PRId64 ", Size=%d, OffsetAddressSpace=%" PRId64
                     ", OffsetBlockSpace=%" PRId64,
                     kFunctionWord, kAtReadBeyond, static_cast<std::int64_t>(position), length,
                     static_cast<std::int64_t>(super.OffsetAddressSpace),
                     static_cast<std::int64_t>(super.OffsetBlockSpace));
        return -1;
    }

    // One device read per logical block touched: the device results are not
    // looked at, the XOR sums of the records read are what catch a bad read.
    // A piece the device does not deliver is cleared, so that it fails the
    // record's sum instead of passing off what the buffer held before; a read
    // refused above leaves the buffer as it was.
    wxInt64 inside = position & super.BlockMask;
    wxInt64 remaining = length;
    for (wxInt64 block = position >> super.BlockSizeShift; block <= last; ++block) {
        const wxInt64 chunk = block == last ? remaining : super.BlockSize - inside;
        if (ReadSectors(dest, PhysicalBlockStart(super, block) + inside, static_cast<unsigned long>(chunk)) < 0)
            ClearRecords(dest, static_cast<int>(chunk));
        dest += chunk;
        remaining -= chunk;
        inside = 0;
    }
    return 1;
}

int DvrDiskReader::PhysicalBlockOffset(int block, wxInt64* result)
{
    if (!result || !HasVolume())
        return -1;
    if (!GeometryIsSound())
        return RefuseUnsoundGeometry();
    *result = static_cast<wxInt64>(PhysicalBlockStart(m_volume->superBlock, block));
    return 1;
}

// --- The operation-code entry points.

int DvrDiskReader::HddataRead(wxFile* /*file*/, char* dest, wxUint64 offset, unsigned long length)
{
    return ReadSectors(dest, offset, length);
}

int DvrDiskReader::BlockRead(wxFile* /*file*/, wxInt64 position, char* dest, int length)
{
    return ReadLogical(position, dest, length);
}

int DvrDiskReader::BlockShift(int block, wxInt64* result)
{
    return PhysicalBlockOffset(block, result);
}
