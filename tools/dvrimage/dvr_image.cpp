#include "tools/dvrimage/dvr_image.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <system_error>

namespace dvrimage {
namespace {

constexpr std::uint64_t kSkipRun = 512;  // one physical block is left out after every 512 logical ones
constexpr std::uint64_t kTableGap = 8192;

void PutLE(std::uint8_t* at, std::uint64_t value, int bytes)
{
    for (int i = 0; i < bytes; ++i)
        at[i] = static_cast<std::uint8_t>(value >> (8 * i));
}

template <typename Bytes>
void Put16(Bytes& b, std::size_t at, std::uint16_t v) { PutLE(&b[at], v, 2); }
template <typename Bytes>
void Put32(Bytes& b, std::size_t at, std::uint32_t v) { PutLE(&b[at], v, 4); }
template <typename Bytes>
void Put64(Bytes& b, std::size_t at, std::uint64_t v) { PutLE(&b[at], v, 8); }

// Sets b[sealAt] so that the XOR of b[0 .. length) comes out as `sum`.
template <typename Bytes>
void Seal(Bytes& b, std::size_t length, std::size_t sealAt, std::uint8_t sum)
{
    b[sealAt] = 0;
    std::uint8_t x = 0;
    for (std::size_t i = 0; i < length; ++i)
        x ^= b[i];
    b[sealAt] = static_cast<std::uint8_t>(x ^ sum);
}

std::uint64_t RoundUp(std::uint64_t value, std::uint64_t unit)
{
    return (value + unit - 1) / unit * unit;
}

std::int32_t RingSlot(std::int64_t n, std::int32_t ring)
{
    return static_cast<std::int32_t>(ring > 0 ? ((n % ring) + ring) % ring : n);
}

// A recording's end block counted on from its start without wrapping: an end
// below the start lies one turn of the ring further on.
std::int64_t UnwrappedEnd(std::int32_t first, std::int32_t last, std::int32_t ring)
{
    return last < first ? std::int64_t{last} + ring : last;
}

void Fail(const std::string& what)
{
    throw std::system_error(errno, std::generic_category(), what);
}

}  // namespace

std::vector<std::vector<std::uint8_t>> SplitAccessUnits(const std::vector<std::uint8_t>& stream)
{
    // Offsets of the start codes (00 00 01, or 00 00 00 01) of delimiters.
    std::vector<std::size_t> starts;
    for (std::size_t i = 0; i + 3 < stream.size(); ++i) {
        if (stream[i] != 0 || stream[i + 1] != 0 || stream[i + 2] != 1 || (stream[i + 3] & 0x1F) != 9)
            continue;
        starts.push_back(i > 0 && stream[i - 1] == 0 ? i - 1 : i);
    }
    if (starts.empty() || starts.front() != 0)
        starts.insert(starts.begin(), 0);
    std::vector<std::vector<std::uint8_t>> units;
    for (std::size_t k = 0; k < starts.size(); ++k) {
        const std::size_t end = k + 1 < starts.size() ? starts[k + 1] : stream.size();
        if (end > starts[k])
            units.emplace_back(stream.begin() + static_cast<std::ptrdiff_t>(starts[k]),
                               stream.begin() + static_cast<std::ptrdiff_t>(end));
    }
    return units;
}

std::vector<std::vector<std::uint8_t>> AccessUnitsOfFile(const std::string& path)
{
    std::ifstream in(path, std::ios::binary);
    const std::vector<std::uint8_t> stream((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    return stream.empty() ? std::vector<std::vector<std::uint8_t>>{} : SplitAccessUnits(stream);
}

std::vector<std::uint8_t> PatternPayload(std::int32_t block, int frame, std::size_t size)
{
    std::vector<std::uint8_t> bytes(size);
    std::uint32_t state = static_cast<std::uint32_t>(block) * 2654435761u ^ static_cast<std::uint32_t>(frame) * 40503u;
    for (std::size_t i = 0; i < size; ++i) {
        state = state * 1103515245u + 12345u;
        bytes[i] = static_cast<std::uint8_t>(state >> 16);
    }
    return bytes;
}

Recording GeneratedRecording(std::int32_t listIdx, std::int32_t startBlock, std::int32_t endBlock,
                             std::uint32_t startTime, std::uint32_t endTime, std::int32_t ringBlocks,
                             int framesPerBlock, std::size_t frameSize)
{
    Recording r;
    r.listIdx = listIdx;
    r.startBlock = startBlock;
    r.endBlock = endBlock;
    r.startTime = startTime;
    r.endTime = endTime;
    const std::int64_t last = UnwrappedEnd(startBlock, endBlock, ringBlocks);
    for (std::int64_t n = startBlock; n <= last; ++n) {
        std::vector<Frame> frames;
        for (int k = 0; k < framesPerBlock; ++k)
            frames.push_back(Frame{PatternPayload(RingSlot(n, ringBlocks), k, frameSize), 1});
        r.blocks.push_back(std::move(frames));
    }
    return r;
}

void FillWithFrames(Recording& recording, std::int32_t ringBlocks, int framesPerBlock,
                    const std::vector<std::vector<std::uint8_t>>& frames, std::size_t& next)
{
    recording.blocks.clear();
    const std::int64_t last = UnwrappedEnd(recording.startBlock, recording.endBlock, ringBlocks);
    for (std::int64_t n = recording.startBlock; n <= last && !frames.empty(); ++n) {
        std::vector<Frame> block;
        for (int k = 0; k < framesPerBlock; ++k, next = (next + 1) % frames.size())
            block.push_back(Frame{frames[next], 1});
        recording.blocks.push_back(std::move(block));
    }
}

DiskImage::DiskImage(Layout layout) : layout_(std::move(layout))
{
    Resolve();
}

void DiskImage::Resolve()
{
    blockSize_ = layout_.blockSize ? *layout_.blockSize : std::int32_t{1} << layout_.blockSizeShift;
    const std::uint64_t bs = static_cast<std::uint64_t>(blockSize_);
    const std::uint64_t ringBytes = static_cast<std::uint64_t>(std::max(layout_.listMax, 1)) * 128;
    listOffset_ = layout_.listOffset ? layout_.listOffset : kAdapterSlots * bs;
    listOffsetBackup_ = layout_.listOffsetBackup ? layout_.listOffsetBackup : listOffset_ + RoundUp(ringBytes, bs);
    dataBlockOffset_ = layout_.dataBlockOffset ? layout_.dataBlockOffset
                                               : RoundUp(std::max(listOffset_, listOffsetBackup_) + ringBytes, bs);
    if (layout_.blockCount != 0) {
        blockCount_ = layout_.blockCount;
    } else {
        const std::uint64_t end =
            dataBlockOffset_ + static_cast<std::uint64_t>(std::max(layout_.dataBlockMax, 0)) * kDataBlockBytes;
        blockCount_ = static_cast<std::int32_t>(RoundUp(end, bs) / bs);
    }
}

std::int32_t DiskImage::BlockSize() const { return blockSize_; }
std::int32_t DiskImage::BlockCount() const { return blockCount_; }
std::uint64_t DiskImage::ListOffset() const { return listOffset_; }
std::uint64_t DiskImage::ListOffsetBackup() const { return listOffsetBackup_; }
std::uint64_t DiskImage::DataBlockOffset() const { return dataBlockOffset_; }

std::uint64_t DiskImage::ImageSize() const
{
    if (layout_.imageSize)
        return *layout_.imageSize;
    const std::uint64_t blocks = blockCount_ > 0 ? static_cast<std::uint64_t>(blockCount_) : 1;
    const std::uint64_t physicalBlocks = blocks + (blocks - 1) / kSkipRun;
    return std::max<std::uint64_t>(layout_.offsetBlockSpace + physicalBlocks * static_cast<std::uint64_t>(blockSize_),
                    layout_.superOffsetBackup + kTableGap + layout_.blockTableCount * std::uint64_t{32});
}

std::uint64_t DiskImage::PhysicalOffset(std::uint64_t logical) const
{
    const std::uint64_t bs = static_cast<std::uint64_t>(blockSize_);
    const std::uint64_t block = logical / bs;
    return layout_.offsetBlockSpace + (block + block / kSkipRun) * bs + logical % bs;
}

std::uint64_t DiskImage::IndexEntryPosition(std::int64_t block, std::int64_t entry) const
{
    return dataBlockOffset_ + static_cast<std::uint64_t>(block + 1) * kDataBlockBytes -
           static_cast<std::uint64_t>(entry + 1) * 64;
}

std::uint64_t DiskImage::PayloadPosition(std::int64_t block, std::int64_t offset) const
{
    return dataBlockOffset_ + static_cast<std::uint64_t>(block) * kDataBlockBytes + 128 +
           static_cast<std::uint64_t>(offset);
}

void DiskImage::Add(Recording recording)
{
    recordings_.push_back(std::move(recording));
}

ListEntryBytes DiskImage::MakeListEntry(std::int32_t idx, std::int32_t startBlock, std::int32_t endBlock,
                                        std::uint32_t startTime, std::uint32_t endTime) const
{
    ListEntryBytes e{};
    Put32(e, 0, 0x4C495354);
    Put32(e, 4, static_cast<std::uint32_t>(idx));
    Put32(e, 8, static_cast<std::uint32_t>(startBlock));
    Put32(e, 12, static_cast<std::uint32_t>(endBlock));
    Put32(e, 16, startTime);
    Put32(e, 20, endTime);
    Seal(e, e.size(), 127, layout_.recordSum);
    return e;
}

BlockHeaderBytes DiskImage::MakeBlockHeader(std::int32_t block, std::int32_t frameCount) const
{
    BlockHeaderBytes h{};
    Put32(h, 0, 0x424C4B48);
    Put32(h, 4, static_cast<std::uint32_t>(block) * 7 + 3);  // the word the information query reports
    Put32(h, 12, static_cast<std::uint32_t>(block));
    Put32(h, 24, static_cast<std::uint32_t>(frameCount));
    Seal(h, h.size(), 127, layout_.recordSum);
    return h;
}

IndexEntryBytes DiskImage::MakeIndexEntry(std::int32_t dataOffset, std::int32_t dataSize, std::int32_t info) const
{
    IndexEntryBytes f{};
    Put32(f, 0, 0x46524D45);
    Put32(f, 4, static_cast<std::uint32_t>(info));
    Put32(f, 12, static_cast<std::uint32_t>(dataOffset));
    Put32(f, 16, static_cast<std::uint32_t>(dataSize));
    Seal(f, f.size(), 63, layout_.recordSum);
    return f;
}

std::vector<std::uint8_t> DiskImage::SuperBlockBytes() const
{
    std::vector<std::uint8_t> s(508);
    Put16(s, 0x00, layout_.magic);
    Put32(s, 0x04, layout_.headerSize);
    Put32(s, 0x08, layout_.blockTableCount);
    Put32(s, 0x0C, static_cast<std::uint32_t>(layout_.tableLimit));
    std::uint8_t tableSum = 0;
    for (std::uint8_t b : BlockTableBytes())
        tableSum ^= b;
    s[0x16] = tableSum;
    Put32(s, 0x18, static_cast<std::uint32_t>(blockSize_));
    Put32(s, 0x1C, static_cast<std::uint32_t>(layout_.blockMask.value_or(blockSize_ - 1)));
    Put32(s, 0x20, static_cast<std::uint32_t>(layout_.blockSizeShift));
    Put32(s, 0x24, static_cast<std::uint32_t>(layout_.tableLimitBound));
    Put32(s, 0x28, static_cast<std::uint32_t>(blockCount_));
    Put64(s, 0x2C, layout_.superOffset);
    Put64(s, 0x34, layout_.superOffsetBackup);
    Put64(s, 0x3C, layout_.offsetBlockSpace);
    Put64(s, 0x44, layout_.offsetAddressSpace);
    // A partition slot the way a partitioning tool would leave it.
    const std::uint8_t partition[16] = {0x00, 0xFE, 0xFF, 0xFF, 0x83, 0xFE, 0xFF, 0xFF,
                                        0x00, 0x08, 0x00, 0x00, 0x00, 0x00, 0x10, 0x00};
    std::memcpy(&s[462], partition, sizeof partition);
    Seal(s, 252, 251, 0);
    return s;
}

std::vector<std::uint8_t> DiskImage::BlockTableBytes() const
{
    std::vector<std::uint8_t> t(static_cast<std::size_t>(layout_.blockTableCount) * 32);
    for (std::size_t i = 0; i < t.size(); ++i)
        t[i] = static_cast<std::uint8_t>(i * 37 + 11);
    return t;
}

bool DiskImage::SlotInRuns(int slot, int* position) const
{
    int counted = 0;
    for (const SlotRun& run : layout_.adapterRuns) {
        const int length = std::min(run.length, kAdapterSlots);
        for (int k = 0; k < length; ++k, ++counted) {
            if ((run.start + k) % kAdapterSlots == slot) {
                *position = counted;
                return true;
            }
        }
    }
    return false;
}

std::vector<std::uint8_t> DiskImage::AdapterBytes(int slot, int positionInRun) const
{
    std::vector<std::uint8_t> a(512);
    Put32(a, 0, layout_.adapterMagic);
    Put32(a, 4, static_cast<std::uint32_t>(layout_.version));
    Put32(a, 8, static_cast<std::uint32_t>(layout_.timeStampBase + positionInRun));
    Put32(a, 12, static_cast<std::uint32_t>(slot));

    // Copies of the oldest and newest list entries, the newest block's header
    // and its newest index entry.
    ListEntryBytes first{}, last{};
    BlockHeaderBytes header{};
    IndexEntryBytes frame{};
    std::uint32_t startTime = 0, endTime = 0;
    std::vector<const Recording*> listed;
    for (const Recording& r : recordings_)
        if (r.listed)
            listed.push_back(&r);
    if (listed.empty()) {
        first = MakeListEntry(-1, 0, 0, 0, 0);
        last = first;
        Put32(frame, 4, 0xFFFFFFFFu);
    } else {
        const Recording& oldest = *listed.front();
        const Recording& newest = *listed.back();
        first = MakeListEntry(oldest.listIdx, oldest.startBlock, oldest.endBlock, oldest.startTime, oldest.endTime);
        last = MakeListEntry(newest.listIdx, newest.startBlock, newest.endBlock, newest.startTime, newest.endTime);
        const std::vector<Frame>& frames = newest.blocks.empty() ? std::vector<Frame>{} : newest.blocks.back();
        header = MakeBlockHeader(newest.endBlock, static_cast<std::int32_t>(frames.size()));
        if (frames.empty() || !layout_.adapterRecordsFrame) {
            Put32(frame, 4, 0xFFFFFFFFu);
        } else {
            std::int64_t offset = 0;
            for (std::size_t k = 0; k + 1 < frames.size(); ++k)
                offset += static_cast<std::int64_t>(frames[k].payload.size());
            frame = MakeIndexEntry(static_cast<std::int32_t>(offset),
                                   static_cast<std::int32_t>(frames.back().payload.size()), frames.back().info);
        }
        startTime = oldest.startTime;
        endTime = oldest.endTime;
        for (const Recording* r : listed) {
            startTime = std::min(startTime, r->startTime);
            endTime = std::max(endTime, r->endTime);
        }
    }
    startTime = layout_.startTime.value_or(startTime);
    endTime = layout_.endTime.value_or(endTime);
    if (layout_.firstListIdx)
        Put32(first, 4, static_cast<std::uint32_t>(*layout_.firstListIdx));
    if (layout_.lastListIdx)
        Put32(last, 4, static_cast<std::uint32_t>(*layout_.lastListIdx));
    std::memcpy(&a[16], first.data(), 128);
    std::memcpy(&a[144], last.data(), 128);
    std::memcpy(&a[272], header.data(), 128);
    std::memcpy(&a[400], frame.data(), 64);
    Put32(a, 468, startTime);
    Put32(a, 472, endTime);
    Put32(a, 476, static_cast<std::uint32_t>(layout_.listMax));
    Put32(a, 480, static_cast<std::uint32_t>(layout_.dataBlockMax));
    Put64(a, 484, listOffset_);
    Put64(a, 492, listOffsetBackup_);
    Put64(a, 500, dataBlockOffset_);
    a[508] = layout_.recordSum;
    Seal(a, a.size(), 511, 0);
    return a;
}

// A slot outside the valid run. Slot 0 still says whether the recorder is
// configured, but its sum is off so that it is not a valid adapter.
std::vector<std::uint8_t> DiskImage::UnusedSlotBytes(int slot) const
{
    std::vector<std::uint8_t> a(512);
    if (slot == 0) {
        Put32(a, 4, static_cast<std::uint32_t>(layout_.version));
        Seal(a, a.size(), 511, 0xFF);
    }
    return a;
}

void DiskImage::WriteAdapterRing()
{
    for (int slot = 0; slot < kAdapterSlots; ++slot) {
        int position = 0;
        const std::vector<std::uint8_t> bytes =
            SlotInRuns(slot, &position) ? AdapterBytes(slot, position) : UnusedSlotBytes(slot);
        WriteLogical(static_cast<std::uint64_t>(slot) * static_cast<std::uint64_t>(blockSize_), bytes.data(),
                     bytes.size());
    }
}

std::int32_t DiskImage::BlockNumber(const Recording& recording, std::size_t i) const
{
    return RingSlot(std::int64_t{recording.startBlock} + static_cast<std::int64_t>(i), layout_.dataBlockMax);
}

void DiskImage::WriteRecording(const Recording& r)
{
    if (r.listed) {
        const ListEntryBytes entry = MakeListEntry(r.listIdx, r.startBlock, r.endBlock, r.startTime, r.endTime);
        WriteLogical(listOffset_ + static_cast<std::uint64_t>(r.listIdx) * 128, entry.data(), entry.size());
        WriteLogical(listOffsetBackup_ + static_cast<std::uint64_t>(r.listIdx) * 128, entry.data(), entry.size());
    }

    for (std::size_t i = 0; i < r.blocks.size(); ++i) {
        const std::int32_t block = BlockNumber(r, i);
        const std::vector<Frame>& frames = r.blocks[i];
        const BlockHeaderBytes header = MakeBlockHeader(block, static_cast<std::int32_t>(frames.size()));
        WriteLogical(dataBlockOffset_ + static_cast<std::uint64_t>(block) * kDataBlockBytes, header.data(),
                     header.size());
        std::uint64_t offset = 0;
        for (std::size_t k = 0; k < frames.size(); ++k) {
            const std::vector<std::uint8_t>& payload = frames[k].payload;
            if (offset + payload.size() + (k + 1) * 64 > kPayloadAreaBytes)
                throw std::length_error("frames overflow data block " + std::to_string(block));
            const IndexEntryBytes index = MakeIndexEntry(static_cast<std::int32_t>(offset),
                                                         static_cast<std::int32_t>(payload.size()), frames[k].info);
            WriteLogical(IndexEntryPosition(block, static_cast<std::int64_t>(k)), index.data(), index.size());
            if (!payload.empty())
                WriteLogical(PayloadPosition(block, static_cast<std::int64_t>(offset)), payload.data(),
                             payload.size());
            offset += payload.size();
        }
    }
}

void DiskImage::Write(const std::string& path)
{
    path_ = path;
    fd_ = ::open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
    if (fd_ < 0)
        Fail("cannot create " + path);
    if (::ftruncate(fd_, static_cast<off_t>(ImageSize())) != 0)
        Fail("cannot size " + path);

    const std::vector<std::uint8_t> super = SuperBlockBytes();
    const std::vector<std::uint8_t> table = BlockTableBytes();
    WritePhysical(0, super.data(), super.size());
    WritePhysical(layout_.superOffset + kTableGap, table.data(), table.size());
    WritePhysical(layout_.superOffsetBackup, super.data(), super.size());
    WritePhysical(layout_.superOffsetBackup + kTableGap, table.data(), table.size());
    WriteAdapterRing();
    for (const Recording& r : recordings_)
        WriteRecording(r);

    ::close(fd_);
    fd_ = -1;
}

void DiskImage::WritePhysical(std::uint64_t offset, const void* data, std::size_t size)
{
    const bool reopen = fd_ < 0;
    if (reopen) {
        fd_ = ::open(path_.c_str(), O_RDWR | O_CLOEXEC);
        if (fd_ < 0)
            Fail("cannot open " + path_);
    }
    const auto* bytes = static_cast<const std::uint8_t*>(data);
    while (size > 0) {
        const ssize_t n = ::pwrite(fd_, bytes, size, static_cast<off_t>(offset));
        if (n <= 0)
            Fail("cannot write " + path_);
        bytes += n;
        offset += static_cast<std::uint64_t>(n);
        size -= static_cast<std::size_t>(n);
    }
    if (reopen) {
        ::close(fd_);
        fd_ = -1;
    }
}

void DiskImage::WriteLogical(std::uint64_t position, const void* data, std::size_t size)
{
    const std::uint64_t bs = static_cast<std::uint64_t>(blockSize_);
    const auto* bytes = static_cast<const std::uint8_t*>(data);
    while (size > 0) {
        const std::size_t piece = static_cast<std::size_t>(std::min<std::uint64_t>(size, bs - position % bs));
        WritePhysical(PhysicalOffset(position), bytes, piece);
        bytes += piece;
        position += piece;
        size -= piece;
    }
}

void DiskImage::FlipByte(std::uint64_t physical)
{
    std::uint8_t byte = 0;
    const int fd = ::open(path_.c_str(), O_RDWR | O_CLOEXEC);
    if (fd < 0 || ::pread(fd, &byte, 1, static_cast<off_t>(physical)) != 1)
        Fail("cannot read " + path_);
    byte ^= 0x01;
    if (::pwrite(fd, &byte, 1, static_cast<off_t>(physical)) != 1)
        Fail("cannot write " + path_);
    ::close(fd);
}

void DiskImage::Damage(Target target, std::int64_t a, std::int64_t b)
{
    const std::uint64_t ua = static_cast<std::uint64_t>(a);
    switch (target) {
    case Target::PrimarySuperBlock:
        return FlipByte(0x80);
    case Target::BackupSuperBlock:
        return FlipByte(layout_.superOffsetBackup + 0x80);
    case Target::PrimaryBlockTable:
        return FlipByte(layout_.superOffset + kTableGap);
    case Target::BackupBlockTable:
        return FlipByte(layout_.superOffsetBackup + kTableGap);
    case Target::AdapterSlot:
        return FlipByte(PhysicalOffset(ua * static_cast<std::uint64_t>(blockSize_) + 465));
    case Target::ListEntry:
        return FlipByte(PhysicalOffset(listOffset_ + ua * 128 + 100));
    case Target::ListMirror:
        return FlipByte(PhysicalOffset(listOffsetBackup_ + ua * 128 + 100));
    case Target::BlockHeader:
        return FlipByte(PhysicalOffset(dataBlockOffset_ + ua * kDataBlockBytes + 100));
    case Target::IndexEntry:
        return FlipByte(PhysicalOffset(IndexEntryPosition(a, b) + 40));
    }
}

}  // namespace dvrimage
