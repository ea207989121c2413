// Raw reads: whole sectors at physical offsets, and logical positions mapped
// across the physical block left out after every 512 logical blocks.
#include <climits>
#include <cstring>
#include <fstream>
#include <vector>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"

namespace {

constexpr std::int64_t kSpace = 1 << 20;  // OffsetBlockSpace of the small layout
constexpr std::int64_t kBlock = 4096;

class RawReadTest : public DiskTest {
protected:
    // A file of `size` bytes whose byte i is PatternByte(i), opened as the
    // reader's source.
    void OpenPatternFile(std::size_t size)
    {
        path_ = dir_ + "/pattern.bin";
        std::ofstream out(path_, std::ios::binary);
        for (std::size_t i = 0; i < size; ++i)
            out.put(static_cast<char>(PatternByte(i)));
        out.close();
        Refingerprint(path_);
        ASSERT_EQ(reader_.OpenSource(path_), 1);
    }
    static unsigned char PatternByte(std::size_t i) { return static_cast<unsigned char>(i * 7 % 251); }

    std::string path_;
};

TEST_F(RawReadTest, ReadsWholeSectorsAndDeliversExactlyTheBytesAskedFor)
{
    OpenPatternFile(8192);
    unsigned char dest[512];

    ASSERT_EQ(reader_.ReadSectors(reinterpret_cast<char*>(dest), 1000, 100), 1);
    for (int i = 0; i < 100; ++i)
        ASSERT_EQ(dest[i], PatternByte(1000 + i));
    ASSERT_EQ(reader_.ReadSectors(reinterpret_cast<char*>(dest), 512, 512), 1);
    EXPECT_EQ(dest[0], PatternByte(512));
    EXPECT_EQ(reader_.ReadSectors(reinterpret_cast<char*>(dest), 0, 0), -1);

    const std::vector<iotrace::ReadCall> reads = iotrace::Reads(path_);
    ASSERT_EQ(reads.size(), 2u);
    EXPECT_EQ(reads[0].offset, 512);
    EXPECT_EQ(reads[0].count, 1024u);
    EXPECT_EQ(reads[1].offset, 512);
    EXPECT_EQ(reads[1].count, 512u);
}

TEST_F(RawReadTest, RefusesWhatCannotBeReadWithoutTouchingTheDestination)
{
    OpenPatternFile(4096);
    char dest[16] = {};
    iotrace::FailReads(path_, 2048, 1);

    EXPECT_EQ(reader_.ReadSectors(dest, 2100, 4), -1);               // a failing sector
    EXPECT_EQ(reader_.ReadSectors(dest, UINT64_MAX - 1, 4), -1);     // offset + length overflows
    EXPECT_EQ(reader_.ReadSectors(dest, 1ull << 63, 4), -1);         // beyond any seek
    EXPECT_EQ(reader_.ReadSectors(dest, 0, 1ul << 40), -1);          // larger than any record
    EXPECT_EQ(reader_.ErrorCode(), kErrNone);  // raw reads write nothing to the register
    CatalogReader unopened;
    EXPECT_EQ(unopened.ReadSectors(dest, 0, 4), -1);
}

class BlockReadTest : public DiskTest {
protected:
    std::string OpenSmallDisk(const dvrimage::Layout& layout = SmallLayout())
    {
        const std::string path = WriteDisk(layout, {});
        EXPECT_EQ(Open(path), 1);
        return path;
    }
};

// One physical block is left out after every 512 logical ones, and a read is
// split at block boundaries into sector-aligned pieces.
TEST_F(BlockReadTest, MapsLogicalBlocksAcrossTheSkippedPhysicalBlocksInSectorPieces)
{
    const std::string path = OpenSmallDisk();
    wxInt64 offset = 0;
    const std::pair<int, wxInt64> expected[] = {
        {0, kSpace}, {511, kSpace + 511 * kBlock}, {512, kSpace + 513 * kBlock},
        {1023, kSpace + 1024 * kBlock}, {1024, kSpace + 1026 * kBlock},
    };
    for (const auto& [block, physical] : expected) {
        ASSERT_EQ(reader_.BlockShift(block, &offset), 1);
        EXPECT_EQ(offset, physical) << "logical block " << block;
    }
    const char marks[] = {'A', 'B'};
    image_->WriteLogical(2097151, marks, 2);  // last byte of block 511, first of block 512
    Refingerprint(path);
    iotrace::Reset();

    char got[2] = {};
    ASSERT_EQ(reader_.BlockRead(nullptr, 2097151, got, 2), 1);
    EXPECT_EQ(got[0], 'A');
    EXPECT_EQ(got[1], 'B');
    const std::vector<iotrace::ReadCall> reads = iotrace::Reads(path);
    ASSERT_EQ(reads.size(), 2u);
    EXPECT_EQ(reads[0].offset, kSpace + 511 * kBlock + 3584);  // the sector holding byte 4095 of block 511
    EXPECT_EQ(reads[0].count, 512u);
    EXPECT_EQ(reads[1].offset, kSpace + 513 * kBlock);
    EXPECT_EQ(reads[1].count, 512u);

    // Three blocks: one read each, none merged.
    std::vector<char> span(kBlock + 2);
    iotrace::Reset();
    ASSERT_EQ(reader_.BlockRead(nullptr, 2097151, span.data(), static_cast<int>(span.size())), 1);
    EXPECT_EQ(span.front(), 'A');
    EXPECT_EQ(span[1], 'B');
    EXPECT_EQ(iotrace::Reads(path).size(), 3u);
}

// Reads beyond the last block or with unusable arguments are refused with
// their code before any device read, the destination untouched.
TEST_F(BlockReadTest, RefusesReadsOutsideTheBlockSpaceOrWithUnusableArguments)
{
    dvrimage::Layout layout = SmallLayout();
    layout.blockCount = 1000;
    const std::string path = OpenSmallDisk(layout);
    char got[4] = {'x', 'y', 'z', 'w'};
    EXPECT_EQ(reader_.BlockRead(nullptr, 4095999, got, 1), 1);
    EXPECT_EQ(reader_.BlockRead(nullptr, 0, got, 0), 1);
    got[0] = 'x';
    iotrace::Reset();
    const struct {
        wxInt64 position;
        int size;
        bool destination;
        std::int32_t code;
    } refused[] = {
        {4095999, 2, true, 37}, {INT64_MAX - 1, 2, true, 37},  // the end overflows
        {0x1000000000000, 2, true, 37},                        // beyond 32-bit block numbers
        {-1, 1, true, 36},      {0, -1, true, 36},      {0, 4, false, 36},
    };
    for (const auto& r : refused) {
        reader_.ClearError();
        EXPECT_EQ(reader_.BlockRead(nullptr, r.position, r.destination ? got : nullptr, r.size), -1);
        EXPECT_EQ(reader_.ErrorCode(), r.code) << r.position << " " << r.size;
    }
    EXPECT_EQ(got[0], 'x');
    EXPECT_TRUE(iotrace::Reads(path).empty());
    ASSERT_EQ(reader_.BlockRead(nullptr, 4095999, got, 2), -1);
    EXPECT_EQ(ErrorText(), "FUNCTION[1150]Pos=4095999, Size=2, OffsetAddressSpace=0, OffsetBlockSpace=1048576");
    ASSERT_EQ(reader_.BlockRead(nullptr, -1, got, 1), -1);
    EXPECT_EQ(ErrorText(), "FUNCTION[1141]");

    reader_.CloseDVRFS();
    EXPECT_EQ(reader_.BlockRead(nullptr, 0, got, 4), -1);
    EXPECT_EQ(reader_.ErrorCode(), 38);
    wxInt64 offset = 0;
    EXPECT_EQ(reader_.BlockShift(3, &offset), -1);
}

TEST_F(BlockReadTest, ErrorTextIsCutToItsBuffer)
{
    const std::string path = OpenSmallDisk();
    const std::uint64_t huge = 0x8000000000000000ull;
    PatchSuperBlocks(*image_, path, 0x44, &huge, sizeof huge);  // OffsetAddressSpace
    PatchSuperBlocks(*image_, path, 0x3C, &huge, sizeof huge);  // OffsetBlockSpace
    Refingerprint(path);
    ASSERT_EQ(Open(path), 1);

    char got[1];
    EXPECT_EQ(reader_.BlockRead(nullptr, INT64_MAX, got, INT_MAX), -1);  // refused before any read
    EXPECT_EQ(std::strlen(reader_.ErrorText()), 131u);
    EXPECT_EQ(ErrorText().substr(0, 37), "FUNCTION[1150]Pos=9223372036854775807");
}

}  // namespace
