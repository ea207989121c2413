// Forensic images read directly: an E01 image made by ewfacquire and a raw
// image split into numbered pieces give what the raw image gives, and a
// damaged E01 chunk reads as an unreadable sector, nothing worse.
#include <sys/wait.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "tests/host/clip_disk.h"
#include "tests/support/disk_fixture.h"
#include "tools/dvrfs/disk_check.h"

namespace {

std::vector<char> FileBytes(const std::string& path)
{
    std::ifstream in(path, std::ios::binary);
    return std::vector<char>(std::istreambuf_iterator<char>(in), {});
}

struct Digest {
    int rows = 0;
    long long verifyChecked = 0;
    long long verifyDamaged = 0;
    std::vector<long long> frames;  // extracted per row
    std::vector<std::size_t> streamHashes;
    long long skipped = 0;
};

Digest Read(const std::string& path)
{
    Digest digest;
    CatalogReader reader;
    if (reader.BuildCatalog(path) != CatalogBuild::kBuilt)
        return digest;
    digest.rows = reader.m_recordCount;
    for (int row = 0; row < reader.m_recordCount; ++row) {
        _HisiList_t recording{};
        dvrfstool::RecordingOfRow(reader, row, &recording);
        dvrfstool::ExtractResult result;
        const std::vector<unsigned char> stream = Extracted(reader, recording, &result);
        digest.frames.push_back(result.frames);
        digest.streamHashes.push_back(std::hash<std::string>()(std::string(stream.begin(), stream.end())));
        digest.skipped += result.skippedFrames;
    }
    CatalogReader verifier;
    const dvrfstool::VerifyResult verified =
        dvrfstool::VerifyDisk(verifier, path, [](const std::string&) {});
    digest.verifyChecked = verified.checked;
    digest.verifyDamaged = verified.damaged;
    return digest;
}

class ImageSourceTest : public DiskTest {
protected:
    // Two recordings of the 1080p sample clip (about 90 KB a second): blocks
    // 0 and 1, and block 2.
    void SetUp() override
    {
        DiskTest::SetUp();
        raw_ = dir_ + "/disk.img";
        image_ = std::make_unique<dvrimage::DiskImage>(
            WriteClipDisk(raw_, {{0, 0, 1, 1700000000, 2}, {1, 2, 2, 1700003600, 1}}, 3, "clip1080.h264"));
        Refingerprint(raw_);
    }

    // ewfacquire, unattended, without compression (so that a chunk's bytes
    // can be found in the segment file).
    std::string Acquire()
    {
        const std::string command = "ewfacquire -u -q -c none -t " + dir_ + "/case " + raw_ + " >/dev/null 2>&1";
        EXPECT_EQ(std::system(command.c_str()), 0) << command;
        return dir_ + "/case.E01";
    }

    // The raw image in pieces of 20 MB, each written sparse as the raw one is.
    std::string Split()
    {
        const std::vector<char> bytes = FileBytes(raw_);
        const std::size_t piece = 20000000;
        for (std::size_t k = 0; k * piece < bytes.size(); ++k) {
            char name[32];
            std::snprintf(name, sizeof name, "/piece.%03zu", k + 1);
            std::ofstream(dir_ + name, std::ios::binary)
                .write(bytes.data() + k * piece, static_cast<std::streamsize>(std::min(piece, bytes.size() - k * piece)));
        }
        return dir_ + "/piece.001";
    }

    std::string raw_;
};

TEST_F(ImageSourceTest, SplitAndE01ImagesReadAsTheRawImage)
{
    const Digest raw = Read(raw_);
    ASSERT_EQ(raw.rows, 2);
    EXPECT_EQ(raw.frames, (std::vector<long long>{50, 25}));
    for (const std::string& image : {Split(), Acquire()}) {
        const Digest other = Read(image);
        EXPECT_EQ(other.rows, raw.rows) << image;
        EXPECT_EQ(other.frames, raw.frames) << image;
        EXPECT_EQ(other.streamHashes, raw.streamHashes) << image;
        EXPECT_EQ(other.verifyChecked, raw.verifyChecked) << image;
        EXPECT_EQ(other.verifyDamaged, 0) << image;
    }
    CatalogReader reader;
    ASSERT_EQ(reader.OpenDisk(dir_ + "/case.E01"), 1);
    ASSERT_NE(reader.Source(), nullptr);
    EXPECT_EQ(reader.Source()->Kind(), "E01 image, 1 segment");
    EXPECT_EQ(reader.Source()->Size(), std::filesystem::file_size(raw_));
}

// A byte flipped in a chunk of the segment file, inside data block 1's
// payload: that chunk fails its checksum and reads as an unreadable sector,
// the tool goes on, everything else reads as before, and only the recording
// that holds the chunk differs.
TEST_F(ImageSourceTest, DamagedE01ChunkLeavesTheRestReadable)
{
    const Digest raw = Read(raw_);
    const std::string e01 = Acquire();
    // 64 KiB into block 1's payload: among its frames, in a 32 KiB chunk of
    // the image that holds no header or index entry.
    const std::vector<char> disk = FileBytes(raw_);
    const std::size_t at = image_->PhysicalOffset(image_->PayloadPosition(1, 65536));
    std::vector<char> segment = FileBytes(e01);
    // Uncompressed, a byte lies a little after its place on the disk (the
    // segment's headers and a checksum per chunk before it).
    const auto found =
        std::search(segment.begin() + static_cast<long>(at), segment.end(), disk.begin() + static_cast<long>(at),
                    disk.begin() + static_cast<long>(at) + 256);
    ASSERT_NE(found, segment.end());
    *found ^= 0x55;
    std::ofstream(e01, std::ios::binary).write(segment.data(), static_cast<std::streamsize>(segment.size()));

    CatalogReader reader;
    ASSERT_EQ(reader.OpenDisk(e01), 1);
    char byte = 0;
    EXPECT_EQ(reader.ReadSectors(&byte, at, 1), -1);
    EXPECT_EQ(reader.ReadSectors(&byte, at - 32768, 1), 1);

    const Digest damaged = Read(e01);
    EXPECT_EQ(damaged.rows, 2);
    EXPECT_EQ(damaged.frames, raw.frames);
    EXPECT_EQ(damaged.verifyDamaged, 0);
    EXPECT_NE(damaged.streamHashes[0], raw.streamHashes[0]);
    EXPECT_EQ(damaged.streamHashes[1], raw.streamHashes[1]);
}

}  // namespace
