// Opening a disk: superblock and block table verification, the backup path,
// the error register, and the queries on an open volume.
#include <fcntl.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <fstream>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"

namespace {

using dvrimage::DiskImage;
using dvrimage::GeneratedRecording;
using dvrimage::Target;

constexpr std::int64_t kBackup = 512 << 10;

std::vector<std::int64_t> ReadOffsets(const std::string& path)
{
    std::vector<std::int64_t> offsets;
    for (const iotrace::ReadCall& call : iotrace::Reads(path))
        offsets.push_back(call.offset);
    return offsets;
}

int OpenFileCount()
{
    int n = 0;
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator("/proc/self/fd"))
        ++n;
    return n;
}

class VolumeOpenTest : public DiskTest {};

TEST_F(VolumeOpenTest, ValidDiskOpensWithCatalogueAndPartitionCopyAndCleanRegister)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);

    EXPECT_EQ(reader_.m_errorCode, 0);
    EXPECT_STREQ(reader_.m_errorText, "");
    ASSERT_EQ(Open(path), 1);
    EXPECT_EQ(reader_.m_errorCode, 0);
    EXPECT_STREQ(reader_.m_errorText, "");

    ASSERT_NE(reader_.m_catalog, nullptr);
    EXPECT_EQ(reader_.m_catalog->Opened, 1);
    EXPECT_EQ(reader_.m_catalog->Opened2, 1);
    EXPECT_EQ(reader_.m_catalog->SpanCount, 0);

    ASSERT_NE(reader_.m_volume, nullptr);
    EXPECT_EQ(reader_.m_volume->superBlock.BlockTableCount, 4u);
    ASSERT_EQ(reader_.m_volume->blockTable.size(), 5u);
    for (unsigned char b : reader_.m_volume->blockTable[4].Bytes)
        EXPECT_EQ(b, 0);
    EXPECT_EQ(reader_.m_volume->adapter, nullptr);

    ASSERT_NE(reader_.m_volume->partitionEntry, nullptr);
    const unsigned char expected[16] = {0x00, 0xFE, 0xFF, 0xFF, 0x83, 0xFE, 0xFF, 0xFF,
                                        0x00, 0x08, 0x00, 0x00, 0x00, 0x00, 0x10, 0x00};
    EXPECT_EQ(std::memcmp(reader_.m_volume->partitionEntry->data(), expected, 16), 0);

    // Sector 0 for the partition slot, sector 0 for the superblock, then the
    // primary table 8192 bytes after SuperOffset: whole sectors each.
    std::vector<std::int64_t> offsets;
    for (const iotrace::ReadCall& call : iotrace::Reads(path)) {
        offsets.push_back(call.offset);
        EXPECT_EQ(call.count % 512, 0u);
    }
    EXPECT_EQ(offsets, (std::vector<std::int64_t>{0, 0, 8192}));
}

TEST_F(VolumeOpenTest, AllZeroDiskFailsOnHeaderSizeAfterTryingTheBackupAtOffsetZero)
{
    const std::string path = dir_ + "/zero.img";
    std::ofstream(path).close();
    std::filesystem::resize_file(path, 4 << 20);
    Refingerprint(path);

    EXPECT_EQ(Open(path), 0);
    EXPECT_EQ(reader_.m_errorCode, 33);
    EXPECT_EQ(ErrorText(), "FUNCTION[909]0 != 252");
    EXPECT_EQ(ReadOffsets(path), (std::vector<std::int64_t>{0, 0, 0}));
    EXPECT_EQ(reader_.m_volume, nullptr);
    EXPECT_EQ(reader_.m_diskFile, nullptr);
    ASSERT_NE(reader_.m_catalog, nullptr);  // allocated by the open, kept after the failure
    EXPECT_EQ(reader_.m_catalog->Opened, 1);
}

struct CopyDamageCase {
    const char* name;
    std::vector<Target> damaged;
    int opened;
    std::int32_t code;
    const char* text;
};

void PrintTo(const CopyDamageCase& c, std::ostream* out)
{
    *out << c.name;
}

class CopyDamageTest : public DiskTest, public ::testing::WithParamInterface<CopyDamageCase> {};

// A sound primary copy is used as it is; a damaged one gives way to a sound
// backup, and the register says which part of the primary was damaged.
TEST_P(CopyDamageTest, OpensOnTheFirstSoundCopy)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);
    for (Target target : GetParam().damaged)
        image.Damage(target);
    Refingerprint(path);

    EXPECT_EQ(Open(path), GetParam().opened);
    EXPECT_EQ(reader_.m_errorCode, GetParam().code);
    EXPECT_EQ(ErrorText(), GetParam().text);
    EXPECT_EQ(reader_.m_volume != nullptr, GetParam().opened == 1);
    EXPECT_EQ(reader_.m_diskFile != nullptr, GetParam().opened == 1);
}

INSTANTIATE_TEST_SUITE_P(
    Copies, CopyDamageTest,
    ::testing::Values(
        CopyDamageCase{"BackupDamaged", {Target::BackupSuperBlock, Target::BackupBlockTable}, 1, 0, ""},
        CopyDamageCase{"PrimarySuperBlock", {Target::PrimarySuperBlock}, 1, 41, "FUNCTION[945]"},
        CopyDamageCase{"PrimaryTable", {Target::PrimaryBlockTable}, 1, 42, "FUNCTION[946]"},
        CopyDamageCase{"BothSuperBlocks", {Target::PrimarySuperBlock, Target::BackupSuperBlock}, 0, 33, ""},
        CopyDamageCase{"BothTables", {Target::PrimaryBlockTable, Target::BackupBlockTable}, 0, 34,
                       "FUNCTION[934]"}),
    [](const ::testing::TestParamInfo<CopyDamageCase>& info) { return std::string(info.param.name); });

TEST_F(VolumeOpenTest, BackupCopyInUseIsNotLeftForThePrimaryAgain)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);
    image.Damage(Target::PrimarySuperBlock);
    Refingerprint(path);

    ASSERT_EQ(Open(path), 1);
    // Partition slot, primary, then the backup and its table, and no more.
    EXPECT_EQ(ReadOffsets(path), (std::vector<std::int64_t>{0, 0, kBackup, kBackup + 8192}));
    EXPECT_EQ(OpenAndSearch(path), 1);
}

TEST_F(VolumeOpenTest, EmptyBlockTableOpensWithoutReadingOne)
{
    dvrimage::Layout layout = SmallLayout();
    layout.blockTableCount = 0;
    DiskImage image(layout);
    const std::string path = WriteImage(image);

    EXPECT_EQ(Open(path), 1);
    EXPECT_EQ(reader_.m_volume->superBlock.BlockTableSum, 0);
    EXPECT_EQ(ReadOffsets(path), (std::vector<std::int64_t>{0, 0}));
}

struct SuperBlockFault {
    const char* name;
    void (*change)(dvrimage::Layout&);
    std::int32_t code;
    const char* text;
};

void PrintTo(const SuperBlockFault& fault, std::ostream* out)
{
    *out << fault.name;
}

class SuperBlockFaultTest : public DiskTest, public ::testing::WithParamInterface<SuperBlockFault> {};

TEST_P(SuperBlockFaultTest, RefusesTheVolumeWithCodeAndText)
{
    dvrimage::Layout layout = SmallLayout();
    GetParam().change(layout);
    DiskImage image(layout);
    const std::string path = WriteImage(image);

    EXPECT_EQ(Open(path), 0);
    EXPECT_EQ(reader_.m_errorCode, GetParam().code);
    EXPECT_EQ(ErrorText(), GetParam().text);
    EXPECT_EQ(reader_.m_volume, nullptr);
    EXPECT_EQ(reader_.m_diskFile, nullptr);
}

INSTANTIATE_TEST_SUITE_P(
    Faults, SuperBlockFaultTest,
    ::testing::Values(
        SuperBlockFault{"HeaderSize", [](dvrimage::Layout& l) { l.headerSize = 100; }, 33, "FUNCTION[909]100 != 252"},
        SuperBlockFault{"Magic", [](dvrimage::Layout& l) { l.magic = 0x4321; }, 33, "FUNCTION[916]"},
        SuperBlockFault{"TableLimit", [](dvrimage::Layout& l) { l.tableLimit = 5, l.tableLimitBound = 4; }, 35,
                        "FUNCTION[642]"},
        SuperBlockFault{"MaskDisagrees", [](dvrimage::Layout& l) { l.blockMask = 4094; }, 39, "FUNCTION[650]"},
        SuperBlockFault{"SizeDisagrees", [](dvrimage::Layout& l) { l.blockSize = 8192; }, 39, "FUNCTION[650]"},
        SuperBlockFault{"ShiftTooSmall",
                        [](dvrimage::Layout& l) { l.blockSizeShift = 8, l.blockSize = 256, l.blockMask = 255; }, 39,
                        "FUNCTION[650]"},
        SuperBlockFault{"ShiftTooLarge",
                        [](dvrimage::Layout& l) {
                            l.blockSizeShift = 31, l.blockSize = 4096, l.blockMask = 4095, l.blockCount = 40000;
                        },
                        39, "FUNCTION[650]"}),
    [](const ::testing::TestParamInfo<SuperBlockFault>& info) { return std::string(info.param.name); });

TEST_F(VolumeOpenTest, HugeBlockTableIsRefusedWithoutAllocatingIt)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);
    const std::uint32_t count = 0xFFFFFFFFu;
    PatchSuperBlocks(image, path, 0x08, &count, sizeof count);
    Refingerprint(path);

    EXPECT_EQ(Open(path), 0);
    EXPECT_EQ(reader_.m_errorCode, 40);
    EXPECT_EQ(ErrorText(), "FUNCTION[925]");
}

TEST_F(VolumeOpenTest, HeaderSumFaultLeavesTheTextOfThePreviousFailure)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);
    image.Damage(Target::PrimarySuperBlock);
    image.Damage(Target::BackupSuperBlock);
    Refingerprint(path);

    EXPECT_EQ(reader_.BlockRead(nullptr, -1, nullptr, 1), -1);
    EXPECT_EQ(ErrorText(), "FUNCTION[1141]");
    EXPECT_EQ(Open(path), 0);
    EXPECT_EQ(reader_.m_errorCode, 33);
    EXPECT_EQ(ErrorText(), "FUNCTION[1141]");
}

TEST_F(VolumeOpenTest, SuperBlockOperationsOnTheOpenVolume)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);
    ASSERT_EQ(Open(path), 1);

    EXPECT_EQ(reader_.SuperBlockOpe(reader_.m_diskFile, 6, nullptr), 1);
    EXPECT_EQ(reader_.SuperBlockOpe(reader_.m_diskFile, 7, nullptr), 1);
    EXPECT_EQ(reader_.SuperBlockOpe(reader_.m_diskFile, 4, nullptr), 1);  // no such mode: nothing happens
    EXPECT_EQ(reader_.SuperBlockOpe(reader_.m_diskFile, 5, nullptr), 1);
    EXPECT_EQ(reader_.SuperBlockOpe(reader_.m_diskFile, 3, nullptr), 1);

    // Verifying a superblock whose only fault is its sum keeps the text.
    reader_.m_volume->superBlock.ReservedHeader[10] ^= 0x40;
    std::strcpy(reader_.m_errorText, "earlier");
    EXPECT_EQ(reader_.SuperBlockOpe(reader_.m_diskFile, 6, nullptr), -1);
    EXPECT_EQ(reader_.m_errorCode, 33);
    EXPECT_EQ(ErrorText(), "earlier");
}

TEST_F(VolumeOpenTest, MissingDeviceFailsWithoutTouchingTheRegister)
{
    EXPECT_EQ(Open(dir_ + "/no-such-disk"), 0);
    EXPECT_EQ(reader_.m_errorCode, 0);
    EXPECT_STREQ(reader_.m_errorText, "");
    ASSERT_NE(reader_.m_diskFile, nullptr);
    EXPECT_FALSE(reader_.m_diskFile->IsOpened());
    EXPECT_NE(reader_.m_volume, nullptr);
    EXPECT_NE(reader_.m_catalog, nullptr);
    reader_.CloseDVRFS();
    reader_.CloseDVRFS();
    EXPECT_EQ(reader_.m_diskFile, nullptr);
    EXPECT_EQ(reader_.m_volume, nullptr);
    EXPECT_NE(reader_.m_catalog, nullptr);
}

TEST_F(VolumeOpenTest, SecondOpenClosesTheFirstDeviceAndKeepsTheCatalogue)
{
    DiskImage first(SmallLayout());
    dvrimage::Layout otherLayout = SmallLayout();
    otherLayout.blockTableCount = 9;
    DiskImage second(otherLayout);
    const std::string a = WriteImage(first, "a.img");
    const std::string b = WriteImage(second, "b.img");

    ASSERT_EQ(Open(a), 1);
    RecordCatalog* catalog = reader_.m_catalog;
    const int filesWithA = OpenFileCount();
    ASSERT_EQ(Open(b), 1);
    EXPECT_EQ(OpenFileCount(), filesWithA);
    EXPECT_EQ(reader_.m_catalog, catalog);
    EXPECT_EQ(reader_.m_volume->superBlock.BlockTableCount, 9u);
}

TEST_F(VolumeOpenTest, ChecksumIsASignedByte)
{
    char abc[] = "abc";
    char high[] = {static_cast<char>(0x80)};
    EXPECT_EQ(reader_.Checksum(abc, 3), 0x60);
    EXPECT_EQ(reader_.Checksum(high, 1), -128);
    EXPECT_EQ(reader_.Checksum(abc, 0), 0);
    EXPECT_EQ(reader_.Checksum(abc, -5), 0);
}

TEST_F(VolumeOpenTest, CheckconfigReadsTheVersionOfSlotZero)
{
    EXPECT_EQ(reader_.Checkconfig(), -1);
    EXPECT_EQ(reader_.m_errorCode, 38);

    dvrimage::Layout configured = SmallLayout();
    configured.version = 7;
    configured.adapterRuns = {{5, 1}};  // slot 0 is not a valid adapter, its version still counts
    DiskImage a(configured);
    dvrimage::Layout unconfigured = SmallLayout();
    unconfigured.version = 0;
    DiskImage b(unconfigured);
    const std::string pathA = WriteImage(a, "a.img");
    const std::string pathB = WriteImage(b, "b.img");

    ASSERT_EQ(Open(pathA), 1);
    EXPECT_EQ(reader_.Checkconfig(), 7);
    ASSERT_EQ(Open(pathB), 1);
    EXPECT_EQ(reader_.Checkconfig(), 0);
}

TEST_F(VolumeOpenTest, GetInfoReportsTheCurrentAdapter)
{
    dvrimage::Layout layout = SmallLayout();
    layout.dataBlockMax = 200;
    layout.listMax = 32;
    DiskImage image(layout);
    image.Add(GeneratedRecording(3, 10, 20, 1000, 2000, 200, 1, 100));
    image.Add(GeneratedRecording(4, 30, 50, 3000, 4000, 200, 1, 100));
    const std::string path = WriteImage(image);

    ASSERT_EQ(Open(path), 1);
    EXPECT_EQ(reader_.GetInfo(1), -1);  // no adapter yet
    EXPECT_EQ(reader_.m_errorCode, 38);
    ASSERT_EQ(reader_.BlockOpe(reader_.m_diskFile, 2, nullptr, 0, 0), 1);
    EXPECT_EQ(reader_.GetInfo(1), 3);
    EXPECT_EQ(reader_.GetInfo(3), 10);
    EXPECT_EQ(reader_.GetInfo(17), 4);
    EXPECT_EQ(reader_.GetInfo(19), 50 * 7 + 3);
    EXPECT_EQ(reader_.GetInfo(33), 32);
    EXPECT_EQ(reader_.GetInfo(35), 200);
    EXPECT_EQ(reader_.GetInfo(49), 25);
    EXPECT_EQ(reader_.GetInfo(50), 1000);
    EXPECT_EQ(reader_.GetInfo(2), -1);
    EXPECT_EQ(reader_.GetInfo(0), -1);

    // Once the data ring has wrapped, 100 is added.
    reader_.m_volume->adapter->FirstList.StartBlock = 60;
    EXPECT_EQ(reader_.GetInfo(49), 125);
}

TEST_F(VolumeOpenTest, FillLevelOfAnEmptyDataRingIsRefusedNotDividedByZero)
{
    dvrimage::Layout layout = SmallLayout();
    layout.dataBlockMax = 0;
    DiskImage image(layout);
    const std::string path = WriteImage(image);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(reader_.GetInfo(35), 0);
    EXPECT_EQ(reader_.GetInfo(49), -1);
    EXPECT_EQ(reader_.m_errorCode, 84);
    EXPECT_EQ(ErrorText(), "FUNCTION[1540]");
}

}  // namespace
