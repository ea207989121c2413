// Opening a disk: superblock and block table verification, the backup path,
// the error register, and the fill level of an open volume.
#include <fcntl.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"

namespace {

using dvrimage::GeneratedRecording;
using dvrimage::Layout;
using dvrimage::Target;

constexpr std::int64_t kBackup = 512 << 10;
using Offsets = std::vector<std::int64_t>;

Offsets ReadOffsets(const std::string& path)
{
    Offsets offsets;
    for (const iotrace::ReadCall& call : iotrace::Reads(path)) {
        offsets.push_back(call.offset);
        EXPECT_EQ(call.count % 512, 0u) << "whole sectors only";
    }
    return offsets;
}

int OpenFileCount()
{
    int n = 0;
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator("/proc/self/fd"))
        ++n;
    return n;
}

struct OpenCase {
    const char* name;
    void (*change)(Layout&);
    std::vector<Damage> damage;
    int opened;
    std::int32_t code;
    const char* text;
    Offsets reads = {};  // the device reads of the open; empty: not checked
};

class OpenTest : public DiskTest, public ::testing::WithParamInterface<OpenCase> {};

// A sound primary copy is used as it is; a damaged one gives way to a sound
// backup, and the register says which part of the primary was damaged; a
// superblock whose values disagree is refused with its code and text.
TEST_P(OpenTest, OpensOnTheFirstSoundCopyOrSaysWhyNot)
{
    const OpenCase& c = GetParam();
    Layout layout = SmallLayout();
    if (c.change)
        c.change(layout);
    const std::string path = WriteDisk(layout, {}, c.damage);

    EXPECT_EQ(Open(path), c.opened);
    EXPECT_EQ(reader_.ErrorCode(), c.code);
    EXPECT_EQ(ErrorText(), c.text);
    EXPECT_EQ(reader_.Volume() != nullptr, c.opened == 1);
    EXPECT_EQ(reader_.Source() != nullptr, c.opened == 1);
    if (!c.reads.empty()) {
        EXPECT_EQ(ReadOffsets(path), c.reads);
    }
    if (c.opened) {
        EXPECT_EQ(OpenAndSearch(path), 1);
    }
}

void NoTable(Layout& l)
{
    l.blockTableCount = 0;
}

INSTANTIATE_TEST_SUITE_P(
    Copies, OpenTest,
    ::testing::Values(
        // Partition slot, superblock, then the primary table 8192 bytes after it.
        OpenCase{"Sound", nullptr, {}, 1, 0, "", {0, 0, 8192}},
        OpenCase{"EmptyTableIsNotRead", NoTable, {}, 1, 0, "", {0, 0}},
        OpenCase{"BackupDamaged", nullptr, {{Target::BackupSuperBlock}, {Target::BackupBlockTable}}, 1, 0, ""},
        // The backup and its table are read once, and not left for the primary again.
        OpenCase{"PrimarySuperBlock", nullptr, {{Target::PrimarySuperBlock}}, 1, 41, "FUNCTION[945]",
                 {0, 0, kBackup, kBackup + 8192}},
        OpenCase{"PrimaryTable", nullptr, {{Target::PrimaryBlockTable}}, 1, 42, "FUNCTION[946]"},
        OpenCase{"BothSuperBlocks", nullptr, {{Target::PrimarySuperBlock}, {Target::BackupSuperBlock}}, 0, 33, ""},
        OpenCase{"BothTables", nullptr, {{Target::PrimaryBlockTable}, {Target::BackupBlockTable}}, 0, 34,
                 "FUNCTION[934]"}),
    CaseName<OpenCase>);

INSTANTIATE_TEST_SUITE_P(
    Faults, OpenTest,
    ::testing::Values(
        OpenCase{"HeaderSize", [](Layout& l) { l.headerSize = 100; }, {}, 0, 33, "FUNCTION[909]100 != 252"},
        OpenCase{"Magic", [](Layout& l) { l.magic = 0x4321; }, {}, 0, 33, "FUNCTION[916]"},
        OpenCase{"TableLimit", [](Layout& l) { l.tableLimit = 5, l.tableLimitBound = 4; }, {}, 0, 35,
                 "FUNCTION[642]"},
        OpenCase{"MaskDisagrees", [](Layout& l) { l.blockMask = 4094; }, {}, 0, 39, "FUNCTION[650]"},
        OpenCase{"SizeDisagrees", [](Layout& l) { l.blockSize = 8192; }, {}, 0, 39, "FUNCTION[650]"},
        OpenCase{"ShiftTooSmall", [](Layout& l) { l.blockSizeShift = 8, l.blockSize = 256, l.blockMask = 255; },
                 {}, 0, 39, "FUNCTION[650]"},
        OpenCase{"ShiftTooLarge",
                 [](Layout& l) { l.blockSizeShift = 31, l.blockSize = 4096, l.blockMask = 4095, l.blockCount = 40000; },
                 {}, 0, 39, "FUNCTION[650]"}),
    CaseName<OpenCase>);

class VolumeOpenTest : public DiskTest {};

TEST_F(VolumeOpenTest, UnreadableSuperBlocksAreRefusedWithoutAllocatingTheirTable)
{
    // All zeros: the backup is looked for at offset 0 too.
    const std::string zeros = dir_ + "/zero.img";
    std::ofstream(zeros).close();
    std::filesystem::resize_file(zeros, 4 << 20);
    Refingerprint(zeros);
    EXPECT_EQ(Open(zeros), 0);
    EXPECT_EQ(reader_.ErrorCode(), 33);
    EXPECT_EQ(ErrorText(), "FUNCTION[909]0 != 252");
    EXPECT_EQ(ReadOffsets(zeros), (Offsets{0, 0, 0}));
    ASSERT_NE(reader_.Catalog(), nullptr);  // allocated by the open, kept after the failure
    EXPECT_EQ(reader_.Catalog()->Opened, 1);

    const std::string huge = WriteDisk(SmallLayout(), {});
    const std::uint32_t count = 0xFFFFFFFFu;
    PatchSuperBlocks(*image_, huge, 0x08, &count, sizeof count);
    Refingerprint(huge);
    EXPECT_EQ(Open(huge), 0);
    EXPECT_EQ(reader_.ErrorCode(), 40);
    EXPECT_EQ(ErrorText(), "FUNCTION[925]");
}

TEST_F(VolumeOpenTest, MissingDeviceLeavesTheRegisterAndASecondOpenClosesTheFirst)
{
    EXPECT_EQ(Open(dir_ + "/no-such-disk"), 0);
    EXPECT_EQ(reader_.ErrorCode(), 0);
    reader_.CloseDVRFS();
    reader_.CloseDVRFS();
    EXPECT_EQ(reader_.Volume(), nullptr);

    Layout otherLayout = SmallLayout();
    otherLayout.blockTableCount = 9;
    ASSERT_EQ(Open(WriteDisk(SmallLayout(), {}, {}, "a.img")), 1);
    const RecordCatalog* catalog = reader_.Catalog();
    const int filesWithA = OpenFileCount();
    ASSERT_EQ(Open(WriteDisk(otherLayout, {}, {}, "b.img")), 1);
    EXPECT_EQ(OpenFileCount(), filesWithA);
    EXPECT_EQ(reader_.Catalog(), catalog);
    EXPECT_EQ(reader_.Volume()->superBlock.BlockTableCount, 9u);
}

TEST_F(VolumeOpenTest, FillLevelOfAnEmptyDataRingIsRefusedNotDividedByZero)
{
    Layout layout = SmallLayout();
    layout.dataBlockMax = 0;
    ASSERT_EQ(OpenAndSearch(WriteDisk(layout, {})), 1);
    EXPECT_EQ(reader_.GetInfo(35), 0);
    EXPECT_EQ(reader_.GetInfo(49), -1);
    EXPECT_EQ(reader_.ErrorCode(), 84);
    EXPECT_EQ(ErrorText(), "FUNCTION[1540]");
}

}  // namespace
