// The verification walk and the extraction on records that lie: neither may
// walk further than the disk can hold.
#include <climits>
#include <string>
#include <vector>

#include "tests/support/disk_fixture.h"
#include "tools/dvrfs/disk_check.h"

namespace {

using dvrimage::DiskImage;
using dvrimage::GeneratedRecording;

class DiskCheckTest : public DiskTest {
protected:
    // One recording in blocks 0 and 1 of a ring of 8, 3 frames each; block 1's
    // header then claims 2^31 - 1 frames.
    std::string WriteLyingDisk()
    {
        dvrimage::Layout layout = SmallLayout();
        layout.adapterRecordsFrame = false;
        image_ = std::make_unique<DiskImage>(layout);
        image_->Add(GeneratedRecording(0, 0, 1, 100, 200, 8, 3, 100));
        const std::string path = WriteImage(*image_);
        const dvrimage::BlockHeaderBytes header = image_->MakeBlockHeader(1, INT_MAX);
        image_->WriteLogical(image_->DataBlockOffset() + (1 << 24), header.data(), header.size());
        Refingerprint(path);
        return path;
    }

    CatalogReader catalog_;
    std::unique_ptr<DiskImage> image_;
};

TEST_F(DiskCheckTest, ExtractionPassesOverFramesABlockOnlyClaims)
{
    const std::string path = WriteLyingDisk();
    ASSERT_EQ(catalog_.BuildCatalog(wxString::FromUTF8(path.c_str())), CatalogBuild::kBuilt);
    _HisiList_t recording{};
    ASSERT_TRUE(dvrfstool::RecordingOfRow(catalog_, 0, &recording));

    std::vector<unsigned char> stream;
    const dvrfstool::ExtractResult result =
        dvrfstool::ExtractRecording(catalog_, recording, [&stream](const unsigned char* data, std::size_t size) {
            stream.insert(stream.end(), data, data + size);
            return true;
        });
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
        dvrfstool::ExtractRecording(catalog_, recording, [](const unsigned char*, std::size_t) { return true; });
    EXPECT_EQ(longest.frames, 6);
    EXPECT_EQ(longest.skippedBlocks, 6);
}

TEST_F(DiskCheckTest, VerificationReportsTheLyingHeader)
{
    const std::string path = WriteLyingDisk();
    std::vector<std::string> lines;
    const dvrfstool::VerifyResult result = dvrfstool::VerifyDisk(
        catalog_, wxString::FromUTF8(path.c_str()), [&lines](const std::string& line) { lines.push_back(line); });
    EXPECT_EQ(result.stage, dvrfstool::VerifyStage::kComplete);
    EXPECT_EQ(lines, (std::vector<std::string>{"damaged: data block 1 header (frame count 2147483647)"}));
    EXPECT_EQ(result.damaged, 1);
}

}  // namespace
