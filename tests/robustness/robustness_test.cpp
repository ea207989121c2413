// A hostile or failing disk: bounded work on the worst disks the writer can
// make, and a medium that fails under the reader.
#include <sys/resource.h>

#include <cstdio>
#include <filesystem>

#include "catalog/catalog_reader.h"
#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"
#include "tools/dvrfs/disk_check.h"

namespace {

using dvrimage::DiskImage;
using dvrimage::GeneratedRecording;
using dvrimage::Layout;

long PeakMemoryKiB()
{
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
}

class RobustnessTest : public DiskTest {
protected:
    // Six recordings, list positions 0 to 5, one data block each.
    std::string WriteSixRecordings()
    {
        std::vector<dvrimage::Recording> recordings;
        for (int i = 0; i < 6; ++i)
            recordings.push_back(GeneratedRecording(i, i, i, 100 * i, 100 * i + 50, 8, 1, 16));
        return WriteDisk(SmallLayout(), recordings);
    }
};

// The worst list the writer can make: a ring of the largest size the reader
// takes, the span covering all of it, every entry but the first unreadable in
// both copies.
TEST_F(RobustnessTest, LargestListRingFullOfDamageCostsABoundedNumberOfReads)
{
    Layout layout = SmallLayout();
    layout.listMax = kMaxListMax;
    layout.adapterRuns = {{0, 120}};
    layout.firstListIdx = 0;
    layout.lastListIdx = kMaxListMax - 1;
    const std::string path = WriteDisk(layout, {GeneratedRecording(0, 0, 0, 100, 200, 8, 1, 16)});

    iotrace::KeepReads(false);
    const long memoryBefore = PeakMemoryKiB();
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);
    const std::size_t buildReads = iotrace::ReadCount(path);
    EXPECT_EQ(reader_.m_recordCount, 1);
    EXPECT_EQ(reader_.ErrorCode(), 50);

    iotrace::Reset();
    iotrace::KeepReads(false);
    CatalogReader verifier;
    const dvrfstool::VerifyResult verified =
        dvrfstool::VerifyDisk(verifier, path, [](const std::string&) {});
    const std::size_t verifyReads = iotrace::ReadCount(path);
    const long memoryAfter = PeakMemoryKiB();

    // Build: superblocks, 241 adapter slots, the refresh's two reads (ring and
    // mirror) of every entry, a few records, then the catalogue's walk.
    EXPECT_LE(buildReads, 2u * kMaxListMax + 300);
    // Verify: the search's refresh, then the two copies of every entry of the
    // span as the disk gives it, the slots, one recording.
    EXPECT_LE(verifyReads, 4u * kMaxListMax + 600);
    EXPECT_EQ(verified.damaged, 0);  // blank entries: never written, not damaged
    EXPECT_EQ(verified.unwritten, kMaxListMax - 1);
    EXPECT_EQ(reader_.m_unwrittenPositions.size(), static_cast<std::size_t>(kMaxListMax - 1));
#ifndef __SANITIZE_ADDRESS__
    // (AddressSanitizer holds freed memory back in quarantine, so its peak
    // says nothing of what the reader keeps.)
    EXPECT_LT(memoryAfter - memoryBefore, 16 * 1024);
#endif
    std::printf("[ figures  ] list ring of %d entries, all but one damaged: build %zu reads, verify %zu reads, "
                "peak memory +%ld KiB\n",
                kMaxListMax, buildReads, verifyReads, memoryAfter - memoryBefore);
}

// The worst data ring walk: the newest recording claims a ring of 2^20 blocks
// whose headers are all missing, so the refresh's backward search tries them
// all, once each, and then lists the recording as one whose newest block is
// unreadable.
TEST_F(RobustnessTest, NewestRecordingWithoutAnyHeaderIsSearchedOnceRoundTheRing)
{
    Layout layout = SmallLayout();
    layout.dataBlockMax = 1 << 20;
    layout.blockSizeShift = 20;  // 1 MiB blocks: the ring needs 16 TiB of block space
    layout.imageSize = 1ull << 30;
    layout.firstListIdx = 0;
    layout.lastListIdx = 0;
    DiskImage image(layout);
    const std::string path = WriteImage(image);
    const dvrimage::ListEntryBytes entry = image.MakeListEntry(0, 1, 0, 100, 200);  // 1 .. 0: the whole ring
    image.WriteLogical(image.ListOffset(), entry.data(), entry.size());
    image.WriteLogical(image.ListOffsetBackup(), entry.data(), entry.size());
    Refingerprint(path);

    iotrace::KeepReads(false);
    EXPECT_EQ(Build(path), CatalogBuild::kBuilt);
    EXPECT_EQ(reader_.m_newestBlockUnreadableRow, 0);
    const std::size_t reads = iotrace::ReadCount(path);
    EXPECT_LE(reads, (1u << 20) + 400);
    std::printf("[ figures  ] data ring of %d blocks without headers: build gave up after %zu reads\n", 1 << 20,
                reads);
}

// The newest recording is one sound block without a frame in a ring of 2^20
// blocks: each stream call goes round that block a bounded number of times,
// not twice the ring's size, before it says the walk found no frame.
TEST_F(RobustnessTest, EmptyBlockInAHugeRingCostsABoundedWalk)
{
    Layout layout = SmallLayout();
    layout.dataBlockMax = 1 << 20;
    layout.blockSizeShift = 20;
    layout.imageSize = 1ull << 30;
    layout.adapterRecordsFrame = false;
    const std::string path = WriteDisk(layout, {GeneratedRecording(0, 5, 5, 100, 200, 1 << 20, 0, 64)});
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);

    iotrace::KeepReads(false);
    iotrace::Reset();
    std::vector<unsigned char> payload(64);
    _HisiHeader_t header{};
    const _HisiAdapter_t adapter = *reader_.Adapter();
    for (int direction : {1, 0}) {
        reader_.SetStreamCursor(5, direction ? 0 : -1);
        EXPECT_EQ(reader_.NextFrame(payload.data(), &header, adapter.FirstList, adapter.LastList, direction), -1);
        EXPECT_EQ(reader_.ErrorCode(), kErrNoFrame);
    }
    EXPECT_LE(iotrace::ReadCount(path), 2u * 3 * 4096 + 16);  // a header and a list entry a step, each way
}

// 2^17 recordings, each claiming the whole data ring of 2^16 blocks (none of
// them written): verify checks each block once, and walks no recording's
// blocks again, so it costs the list span plus the ring, not their product.
TEST_F(RobustnessTest, ManyRecordingsClaimingTheWholeRingAreVerifiedBlockByBlockOnce)
{
    constexpr int kEntries = 1 << 17;
    constexpr int kRing = 1 << 16;
    Layout layout = SmallLayout();
    layout.listMax = kEntries;
    layout.dataBlockMax = kRing;
    DiskImage image(layout);
    for (int i = 0; i < kEntries; ++i) {
        dvrimage::Recording r;  // the list entry alone
        r.listIdx = i;
        r.endBlock = kRing - 1;
        image.Add(std::move(r));
    }
    const std::string path = WriteImage(image);

    iotrace::KeepReads(false);
    long long headers = 0;
    const dvrfstool::VerifyResult verified =
        dvrfstool::VerifyDisk(reader_, path, [&headers](const std::string& line) {
            headers += line.find(" header") != std::string::npos;
        });
    EXPECT_EQ(verified.stage, dvrfstool::VerifyStage::kComplete);
    EXPECT_EQ(headers, kRing);  // every block reported once: none of them was written
    // The refresh and the verification each read both copies of the span's
    // entries; the refresh's search and the verification each read the ring's headers.
    EXPECT_LE(iotrace::ReadCount(path), 4u * kEntries + 2u * kRing + 600);
}

TEST_F(RobustnessTest, ImageEndingInTheMiddleOfTheListStopsTheCatalogueThere)
{
    const std::string path = WriteSixRecordings();
    // Cut the file in the middle of list entry 3 (and so before its mirror and
    // the data blocks).
    std::filesystem::resize_file(path, image_->PhysicalOffset(image_->ListOffset() + 3 * 128 + 60));
    Refingerprint(path);

    // Entries 0 to 2 read; the newest of them has its data block beyond the
    // end: the three are listed, the newest marked, the three entries past
    // the cut damaged (not blank: their bytes are not there), and the image
    // is said to be cut short.
    EXPECT_EQ(Build(path), CatalogBuild::kBuilt);
    EXPECT_EQ(reader_.ErrorCode(), kErrBlockHeader);
    EXPECT_EQ(reader_.m_recordCount, 3);
    EXPECT_EQ(reader_.m_newestBlockUnreadableRow, 2);
    EXPECT_EQ(reader_.m_skippedPositions, (std::vector<std::int32_t>{3, 4, 5}));
    EXPECT_TRUE(reader_.m_unwrittenPositions.empty());
    EXPECT_TRUE(reader_.Status().Truncated());
}

TEST_F(RobustnessTest, UnreadableSectorCostsTheEntriesInItAndSaysSo)
{
    const std::string path = WriteSixRecordings();
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);
    ASSERT_EQ(reader_.m_recordCount, 6);

    // The sector of entries 4 and 5, in the ring and in the mirror, fails
    // from now on: the next build lists entries 0 to 3 and names 4 and 5.
    for (std::uint64_t ring : {image_->ListOffset(), image_->ListOffsetBackup()})
        iotrace::FailReads(path, static_cast<std::int64_t>(image_->PhysicalOffset(ring + 4 * 128)), 1);
    EXPECT_EQ(Build(path), CatalogBuild::kBuilt);
    EXPECT_EQ(reader_.m_recordCount, 4);
    EXPECT_EQ(reader_.m_skippedPositions, (std::vector<std::int32_t>{4, 5}));
    EXPECT_EQ(reader_.ErrorCode(), 50);
    EXPECT_STREQ(reader_.ErrorText(), "FUNCTION[1463]");
}

TEST_F(RobustnessTest, DiskThatDisappearsFailsTheReadsAndTheNextBuild)
{
    const std::string path = WriteSixRecordings();
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);

    // The disk goes away under the open handle: every read now finds nothing.
    std::filesystem::resize_file(path, 0);
    std::filesystem::remove(path);
    Refingerprint(path);
    reader_.SetStreamCursor(0, 0);
    std::vector<unsigned char> payload(16);
    _HisiHeader_t header{};
    const _HisiAdapter_t adapter = *reader_.Adapter();
    EXPECT_EQ(reader_.get_stream(nullptr, payload.data(), &header, adapter.FirstList, adapter.LastList, 1),
              -1);
    EXPECT_EQ(reader_.ErrorCode(), 52);

    EXPECT_EQ(Build(path), CatalogBuild::kNotOpened);
    EXPECT_EQ(reader_.m_recordCount, 0);
}

}  // namespace
