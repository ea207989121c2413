// Writes synthetic recorder disk images: sparse files laid out as a recorder
// lays out its disk (superblock and block table with their backup copies, the
// ring of 120 adapter slots, the list ring and its mirror, the data ring of
// 16 MiB blocks with their headers, index entries and frame payloads), and
// damages any single record of them on purpose.
//
// This writer works from the format alone and shares no code with the
// reader, so that images it writes check the reader instead of echoing it.
#ifndef TOOLS_DVRIMAGE_DVR_IMAGE_H
#define TOOLS_DVRIMAGE_DVR_IMAGE_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace dvrimage {

constexpr std::uint64_t kDataBlockBytes = 16777216;
constexpr std::uint64_t kPayloadAreaBytes = kDataBlockBytes - 128;
constexpr int kAdapterSlots = 120;

using ListEntryBytes = std::array<std::uint8_t, 128>;
using BlockHeaderBytes = std::array<std::uint8_t, 128>;
using IndexEntryBytes = std::array<std::uint8_t, 64>;

struct Frame {
    std::vector<std::uint8_t> payload;
    std::int32_t info = 1;  // the index entry's word at offset 4 (kept non-negative)
};

// One recording: its list entry and the frames of each of its data blocks,
// from StartBlock onward (across the end of the data ring when it wraps).
struct Recording {
    std::int32_t listIdx = 0;
    std::int32_t startBlock = 0;
    std::int32_t endBlock = 0;
    std::uint32_t startTime = 0;
    std::uint32_t endTime = 0;
    std::vector<std::vector<Frame>> blocks;
    // False for a recording whose list entry the recorder has since written
    // over: its blocks are on the disk, its entry is not.
    bool listed = true;
};

// A run of consecutive adapter slots, wrapping past slot 119.
struct SlotRun {
    int start = 0;
    int length = 1;
};

// Everything an image is made from. Fields left at their defaults give a
// small valid disk; the superblock and adapter values are written as they
// stand, so that tests can write values a recorder never would.
struct Layout {
    // Superblock.
    std::int32_t blockSizeShift = 12;
    std::optional<std::int32_t> blockSize;   // default 1 << blockSizeShift
    std::optional<std::int32_t> blockMask;   // default blockSize - 1
    std::int32_t blockCount = 0;             // 0: just enough for the rings
    std::uint64_t offsetBlockSpace = 1u << 20;
    std::uint64_t superOffset = 0;
    std::uint64_t superOffsetBackup = 512u << 10;
    std::uint64_t offsetAddressSpace = 0;
    std::uint32_t blockTableCount = 4;
    std::int32_t tableLimit = 1;             // the value at 0x0C
    std::int32_t tableLimitBound = 1;        // the value at 0x24
    std::uint32_t headerSize = 252;
    // Size of the image file; default: up to the end of the block space. A
    // smaller one stands for a disk that is shorter than its superblock says.
    std::optional<std::uint64_t> imageSize;
    std::uint16_t magic = 0x1234;

    // Adapter ring.
    std::vector<SlotRun> adapterRuns = {SlotRun{}};  // valid slots; the rest are left unused
    std::int32_t version = 1;                // Version: above 0 when the recorder is configured
    std::uint32_t adapterMagic = 0x48444152;
    std::int32_t timeStampBase = 1000;       // the k-th valid slot carries timeStampBase + k
    std::uint8_t recordSum = 0x5A;
    bool adapterRecordsFrame = true;         // false: LastFrame says "no frame"
    std::optional<std::int32_t> firstListIdx;  // default: the first recording added
    std::optional<std::int32_t> lastListIdx;   // default: the last recording added (-1 if none)
    std::optional<std::uint32_t> startTime;    // default: the earliest start of the recordings
    std::optional<std::uint32_t> endTime;      // default: the latest end

    // Rings: sizes, and logical positions (0 places them after the adapter ring).
    std::int32_t listMax = 64;
    std::int32_t dataBlockMax = 8;
    std::uint64_t listOffset = 0;
    std::uint64_t listOffsetBackup = 0;
    std::uint64_t dataBlockOffset = 0;
};

enum class Target {
    PrimarySuperBlock,
    BackupSuperBlock,
    PrimaryBlockTable,
    BackupBlockTable,
    AdapterSlot,   // a = slot
    ListEntry,     // a = list index, the copy in the list ring
    ListMirror,    // a = list index, the copy in the list mirror
    BlockHeader,   // a = data block number
    IndexEntry,    // a = data block number, b = index entry number
};

// An H.264 elementary stream (Annex B) cut into access units, one per frame:
// a new unit begins at each access unit delimiter (NAL unit type 9).
std::vector<std::vector<std::uint8_t>> SplitAccessUnits(const std::vector<std::uint8_t>& stream);
// The access units of an H.264 stream file; none when it cannot be read.
std::vector<std::vector<std::uint8_t>> AccessUnitsOfFile(const std::string& path);

// Frame payloads that say where they belong: useful to check what was read.
std::vector<std::uint8_t> PatternPayload(std::int32_t block, int frame, std::size_t size);

// A recording of generated frames: framesPerBlock frames of frameSize bytes
// in each block from startBlock to endBlock, around a ring of ringBlocks.
Recording GeneratedRecording(std::int32_t listIdx, std::int32_t startBlock, std::int32_t endBlock,
                             std::uint32_t startTime, std::uint32_t endTime, std::int32_t ringBlocks,
                             int framesPerBlock = 3, std::size_t frameSize = 1000);

// Fills the recording's blocks, from startBlock to endBlock around a ring of
// ringBlocks, with framesPerBlock of these frames each, in order from `next`
// (which it advances); the frames start again when used up.
void FillWithFrames(Recording& recording, std::int32_t ringBlocks, int framesPerBlock,
                    const std::vector<std::vector<std::uint8_t>>& frames, std::size_t& next);

class DiskImage {
public:
    explicit DiskImage(Layout layout);

    void Add(Recording recording);
    // Writes the whole image to path as a sparse file, replacing it.
    void Write(const std::string& path);

    // After Write: flips one byte that the record's XOR sum covers, leaving
    // its named fields as they were.
    void Damage(Target target, std::int64_t a = 0, std::int64_t b = 0);
    // After Write: raw bytes at a logical position of the block space or at
    // a physical offset of the image.
    void WriteLogical(std::uint64_t position, const void* data, std::size_t size);
    void WritePhysical(std::uint64_t offset, const void* data, std::size_t size);

    // Records as this image's writer makes them, their sums set.
    ListEntryBytes MakeListEntry(std::int32_t idx, std::int32_t startBlock, std::int32_t endBlock,
                                 std::uint32_t startTime, std::uint32_t endTime) const;
    BlockHeaderBytes MakeBlockHeader(std::int32_t block, std::int32_t frameCount) const;
    IndexEntryBytes MakeIndexEntry(std::int32_t dataOffset, std::int32_t dataSize, std::int32_t info = 1) const;

    // The resolved geometry.
    const Layout& layout() const { return layout_; }
    std::int32_t BlockSize() const;
    std::int32_t BlockCount() const;
    std::uint64_t ListOffset() const;
    std::uint64_t ListOffsetBackup() const;
    std::uint64_t DataBlockOffset() const;
    std::uint64_t ImageSize() const;
    std::uint64_t PhysicalOffset(std::uint64_t logical) const;
    // Logical position of index entry k of data block n, and of its payload byte o.
    std::uint64_t IndexEntryPosition(std::int64_t block, std::int64_t entry) const;
    std::uint64_t PayloadPosition(std::int64_t block, std::int64_t offset) const;

private:
    void Resolve();
    std::vector<std::uint8_t> SuperBlockBytes() const;
    std::vector<std::uint8_t> BlockTableBytes() const;
    std::vector<std::uint8_t> AdapterBytes(int slot, int positionInRun) const;
    std::vector<std::uint8_t> UnusedSlotBytes(int slot) const;
    bool SlotInRuns(int slot, int* position) const;
    void WriteAdapterRing();
    void WriteRecording(const Recording& recording);
    std::int32_t BlockNumber(const Recording& recording, std::size_t i) const;
    void FlipByte(std::uint64_t physical);

    Layout layout_;
    std::vector<Recording> recordings_;
    std::string path_;
    int fd_ = -1;
    std::int32_t blockSize_ = 0;
    std::int32_t blockCount_ = 0;
    std::uint64_t listOffset_ = 0;
    std::uint64_t listOffsetBackup_ = 0;
    std::uint64_t dataBlockOffset_ = 0;
};

}  // namespace dvrimage

#endif
