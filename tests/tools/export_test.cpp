// Recordings exported to files a player opens: read back with libavformat,
// each must hold the recording's frames, last as long as the recording, and
// carry its start as the creation time; a time range is cut at key frames.
#include <filesystem>
#include <string>

extern "C" {
#include <libavformat/avformat.h>
}

#include "tests/host/clip_disk.h"
#include "tests/support/disk_fixture.h"
#include "tools/dvrfs/export.h"

namespace {

struct Probed {
    long long packets = 0;
    long long keyPackets = 0;
    double seconds = 0;
    std::string creationTime;
};

Probed Probe(const std::string& path)
{
    Probed probed;
    AVFormatContext* input = nullptr;
    if (avformat_open_input(&input, path.c_str(), nullptr, nullptr) < 0)
        return probed;
    avformat_find_stream_info(input, nullptr);
    probed.seconds = input->duration > 0 ? static_cast<double>(input->duration) / AV_TIME_BASE : 0;
    if (const AVDictionaryEntry* tag = av_dict_get(input->metadata, "creation_time", nullptr, 0))
        probed.creationTime = tag->value;
    AVPacket* packet = av_packet_alloc();
    while (av_read_frame(input, packet) >= 0) {
        ++probed.packets;
        probed.keyPackets += (packet->flags & AV_PKT_FLAG_KEY) != 0;
        av_packet_unref(packet);
    }
    av_packet_free(&packet);
    avformat_close_input(&input);
    return probed;
}

struct ExportCase {
    const char* name;
    dvrfstool::ExportFormat format;
    std::optional<std::uint32_t> from, to;
    int damagedBlock;  // -1: none
    long long packets;
    double seconds;
    const char* creationTime;
};

class ExportTest : public DiskTest, public ::testing::WithParamInterface<ExportCase> {};

// Recording 1 holds blocks 2 to 5: 100 frames (key frame every 25) over 4 s.
TEST_P(ExportTest, FileHoldsTheRecordingsFramesAndTime)
{
    const ExportCase& c = GetParam();
    const std::string disk = dir_ + "/disk.img";
    dvrimage::DiskImage image = WriteClipDisk(disk, {{0, 0, 1, 1700000000, 2}, {1, 2, 5, 1700003600, 4}});
    if (c.damagedBlock >= 0)
        image.Damage(dvrimage::Target::BlockHeader, c.damagedBlock);
    ASSERT_EQ(Build(disk), CatalogBuild::kBuilt);
    _HisiList_t recording{};
    ASSERT_TRUE(dvrfstool::RecordingOfRow(reader_, 1, &recording));

    dvrfstool::ExportRequest request;
    request.format = c.format;
    request.output = dir_ + "/out." + dvrfstool::Extension(c.format);
    request.from = c.from;
    request.to = c.to;
    const dvrfstool::ExportOutcome outcome = dvrfstool::ExportRecording(reader_, recording, request);
    ASSERT_EQ(outcome.error, "");
    EXPECT_TRUE(outcome.timingFromStream);
    EXPECT_EQ(outcome.extracted.skippedBlocks, c.damagedBlock >= 0 ? 1 : 0);

    const Probed probed = Probe(request.output);
    EXPECT_EQ(probed.packets, c.packets);
    EXPECT_NEAR(probed.seconds, c.seconds, 1.0);
    EXPECT_EQ(probed.creationTime, c.creationTime);
    EXPECT_EQ(probed.keyPackets, c.packets / 25);
    EXPECT_EQ(dvrfstool::Sha256OfFile(request.output).size(), 64u);
}

INSTANTIATE_TEST_SUITE_P(
    Exports, ExportTest,
    ::testing::Values(
        ExportCase{"Mp4", dvrfstool::ExportFormat::kMp4, {}, {}, -1, 100, 4.0, "2023-11-14T23:13:20.000000Z"},
        ExportCase{"Matroska", dvrfstool::ExportFormat::kMkv, {}, {}, -1, 100, 4.0, "2023-11-14T23:13:20.000000Z"},
        // From 1 s in (a key frame) to 3 s: 50 frames.
        ExportCase{"TimeRangeCutAtAKeyFrame", dvrfstool::ExportFormat::kMp4, 1700003601u, 1700003603u, -1, 50,
                   2.0, "2023-11-14T23:13:21.000000Z"},
        // The damaged block's second is left out; the file keeps its place in time.
        ExportCase{"DamagedBlockLeftOut", dvrfstool::ExportFormat::kMp4, {}, {}, 3, 75, 4.0,
                   "2023-11-14T23:13:20.000000Z"}),
    CaseName<ExportCase>);

// Both recordings in one file on one timeline: rows 0 (2 s) and 1 (4 s, an
// hour later) keep their frames and the hour between them.
using MergedExportTest = DiskTest;

TEST_F(MergedExportTest, RecordingsShareOneFileAndKeepThePauseBetweenThem)
{
    const std::string disk = dir_ + "/disk.img";
    WriteClipDisk(disk, {{0, 0, 1, 1700000000, 2}, {1, 2, 5, 1700003600, 4}});
    ASSERT_EQ(Build(disk), CatalogBuild::kBuilt);
    std::vector<_HisiList_t> recordings(2);
    ASSERT_TRUE(dvrfstool::RecordingOfRow(reader_, 0, &recordings[0]));
    ASSERT_TRUE(dvrfstool::RecordingOfRow(reader_, 1, &recordings[1]));
    dvrfstool::ExportRequest request;
    request.output = dir_ + "/merged.mp4";

    const std::vector<dvrfstool::ExportOutcome> outcomes = dvrfstool::ExportRecordings(reader_, recordings, request);
    ASSERT_EQ(outcomes.size(), 2u);
    EXPECT_EQ(outcomes[1].error, "");
    EXPECT_EQ(outcomes[0].framesWritten + outcomes[1].framesWritten, 150);
    EXPECT_EQ(outcomes[1].firstTime, 1700003600u);
    const Probed probed = Probe(request.output);
    EXPECT_EQ(probed.packets, 150);
    EXPECT_NEAR(probed.seconds, 3604.0, 1.0);
    EXPECT_EQ(probed.creationTime, "2023-11-14T22:13:20.000000Z");
}

}  // namespace
