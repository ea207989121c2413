// Finding the current adapter in its ring, refreshing it from the list ring
// and the data ring, and its dump.
#include <climits>
#include <vector>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"

namespace {

using dvrimage::GeneratedRecording;
using dvrimage::Layout;
using dvrimage::SlotRun;
using dvrimage::Target;

struct SearchCase {
    const char* name;
    std::vector<SlotRun> runs;
    int chosen;  // -1: none
    std::size_t reads = 0;  // slot reads of the search; 0: not checked
};

class AdapterSearchTest : public DiskTest, public ::testing::WithParamInterface<SearchCase> {};

TEST_P(AdapterSearchTest, ChoosesTheEndOfTheFirstRunOfValidSlots)
{
    Layout layout = SmallLayout();
    layout.adapterRuns = GetParam().runs;
    const std::string path = WriteDisk(layout, {});
    ASSERT_EQ(Open(path), 1);
    iotrace::Reset();

    const bool found = GetParam().chosen >= 0;
    ASSERT_EQ(reader_.BlockOpe(nullptr, 2, nullptr, 0, 0), found ? 1 : -1);
    if (GetParam().reads > 0) {
        EXPECT_EQ(iotrace::Reads(path).size(), GetParam().reads);
    }
    if (found) {
        EXPECT_EQ(Adapter().Idx, GetParam().chosen);
        EXPECT_EQ(reader_.ErrorCode(), 0);
    } else {
        EXPECT_EQ(reader_.ErrorCode(), 36);
        EXPECT_EQ(reader_.Adapter(), nullptr);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Runs, AdapterSearchTest,
    ::testing::Values(SearchCase{"FromSlotZero", {{0, 50}}, 49},
                      SearchCase{"AcrossTheEndOfTheRing", {{70, 60}}, 9},
                      SearchCase{"AllSlotsInAtMost241Reads", {{0, 120}}, 119, 241},
                      SearchCase{"TwoRuns", {{5, 5}, {20, 10}}, 9},
                      SearchCase{"OnlyTheLastSlot", {{119, 1}}, 119},
                      // Slot 0, slot 1, slot 0 again; no recordings, so no list read.
                      SearchCase{"OnlySlotZeroNeedsNoListRead", {{0, 1}}, 0, 3},
                      SearchCase{"NoneValid", {}, -1}),
    CaseName<SearchCase>);

class AdapterTest : public DiskTest {};

TEST_F(AdapterTest, AdapterWhoseRingsAreLargerThanAnyRecordersIsRefused)
{
    Layout list = SmallLayout();
    list.listMax = (1 << 20) + 1, list.blockCount = 1 << 30, list.imageSize = 1 << 30;
    Layout data = SmallLayout();
    data.dataBlockMax = (1 << 22) + 1, data.blockCount = INT_MAX, data.blockSizeShift = 20, data.imageSize = 1 << 30;
    for (const Layout& layout : {list, data}) {
        EXPECT_EQ(OpenAndSearch(WriteDisk(layout, {}, {}, std::to_string(layout.listMax) + ".img")), -1);
        EXPECT_EQ(reader_.ErrorCode(), 82);
        EXPECT_EQ(ErrorText(), "FUNCTION[1250]");
        EXPECT_EQ(reader_.Adapter(), nullptr);
    }
}

TEST_F(AdapterTest, EmptyRingsAreAcceptedAndNothingDividesByThem)
{
    Layout layout = SmallLayout();
    layout.listMax = 0;
    layout.dataBlockMax = 0;
    layout.firstListIdx = 3;
    layout.lastListIdx = 2;  // claims recordings in a ring of none
    EXPECT_EQ(OpenAndSearch(WriteDisk(layout, {})), -1);  // the refresh cannot read an entry of an empty ring
    EXPECT_EQ(reader_.ErrorCode(), 65);                   // and so finds no oldest entry to read
    ASSERT_NE(reader_.Adapter(), nullptr);
    _HisiHeader_t header{};
    std::vector<unsigned char> payload(16);
    reader_.SetStreamCursor(5, 0);
    for (const auto& [direction, code] : {std::pair{1, 70}, std::pair{0, 65}}) {
        EXPECT_EQ(reader_.get_stream(nullptr, payload.data(), &header, Adapter().FirstList,
                                     Adapter().LastList, direction),
                  -1);
        EXPECT_EQ(reader_.ErrorCode(), code);
    }
}

// Positions repeat around the ring: the span is walked one turn, and the
// newest is the last readable position of its final turn (20 % 16 = 4, then
// back to 2).
TEST_F(AdapterTest, ListSpanLongerThanTheRingIsWalkedOneTurn)
{
    Layout layout = SmallLayout();
    layout.firstListIdx = 0;
    layout.lastListIdx = 20;  // ListMax is 16
    std::vector<dvrimage::Recording> recordings;
    for (int i = 0; i < 3; ++i)
        recordings.push_back(GeneratedRecording(i, i, i, 100 * (i + 1), 100 * (i + 1) + 50, 8));
    const std::string path = WriteDisk(layout, recordings);
    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().FirstList.Idx, 0);
    EXPECT_EQ(Adapter().LastList.Idx, 2);
    iotrace::Reset();
    EXPECT_EQ(reader_.BlockOpe(nullptr, 35, nullptr, 0, INT_MAX), 1);
    EXPECT_EQ(Adapter().LastList.Idx, 2);
    EXPECT_LE(iotrace::Reads(path).size(), 2u * 16 + 4);  // both copies of one turn, a few records
}

struct Listed {
    int position, block;
    std::uint32_t start, end;
};

struct RefreshCase {
    const char* name;
    std::vector<Listed> recordings;
    std::vector<std::int32_t> damagedInBothCopies;
    int result;
    std::int32_t code;
    int oldest, newest, newestBlock;
    std::uint32_t start, end;
};

class RefreshTest : public DiskTest, public ::testing::WithParamInterface<RefreshCase> {};

// The refresh takes the oldest and newest readable entries of the span, the
// earliest start and latest end among the readable ones, and names the
// positions it could not read.
TEST_P(RefreshTest, SpanRunsFromTheOldestToTheNewestReadableEntry)
{
    const RefreshCase& c = GetParam();
    Layout layout = SmallLayout();
    layout.startTime = 5;  // a stale summary that the refresh replaces
    layout.endTime = 6;
    std::vector<dvrimage::Recording> recordings;
    for (const Listed& r : c.recordings)
        recordings.push_back(GeneratedRecording(r.position, r.block, r.block, r.start, r.end, 8));
    std::vector<Damage> damage;
    for (std::int32_t position : c.damagedInBothCopies)
        damage.insert(damage.end(), {{Target::ListEntry, position}, {Target::ListMirror, position}});

    EXPECT_EQ(OpenAndSearch(WriteDisk(layout, recordings, damage)), c.result);
    EXPECT_EQ(reader_.ErrorCode(), c.code);
    ASSERT_NE(reader_.Adapter(), nullptr);  // installed before the refresh
    if (c.result < 0)
        return;
    EXPECT_EQ(Adapter().FirstList.Idx, c.oldest);
    EXPECT_EQ(Adapter().LastList.Idx, c.newest);
    EXPECT_EQ(Adapter().LastList.EndBlock, c.newestBlock);  // the entry itself, read again from the disk
    EXPECT_EQ(Adapter().CurBlockHeader.BlockIdx, c.newestBlock);
    EXPECT_EQ(Adapter().StartTime, c.start);
    EXPECT_EQ(Adapter().EndTime, c.end);
    EXPECT_EQ(reader_.Volume()->unreadableListPositions, c.damagedInBothCopies);
}

INSTANTIATE_TEST_SUITE_P(
    Spans, RefreshTest,
    ::testing::Values(
        RefreshCase{"EarliestStartLatestEnd", {{0, 0, 300, 400}, {1, 1, 100, 900}, {2, 2, 200, 500}}, {}, 1, 0, 0, 2,
                    2, 100, 900},
        RefreshCase{"PassesOverUnreadableEntries",
                    {{0, 0, 100, 150}, {1, 1, 200, 250}, {2, 2, 300, 350}, {3, 3, 400, 450}, {4, 4, 500, 550},
                     {5, 5, 600, 650}},
                    {0, 2, 5}, 1, 50, 1, 4, 4, 200, 550},
        RefreshCase{"AcrossTheEndOfTheListRing",
                    {{14, 0, 1000, 1050}, {15, 1, 1100, 1150}, {0, 2, 1200, 1250}, {1, 3, 1300, 1350}},
                    {1}, 1, 50, 14, 0, 2, 1000, 1250},
        // The oldest readable entry is none: position -1.
        RefreshCase{"NoReadableEntry", {{0, 0, 100, 200}}, {0}, -1, 65, 0, 0, 0, 0, 0}),
    CaseName<RefreshCase>);

struct NewestHeaderCase {
    const char* name;
    std::vector<int> damagedHeaders;
    int newestBlock;  // as the refresh leaves it
    bool unreadable;  // no header of the newest recording reads
};

class NewestHeaderTest : public DiskTest, public ::testing::WithParamInterface<NewestHeaderCase> {};

// The newest recording runs from block 190 across the end of a ring of 200
// blocks to block 5; a damaged last header gives way to the newest readable
// one. With none readable the volume still opens: the other recording is
// there, and the newest is listed and marked.
TEST_P(NewestHeaderTest, DamagedLastHeaderIsReplacedByTheNewestReadableOne)
{
    Layout layout = SmallLayout();
    layout.dataBlockMax = 200;
    std::vector<Damage> damage;
    for (int block : GetParam().damagedHeaders)
        damage.push_back({Target::BlockHeader, block});
    ASSERT_EQ(Build(WriteDisk(layout,
                              {GeneratedRecording(0, 100, 110, 1000, 2000, 200, 1, 64),
                               GeneratedRecording(1, 190, 5, 3000, 4000, 200, 1, 64)},
                              damage)),
              CatalogBuild::kBuilt);
    EXPECT_EQ(reader_.ErrorCode(), kErrBlockHeader);
    EXPECT_EQ(reader_.m_recordCount, 2);
    EXPECT_EQ(Adapter().LastList.EndBlock, GetParam().newestBlock);
    EXPECT_EQ(reader_.Status().newestBlockUnreadable, GetParam().unreadable);
    EXPECT_EQ(reader_.m_newestBlockUnreadableRow, GetParam().unreadable ? 1 : -1);
    if (!GetParam().unreadable) {
        EXPECT_EQ(Adapter().CurBlockHeader.BlockIdx, GetParam().newestBlock);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Headers, NewestHeaderTest,
    ::testing::Values(NewestHeaderCase{"ThreeDamaged", {5, 4, 3}, 2, false},
                      NewestHeaderCase{"BackAcrossTheStartOfTheRing", {5, 4, 3, 2, 1, 0}, 199, false},
                      NewestHeaderCase{"NoneReadable",
                                       {190, 191, 192, 193, 194, 195, 196, 197, 198, 199, 0, 1, 2, 3, 4, 5}, 5, true}),
    CaseName<NewestHeaderCase>);

// The newest block's header reads but none of its frames does: the block is
// unreadable, and the recording's frames before it still extract.
TEST_F(AdapterTest, NewestBlockWithoutAReadableFrameCostsOnlyItsFrames)
{
    std::vector<Damage> damage;
    for (int frame = 0; frame < 3; ++frame)
        damage.push_back({Target::IndexEntry, 1, frame});
    ASSERT_EQ(Build(WriteDisk(SmallLayout(), {GeneratedRecording(0, 0, 1, 100, 200, 8, 3, 1000)}, damage)),
              CatalogBuild::kBuilt);
    EXPECT_EQ(reader_.ErrorCode(), kErrIndexEntry);
    EXPECT_EQ(reader_.m_newestBlockUnreadableRow, 0);
    _HisiList_t recording{};
    ASSERT_TRUE(dvrfstool::RecordingOfRow(reader_, 0, &recording));
    dvrfstool::ExtractResult result;
    EXPECT_EQ(Extracted(reader_, recording, &result).size(), 3u * 1000);
    EXPECT_EQ(result.frames, 3);
    EXPECT_EQ(result.skippedFrames, 3);
}

TEST_F(AdapterTest, NewestFrameIsTheLastReadableIndexEntryThatFits)
{
    ASSERT_EQ(OpenAndSearch(WriteDisk(SmallLayout(), {GeneratedRecording(0, 0, 1, 100, 200, 8, 3, 1000)},
                                      {{Target::IndexEntry, 1, 2}}, "damaged.img")),
              1);
    EXPECT_EQ(Adapter().CurBlockHeader.FrameCount, 2);
    EXPECT_EQ(Adapter().LastFrame.DataOffset, 1000);
    EXPECT_EQ(Adapter().LastFrame.DataSize, 1000);
    EXPECT_EQ(reader_.ErrorCode(), 53);

    // A header claiming 2^31 - 1 frames is walked down from the last entry a block can hold.
    const std::string path =
        WriteDisk(SmallLayout(), {GeneratedRecording(0, 0, 0, 100, 200, 8, 3, 100)}, {}, "huge.img");
    const dvrimage::BlockHeaderBytes header = image_->MakeBlockHeader(0, INT_MAX);
    image_->WriteLogical(image_->DataBlockOffset(), header.data(), header.size());
    Refingerprint(path);
    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().CurBlockHeader.FrameCount, 3);
    EXPECT_EQ(Adapter().LastFrame.DataOffset, 200);
}

}  // namespace
