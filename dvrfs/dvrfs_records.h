// On-disk records of the recorder's disk file system, exactly as the recorder
// lays them out: little-endian, packed, read straight into memory.
#ifndef DVRFS_DVRFS_RECORDS_H
#define DVRFS_DVRFS_RECORDS_H

#include <cstddef>
#include <cstdint>

// Fixed sizes of the format.
enum : int {
    kSectorSize = 512,
    kSuperBlockSize = 508,
    kSuperHeaderSize = 252,      // the checksummed header of the superblock
    kBlockTableEntrySize = 32,
    kBlockTableGap = 8192,       // a block table lies this far after its superblock area
    kAdapterSlotCount = 120,
    kAdapterSize = 512,
    kListEntrySize = 128,
    kBlockHeaderSize = 128,
    kIndexEntrySize = 64,
    kPartitionSlotOffset = 462,  // second slot of a standard partition table
    kPartitionSlotSize = 16,
    kLogicalRunLength = 512,     // one physical block is skipped after every run
};

constexpr std::int64_t kDataBlockSize = 16777216;                       // 1 << 24
constexpr std::int64_t kPayloadAreaSize = kDataBlockSize - kBlockHeaderSize; // 16,777,088
constexpr int kLastIndexEntry = 262141;  // the last index entry that fits after the header
constexpr std::uint16_t kSuperMagic = 0x1234;

#pragma pack(push, 1)

struct _H264SuperBlock_t {
    std::uint16_t Magic;
    std::uint8_t Reserved02[2];
    std::uint32_t HeaderSize;
    std::uint32_t BlockTableCount;
    std::int32_t TableLimit;          // must not exceed TableLimitBound
    std::uint8_t Reserved10[6];
    std::uint8_t BlockTableSum;
    std::uint8_t Reserved17;
    std::int32_t BlockSize;
    std::int32_t BlockMask;
    std::int32_t BlockSizeShift;
    std::int32_t TableLimitBound;
    std::int32_t BlockCount;
    std::uint64_t SuperOffset;
    std::uint64_t SuperOffsetBackup;
    std::uint64_t OffsetBlockSpace;
    std::uint64_t OffsetAddressSpace;
    std::uint8_t ReservedHeader[176];
    std::uint8_t ReservedTail[256];
};

struct _H264BlockTable_t {
    std::uint8_t Bytes[32];
};

// One recording: a run of data blocks and the times it covers.
struct _HisiList_t {
    std::uint8_t Reserved00[4];
    std::int32_t Idx;
    std::int32_t StartBlock;
    std::int32_t EndBlock;
    std::uint32_t StartTime;
    std::uint32_t EndTime;
    std::uint8_t Reserved24[104];
};

// The header at the start of every 16 MiB data block.
struct _HisiBlockHeader_t {
    std::uint8_t Reserved00[4];
    std::int32_t Info;                // reported by the information query
    std::uint8_t Reserved08[4];
    std::int32_t BlockIdx;
    std::uint8_t Reserved16[8];
    std::int32_t FrameCount;
    std::uint8_t Reserved28[100];
};

// One frame of the recorded stream.
struct _HisiHeader_t {
    std::uint8_t Reserved00[4];
    std::int32_t FrameInfo;           // negative in an adapter that records no frame
    std::uint8_t Reserved08[4];
    std::int32_t DataOffset;
    std::int32_t DataSize;
    std::uint8_t Reserved20[44];
};

// One slot of the ring of state records.
struct _HisiAdapter_t {
    std::uint32_t Magic;
    std::int32_t Version;
    std::int32_t TimeStamp;
    std::int32_t Idx;
    _HisiList_t FirstList;
    _HisiList_t LastList;
    _HisiBlockHeader_t CurBlockHeader;
    _HisiHeader_t LastFrame;
    std::uint8_t Reserved464[4];
    std::uint32_t StartTime;
    std::uint32_t EndTime;
    std::int32_t ListMax;
    std::int32_t DataBlockMax;
    std::uint64_t ListOffset;
    std::uint64_t ListOffsetBackup;
    std::uint64_t DataBlockOffset;
    std::uint8_t RecordSum;
    std::uint8_t Reserved509[3];
};

#pragma pack(pop)

// Records the format names but the reader never reads; only their byte-order
// hooks exist.
struct _HisiLink_t;
struct _H264EventList_t;

static_assert(sizeof(_H264SuperBlock_t) == 508, "superblock size");
static_assert(offsetof(_H264SuperBlock_t, HeaderSize) == 0x04, "HeaderSize");
static_assert(offsetof(_H264SuperBlock_t, BlockTableCount) == 0x08, "BlockTableCount");
static_assert(offsetof(_H264SuperBlock_t, TableLimit) == 0x0C, "value at 0x0C");
static_assert(offsetof(_H264SuperBlock_t, BlockTableSum) == 0x16, "BlockTableSum");
static_assert(offsetof(_H264SuperBlock_t, BlockSize) == 0x18, "BlockSize");
static_assert(offsetof(_H264SuperBlock_t, BlockMask) == 0x1C, "BlockMask");
static_assert(offsetof(_H264SuperBlock_t, BlockSizeShift) == 0x20, "BlockSizeShift");
static_assert(offsetof(_H264SuperBlock_t, TableLimitBound) == 0x24, "value at 0x24");
static_assert(offsetof(_H264SuperBlock_t, BlockCount) == 0x28, "BlockCount");
static_assert(offsetof(_H264SuperBlock_t, SuperOffset) == 0x2C, "SuperOffset");
static_assert(offsetof(_H264SuperBlock_t, SuperOffsetBackup) == 0x34, "SuperOffsetBackup");
static_assert(offsetof(_H264SuperBlock_t, OffsetBlockSpace) == 0x3C, "OffsetBlockSpace");
static_assert(offsetof(_H264SuperBlock_t, OffsetAddressSpace) == 0x44, "OffsetAddressSpace");
static_assert(offsetof(_H264SuperBlock_t, ReservedTail) == 0xFC, "end of the header");

static_assert(sizeof(_H264BlockTable_t) == 32, "block table entry size");

static_assert(sizeof(_HisiList_t) == 128, "list entry size");
static_assert(offsetof(_HisiList_t, Idx) == 4, "list Idx");
static_assert(offsetof(_HisiList_t, StartBlock) == 8, "list StartBlock");
static_assert(offsetof(_HisiList_t, EndBlock) == 12, "list EndBlock");
static_assert(offsetof(_HisiList_t, StartTime) == 16, "list StartTime");
static_assert(offsetof(_HisiList_t, EndTime) == 20, "list EndTime");

static_assert(sizeof(_HisiBlockHeader_t) == 128, "data block header size");
static_assert(offsetof(_HisiBlockHeader_t, Info) == 4, "header info");
static_assert(offsetof(_HisiBlockHeader_t, BlockIdx) == 12, "header BlockIdx");
static_assert(offsetof(_HisiBlockHeader_t, FrameCount) == 24, "header FrameCount");

static_assert(sizeof(_HisiHeader_t) == 64, "index entry size");
static_assert(offsetof(_HisiHeader_t, FrameInfo) == 4, "index frame info");
static_assert(offsetof(_HisiHeader_t, DataOffset) == 12, "index DataOffset");
static_assert(offsetof(_HisiHeader_t, DataSize) == 16, "index DataSize");

static_assert(sizeof(_HisiAdapter_t) == 512, "adapter size");
static_assert(offsetof(_HisiAdapter_t, Version) == 4, "adapter Version");
static_assert(offsetof(_HisiAdapter_t, TimeStamp) == 8, "adapter TimeStamp");
static_assert(offsetof(_HisiAdapter_t, Idx) == 12, "adapter Idx");
static_assert(offsetof(_HisiAdapter_t, FirstList) == 16, "adapter FirstList");
static_assert(offsetof(_HisiAdapter_t, LastList) == 144, "adapter LastList");
static_assert(offsetof(_HisiAdapter_t, LastList) + offsetof(_HisiList_t, EndBlock) == 156,
              "newest data block number");
static_assert(offsetof(_HisiAdapter_t, CurBlockHeader) == 272, "adapter CurBlockHeader");
static_assert(offsetof(_HisiAdapter_t, LastFrame) == 400, "adapter LastFrame");
static_assert(offsetof(_HisiAdapter_t, StartTime) == 468, "adapter StartTime");
static_assert(offsetof(_HisiAdapter_t, EndTime) == 472, "adapter EndTime");
static_assert(offsetof(_HisiAdapter_t, ListMax) == 476, "adapter ListMax");
static_assert(offsetof(_HisiAdapter_t, DataBlockMax) == 480, "adapter DataBlockMax");
static_assert(offsetof(_HisiAdapter_t, ListOffset) == 484, "adapter ListOffset");
static_assert(offsetof(_HisiAdapter_t, ListOffsetBackup) == 492, "adapter ListOffsetBackup");
static_assert(offsetof(_HisiAdapter_t, DataBlockOffset) == 500, "adapter DataBlockOffset");
static_assert(offsetof(_HisiAdapter_t, RecordSum) == 508, "adapter RecordSum");

#endif
