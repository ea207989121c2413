// Benchmarks of the disk paths against the floor of their read patterns, each
// pair measured in one run and reported as a ratio:
//  - the catalogue build of a disk of 8192 recordings, against 8192 raw
//    512-byte reads at the sectors of the same list entries;
//  - the extraction of a recording of 50 KiB frames, against one plain
//    sequential read of the same payload bytes per data block.
// The image files are written first, so both sides read from the page cache:
// the figures compare the work of the read paths, not the medium.
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "catalog/catalog_reader.h"
#include "tools/dvrfs/disk_check.h"
#include "tools/dvrimage/dvr_image.h"

namespace {

constexpr int kRecordings = 8192;
constexpr int kExtractBlocks = 8;
constexpr int kFramesPerBlock = 300;
constexpr std::size_t kFrameSize = 50 * 1024;

struct Disks {
    std::filesystem::path dir;
    std::string catalogPath;
    std::vector<off_t> listSectors;  // the sector of each list entry the build reads
    std::string extractPath;
    std::vector<std::pair<off_t, std::size_t>> payloadRanges;  // one per data block

    Disks()
    {
        dir = std::filesystem::temp_directory_path() / ("dvrfs-bench-" + std::to_string(::getpid()));
        std::filesystem::create_directories(dir);
        WriteCatalogDisk();
        WriteExtractDisk();
    }
    ~Disks() { std::filesystem::remove_all(dir); }

    void WriteCatalogDisk()
    {
        dvrimage::Layout layout;
        layout.listMax = kRecordings;
        layout.dataBlockMax = 8;
        dvrimage::DiskImage image(layout);
        for (int i = 0; i < kRecordings; ++i) {
            dvrimage::Recording r = dvrimage::GeneratedRecording(i, 0, 0, 1000u * i, 1000u * i + 600, 8, 1, 64);
            if (i + 1 < kRecordings)
                r.blocks.clear();  // only the newest recording needs its data block
            image.Add(std::move(r));
        }
        catalogPath = (dir / "catalog.img").string();
        image.Write(catalogPath);
        for (int i = 0; i < kRecordings; ++i)
            listSectors.push_back(
                static_cast<off_t>(image.PhysicalOffset(image.ListOffset() + std::uint64_t{128} * i) / 512 * 512));
    }

    void WriteExtractDisk()
    {
        dvrimage::Layout layout;
        layout.dataBlockMax = kExtractBlocks;
        dvrimage::DiskImage image(layout);
        image.Add(dvrimage::GeneratedRecording(0, 0, kExtractBlocks - 1, 100, 200, kExtractBlocks, kFramesPerBlock,
                                               kFrameSize));
        extractPath = (dir / "extract.img").string();
        image.Write(extractPath);
        for (int block = 0; block < kExtractBlocks; ++block)
            payloadRanges.emplace_back(static_cast<off_t>(image.PhysicalOffset(image.PayloadPosition(block, 0))),
                                       kFramesPerBlock * kFrameSize);
    }
};

Disks& TheDisks()
{
    static Disks disks;
    return disks;
}

void BM_CatalogBuild(benchmark::State& state)
{
    const std::string path = TheDisks().catalogPath;
    for (auto _ : state) {
        CatalogReader reader;
        if (reader.BuildCatalog(path) != CatalogBuild::kBuilt || reader.m_recordCount != kRecordings)
            state.SkipWithError("the catalogue build failed");
        benchmark::DoNotOptimize(reader.Catalog()->Entries[kRecordings - 1].Idx);
    }
    state.SetItemsProcessed(state.iterations() * kRecordings);
}

void BM_CatalogFloor(benchmark::State& state)
{
    const Disks& disks = TheDisks();
    char sector[512];
    for (auto _ : state) {
        const int fd = ::open(disks.catalogPath.c_str(), O_RDONLY | O_CLOEXEC);
        for (off_t offset : disks.listSectors)
            if (::pread(fd, sector, sizeof sector, offset) != sizeof sector)
                state.SkipWithError("raw read failed");
        ::close(fd);
        benchmark::DoNotOptimize(sector[0]);
    }
    state.SetItemsProcessed(state.iterations() * kRecordings);
}

void BM_Extract(benchmark::State& state)
{
    CatalogReader reader;
    if (reader.BuildCatalog(TheDisks().extractPath) != CatalogBuild::kBuilt) {
        state.SkipWithError("the catalogue build failed");
        return;
    }
    _HisiList_t recording{};
    dvrfstool::RecordingOfRow(reader, 0, &recording);
    for (auto _ : state) {
        std::size_t bytes = 0;
        const dvrfstool::ExtractResult result = dvrfstool::ExtractRecording(
            reader, recording, [&bytes](const dvrfstool::ExtractedFrame& f) {
                benchmark::DoNotOptimize(f.data[0]);
                bytes += f.size;
                return true;
            });
        if (result.frames != kExtractBlocks * kFramesPerBlock)
            state.SkipWithError("frames were lost");
    }
    state.SetBytesProcessed(state.iterations() * kExtractBlocks * kFramesPerBlock * kFrameSize);
}

void BM_ExtractFloor(benchmark::State& state)
{
    const Disks& disks = TheDisks();
    std::vector<char> buffer(kFramesPerBlock * kFrameSize);
    for (auto _ : state) {
        const int fd = ::open(disks.extractPath.c_str(), O_RDONLY | O_CLOEXEC);
        for (const auto& [offset, size] : disks.payloadRanges)
            if (::pread(fd, buffer.data(), size, offset) != static_cast<ssize_t>(size))
                state.SkipWithError("raw read failed");
        ::close(fd);
        benchmark::DoNotOptimize(buffer[0]);
    }
    state.SetBytesProcessed(state.iterations() * kExtractBlocks * kFramesPerBlock * kFrameSize);
}

BENCHMARK(BM_CatalogBuild)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_CatalogFloor)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_Extract)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ExtractFloor)->Unit(benchmark::kMillisecond);

// Prints the usual table, then each path's time over its floor's.
class RatioReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override
    {
        ConsoleReporter::ReportRuns(runs);
        for (const Run& run : runs)
            if (!run.error_occurred && run.run_type == Run::RT_Iteration)
                seconds_[run.benchmark_name()] = run.GetAdjustedRealTime();
    }
    void Finalize() override
    {
        ConsoleReporter::Finalize();
        PrintRatio("catalogue build / raw list reads", "BM_CatalogBuild", "BM_CatalogFloor");
        PrintRatio("extract / sequential payload read", "BM_Extract", "BM_ExtractFloor");
    }

private:
    void PrintRatio(const char* what, const std::string& path, const std::string& floor)
    {
        if (seconds_.count(path) && seconds_.count(floor) && seconds_[floor] > 0)
            std::printf("ratio %-36s %6.2f\n", what, seconds_[path] / seconds_[floor]);
    }
    std::map<std::string, double> seconds_;
};

}  // namespace

int main(int argc, char** argv)
{
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv))
        return 1;
    TheDisks();
    RatioReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();
    return 0;
}
