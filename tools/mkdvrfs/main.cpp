// mkdvrfs: writes a synthetic recorder disk image from a description on the
// command line, optionally with damaged records.
#include <getopt.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <iterator>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "tools/dvrimage/dvr_image.h"

namespace {

const char kUsage[] = R"(Usage: mkdvrfs [OPTION]... IMAGE
Write a synthetic recorder disk image to IMAGE (a sparse file: only the bytes
written take space, so a large disk costs little).

Geometry:
  --block-size-shift N    log2 of the logical block size (default 12: 4096 bytes)
  --block-count N         logical blocks in the block space (default: just enough)
  --block-space-offset N  physical offset of logical block 0 (default 1048576)
  --backup-offset N       physical offset of the backup superblock (default 524288)
  --table-count N         entries in the block table (default 4)
  --list-max N            entries in the list ring (default 64)
  --data-blocks N         16 MiB blocks in the data ring (default 8)
  --mirror-at N           logical position (bytes) of the list mirror
  --data-ring-at N        logical position (bytes) of the data ring (default:
                          the rings follow the adapter ring, in this order)

Adapter:
  --adapter-run S:L       a run of valid adapter slots: L slots from slot S,
                          wrapping past slot 119 (repeatable; default 0:1);
                          the end of the first run is the current adapter
  --version N             Version of adapter slot 0; 0 means the recorder was
                          never configured (default 1)
  --record-sum N          XOR sum of every list entry, data block header and
                          index entry (default 90)
  --no-frame              the adapter records no newest frame
  --list-span FIRST:LAST  the list positions the adapter names as its oldest
                          and newest recordings (default: the first and the
                          last recording given)

Recordings, in list order, oldest first (repeatable):
  --recording IDX:START:END:T0:T1[:FRAMES[:SIZE]]
                          a list entry at ring position IDX whose data runs
                          from data block START to END (END below START wraps
                          across the end of the data ring), recorded from T0
                          to T1 (seconds since 1970-01-01 UTC), with FRAMES
                          frames of SIZE bytes in each block (default 3 x 1000)
  --overwritten START:END:T0:T1[:FRAMES[:SIZE]]
                          a recording whose list entry the recorder has since
                          written over: its data blocks are written, its entry
                          is not (as after the list ring wrapped)
  --frames FILE           take the frame payloads from FILE, in order, instead
                          of generating them (SIZE of --recording is ignored)
  --frame-size N          with --frames: cut FILE into frames of N bytes
                          (default 4096)
  --h264 FILE             take the frames from an H.264 elementary stream,
                          one access unit per frame (the stream must carry
                          access unit delimiters)

Damage, applied after writing (repeatable):
  --damage WHAT           flips one byte covered by the record's XOR sum:
                          primary-super, backup-super, primary-table,
                          backup-table, adapter:SLOT, list:IDX (the copy in the
                          list ring), mirror:IDX (the copy in the list mirror),
                          header:BLOCK, index:BLOCK:ENTRY

  -h, --help              show this help

Example: a disk with two recordings, the second wrapping across the end of a
ring of 8 data blocks, and the ring copy of the first one's list entry damaged:
  mkdvrfs --recording 0:0:2:1700000000:1700000600 \
          --recording 1:6:1:1700000700:1700001500 --damage list:0 disk.img
)";

struct RecordingArg {
    dvrimage::Recording recording;
    int framesPerBlock = 3;
    std::size_t frameSize = 1000;
};

[[noreturn]] void UsageError(const std::string& message)
{
    std::cerr << "mkdvrfs: " << message << "\nTry 'mkdvrfs --help'.\n";
    std::exit(2);
}

std::vector<long long> Numbers(const std::string& text, const std::string& what)
{
    std::vector<long long> values;
    std::stringstream in(text);
    std::string part;
    while (std::getline(in, part, ':')) {
        char* end = nullptr;
        const long long v = std::strtoll(part.c_str(), &end, 0);
        if (part.empty() || *end != '\0')
            UsageError("bad number '" + part + "' in " + what);
        values.push_back(v);
    }
    return values;
}

long long Number(const char* text, const std::string& what)
{
    const std::vector<long long> v = Numbers(text, what);
    if (v.size() != 1)
        UsageError("expected one number for " + what);
    return v[0];
}

// Two numbers A:B, or a usage error naming the option's form.
std::pair<long long, long long> NumberPair(const char* text, const std::string& option, const std::string& form)
{
    const std::vector<long long> v = Numbers(text, option);
    if (v.size() != 2)
        UsageError(option + " takes " + form);
    return {v[0], v[1]};
}

RecordingArg ParseRecording(const std::string& text)
{
    const std::vector<long long> v = Numbers(text, "--recording");
    if (v.size() < 5 || v.size() > 7)
        UsageError("--recording takes IDX:START:END:T0:T1[:FRAMES[:SIZE]]");
    RecordingArg arg;
    arg.recording.listIdx = static_cast<std::int32_t>(v[0]);
    arg.recording.startBlock = static_cast<std::int32_t>(v[1]);
    arg.recording.endBlock = static_cast<std::int32_t>(v[2]);
    arg.recording.startTime = static_cast<std::uint32_t>(v[3]);
    arg.recording.endTime = static_cast<std::uint32_t>(v[4]);
    if (v.size() > 5)
        arg.framesPerBlock = static_cast<int>(v[5]);
    if (v.size() > 6)
        arg.frameSize = static_cast<std::size_t>(v[6]);
    return arg;
}

// A recording without a list entry: its blocks only.
RecordingArg ParseOverwritten(const std::string& text)
{
    const std::vector<long long> v = Numbers(text, "--overwritten");
    if (v.size() < 4 || v.size() > 6)
        UsageError("--overwritten takes START:END:T0:T1[:FRAMES[:SIZE]]");
    std::string asRecording = "0";
    for (long long n : v)
        asRecording += ":" + std::to_string(n);
    RecordingArg arg = ParseRecording(asRecording);
    arg.recording.listed = false;
    return arg;
}

struct DamageArg {
    dvrimage::Target target;
    long long a = 0;
    long long b = 0;
};

DamageArg ParseDamage(const std::string& text)
{
    const std::string kind = text.substr(0, text.find(':'));
    const std::string rest = text.find(':') == std::string::npos ? "" : text.substr(text.find(':') + 1);
    const std::vector<long long> v = rest.empty() ? std::vector<long long>{} : Numbers(rest, "--damage");
    struct Kind {
        const char* name;
        dvrimage::Target target;
        std::size_t numbers;
    };
    static const Kind kinds[] = {
        {"primary-super", dvrimage::Target::PrimarySuperBlock, 0},
        {"backup-super", dvrimage::Target::BackupSuperBlock, 0},
        {"primary-table", dvrimage::Target::PrimaryBlockTable, 0},
        {"backup-table", dvrimage::Target::BackupBlockTable, 0},
        {"adapter", dvrimage::Target::AdapterSlot, 1},
        {"list", dvrimage::Target::ListEntry, 1},
        {"mirror", dvrimage::Target::ListMirror, 1},
        {"header", dvrimage::Target::BlockHeader, 1},
        {"index", dvrimage::Target::IndexEntry, 2},
    };
    for (const Kind& k : kinds) {
        if (kind != k.name)
            continue;
        if (v.size() != k.numbers)
            UsageError("--damage " + kind + " takes " + std::to_string(k.numbers) + " number(s)");
        return DamageArg{k.target, v.empty() ? 0 : v[0], v.size() > 1 ? v[1] : 0};
    }
    UsageError("unknown record to damage: '" + kind + "'");
}

std::vector<std::uint8_t> ReadFile(const std::string& path)
{
    std::ifstream in(path, std::ios::binary);
    if (!in)
        UsageError("cannot read " + path);
    return std::vector<std::uint8_t>((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

std::vector<std::vector<std::uint8_t>> FramesOfFile(const std::string& path, std::size_t frameSize)
{
    const std::vector<std::uint8_t> bytes = ReadFile(path);
    if (bytes.empty() || frameSize == 0)
        UsageError("no frames in " + path);
    std::vector<std::vector<std::uint8_t>> frames;
    for (std::size_t at = 0; at < bytes.size(); at += frameSize)
        frames.emplace_back(bytes.begin() + static_cast<std::ptrdiff_t>(at),
                            bytes.begin() + static_cast<std::ptrdiff_t>(std::min(bytes.size(), at + frameSize)));
    return frames;
}

}  // namespace

int main(int argc, char** argv)
{
    enum {
        kBlockSizeShift = 1000, kBlockCount, kBlockSpaceOffset, kBackupOffset, kTableCount, kListMax,
        kDataBlocks, kAdapterRun, kVersion, kRecordSum, kNoFrame, kRecording, kOverwritten, kFrames, kFrameSize, kDamage,
        kH264, kMirrorAt, kDataRingAt, kListSpan,
    };
    static const option options[] = {
        {"block-size-shift", required_argument, nullptr, kBlockSizeShift},
        {"block-count", required_argument, nullptr, kBlockCount},
        {"block-space-offset", required_argument, nullptr, kBlockSpaceOffset},
        {"backup-offset", required_argument, nullptr, kBackupOffset},
        {"table-count", required_argument, nullptr, kTableCount},
        {"list-max", required_argument, nullptr, kListMax},
        {"data-blocks", required_argument, nullptr, kDataBlocks},
        {"adapter-run", required_argument, nullptr, kAdapterRun},
        {"version", required_argument, nullptr, kVersion},
        {"record-sum", required_argument, nullptr, kRecordSum},
        {"no-frame", no_argument, nullptr, kNoFrame},
        {"recording", required_argument, nullptr, kRecording},
        {"overwritten", required_argument, nullptr, kOverwritten},
        {"frames", required_argument, nullptr, kFrames},
        {"frame-size", required_argument, nullptr, kFrameSize},
        {"damage", required_argument, nullptr, kDamage},
        {"h264", required_argument, nullptr, kH264},
        {"mirror-at", required_argument, nullptr, kMirrorAt},
        {"data-ring-at", required_argument, nullptr, kDataRingAt},
        {"list-span", required_argument, nullptr, kListSpan},
        {"help", no_argument, nullptr, 'h'},
        {nullptr, 0, nullptr, 0},
    };

    dvrimage::Layout layout;
    std::vector<RecordingArg> recordings;
    std::vector<DamageArg> damage;
    std::string framesFile;
    bool accessUnits = false;
    std::size_t frameSize = 4096;
    bool runsGiven = false;
    int c = 0;
    while ((c = getopt_long(argc, argv, "h", options, nullptr)) != -1) {
        switch (c) {
        case kBlockSizeShift: layout.blockSizeShift = static_cast<std::int32_t>(Number(optarg, "--block-size-shift")); break;
        case kBlockCount: layout.blockCount = static_cast<std::int32_t>(Number(optarg, "--block-count")); break;
        case kBlockSpaceOffset: layout.offsetBlockSpace = static_cast<std::uint64_t>(Number(optarg, "--block-space-offset")); break;
        case kBackupOffset: layout.superOffsetBackup = static_cast<std::uint64_t>(Number(optarg, "--backup-offset")); break;
        case kTableCount: layout.blockTableCount = static_cast<std::uint32_t>(Number(optarg, "--table-count")); break;
        case kListMax: layout.listMax = static_cast<std::int32_t>(Number(optarg, "--list-max")); break;
        case kDataBlocks: layout.dataBlockMax = static_cast<std::int32_t>(Number(optarg, "--data-blocks")); break;
        case kAdapterRun: {
            const auto [start, length] = NumberPair(optarg, "--adapter-run", "START:LENGTH");
            if (!runsGiven)
                layout.adapterRuns.clear();
            runsGiven = true;
            layout.adapterRuns.push_back({static_cast<int>(start), static_cast<int>(length)});
            break;
        }
        case kVersion: layout.version = static_cast<std::int32_t>(Number(optarg, "--version")); break;
        case kRecordSum: layout.recordSum = static_cast<std::uint8_t>(Number(optarg, "--record-sum")); break;
        case kNoFrame: layout.adapterRecordsFrame = false; break;
        case kMirrorAt: layout.listOffsetBackup = static_cast<std::uint64_t>(Number(optarg, "--mirror-at")); break;
        case kDataRingAt: layout.dataBlockOffset = static_cast<std::uint64_t>(Number(optarg, "--data-ring-at")); break;
        case kListSpan: {
            const auto [first, last] = NumberPair(optarg, "--list-span", "FIRST:LAST");
            layout.firstListIdx = static_cast<std::int32_t>(first);
            layout.lastListIdx = static_cast<std::int32_t>(last);
            break;
        }
        case kRecording: recordings.push_back(ParseRecording(optarg)); break;
        case kOverwritten: recordings.push_back(ParseOverwritten(optarg)); break;
        case kFrames: framesFile = optarg; break;
        case kH264: framesFile = optarg; accessUnits = true; break;
        case kFrameSize: frameSize = static_cast<std::size_t>(Number(optarg, "--frame-size")); break;
        case kDamage: damage.push_back(ParseDamage(optarg)); break;
        case 'h': std::cout << kUsage; return 0;
        default: UsageError("unknown option");
        }
    }
    if (optind + 1 != argc)
        UsageError("expected one IMAGE");
    const std::string path = argv[optind];

    try {
        dvrimage::DiskImage image(layout);
        std::vector<std::vector<std::uint8_t>> frames;
        if (!framesFile.empty())
            frames = accessUnits ? dvrimage::AccessUnitsOfFile(framesFile) : FramesOfFile(framesFile, frameSize);
        if (!framesFile.empty() && frames.empty())
            UsageError("no frames in " + framesFile);
        std::size_t nextFrame = 0;
        for (RecordingArg& arg : recordings) {
            if (frames.empty()) {
                const dvrimage::Recording& r = arg.recording;
                const bool listed = r.listed;  // an --overwritten recording keeps its entry unwritten
                arg.recording = dvrimage::GeneratedRecording(r.listIdx, r.startBlock, r.endBlock, r.startTime,
                                                             r.endTime, layout.dataBlockMax, arg.framesPerBlock,
                                                             arg.frameSize);
                arg.recording.listed = listed;
            } else {
                // From where the previous recording stopped.
                dvrimage::FillWithFrames(arg.recording, layout.dataBlockMax, arg.framesPerBlock, frames,
                                         nextFrame);
            }
            image.Add(arg.recording);
        }
        image.Write(path);
        for (const DamageArg& d : damage)
            image.Damage(d.target, d.a, d.b);
        std::cout << "wrote " << path << ": " << image.ImageSize() << " bytes, block size " << image.BlockSize()
                  << ", " << image.BlockCount() << " blocks, " << recordings.size() << " recording(s), "
                  << damage.size() << " damaged record(s)\n";
    } catch (const std::exception& e) {
        std::cerr << "mkdvrfs: " << e.what() << "\n";
        return 1;
    }
    return 0;
}
