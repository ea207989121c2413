// The catalogue build: the list ring walked from the oldest to the newest
// recording into at most 8192 entries with their UTC texts.
#include <cerrno>
#include <numeric>
#include <string>
#include <vector>

#include "catalog/build_summary.h"
#include "catalog/catalog_reader.h"
#include "tests/support/disk_fixture.h"
#include "tests/support/time_zone.h"
#include "tools/dvrfs/disk_check.h"

namespace {

using dvrimage::GeneratedRecording;
using dvrimage::Layout;
using dvrimage::Recording;
using dvrimage::Target;

// A recording whose list entry is all there is of it; the newest recording
// of a disk also needs its data block, for the adapter refresh.
Recording EntryOnly(std::int32_t listIdx, std::uint32_t startTime, std::uint32_t endTime)
{
    Recording r = GeneratedRecording(listIdx, 0, 0, startTime, endTime, 8, 1, 16);
    r.blocks.clear();
    return r;
}

class CatalogBuildTest : public DiskTest {
protected:
    // A disk whose recordings sit at these list positions, oldest first.
    std::string WriteListed(const std::vector<int>& positions, const Layout& layout = SmallLayout(),
                            const std::string& name = "disk.img")
    {
        std::vector<Recording> recordings;
        for (std::size_t i = 0; i < positions.size(); ++i) {
            const std::uint32_t start = 1000 * static_cast<std::uint32_t>(positions[i]);
            recordings.push_back(i + 1 == positions.size() ? GeneratedRecording(positions[i], 0, 0, start, start + 500,
                                                                                layout.dataBlockMax, 1, 16)
                                                           : EntryOnly(positions[i], start, start + 500));
        }
        return WriteDisk(layout, recordings, {}, name);
    }

    std::vector<int> Indices() const
    {
        std::vector<int> indices;
        for (int i = 0; i < reader_.m_recordCount; ++i)
            indices.push_back(reader_.Catalog()->Entries[i].Idx);
        return indices;
    }
};

// The span from the oldest to the newest, around the end of the ring, of at
// most 8192 rows.
TEST_F(CatalogBuildTest, SpanIsReadFromTheOldestAroundTheRingToTheNewest)
{
    std::vector<int> many(9000);
    std::iota(many.begin(), many.end(), 0);
    const struct {
        int listMax;
        std::vector<int> positions;
        int rows, spanCount;
    } cases[] = {{10, {5, 6, 7, 8, 9, 0, 1, 2}, 8, 8}, {16, {4}, 1, 1}, {9000, many, 8192, 9000}};
    for (const auto& c : cases) {
        Layout layout = SmallLayout();
        layout.listMax = c.listMax;
        ASSERT_EQ(Build(WriteListed(c.positions, layout, std::to_string(c.listMax) + ".img")), CatalogBuild::kBuilt);
        const std::vector<int> rows(c.positions.begin(), c.positions.begin() + c.rows);
        EXPECT_EQ(Indices(), rows);
        EXPECT_EQ(reader_.Catalog()->SpanCount, c.spanCount);
        EXPECT_EQ(reader_.Catalog()->Entries[0].StartTime, 1000 * c.positions[0]);
        EXPECT_EQ(reader_.Catalog()->Entries[c.rows - 1].EndTime, 1000 * c.positions[c.rows - 1] + 500);
        if (c.rows < 8192) {
            EXPECT_EQ(reader_.Catalog()->Entries[c.rows].Idx, -1);
        }
    }
}

struct DamagedListCase {
    const char* name;
    std::vector<int> damagedBoth;        // list positions damaged in ring and mirror
    std::vector<int> damagedRing;        // damaged in the ring only: repaired from the mirror
    std::vector<int> rows;               // the Idx of each row, in order
    std::vector<std::int32_t> skipped;
    int spanCount;
};

class DamagedListTest : public CatalogBuildTest, public ::testing::WithParamInterface<DamagedListCase> {};

// Twelve recordings, each in a data block of its own. An entry unreadable in
// both copies costs its own row only, wherever it lies in the span, and is
// named among the skipped positions; the rows after it keep their entries.
TEST_P(DamagedListTest, DamagedEntryCostsOnlyItsOwnRow)
{
    Layout layout = SmallLayout();
    layout.dataBlockMax = 16;
    std::vector<Recording> recordings;
    for (int i = 0; i < 12; ++i)
        recordings.push_back(GeneratedRecording(i, i, i, 1000 * i, 1000 * i + 500, 16, 2, 64));
    std::vector<Damage> damage;
    for (int p : GetParam().damagedBoth)
        damage.insert(damage.end(), {{Target::ListEntry, p}, {Target::ListMirror, p}});
    for (int p : GetParam().damagedRing)
        damage.push_back({Target::ListEntry, p});
    const std::string path = WriteDisk(layout, recordings, damage);

    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);
    EXPECT_EQ(Indices(), GetParam().rows);
    EXPECT_EQ(reader_.m_skippedPositions, GetParam().skipped);
    EXPECT_EQ(reader_.Catalog()->SpanCount, GetParam().spanCount);
    EXPECT_EQ(reader_.ErrorCode(), 50);

    // Each row plays and extracts its own entry's recording.
    for (int row = 0; row < reader_.m_recordCount; ++row) {
        const int idx = GetParam().rows[static_cast<std::size_t>(row)];
        _HisiList_t recording{};
        ASSERT_TRUE(dvrfstool::RecordingOfRow(reader_, row, &recording));
        EXPECT_EQ(recording.Idx, idx);
        std::vector<std::uint8_t> expected = dvrimage::PatternPayload(idx, 0, 64);
        const std::vector<std::uint8_t> second = dvrimage::PatternPayload(idx, 1, 64);
        expected.insert(expected.end(), second.begin(), second.end());
        EXPECT_EQ(Extracted(reader_, recording), expected) << "row " << row;
    }
}

INSTANTIATE_TEST_SUITE_P(
    Lists, DamagedListTest,
    ::testing::Values(DamagedListCase{"ThirdAndSeventh", {2, 6}, {4}, {0, 1, 3, 4, 5, 7, 8, 9, 10, 11}, {2, 6}, 12},
                      DamagedListCase{"OldestAndNewest", {0, 11}, {}, {1, 2, 3, 4, 5, 6, 7, 8, 9, 10}, {0, 11}, 10}),
    CaseName<DamagedListCase>);

struct OddAdapterCase {
    const char* name;
    void (*change)(Layout&);
};

class OddAdapterTest : public CatalogBuildTest, public ::testing::WithParamInterface<OddAdapterCase> {};

// Adapters whose declared rings reach past the disk, or whose newest position
// lies past the end of the list ring: what they describe can be read, so the
// recordings are listed.
TEST_P(OddAdapterTest, RecordingsThatCanBeReadAreListed)
{
    Layout layout = SmallLayout();
    layout.blockCount = 40000;
    GetParam().change(layout);
    const std::string path = WriteListed({0, 1}, layout);
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);
    EXPECT_EQ(Indices(), (std::vector<int>{0, 1}));
}

INSTANTIATE_TEST_SUITE_P(
    Adapters, OddAdapterTest,
    ::testing::Values(
        OddAdapterCase{"DataRingLargerThanTheDisk", [](Layout& l) { l.dataBlockMax = 10; }},
        OddAdapterCase{"MirrorBeyondTheDisk",
                       [](Layout& l) { l.listOffsetBackup = 40000ull * 4096, l.dataBlockOffset = 1 << 20; }},
        OddAdapterCase{"NewestPositionBeyondTheRing", [](Layout& l) { l.lastListIdx = 16 + 1; }}),
    CaseName<OddAdapterCase>);

TEST_F(CatalogBuildTest, NewestBelowZeroAndBelowTheOldestCountsAsWrapped)
{
    const std::string path = WriteListed({3, 4, 5});  // a ring of 16
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);
    reader_.MutableAdapter()->LastList.Idx = -2;  // -2 + 16 = 14: read from 3 until the first unreadable
    reader_.Setplaylist();
    EXPECT_EQ(Indices(), (std::vector<int>{3, 4, 5}));
    EXPECT_EQ(reader_.Catalog()->SpanCount, 12);

    reader_.MutableAdapter()->LastList.Idx = -20;  // still below the oldest: nothing, and no span
    reader_.MutableCatalog()->SpanCount = 77;
    reader_.Setplaylist();
    EXPECT_EQ(reader_.m_recordCount, 0);
    EXPECT_EQ(reader_.Catalog()->SpanCount, 77);
    EXPECT_EQ(reader_.Catalog()->Entries[0].Idx, -1);
}

// What the panel's status line says of a build, in plain words (the failures
// to open are said the same way by dvrfs: its command-line test checks them).
TEST_F(CatalogBuildTest, BuildIsDescribedInPlainWords)
{
    TimeZone utc("UTC");
    std::vector<Damage> all;
    for (int p : {0, 1, 2})
        all.insert(all.end(), {{Target::ListEntry, p}, {Target::ListMirror, p}});
    const struct {
        std::vector<Damage> damage;
        std::string summary;
    } cases[] = {
        {{{Target::PrimarySuperBlock}, {Target::ListEntry, 1}, {Target::ListMirror, 1}},
         "2 recordings, 2023-11-14 22:13 to 2023-11-15 01:01 (local time); 1 damaged entry skipped; "
         "primary superblock damaged, backup used"},
        {{{Target::PrimaryBlockTable}, {Target::BackupBlockTable}}, "not a recorder disk (both block tables damaged)"},
        {{{Target::PrimaryBlockTable}, {Target::BackupSuperBlock}},
         "not a recorder disk (primary block table and backup superblock damaged)"},
        {{{Target::PrimarySuperBlock}, {Target::BackupBlockTable}},
         "not a recorder disk (primary superblock and backup block table damaged)"},
        {{{Target::BlockHeader, 2}},
         "3 recordings, 2023-11-14 22:13 to 2023-11-15 01:01 (local time); "
         "the newest recording's newest block is unreadable"},
        {all, "no recording entry can be read (3 entries damaged)"},
    };
    int n = 0;
    for (const auto& c : cases) {
        const std::string path = WriteDisk(SmallLayout(),
                                           {GeneratedRecording(0, 0, 0, 1700000000, 1700000600, 8, 1, 16),
                                            GeneratedRecording(1, 1, 1, 1700003600, 1700007200, 8, 1, 16),
                                            GeneratedRecording(2, 2, 2, 1700010000, 1700010100, 8, 1, 16)},
                                           c.damage, std::to_string(n++) + ".img");
        Build(path);
        EXPECT_EQ(DescribeBuild(reader_), c.summary);
    }
}

// Failures no image writer makes, said from the open's status alone.
TEST(DescribeFailureTest, EachStageInItsOwnWords)
{
    using dvrfs::OpenStage;
    using dvrfs::VolumeStatus;
    auto status = [](OpenStage stage, void (*change)(VolumeStatus&)) {
        VolumeStatus s;
        s.stage = stage;
        s.sourceSize = 600000;
        s.listRingSize = 16;
        change(s);
        return s;
    };
    const struct {
        const char* name;
        VolumeStatus status;
        std::string words;
    } cases[] = {
        {"NoPermission", status(OpenStage::kSource, [](VolumeStatus& s) { s.systemError = EACCES; }),
         "cannot open: Permission denied \u2014 reading a raw disk needs membership of the disk group"},
        {"ImageOfAKnownKind", status(OpenStage::kSource, [](VolumeStatus& s) { s.detail = "the first piece cannot be read"; }),
         "cannot open the image: the first piece cannot be read"},
        {"Folder", status(OpenStage::kSource, [](VolumeStatus& s) { s.systemError = EISDIR; }),
         "cannot read: Is a directory"},
        {"EmptyImage", status(OpenStage::kSuperBlock, [](VolumeStatus& s) { s.sourceSize = 0; }),
         "not a recorder disk (the image is empty)"},
        {"ImpossibleLayout",
         status(OpenStage::kSuperBlock, [](VolumeStatus& s) { s.backup = dvrfs::CopyState::kImpossibleLayout; }),
         "not a recorder disk (its superblock describes an impossible layout)"},
        {"RingsTooLarge", status(OpenStage::kAdapter, [](VolumeStatus& s) { s.code = kErrAdapterRings; }),
         "the recorder's rings are larger than this reader accepts (list ring above 1,048,576 entries or data "
         "ring above 4,194,304 blocks)"},
        {"NoAdapterOfATruncatedImage", status(OpenStage::kAdapter, [](VolumeStatus& s) { s.claimedSize = 136000000; }),
         "no valid state record of the recorder found; the image is 600 KB but the disk it holds is 136 MB: "
         "truncated?"},
        {"EmptyListRing", status(OpenStage::kRefresh, [](VolumeStatus& s) { s.listRingSize = 0; }),
         "no recording entry can be read (the list ring holds no entry)"},
        {"DamagedAndBlankEntries",
         status(OpenStage::kRefresh, [](VolumeStatus& s) { s.damagedEntries = 1, s.unwrittenEntries = 2; }),
         "no recording entry can be read (1 entry damaged, 2 entries never written)"},
        {"DeviceOfUnknownSize",
         status(OpenStage::kConfiguration, [](VolumeStatus& s) { s.device = true, s.sourceSize = 0, s.claimedSize = 9; }),
         "no recorder was ever configured on this disk"},
        {"Ready", status(OpenStage::kReady, [](VolumeStatus&) {}), ""},
    };
    for (const auto& c : cases)
        EXPECT_EQ(dvrfs::DescribeFailure(c.status), c.words) << c.name;
}

}  // namespace

namespace {

// Skipped positions are said as runs, and a long list is cut with its count.
TEST(PositionsTextTest, RunsThenHowManyInAll)
{
    EXPECT_EQ(PositionsText({}), "");
    EXPECT_EQ(PositionsText({2, 6}), "2, 6");
    EXPECT_EQ(PositionsText({4, 5, 6, 9}), "4-6, 9");
    EXPECT_EQ(PositionsText({1, 3, 5, 7}, 2), "1, 3, ... (4 in all)");
}

}  // namespace
