// The verification walk and the extraction on records that lie: neither may
// walk further than the disk can hold.
#include <climits>
#include <string>
#include <vector>

#include "tests/support/disk_fixture.h"
#include "tests/support/io_trace.h"
#include "tools/dvrfs/disk_check.h"
#include "tools/dvrfs/recover.h"

namespace {

using dvrimage::GeneratedRecording;

class DiskCheckTest : public DiskTest {
protected:
    // One recording in blocks 0 and 1 of a ring of 8, 3 frames each; block 1's
    // header then claims 2^31 - 1 frames.
    std::string WriteLyingDisk()
    {
        dvrimage::Layout layout = SmallLayout();
        layout.adapterRecordsFrame = false;
        const std::string path = WriteDisk(layout, {GeneratedRecording(0, 0, 1, 100, 200, 8, 3, 100)});
        const dvrimage::BlockHeaderBytes header = image_->MakeBlockHeader(1, INT_MAX);
        image_->WriteLogical(image_->DataBlockOffset() + (1 << 24), header.data(), header.size());
        Refingerprint(path);
        return path;
    }
};

TEST_F(DiskCheckTest, ExtractionPassesOverFramesABlockOnlyClaims)
{
    const std::string path = WriteLyingDisk();
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);
    _HisiList_t recording{};
    ASSERT_TRUE(dvrfstool::RecordingOfRow(reader_, 0, &recording));

    dvrfstool::ExtractResult result;
    const std::vector<unsigned char> stream = Extracted(reader_, recording, &result);
    EXPECT_EQ(result.frames, 6);
    EXPECT_EQ(result.skippedFrames, 262142 - 3);  // the rest of what fits in a block, each refused
    std::vector<unsigned char> expected;
    for (int block = 0; block < 2; ++block)
        for (int frame = 0; frame < 3; ++frame) {
            const std::vector<std::uint8_t> payload = dvrimage::PatternPayload(block, frame, 100);
            expected.insert(expected.end(), payload.begin(), payload.end());
        }
    EXPECT_EQ(stream, expected);

    // A recording claiming 2^31 blocks is walked once round the ring of 8.
    recording.EndBlock = INT_MAX;
    const dvrfstool::ExtractResult longest =
        dvrfstool::ExtractRecording(reader_, recording, [](const dvrfstool::ExtractedFrame&) { return true; });
    EXPECT_EQ(longest.frames, 6);
    EXPECT_EQ(longest.skippedBlocks, 6);
}

struct FramesCase {
    const char* name;
    std::uint8_t recordSum;
    std::vector<std::pair<std::int32_t, std::int32_t>> entries;  // offset, size of each frame of block 0
    std::int32_t frameCount;                                    // the block header's claim
    long long frames;                                           // delivered
    long long bytes;
    long long skipped;
};

class FramesTest : public DiskCheckTest, public ::testing::WithParamInterface<FramesCase> {};

// What one block gives, whatever its index entries claim: never a byte
// outside its payload area nor a byte twice, and no read per empty frame.
TEST_P(FramesTest, BlockGivesAtMostItsPayloadAreaInThreeReads)
{
    dvrimage::Layout layout = SmallLayout();
    layout.blockSizeShift = 16;  // a data block in 256 logical blocks: the format skips none inside it
    layout.recordSum = GetParam().recordSum;
    layout.adapterRecordsFrame = false;
    const std::string path = WriteDisk(layout, {GeneratedRecording(0, 0, 0, 100, 200, 8, 1, 100)});
    const dvrimage::BlockHeaderBytes header = image_->MakeBlockHeader(0, GetParam().frameCount);
    image_->WriteLogical(image_->DataBlockOffset(), header.data(), header.size());
    for (std::size_t k = 0; k < GetParam().entries.size(); ++k) {
        const auto [offset, size] = GetParam().entries[k];
        const dvrimage::IndexEntryBytes entry = image_->MakeIndexEntry(offset, size);
        image_->WriteLogical(image_->IndexEntryPosition(0, static_cast<std::int64_t>(k)), entry.data(), entry.size());
    }
    Refingerprint(path);
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);
    _HisiList_t recording{};
    ASSERT_TRUE(dvrfstool::RecordingOfRow(reader_, 0, &recording));

    iotrace::Reset();
    const dvrfstool::ExtractResult result =
        dvrfstool::ExtractRecording(reader_, recording, [](const dvrfstool::ExtractedFrame&) { return true; });
    EXPECT_EQ(result.frames, GetParam().frames);
    EXPECT_EQ(result.bytes, GetParam().bytes);
    EXPECT_EQ(result.skippedFrames, GetParam().skipped);
    // Header, index entries, payload: each piece of a read after the first
    // goes on where the one before it ended, so a disk seeks three times.
    int seeks = 0;
    std::int64_t end = -1;
    for (const iotrace::ReadCall& read : iotrace::Reads(path)) {
        seeks += read.offset != end;
        end = read.offset + static_cast<std::int64_t>(read.count);
    }
    EXPECT_LE(seeks, 3);
}

constexpr std::int32_t kArea = 16777088;

INSTANTIATE_TEST_SUITE_P(
    Blocks, FramesTest,
    ::testing::Values(
        FramesCase{"Consecutive", 0x5A, {{0, 100}, {100, 50}, {150, 10}}, 3, 3, 160, 0},
        FramesCase{"OverlappingAnEarlierFrame", 0x5A, {{0, 100}, {50, 100}, {100, 10}}, 3, 2, 110, 1},
        FramesCase{"PastThePayloadArea", 0x5A, {{0, 100}, {kArea - 10, 11}, {-1, 5}}, 3, 1, 100, 2},
        FramesCase{"EachTheWholeArea", 0x5A, {{0, kArea}, {0, kArea}, {0, kArea}, {0, kArea}}, 4, 1, kArea, 3},
        // Unwritten entries read as zeros, which pass where the record sum is 0.
        FramesCase{"ThousandEmptyFrames", 0x00, {}, 1000, 1000, 100, 0}),
    CaseName<FramesCase>);

TEST_F(DiskCheckTest, VerificationReportsTheLyingHeader)
{
    const std::string path = WriteLyingDisk();
    std::vector<std::string> lines;
    const dvrfstool::VerifyResult result = dvrfstool::VerifyDisk(
        reader_, path, [&lines](const std::string& line) { lines.push_back(line); });
    EXPECT_EQ(result.stage, dvrfstool::VerifyStage::kComplete);
    EXPECT_EQ(lines, (std::vector<std::string>{"damaged: data block 1 header (frame count 2147483647)"}));
    EXPECT_EQ(result.damaged, 1);
}

// A recorder's disk after its list ring wrapped: two older recordings whose
// entries were written over keep their blocks (0 to 1, and 2), a third
// recording's entry is damaged in both copies (block 7); recover finds
// exactly those blocks, in the time between the listed recordings around
// them (dvrfs's command-line test extracts such a run).
TEST_F(DiskCheckTest, RecoverFindsTheBlocksTheIndexLost)
{
    dvrimage::Layout layout = SmallLayout();
    layout.dataBlockMax = 12;
    auto overwritten = [](std::int32_t first, std::int32_t last, std::uint32_t start) {
        dvrimage::Recording r = GeneratedRecording(0, first, last, start, start + 60, 12, 3, 100);
        r.listed = false;
        return r;
    };
    const std::string path = WriteDisk(
        layout,
        {overwritten(0, 1, 1000), overwritten(2, 2, 2000), GeneratedRecording(0, 3, 4, 3000, 3060, 12, 3, 100),
         GeneratedRecording(1, 5, 6, 4000, 4060, 12, 3, 100), GeneratedRecording(2, 7, 7, 5000, 5060, 12, 3, 100),
         GeneratedRecording(3, 8, 8, 6000, 6060, 12, 3, 100)},
        {{dvrimage::Target::ListEntry, 2}, {dvrimage::Target::ListMirror, 2}});
    ASSERT_EQ(Build(path), CatalogBuild::kBuilt);

    iotrace::Reset();
    const dvrfstool::RecoverResult result = dvrfstool::FindUnlistedRuns(reader_);
    ASSERT_EQ(result.runs.size(), 2u);
    EXPECT_EQ(result.runs[0].firstBlock, 0);
    EXPECT_EQ(result.runs[0].lastBlock, 2);
    EXPECT_EQ(result.runs[0].frames, 9);
    EXPECT_FALSE(result.runs[0].after.has_value());  // the oldest data on the disk
    EXPECT_EQ(result.runs[0].before, 3000u);
    EXPECT_EQ(result.runs[1].firstBlock, 7);
    EXPECT_EQ(result.runs[1].lastBlock, 7);
    EXPECT_EQ(result.runs[1].after, 4060u);
    EXPECT_EQ(result.runs[1].before, 6000u);
    EXPECT_EQ(result.blocksScanned, 12);
    EXPECT_EQ(result.headersRead, 12 - 5);  // one per block no listed recording covers
    EXPECT_EQ(iotrace::Reads(path).size(), 3u + 7u);  // the rows' entries, then those headers
}

}  // namespace
