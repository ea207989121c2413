// Writes the fuzzers' seed corpus: disks of several geometries from the
// image writer, valid and with every kind of damage it can make, each kept
// as the extents that hold bytes.
//   make_seeds OUTPUT_DIR
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>

#include "tests/fuzz/extent_image.h"
#include "tools/dvrimage/dvr_image.h"

namespace {

using dvrimage::DiskImage;
using dvrimage::GeneratedRecording;
using dvrimage::Layout;
using dvrimage::Target;

struct Hit {
    Target target;
    std::int64_t a = 0;
    std::int64_t b = 0;
};

Layout Small(int shift = 12)
{
    Layout l;
    l.blockSizeShift = shift;
    l.listMax = 16;
    l.dataBlockMax = 8;
    l.blockTableCount = 2;
    return l;
}

void ThreeRecordings(DiskImage& image)
{
    image.Add(GeneratedRecording(0, 0, 1, 100, 200, 8, 2, 16));
    image.Add(GeneratedRecording(1, 2, 3, 300, 400, 8, 2, 16));
    image.Add(GeneratedRecording(2, 6, 0, 500, 600, 8, 2, 16));  // wraps the data ring
}

struct Seed {
    const char* name;
    std::vector<Hit> damage = {};
    std::function<void(DiskImage&)> recordings = ThreeRecordings;
    Layout layout = Small();
};

Layout With(void (*change)(Layout&))
{
    Layout l = Small();
    change(l);
    return l;
}

}  // namespace

int main(int argc, char** argv)
{
    if (argc != 2) {
        std::fprintf(stderr, "usage: make_seeds OUTPUT_DIR\n");
        return 2;
    }
    const std::filesystem::path out = argv[1];
    std::filesystem::create_directories(out);
    const std::string scratch = "/dev/shm/morvane-seed-" + std::to_string(::getpid()) + ".img";
    const auto none = [](DiskImage&) {};
    const std::vector<Seed> seeds = {
        {"valid-4k"},
        {"valid-512", {}, ThreeRecordings, Small(9)},
        {"valid-64k", {}, ThreeRecordings, Small(16)},
        {"empty", {}, none},
        {"list-wraps", {},
         [](DiskImage& i) {
             for (int p : {14, 15, 0, 1})
                 i.Add(GeneratedRecording(p, p % 8, p % 8, 100u * p, 100u * p + 50, 8, 1, 16));
         }},
        {"adapter-run-wraps", {}, ThreeRecordings, With([](Layout& l) { l.adapterRuns = {{110, 20}}; })},
        {"no-frame", {}, ThreeRecordings, With([](Layout& l) { l.adapterRecordsFrame = false; })},
        {"primary-super", {{Target::PrimarySuperBlock}}},
        {"backup-super", {{Target::BackupSuperBlock}}},
        {"primary-table", {{Target::PrimaryBlockTable}}},
        {"backup-table", {{Target::BackupBlockTable}}},
        {"adapter-slot", {{Target::AdapterSlot, 0}}},
        {"list-entry", {{Target::ListEntry, 1}}},
        {"list-both", {{Target::ListEntry, 1}, {Target::ListMirror, 1}}},
        {"list-oldest-and-newest-both",
         {{Target::ListEntry, 0}, {Target::ListMirror, 0}, {Target::ListEntry, 2}, {Target::ListMirror, 2}}},
        {"span-past-the-ring", {}, ThreeRecordings, With([](Layout& l) { l.lastListIdx = 16 + 2; })},
        {"mirror-beyond-the-disk", {{Target::ListEntry, 1}}, ThreeRecordings, With([](Layout& l) {
             l.blockCount = 40000, l.listOffsetBackup = 40000ull * 4096, l.dataBlockOffset = 1 << 20;
         })},
        {"both-supers", {{Target::PrimarySuperBlock}, {Target::BackupSuperBlock}}},
        {"clip-h264", {},
         [](DiskImage& i) {
             const std::vector<std::vector<std::uint8_t>> units =
                 dvrimage::AccessUnitsOfFile(MORVANE_SOURCE_DIR "/samples/clip.h264");
             for (int r = 0; r < 2; ++r) {
                 dvrimage::Recording recording = GeneratedRecording(r, r, r, 1000u + 100u * r, 1001u + 100u * r, 8);
                 recording.blocks.assign(1, {});
                 for (int k = 0; k < 25; ++k)
                     recording.blocks[0].push_back({units[static_cast<std::size_t>(k)], 1});
                 i.Add(recording);
             }
         }},
        {"list-wrapped-over", {},
         [](DiskImage& i) {
             dvrimage::Recording old = GeneratedRecording(0, 0, 1, 100, 200, 8, 2, 16);
             old.listed = false;
             i.Add(old);
             i.Add(GeneratedRecording(0, 2, 3, 300, 400, 8, 2, 16));
         }},
        {"block-header", {{Target::BlockHeader, 0}}},
        {"index-entry", {{Target::IndexEntry, 0, 1}}},
    };
    for (const Seed& seed : seeds) {
        DiskImage image(seed.layout);
        seed.recordings(image);
        image.Write(scratch);
        for (const Hit& hit : seed.damage)
            image.Damage(hit.target, hit.a, hit.b);
        const std::vector<std::uint8_t> extents = fuzzdisk::ReadExtents(scratch);
        std::ofstream(out / seed.name, std::ios::binary)
            .write(reinterpret_cast<const char*>(extents.data()), static_cast<std::streamsize>(extents.size()));
        std::printf("%-18s %6zu bytes\n", seed.name, extents.size());
    }
    std::filesystem::remove(scratch);
    return 0;
}
