// Finding the current adapter in its ring, refreshing it from the list ring
// and the data ring, and its dump.
#include <climits>
#include <vector>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"

namespace {

using dvrimage::DiskImage;
using dvrimage::GeneratedRecording;
using dvrimage::Layout;
using dvrimage::SlotRun;
using dvrimage::Target;

struct SearchCase {
    const char* name;
    std::vector<SlotRun> runs;
    int chosen;
};

void PrintTo(const SearchCase& c, std::ostream* out)
{
    *out << c.name;
}

class AdapterSearchTest : public DiskTest, public ::testing::WithParamInterface<SearchCase> {};

TEST_P(AdapterSearchTest, ChoosesTheEndOfTheFirstRunOfValidSlots)
{
    Layout layout = SmallLayout();
    layout.adapterRuns = GetParam().runs;
    DiskImage image(layout);
    const std::string path = WriteImage(image);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().Idx, GetParam().chosen);
    EXPECT_EQ(reader_.m_errorCode, 0);
}

INSTANTIATE_TEST_SUITE_P(
    Runs, AdapterSearchTest,
    ::testing::Values(SearchCase{"FromSlotZero", {{0, 50}}, 49},
                      SearchCase{"AcrossTheEndOfTheRing", {{70, 60}}, 9},
                      SearchCase{"AllSlots", {{0, 120}}, 119},
                      SearchCase{"TwoRuns", {{5, 5}, {20, 10}}, 9},
                      SearchCase{"OnlyTheLastSlot", {{119, 1}}, 119}),
    [](const ::testing::TestParamInfo<SearchCase>& info) { return std::string(info.param.name); });

class AdapterTest : public DiskTest {};

TEST_F(AdapterTest, SearchReadsAtMost241SlotsAndFailsWhenNoneIsValid)
{
    Layout all = SmallLayout();
    all.adapterRuns = {{0, 120}};
    DiskImage full(all);
    const std::string fullPath = WriteImage(full, "full.img");
    ASSERT_EQ(Open(fullPath), 1);
    iotrace::Reset();
    ASSERT_EQ(reader_.BlockOpe(reader_.m_diskFile, 2, nullptr, 0, 0), 1);
    EXPECT_EQ(iotrace::Reads(fullPath).size(), 241u);

    Layout none = SmallLayout();
    none.adapterRuns.clear();
    DiskImage empty(none);
    const std::string emptyPath = WriteImage(empty, "empty.img");
    EXPECT_EQ(OpenAndSearch(emptyPath), -1);
    EXPECT_EQ(reader_.m_errorCode, 36);
    EXPECT_EQ(reader_.m_volume->adapter, nullptr);
}

TEST_F(AdapterTest, SlotWithAZeroSumButAnotherNumberEndsTheRun)
{
    Layout layout = SmallLayout();
    layout.adapterRuns = {{0, 10}};
    DiskImage image(layout);
    const std::string path = WriteImage(image);
    const std::vector<char> zeros(512);
    image.WriteLogical(5 * 4096, zeros.data(), zeros.size());  // XOR 0, Idx 0
    Refingerprint(path);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().Idx, 4);
}

TEST_F(AdapterTest, ChosenSlotThatChangesWhenReadAgainIsRefused)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);
    ASSERT_EQ(Open(path), 1);
    iotrace::CorruptReads(path, (1 << 20) + 100, 2);  // slot 0 arrives changed on its second read

    EXPECT_EQ(reader_.BlockOpe(reader_.m_diskFile, 2, nullptr, 0, 0), -1);
    EXPECT_EQ(reader_.m_errorCode, 81);
    EXPECT_EQ(ErrorText(), "FUNCTION[1241]");
    EXPECT_EQ(reader_.m_volume->adapter, nullptr);
}

TEST_F(AdapterTest, VolumeWithoutRecordingsNeedsNoListRead)
{
    DiskImage image(SmallLayout());
    const std::string path = WriteImage(image);
    ASSERT_EQ(Open(path), 1);
    iotrace::Reset();
    ASSERT_EQ(reader_.BlockOpe(reader_.m_diskFile, 2, nullptr, 0, 0), 1);
    EXPECT_EQ(Adapter().LastList.Idx, -1);
    EXPECT_EQ(iotrace::Reads(path).size(), 3u);  // slot 0, slot 1, slot 0 again
}

struct RingCase {
    const char* name;
    void (*change)(Layout&);
};

void PrintTo(const RingCase& c, std::ostream* out)
{
    *out << c.name;
}

class AdapterRingsTest : public DiskTest, public ::testing::WithParamInterface<RingCase> {};

TEST_P(AdapterRingsTest, AdapterWhoseRingsAreLargerThanAnyRecordersIsRefused)
{
    Layout layout = SmallLayout();
    GetParam().change(layout);
    DiskImage image(layout);
    const std::string path = WriteImage(image);

    EXPECT_EQ(OpenAndSearch(path), -1);
    EXPECT_EQ(reader_.m_errorCode, 82);
    EXPECT_EQ(ErrorText(), "FUNCTION[1250]");
    EXPECT_EQ(reader_.m_volume->adapter, nullptr);
}

INSTANTIATE_TEST_SUITE_P(
    Rings, AdapterRingsTest,
    ::testing::Values(
        RingCase{"ListRingTooLarge",
                 [](Layout& l) { l.listMax = (1 << 20) + 1, l.blockCount = 1 << 30, l.imageSize = 1 << 30; }},
        RingCase{"DataRingTooLarge",
                 [](Layout& l) {
                     l.dataBlockMax = (1 << 22) + 1, l.blockCount = INT_MAX, l.blockSizeShift = 20;
                     l.imageSize = 1 << 30;
                 }}),
    [](const ::testing::TestParamInfo<RingCase>& info) { return std::string(info.param.name); });

TEST_F(AdapterTest, EmptyRingsAreAcceptedAndNothingDividesByThem)
{
    Layout layout = SmallLayout();
    layout.listMax = 0;
    layout.dataBlockMax = 0;
    layout.firstListIdx = 3;
    layout.lastListIdx = 2;  // claims recordings in a ring of none
    DiskImage image(layout);
    const std::string path = WriteImage(image);

    EXPECT_EQ(OpenAndSearch(path), -1);  // the refresh cannot read an entry of an empty ring
    EXPECT_EQ(reader_.m_errorCode, 65);  // and so finds no oldest entry to read
    ASSERT_NE(reader_.m_volume->adapter, nullptr);
    _HisiHeader_t header{};
    std::vector<unsigned char> payload(16);
    reader_.m_streamBlock = 5;
    EXPECT_EQ(reader_.get_stream(reader_.m_diskFile, payload.data(), &header, Adapter().FirstList,
                                 Adapter().LastList, 1),
              -1);
    EXPECT_EQ(reader_.m_errorCode, 70);
    EXPECT_EQ(reader_.get_stream(reader_.m_diskFile, payload.data(), &header, Adapter().FirstList,
                                 Adapter().LastList, 0),
              -1);
    EXPECT_EQ(reader_.m_errorCode, 65);
}

// Positions repeat around the ring: the span is walked one turn, and the
// newest is the last readable position of its final turn (20 % 16 = 4, then
// back to 2).
TEST_F(AdapterTest, ListSpanLongerThanTheRingIsWalkedOneTurn)
{
    Layout layout = SmallLayout();
    layout.firstListIdx = 0;
    layout.lastListIdx = 20;  // ListMax is 16
    DiskImage image(layout);
    for (int i = 0; i < 3; ++i)
        image.Add(GeneratedRecording(i, i, i, 100 * (i + 1), 100 * (i + 1) + 50, 8));
    const std::string path = WriteImage(image);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().FirstList.Idx, 0);
    EXPECT_EQ(Adapter().LastList.Idx, 2);
    iotrace::Reset();
    EXPECT_EQ(reader_.BlockOpe(reader_.m_diskFile, 35, nullptr, 0, INT_MAX), 1);
    EXPECT_EQ(Adapter().LastList.Idx, 2);
    EXPECT_LE(iotrace::Reads(path).size(), 2u * 16 + 4);  // both copies of one turn, a few records
}

TEST_F(AdapterTest, RefreshTakesTheEarliestStartAndLatestEndOfTheReadableEntries)
{
    Layout layout = SmallLayout();
    layout.startTime = 5;  // a stale summary that the refresh replaces
    layout.endTime = 6;
    DiskImage image(layout);
    image.Add(GeneratedRecording(0, 0, 0, 300, 400, 8));
    image.Add(GeneratedRecording(1, 1, 1, 100, 900, 8));
    image.Add(GeneratedRecording(2, 2, 2, 200, 500, 8));
    const std::string path = WriteImage(image);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().StartTime, 100u);
    EXPECT_EQ(Adapter().EndTime, 900u);
    EXPECT_EQ(Adapter().FirstList.Idx, 0);
    EXPECT_EQ(Adapter().LastList.Idx, 2);
}

TEST_F(AdapterTest, RefreshPassesOverUnreadableEntriesFromTheOldestToTheNewestReadable)
{
    Layout layout = SmallLayout();
    DiskImage image(layout);
    for (int i = 0; i < 6; ++i)
        image.Add(GeneratedRecording(i, i, i, 100 * (i + 1), 100 * (i + 1) + 50, 8));
    const std::string path = WriteImage(image);
    for (int damaged : {0, 2, 5}) {
        image.Damage(Target::ListEntry, damaged);
        image.Damage(Target::ListMirror, damaged);
    }
    Refingerprint(path);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().FirstList.Idx, 1);
    EXPECT_EQ(Adapter().LastList.Idx, 4);
    EXPECT_EQ(Adapter().LastList.EndBlock, 4);  // the entry itself, read again from the disk
    EXPECT_EQ(Adapter().StartTime, 200u);
    EXPECT_EQ(Adapter().EndTime, 550u);
    EXPECT_EQ(Adapter().CurBlockHeader.BlockIdx, 4);
    EXPECT_EQ(reader_.m_volume->unreadableListPositions, (std::vector<std::int32_t>{0, 2, 5}));
    EXPECT_EQ(reader_.m_errorCode, 50);  // left by the damaged entries on the way
}

TEST_F(AdapterTest, RefreshWalksAListSpanAcrossTheEndOfTheListRing)
{
    DiskImage image(SmallLayout());  // a list ring of 16 entries
    const int positions[] = {14, 15, 0, 1};
    for (int i = 0; i < 4; ++i)
        image.Add(GeneratedRecording(positions[i], i, i, 1000 + 100 * i, 1050 + 100 * i, 8));
    const std::string path = WriteImage(image);
    image.Damage(Target::ListEntry, 1);
    image.Damage(Target::ListMirror, 1);
    Refingerprint(path);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().FirstList.Idx, 14);
    EXPECT_EQ(Adapter().LastList.Idx, 0);
    EXPECT_EQ(Adapter().LastList.EndBlock, 2);
    EXPECT_EQ(Adapter().StartTime, 1000u);
    EXPECT_EQ(Adapter().EndTime, 1250u);
}

TEST_F(AdapterTest, RefreshWithoutAnyReadableEntryFails)
{
    DiskImage image(SmallLayout());
    image.Add(GeneratedRecording(0, 0, 0, 100, 200, 8));
    const std::string path = WriteImage(image);
    image.Damage(Target::ListEntry, 0);
    image.Damage(Target::ListMirror, 0);
    Refingerprint(path);

    EXPECT_EQ(OpenAndSearch(path), -1);
    EXPECT_EQ(reader_.m_errorCode, 65);  // the oldest readable entry is none: position -1
    EXPECT_NE(reader_.m_volume->adapter, nullptr);  // installed before the refresh
}

class NewestHeaderTest : public DiskTest {
protected:
    // The newest recording runs from block 190 across the end of a ring of
    // 200 blocks to block 5.
    std::string WriteWrappedDisk(const std::vector<int>& damagedHeaders)
    {
        Layout layout = SmallLayout();
        layout.dataBlockMax = 200;
        image_ = std::make_unique<DiskImage>(layout);
        image_->Add(GeneratedRecording(0, 100, 110, 1000, 2000, 200, 1, 64));
        image_->Add(GeneratedRecording(1, 190, 5, 3000, 4000, 200, 1, 64));
        const std::string path = WriteImage(*image_);
        for (int block : damagedHeaders)
            image_->Damage(Target::BlockHeader, block);
        Refingerprint(path);
        return path;
    }
    std::unique_ptr<DiskImage> image_;
};

TEST_F(NewestHeaderTest, DamagedLastHeaderIsReplacedByTheNewestReadableOne)
{
    ASSERT_EQ(OpenAndSearch(WriteWrappedDisk({5, 4, 3})), 1);
    EXPECT_EQ(Adapter().LastList.EndBlock, 2);
    EXPECT_EQ(Adapter().CurBlockHeader.BlockIdx, 2);
    EXPECT_EQ(reader_.m_errorCode, 52);
}

TEST_F(NewestHeaderTest, BackwardSearchCrossesTheStartOfTheRing)
{
    ASSERT_EQ(OpenAndSearch(WriteWrappedDisk({5, 4, 3, 2, 1, 0})), 1);
    EXPECT_EQ(Adapter().LastList.EndBlock, 199);
    EXPECT_EQ(Adapter().CurBlockHeader.BlockIdx, 199);
}

TEST_F(NewestHeaderTest, NoReadableHeaderInTheRecordingFailsTheRefresh)
{
    std::vector<int> all;
    for (int b = 190; b < 200; ++b)
        all.push_back(b);
    for (int b = 0; b <= 5; ++b)
        all.push_back(b);
    EXPECT_EQ(OpenAndSearch(WriteWrappedDisk(all)), -1);
    EXPECT_EQ(reader_.m_errorCode, 52);
}

TEST_F(AdapterTest, BackwardHeaderSearchTriesEachBlockOfTheRingOnlyOnce)
{
    // The only entry claims data blocks 0 to 2^31 - 1 of a ring of 200 blocks
    // and none of them has a header: after 200 candidates every block has
    // been tried, and the search gives up instead of reading 2^31 headers.
    Layout layout = SmallLayout();
    layout.dataBlockMax = 200;
    layout.firstListIdx = 0;
    layout.lastListIdx = 0;
    DiskImage image(layout);
    const std::string path = WriteImage(image);
    const dvrimage::ListEntryBytes entry = image.MakeListEntry(0, 0, INT_MAX, 100, 200);
    image.WriteLogical(image.ListOffset(), entry.data(), entry.size());
    Refingerprint(path);
    ASSERT_EQ(Open(path), 1);
    iotrace::Reset();

    EXPECT_EQ(reader_.BlockOpe(reader_.m_diskFile, 2, nullptr, 0, 0), -1);
    EXPECT_EQ(reader_.m_errorCode, 52);
    EXPECT_LT(iotrace::Reads(path).size(), 250u);
}

TEST_F(AdapterTest, DamagedNewestIndexEntryShortensTheNewestBlock)
{
    DiskImage image(SmallLayout());
    image.Add(GeneratedRecording(0, 0, 1, 100, 200, 8, 3, 1000));
    const std::string path = WriteImage(image);
    image.Damage(Target::IndexEntry, 1, 2);
    Refingerprint(path);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().CurBlockHeader.FrameCount, 2);
    EXPECT_EQ(Adapter().LastFrame.DataOffset, 1000);
    EXPECT_EQ(Adapter().LastFrame.DataSize, 1000);
    EXPECT_EQ(reader_.m_errorCode, 53);
}

TEST_F(AdapterTest, NoReadableIndexEntryFailsUnlessTheAdapterRecordsNoFrame)
{
    for (bool recordsFrame : {true, false}) {
        Layout layout = SmallLayout();
        layout.adapterRecordsFrame = recordsFrame;
        DiskImage image(layout);
        image.Add(GeneratedRecording(0, 0, 1, 100, 200, 8, 2, 100));
        const std::string path = WriteImage(image, recordsFrame ? "frame.img" : "noframe.img");
        image.Damage(Target::IndexEntry, 1, 0);
        image.Damage(Target::IndexEntry, 1, 1);
        Refingerprint(path);
        EXPECT_EQ(OpenAndSearch(path), recordsFrame ? -1 : 1);
    }
}

TEST_F(AdapterTest, HugeFrameCountIsWalkedDownFromTheLastEntryThatFits)
{
    DiskImage image(SmallLayout());
    image.Add(GeneratedRecording(0, 0, 0, 100, 200, 8, 3, 100));
    const std::string path = WriteImage(image);
    const dvrimage::BlockHeaderBytes header = image.MakeBlockHeader(0, INT_MAX);
    image.WriteLogical(image.DataBlockOffset(), header.data(), header.size());
    Refingerprint(path);

    ASSERT_EQ(OpenAndSearch(path), 1);
    EXPECT_EQ(Adapter().CurBlockHeader.FrameCount, 3);
    EXPECT_EQ(Adapter().LastFrame.DataOffset, 200);
}

TEST_F(AdapterTest, DumpPrintsTheAdapterInFourLines)
{
    Layout layout = SmallLayout();
    layout.timeStampBase = 77;
    DiskImage image(layout);
    image.Add(GeneratedRecording(0, 0, 0, 3661, 90061, 8));
    const std::string path = WriteImage(image);
    ASSERT_EQ(OpenAndSearch(path), 1);

    ::testing::internal::CaptureStdout();
    EXPECT_EQ(reader_.BlockOpe(reader_.m_diskFile, 5, nullptr, 0, 0), 1);
    const std::string dump = ::testing::internal::GetCapturedStdout();
    EXPECT_EQ(dump, "\tAdapter: Version=1, TimeStamp=77, Idx=0, Magic=0x48444152\n"
                    "\tList: Offset=491520, OffsetBackup=495616, Max=16\n"
                    "\tDataBlock: Offset=499712, Max=8\n"
                    "\tStartTime=1:1:1(3661), EndTime=1:1:1(90061)\n");

    reader_.CloseDVRFS();
    EXPECT_EQ(reader_.BlockOpe(nullptr, 5, nullptr, 0, 0), -1);
    EXPECT_EQ(reader_.BlockOpe(nullptr, 7, nullptr, 0, 0), 1);  // no such operation: nothing happens
}

}  // namespace
