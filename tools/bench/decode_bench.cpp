// The decode path of the host's decoder thread, per channel: frames read
// from a disk with the stream extraction and decoded to RGB pictures with
// libavcodec, in frames per second against the stream's own 25.
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>

#include "catalog/catalog_reader.h"
#include "host/h264_decoder.h"
#include "tools/dvrimage/dvr_image.h"

namespace {

constexpr int kBlocks = 8;
constexpr int kFramesPerBlock = 25;
constexpr double kStreamFramesPerSecond = 25.0;

struct ClipDisk {
    std::filesystem::path path;
    std::vector<std::vector<std::uint8_t>> frames;

    ClipDisk()
    {
        const std::vector<std::vector<std::uint8_t>> units =
            dvrimage::AccessUnitsOfFile(MORVANE_SOURCE_DIR "/samples/clip.h264");
        dvrimage::Layout layout;
        layout.dataBlockMax = kBlocks;
        dvrimage::DiskImage image(layout);
        dvrimage::Recording r;
        r.startBlock = 0;
        r.endBlock = kBlocks - 1;
        r.startTime = 100;
        r.endTime = 108;
        for (int b = 0; b < kBlocks; ++b) {
            r.blocks.emplace_back();
            for (int k = 0; k < kFramesPerBlock; ++k) {
                frames.push_back(units[(b * kFramesPerBlock + k) % units.size()]);
                r.blocks.back().push_back(dvrimage::Frame{frames.back(), 1});
            }
        }
        image.Add(r);
        path = std::filesystem::temp_directory_path() / ("decode-bench-" + std::to_string(::getpid()) + ".img");
        image.Write(path.string());
    }
    ~ClipDisk() { std::filesystem::remove(path); }
};

ClipDisk& TheDisk()
{
    static ClipDisk disk;
    return disk;
}

void BM_DecodeToRgb(benchmark::State& state)
{
    const std::vector<std::vector<std::uint8_t>>& frames = TheDisk().frames;
    for (auto _ : state) {
        H264Decoder decoder;
        std::size_t pictures = 0;
        for (const std::vector<std::uint8_t>& frame : frames)
            pictures += decoder.Decode(frame.data(), frame.size(), 0, 0, false).size();
        benchmark::DoNotOptimize(pictures);
    }
    state.SetItemsProcessed(state.iterations() * static_cast<long long>(frames.size()));
}

void BM_ReadAndDecodeToRgb(benchmark::State& state)
{
    CatalogReader reader;
    if (reader.BuildCatalog(wxString::FromUTF8(TheDisk().path.c_str())) != CatalogBuild::kBuilt) {
        state.SkipWithError("the disk did not open");
        return;
    }
    const _HisiAdapter_t& adapter = *reader.m_volume->adapter;
    std::vector<unsigned char> payload(static_cast<std::size_t>(kPayloadAreaSize));
    const int frames = kBlocks * kFramesPerBlock;
    for (auto _ : state) {
        H264Decoder decoder;
        reader.m_streamBlock = 0;
        reader.m_streamFrame = 0;
        for (int i = 0; i < frames; ++i) {
            _HisiHeader_t header{};
            const int size = reader.get_stream(reader.m_diskFile, payload.data(), &header, adapter.FirstList,
                                               adapter.LastList, 1);
            if (size < 0) {
                state.SkipWithError("a frame did not read");
                break;
            }
            benchmark::DoNotOptimize(decoder.Decode(payload.data(), static_cast<std::size_t>(size), 0, i, false));
        }
    }
    state.SetItemsProcessed(state.iterations() * frames);
}

BENCHMARK(BM_DecodeToRgb)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ReadAndDecodeToRgb)->Unit(benchmark::kMillisecond);

// Prints the usual table, then each path's frames per second over the 25 of
// the stream: how many channels of this stream one core keeps up with.
class StreamRateReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override
    {
        ConsoleReporter::ReportRuns(runs);
        for (const Run& run : runs) {
            auto items = run.counters.find("items_per_second");
            if (run.error_occurred || items == run.counters.end())
                continue;
            std::printf("%-26s %8.0f frames/s = %6.1f x the stream's 25 frames/s\n", run.benchmark_name().c_str(),
                        items->second.value, items->second.value / kStreamFramesPerSecond);
        }
    }
};

}  // namespace

int main(int argc, char** argv)
{
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv))
        return 1;
    TheDisk();
    StreamRateReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();
    return 0;
}
