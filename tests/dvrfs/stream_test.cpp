// Reading the recorded stream back one frame per call: past blocks without
// frames, across the end of the data ring, at the far end of a terabyte
// disk, round a ring with no frame at all; and runs of frames.
#include <sys/stat.h>

#include <climits>
#include <utility>
#include <vector>

#include "tests/support/disk_fixture.h"

namespace {

using dvrimage::Frame;
using dvrimage::GeneratedRecording;
using dvrimage::Layout;
using dvrimage::Recording;

constexpr std::size_t kFrameSize = 100;

class StreamTest : public DiskTest {
protected:
    void Search() { ASSERT_EQ(OpenAndSearch(path_), 1); }
    void Place(wxInt64 block, std::int32_t frame)
    {
        reader_.SetStreamCursor(block, frame);
    }

    // One call; returns the block and entry number of the frame delivered,
    // judged by its payload, or {-1, -1}.
    std::pair<int, int> Next(int direction, const _HisiList_t& first, const _HisiList_t& last)
    {
        _HisiHeader_t header{};
        std::vector<unsigned char> payload(1 << 16);
        const int size = reader_.get_stream(nullptr, payload.data(), &header, first, last, direction);
        if (size < 0)
            return {-1, -1};
        payload.resize(static_cast<std::size_t>(size));
        for (int block = 0; block < image_->layout().dataBlockMax; ++block)
            for (int frame = 0; frame < 4; ++frame)
                if (payload == dvrimage::PatternPayload(block, frame, kFrameSize))
                    return {block, frame};
        ADD_FAILURE() << "a frame of " << size << " bytes that no block holds";
        return {-1, -1};
    }
    std::pair<int, int> Forward() { return Next(1, Adapter().FirstList, Adapter().LastList); }
    std::pair<int, int> Backward() { return Next(0, Adapter().FirstList, Adapter().LastList); }

    std::string path_;
};

using Frames = std::vector<std::pair<int, int>>;

TEST_F(StreamTest, ForwardPassesOverABlockWithoutFrames)
{
    Recording r = GeneratedRecording(0, 0, 2, 100, 200, 8, 1, kFrameSize);
    r.blocks[1].clear();
    path_ = WriteDisk(SmallLayout(), {r});
    Search();
    Place(0, 0);
    EXPECT_EQ(Forward(), std::make_pair(0, 0));
    EXPECT_EQ(Forward(), std::make_pair(2, 0));
}

TEST_F(StreamTest, ForwardRunsAcrossTheEndOfTheRingThenRestartsAtTheOldestRecording)
{
    Layout layout = SmallLayout();
    layout.dataBlockMax = 200;
    path_ = WriteDisk(layout, {GeneratedRecording(0, 10, 11, 100, 200, 200, 1, kFrameSize),
                               GeneratedRecording(1, 190, 5, 300, 400, 200, 1, kFrameSize)});
    Search();
    const _HisiList_t newest = Adapter().LastList;
    Place(190, 0);
    Frames got;
    for (int i = 0; i < 17; ++i)
        got.push_back(Next(1, newest, newest));  // the range ends at 5 + 200
    Frames expected;
    for (int b = 190; b < 200; ++b)
        expected.push_back({b, 0});
    for (int b = 0; b <= 5; ++b)
        expected.push_back({b, 0});
    expected.push_back({10, 0});  // past the range: the oldest recording's first block
    EXPECT_EQ(got, expected);
    EXPECT_EQ(reader_.StreamBlock(), 10);
}

TEST_F(StreamTest, RingWithoutAnyFrameEndsTheWalkInsteadOfCirclingForever)
{
    Recording r = GeneratedRecording(0, 0, 7, 100, 200, 8, 0, kFrameSize);
    Layout layout = SmallLayout();
    layout.adapterRecordsFrame = false;
    path_ = WriteDisk(layout, {r});
    Search();
    Place(3, 0);
    EXPECT_EQ(Forward(), std::make_pair(-1, -1));
    EXPECT_EQ(reader_.ErrorCode(), 54);
    EXPECT_EQ(ErrorText(), "FUNCTION[1710]");
    Place(3, -1);
    reader_.ClearError();
    EXPECT_EQ(Backward(), std::make_pair(-1, -1));
    EXPECT_EQ(reader_.ErrorCode(), 54);
}

TEST_F(StreamTest, TerabyteDiskCostsOnlyTheBytesWrittenAndPlaysAtItsFarEnd)
{
    Layout layout = SmallLayout();
    layout.dataBlockMax = 65530;  // a little under 1 TiB of data ring
    path_ = WriteDisk(layout, {GeneratedRecording(0, 65528, 1, 100, 200, 65530, 1, kFrameSize)});
    struct stat info {};
    ASSERT_EQ(::stat(path_.c_str(), &info), 0);
    EXPECT_GT(info.st_size, 1000000000000);
    EXPECT_LT(info.st_blocks * 512, 16 << 20);
    Search();

    Place(65528, 0);
    Frames got;
    for (int i = 0; i < 4; ++i)
        got.push_back(Forward());
    EXPECT_EQ(got, (Frames{{65528, 0}, {65529, 0}, {0, 0}, {1, 0}}));
}

TEST_F(StreamTest, StreamReadDeliversTheSpanOfARunOfFrames)
{
    // Frames 0 to 9 of 100 bytes, then 500, 700 and 300 bytes: entries 10 to
    // 12 start at payload offsets 1000, 1500 and 2200.
    Recording r = GeneratedRecording(0, 0, 0, 100, 200, 8, 0, 0);
    std::vector<std::uint8_t> expected;
    for (int k = 0; k < 13; ++k) {
        const std::size_t size = k < 10 ? 100 : k == 10 ? 500 : k == 11 ? 700 : 300;
        r.blocks[0].push_back(Frame{dvrimage::PatternPayload(0, k, size), 1});
        if (k >= 10)
            expected.insert(expected.end(), r.blocks[0].back().payload.begin(), r.blocks[0].back().payload.end());
    }
    path_ = WriteDisk(SmallLayout(), {r});
    Search();

    _HisiHeader_t entries[3];
    std::vector<unsigned char> payload(1500);
    ASSERT_EQ(reader_.StreamRead(nullptr, 3, 0, 10, 3, entries, payload.data()), 1500);
    EXPECT_EQ(entries[0].DataOffset, 2200);
    EXPECT_EQ(entries[2].DataOffset, 1000);
    EXPECT_EQ(std::vector<std::uint8_t>(payload.begin(), payload.end()), expected);

    // Without reading: the span of the entries as given.
    EXPECT_EQ(reader_.StreamRead(nullptr, 0, 0, 0, 3, entries, nullptr), 1500);
    EXPECT_EQ(reader_.StreamRead(nullptr, 3, 0, 10, 0, entries, payload.data()), -1);

    entries[0].DataOffset = INT_MAX;
    entries[0].DataSize = INT_MAX;
    entries[2].DataOffset = INT_MIN;
    EXPECT_EQ(reader_.StreamRead(nullptr, 0, 0, 0, 3, entries, nullptr), -1);
    EXPECT_EQ(reader_.ErrorCode(), 74);
}

}  // namespace
