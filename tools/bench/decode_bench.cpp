// The decode path of the host's decoder thread, per channel: frames read
// from a disk with the stream extraction and decoded to RGB pictures with
// libavcodec, in frames per second against the stream's own 25; at the
// sample clip's 320 x 240 and at the 1920 x 1080 recorders record, on one
// core, with libavcodec's threads on every core, and as many single-threaded
// channels at once as there are cores.
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <thread>

#include "catalog/catalog_reader.h"
#include "host/h264_decoder.h"
#include "tools/dvrimage/dvr_image.h"

namespace {

constexpr int kBlocks = 8;
constexpr int kFramesPerBlock = 25;
constexpr double kStreamFramesPerSecond = 25.0;

using Frames = std::vector<std::vector<std::uint8_t>>;

const Frames& Clip1080()
{
    static const Frames frames = dvrimage::AccessUnitsOfFile(MORVANE_SOURCE_DIR "/samples/clip1080.h264");
    return frames;
}

struct ClipDisk {
    std::filesystem::path path;
    Frames frames;

    ClipDisk()
    {
        const Frames units = dvrimage::AccessUnitsOfFile(MORVANE_SOURCE_DIR "/samples/clip.h264");
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

// Decodes every frame, then pushes out what the decoder still holds; the
// number of pictures that came out.
std::size_t DecodeAll(const Frames& frames, int threads)
{
    H264Decoder decoder(threads);
    std::size_t pictures = 0;
    for (std::size_t i = 0; i < frames.size(); ++i)
        pictures += decoder.Decode(frames[i].data(), frames[i].size(), 0, 0, i + 1 == frames.size()).size();
    return pictures;
}

void BM_DecodeToRgb(benchmark::State& state)
{
    const Frames& frames = TheDisk().frames;
    for (auto _ : state)
        benchmark::DoNotOptimize(DecodeAll(frames, 1));
    state.SetItemsProcessed(state.iterations() * static_cast<long long>(frames.size()));
}

// One 1080p channel; range(0) is libavcodec's thread count (0: every core).
void BM_Decode1080ToRgb(benchmark::State& state)
{
    const Frames& frames = Clip1080();
    for (auto _ : state)
        benchmark::DoNotOptimize(DecodeAll(frames, static_cast<int>(state.range(0))));
    state.SetItemsProcessed(state.iterations() * static_cast<long long>(frames.size()));
}

// As many 1080p channels at once as there are cores, each decoded on a
// thread of its own as the host's decoder threads do: the frames per second
// of all of them together.
void BM_Decode1080Channels(benchmark::State& state)
{
    const Frames& frames = Clip1080();
    const unsigned channels = std::max(1u, std::thread::hardware_concurrency());
    for (auto _ : state) {
        std::vector<std::thread> workers;
        for (unsigned c = 0; c < channels; ++c)
            workers.emplace_back([&frames] { benchmark::DoNotOptimize(DecodeAll(frames, 1)); });
        for (std::thread& worker : workers)
            worker.join();
    }
    state.SetItemsProcessed(state.iterations() * static_cast<long long>(frames.size()) * channels);
    state.counters["channels"] = channels;
}

void BM_ReadAndDecodeToRgb(benchmark::State& state)
{
    CatalogReader reader;
    if (reader.BuildCatalog(TheDisk().path) != CatalogBuild::kBuilt) {
        state.SkipWithError("the disk did not open");
        return;
    }
    const _HisiAdapter_t& adapter = *reader.Adapter();
    std::vector<unsigned char> payload(static_cast<std::size_t>(kPayloadAreaSize));
    const int frames = kBlocks * kFramesPerBlock;
    for (auto _ : state) {
        H264Decoder decoder;
        reader.SetStreamCursor(0, 0);
        for (int i = 0; i < frames; ++i) {
            _HisiHeader_t header{};
            const int size = reader.NextFrame(payload.data(), &header, adapter.FirstList, adapter.LastList, 1);
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
BENCHMARK(BM_Decode1080ToRgb)->Arg(1)->Arg(0)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(BM_Decode1080Channels)->Unit(benchmark::kMillisecond)->UseRealTime();

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
            std::printf("%-36s %8.0f frames/s = %6.1f channels of 25 frames/s in real time\n",
                        run.benchmark_name().c_str(), items->second.value,
                        items->second.value / kStreamFramesPerSecond);
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
    Clip1080();
    StreamRateReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();
    return 0;
}
