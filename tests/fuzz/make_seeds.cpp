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

struct Seed {
    const char* name;
    std::function<Layout()> layout;
    std::function<void(DiskImage&)> recordings;
    std::function<void(DiskImage&)> damage;
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

void None(DiskImage&) {}

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
    const std::vector<Seed> seeds = {
        {"valid-4k", [] { return Small(); }, ThreeRecordings, None},
        {"valid-512", [] { return Small(9); }, ThreeRecordings, None},
        {"valid-64k", [] { return Small(16); }, ThreeRecordings, None},
        {"empty", [] { return Small(); }, None, None},
        {"list-wraps",
         [] { return Small(); },
         [](DiskImage& i) {
             for (int p : {14, 15, 0, 1})
                 i.Add(GeneratedRecording(p, p % 8, p % 8, 100u * p, 100u * p + 50, 8, 1, 16));
         },
         None},
        {"adapter-run-wraps",
         [] {
             Layout l = Small();
             l.adapterRuns = {{110, 20}};
             return l;
         },
         ThreeRecordings, None},
        {"no-frame",
         [] {
             Layout l = Small();
             l.adapterRecordsFrame = false;
             return l;
         },
         ThreeRecordings, None},
        {"primary-super", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::PrimarySuperBlock); }},
        {"backup-super", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::BackupSuperBlock); }},
        {"primary-table", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::PrimaryBlockTable); }},
        {"backup-table", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::BackupBlockTable); }},
        {"adapter-slot", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::AdapterSlot, 0); }},
        {"list-entry", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::ListEntry, 1); }},
        {"list-both",
         [] { return Small(); },
         ThreeRecordings,
         [](DiskImage& i) {
             i.Damage(Target::ListEntry, 1);
             i.Damage(Target::ListMirror, 1);
         }},
        {"list-oldest-and-newest-both",
         [] { return Small(); },
         ThreeRecordings,
         [](DiskImage& i) {
             for (int p : {0, 2}) {
                 i.Damage(Target::ListEntry, p);
                 i.Damage(Target::ListMirror, p);
             }
         }},
        {"span-past-the-ring",
         [] {
             Layout l = Small();
             l.lastListIdx = 16 + 2;
             return l;
         },
         ThreeRecordings, None},
        {"mirror-beyond-the-disk",
         [] {
             Layout l = Small();
             l.blockCount = 40000;
             l.listOffsetBackup = 40000ull * 4096;
             l.dataBlockOffset = 1 << 20;
             return l;
         },
         ThreeRecordings, [](DiskImage& i) { i.Damage(Target::ListEntry, 1); }},
        {"both-supers",
         [] { return Small(); },
         ThreeRecordings,
         [](DiskImage& i) {
             i.Damage(Target::PrimarySuperBlock);
             i.Damage(Target::BackupSuperBlock);
         }},
        {"clip-h264",
         [] { return Small(); },
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
         },
         None},
        {"list-wrapped-over",
         [] { return Small(); },
         [](DiskImage& i) {
             dvrimage::Recording old = GeneratedRecording(0, 0, 1, 100, 200, 8, 2, 16);
             old.listed = false;
             i.Add(old);
             i.Add(GeneratedRecording(0, 2, 3, 300, 400, 8, 2, 16));
         },
         None},
        {"block-header", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::BlockHeader, 0); }},
        {"index-entry", [] { return Small(); }, ThreeRecordings, [](DiskImage& i) { i.Damage(Target::IndexEntry, 0, 1); }},
    };
    for (const Seed& seed : seeds) {
        DiskImage image(seed.layout());
        seed.recordings(image);
        image.Write(scratch);
        seed.damage(image);
        const std::vector<std::uint8_t> extents = fuzzdisk::ReadExtents(scratch);
        std::ofstream(out / seed.name, std::ios::binary)
            .write(reinterpret_cast<const char*>(extents.data()), static_cast<std::streamsize>(extents.size()));
        std::printf("%-18s %6zu bytes\n", seed.name, extents.size());
    }
    std::filesystem::remove(scratch);
    return 0;
}
