// dvrfs: looks at a recorder's disk without the host application: what its
// superblock and adapter say, the recordings on it, whether its records are
// sound, a recording taken off it as an elementary stream; and, through
// export_command.cpp, recordings handed on as files, the disk's hash and the
// blocks its index lost.
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "catalog/build_summary.h"
#include "catalog/catalog_reader.h"
#include "tools/dvrfs/command_line.h"
#include "tools/dvrfs/disk_check.h"
#include "tools/dvrfs/export.h"
#include "tools/dvrfs/json_text.h"
#include "tools/dvrfs/recover.h"
#include "tools/dvrfs/report.h"

namespace {

using namespace dvrfscli;

const char kVersion[] = "dvrfs 1.1 (morvane)\n";

const char kHelp[] = R"(Usage: dvrfs COMMAND DISK [OPTION]...
Look at a recorder's disk (a device, a raw image, a split raw image by its
.001 piece, an E01 image by its .E01 segment) read-only, and hand its
recordings on. Options may stand before or after the operands.

Commands:
  info DISK [--dump] [--json] the superblock and the current adapter
  list DISK [--json] [--local]
                              the recordings, as the playback panel lists them
  verify DISK [--json]        read every record once, report damage
  extract DISK ROW -o FILE    the frames of a recording as the raw stream
  export DISK ROW... [-o FILE|DIR] [--format mp4|mkv|h264] [--merge]
  export DISK --from TIME --to TIME [-o FILE|DIR] [--merge]
                              recordings as MP4 files with their real time,
                              each with its SHA-256
  hash DISK                   the SHA-256 of the whole disk or image
  recover DISK [--json] [--local]
                              runs of data blocks no listed recording covers
  report DISK [-o DIR] [--hash]
                              a case report: JSON, CSV and an HTML page with
                              a picture of each recording

'dvrfs COMMAND --help' says more of each; 'dvrfs --version' names this one.

Text outputs give times in UTC; --local gives them in the workstation's
local time. JSON times are UTC.

Exit status: 0 success; 1 the disk cannot be opened or read as a recorder
disk; 2 usage error; 3 verify found damage; 4 export left damaged frames or
blocks out; 5 an output could not be written.
)";

const std::map<std::string, std::string> kCommandHelp = {
    {"info", R"(Usage: dvrfs info DISK [--dump] [--json]
The superblock and the current adapter, one key=value a line (times in
seconds since 1970, UTC); image says what kind of image was read (and, for
an E01, what it says of its acquisition); superblock_copy whether the
primary or the backup copy was read. --dump adds the reader's adapter dump;
--json prints one object instead, the times also as ISO 8601 UTC texts.
)"},
    {"list", R"(Usage: dvrfs list DISK [--json] [--local]
The recordings, as the playback panel lists them: ROW, IDX, START, END
(seconds since 1970, UTC), DATE TIME (UTC; --local: the workstation's local
time), tab-separated; --json prints one object, the times also as ISO 8601
UTC texts (start_utc, end_utc). Entries damaged in both copies are skipped
and named on standard error (and under "skipped" in the JSON).
)"},
    {"verify", R"(Usage: dvrfs verify DISK [--json]
Reads every record once (both superblock copies, the 120 adapter slots, the
list entries of the span in the ring and the mirror, each claimed data
block's header and index) and reports each damaged or repaired one, then a
summary; --json prints one object with the stage reached, the counts and
each finding. Exit status 3 when it found damage.
)"},
    {"extract", R"(Usage: dvrfs extract DISK ROW -o FILE [--force]
Writes the frames of recording ROW (as listed) to FILE, in order, as the raw
H.264 stream; '-o -' writes to standard output. An existing FILE is replaced
only with --force. Damaged frames and blocks are left out with a warning.
)"},
    {"export", R"(Usage: dvrfs export DISK ROW... [-o FILE|DIR] [--format mp4|mkv|h264] [--merge] [--force]
       dvrfs export DISK --from TIME --to TIME [-o FILE|DIR] [--merge] [--format ...]
Remuxes recordings, without re-encoding, into MP4 (default), Matroska or the
raw H.264 stream, timed by the stream's own frame rate (or the recording's
frames over its duration) and with the recording's start as the file's
creation time. Files are named rowROW-STARTZ.EXT (UTC, ISO 8601 without
colons) in DIR (default: the current folder); one ROW may name a FILE, or
'-' for standard output. With --from/--to (seconds since 1970, or
YYYY-MM-DDTHH:MM:SSZ) every recording that overlaps the range is exported,
from the key frame at or before its start. --merge writes all the
recordings into one file (rowsFIRST-LAST-STARTZ.EXT), each frame at its
recording's own time, so the pauses between recordings stay gaps. Each
file's SHA-256 is printed and written beside it as FILE.sha256 (sha256sum
-c). Damaged frames and blocks are left out, named in a warning with their
time (UTC; --local: the workstation's local time); the exit status is then 4.
)"},
    {"recover", R"(Usage: dvrfs recover DISK [--json] [--local]
Scans the header of every data block of the data ring once (one 128-byte
read per 16 MiB block) and lists the runs of consecutive blocks whose header
is sound but which no listed recording covers: what the recorder's index
lost when its list ring wrote over older entries, or when an entry is
damaged. Each run: its blocks, its frames, and the time it must lie in
(after the end of the listed recording before it, before the start of the
one after, UTC; --local: the workstation's local time). 'extract --blocks
FIRST:LAST' and 'export --blocks FIRST:LAST' take such a run.
)"},
    {"report", R"(Usage: dvrfs report DISK [-o DIR] [--hash]
A case report on the disk in DIR (default: the current folder):
report.json, report.csv and report.html, a page a browser opens by itself:
the tool, the disk, when the report was made, what the disk holds, the
verification with each damaged or repaired record, and the catalogue (row,
list index, start, end and duration in UTC and local time, repaired
entries, skipped entries) with a picture of each recording's first key
frame (also beside it as report-rowN.png). --hash adds the disk's SHA-256.
)"},
    {"hash", R"(Usage: dvrfs hash DISK
The SHA-256 of the whole disk or image, read once from start to end, in the
format of sha256sum; a progress bar on a terminal.
)"},
};


const char* PlainWords(std::int32_t code)
{
    switch (code) {
    case kErrNone: return "the disk cannot be opened";
    case kErrSuperBlock: return "the superblock is damaged";
    case kErrBlockTable: return "the block table is damaged";
    case kErrTableLimit: return "the superblock is inconsistent";
    case kErrGeometry: return "the superblock's block size is inconsistent";
    case kErrTableSize: return "the block table is too large";
    case kErrReadRange:
    case kErrReadBeyond: return "a record lies outside the disk";
    case kErrAdapter: return "no valid state record was found";
    case kErrAdapterRings: return "the state record describes rings larger than any recorder's";
    case kErrListEntry:
    case kErrListNegative:
    case kErrListBeyond: return "a recording entry is damaged";
    case kErrBlockHeader:
    case kErrBlockNegative:
    case kErrBlockBeyond: return "a data block header is damaged";
    case kErrIndexEntry:
    case kErrIndexNegative:
    case kErrIndexBeyond: return "a frame index entry is damaged";
    default: return "the disk is damaged";
    }
}

int CannotRead(const char* disk, const char* what, const DvrDiskReader& reader)
{
    std::fflush(stdout);
    std::fprintf(stderr, "dvrfs: %s: %s: %s (code %d%s%s)\n", PrintableName(disk).c_str(), what,
                 PlainWords(reader.ErrorCode()), reader.ErrorCode(), reader.ErrorText()[0] ? ": " : "",
                 reader.ErrorText());
    return kDiskUnreadable;
}

struct Fact {
    std::string key;
    std::string value;
    bool text;  // a string in JSON, else a number
};

template <typename Number>
Fact Numeric(const char* key, Number value)
{
    return {key, std::to_string(value), false};
}

void PrintFacts(const std::vector<Fact>& facts, bool json);

int Info(const char* disk, bool dump, bool json)
{
    CatalogReader reader;
    const dvrfs::VolumeStatus status = reader.OpenVolume(disk);
    if (!reader.Volume())
        return SayWhyNot(status, disk);
    const _H264SuperBlock_t& super = reader.Volume()->superBlock;
    char magic[16];
    std::snprintf(magic, sizeof magic, "0x%04X", super.Magic);
    std::vector<Fact> facts = {
        {"magic", magic, true},
        Numeric("header_size", super.HeaderSize),
        Numeric("block_size", super.BlockSize),
        Numeric("block_count", super.BlockCount),
        Numeric("block_table_count", super.BlockTableCount),
        Numeric("offset_block_space", static_cast<unsigned long long>(super.OffsetBlockSpace)),
        Numeric("super_offset", static_cast<unsigned long long>(super.SuperOffset)),
        Numeric("super_offset_backup", static_cast<unsigned long long>(super.SuperOffsetBackup)),
        {"image", status.sourceKind, true},
    };
    for (const auto& [key, value] : reader.Source()->Facts())
        facts.push_back({"image_" + key, value, true});
    const bool onBackup = reader.Volume()->copyInUse != SuperBlockCopy::kPrimary;
    facts.push_back({"superblock_copy", onBackup ? "backup" : "primary", true});

    // The superblock and the adapter as far as the open found them.
    if (!reader.Adapter()) {
        PrintFacts(facts, json);
        return SayWhyNot(status, disk);
    }
    const _HisiAdapter_t& adapter = *reader.Adapter();
    for (const Fact& fact : {Numeric("adapter_slot", adapter.Idx), Numeric("adapter_version", adapter.Version),
                             Numeric("list_max", adapter.ListMax), Numeric("data_block_max", adapter.DataBlockMax),
                             Numeric("first_list", adapter.FirstList.Idx), Numeric("last_list", adapter.LastList.Idx),
                             Numeric("record_sum", static_cast<unsigned>(adapter.RecordSum)),
                             Numeric("start_time", adapter.StartTime), Numeric("end_time", adapter.EndTime)})
        facts.push_back(fact);
    for (char selector : {1, 3, 17, 19, 33, 35, 49, 50})
        facts.push_back(Numeric(("info_" + std::to_string(selector)).c_str(),
                                static_cast<long long>(reader.GetInfo(selector))));
    if (json) {  // the times also as text, for whoever reads the JSON
        facts.push_back({"start_time_utc", dvrfstool::IsoUtc(adapter.StartTime), true});
        facts.push_back({"end_time_utc", dvrfstool::IsoUtc(adapter.EndTime), true});
    }
    PrintFacts(facts, json);
    if (dump && !json)
        reader.DumpAdapter();
    return kOk;
}

// key=value a line, or one JSON object.
void PrintFacts(const std::vector<Fact>& facts, bool json)
{
    if (!json) {
        for (const Fact& fact : facts)
            std::printf("%s=%s\n", fact.key.c_str(), fact.value.c_str());
    } else {
        std::printf("{");
        for (std::size_t i = 0; i < facts.size(); ++i)
            std::printf("%s\"%s\": %s", i ? ", " : "", facts[i].key.c_str(),
                        facts[i].text ? JsonText(facts[i].value).c_str() : facts[i].value.c_str());
        std::printf("}\n");
    }
    std::fflush(stdout);
}

// Says on standard error which entries of the disk's list have no row, and
// which recording could not be read to its end.
void ReportSkipped(const CatalogReader& reader)
{
    std::fflush(stdout);
    auto say = [](const std::vector<std::int32_t>& positions, const char* what) {
        if (positions.empty())
            return;
        std::fprintf(stderr, "dvrfs: %zu %s recording entr%s skipped (list position%s %s)\n", positions.size(), what,
                     positions.size() == 1 ? "y" : "ies", positions.size() == 1 ? "" : "s",
                     PositionsText(positions).c_str());
    };
    say(reader.m_skippedPositions, "damaged");
    say(reader.m_unwrittenPositions, "unwritten");
    if (reader.m_newestBlockUnreadableRow >= 0)
        std::fprintf(stderr, "dvrfs: the newest recording's newest block is unreadable (row %d)\n",
                     reader.m_newestBlockUnreadableRow);
    if (reader.Status().Truncated())
        std::fprintf(stderr, "dvrfs: %s\n", dvrfs::TruncationText(reader.Status()).c_str());
}

void PrintPositions(const char* key, const std::vector<std::int32_t>& positions)
{
    std::printf("], \"%s\": [", key);
    for (std::size_t i = 0; i < positions.size(); ++i)
        std::printf("%s%d", i ? ", " : "", positions[i]);
}

int List(const char* disk, bool json)
{
    CatalogReader reader;
    if (const int status = BuildCatalog(reader, disk); status != kOk)
        return status;
    ReportSkipped(reader);
    const RecordCatalog& catalog = *reader.Catalog();
    if (!json) {
        for (int row = 0; row < reader.m_recordCount; ++row) {
            const CatalogEntry& e = catalog.Entries[row];
            const std::uint32_t start = e.StartSeconds();
            const std::uint32_t end = e.EndSeconds();
            std::string when = std::string(e.DateText) + " " + e.TimeText;
            if (TextZone() == Zone::kLocal)
                when = TimeText(start, "%Y/%m/%d %H:%M:%S-", Zone::kLocal) + TimeText(end, "%H:%M:%S", Zone::kLocal);
            std::printf("%d\t%d\t%u\t%u\t%s\n", row, e.Idx, start, end, when.c_str());
        }
        return kOk;
    }
    std::printf("{\"span_count\": %u, \"recordings\": [", catalog.SpanCount);
    for (int row = 0; row < reader.m_recordCount; ++row) {
        const CatalogEntry& e = catalog.Entries[row];
        const std::uint32_t start = e.StartSeconds();
        const std::uint32_t end = e.EndSeconds();
        std::printf("%s{\"row\": %d, \"idx\": %d, \"start\": %u, \"end\": %u, \"date\": %s, \"time\": %s, "
                    "\"start_utc\": \"%s\", \"end_utc\": \"%s\"}",
                    row ? ", " : "", row, e.Idx, start, end, JsonText(e.DateText).c_str(),
                    JsonText(e.TimeText).c_str(), dvrfstool::IsoUtc(start).c_str(), dvrfstool::IsoUtc(end).c_str());
    }
    PrintPositions("skipped", reader.m_skippedPositions);
    if (!reader.m_unwrittenPositions.empty())
        PrintPositions("unwritten", reader.m_unwrittenPositions);
    std::printf("]");
    if (reader.m_newestBlockUnreadableRow >= 0)
        std::printf(", \"newest_block_unreadable_row\": %d", reader.m_newestBlockUnreadableRow);
    if (!reader.HasError())
        std::printf(", \"error\": null}\n");
    else
        std::printf(", \"error\": {\"code\": %d, \"text\": %s}}\n", reader.ErrorCode(),
                    JsonText(reader.ErrorText()).c_str());
    return kOk;
}

int Verify(const char* disk, bool json)
{
    CatalogReader reader;
    std::vector<std::string> findings;
    const dvrfstool::VerifyResult result =
        dvrfstool::VerifyDisk(reader, disk, [json, &findings](const std::string& line) {
            if (json)
                findings.push_back(line);
            else
                std::printf("%s\n", line.c_str());
        });
    static const char* const kStages[] = {"not opened", "not configured", "no adapter", "complete"};
    if (json) {
        std::printf("{\"stage\": \"%s\", \"checked\": %lld, \"damaged\": %lld, \"repaired\": %lld, ",
                    kStages[static_cast<int>(result.stage)], result.checked, result.damaged, result.repaired);
        if (result.unwritten > 0)
            std::printf("\"unwritten\": %lld, ", result.unwritten);
        std::printf("\"findings\": [");
        for (std::size_t i = 0; i < findings.size(); ++i) {
            const std::size_t colon = findings[i].find(": ");
            std::printf("%s{\"kind\": %s, \"record\": %s}", i ? ", " : "",
                        JsonText(findings[i].substr(0, colon)).c_str(),
                        JsonText(findings[i].substr(colon + 2)).c_str());
        }
        std::printf("]}\n");
    } else {
        std::printf("summary: %lld records checked, %lld damaged, %lld repaired%s\n", result.checked, result.damaged,
                    result.repaired,
                    result.unwritten > 0 ? (", " + std::to_string(result.unwritten) + " unwritten").c_str() : "");
    }
    if (result.stage != dvrfstool::VerifyStage::kComplete)
        return SayWhyNot(result.status, disk);
    return result.damaged + result.repaired > 0 ? kDamageFound : kOk;
}

// Opens the output file, after CheckOutput.
int OpenOutput(const char* disk, const char* output, bool force, int* fd)
{
    if (const int status = CheckOutput(disk, output, force); status != kOk)
        return status;
    *fd = ::open(output, O_WRONLY | O_CREAT | O_CLOEXEC | (force ? O_TRUNC : O_EXCL), 0644);
    if (*fd < 0) {
        std::fprintf(stderr, "dvrfs: cannot write %s: %s\n", output, std::strerror(errno));
        return kOutputFailed;
    }
    return kOk;
}

bool WriteAll(int fd, const unsigned char* data, std::size_t size)
{
    while (size > 0) {
        const ssize_t n = ::write(fd, data, size);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            return false;
        data += n;
        size -= static_cast<std::size_t>(n);
    }
    return true;
}

// The frames of a row, or with `blocks` of a run of blocks as recover
// lists them.
int Extract(const char* disk, const char* rowText, const char* output, bool force, const std::string& blocks = "")
{
    std::int32_t first = 0;
    std::int32_t last = 0;
    long row = 0;
    if (!blocks.empty()) {
        if (!ParseBlocks(blocks, &first, &last))
            return UsageError("--blocks takes FIRST:LAST");
    } else {
        char* end = nullptr;
        row = std::strtol(rowText, &end, 10);
        if (*rowText == '\0' || *end != '\0' || row < 0)
            return UsageError(std::string("not a row number: ") + rowText);
    }
    CatalogReader reader;
    if (const int status = BuildCatalog(reader, disk); status != kOk)
        return status;
    _HisiList_t recording = dvrfstool::RecordingOfBlocks(first, last);
    if (blocks.empty()) {
        if (row >= reader.m_recordCount)
            return UsageError("no row " + std::to_string(row) + ": the disk lists " +
                              std::to_string(reader.m_recordCount) + " recording(s)");
        if (!dvrfstool::RecordingOfRow(reader, static_cast<int>(row), &recording))
            return CannotRead(disk, "the recording's entry cannot be read", reader);
    }

    const bool toStdout = std::strcmp(output, "-") == 0;
    int fd = STDOUT_FILENO;
    if (!toStdout) {
        if (const int status = OpenOutput(disk, output, force, &fd); status != kOk)
            return status;
    }
    dvrfstool::ExtractResult result;
    {
        ProgressBar bar;
        result = dvrfstool::ExtractRecording(
            reader, recording, [fd](const dvrfstool::ExtractedFrame& f) { return WriteAll(fd, f.data, f.size); },
            [&bar](double fraction) { bar.Show(fraction); });
    }
    const bool closed = toStdout || ::close(fd) == 0;
    if (!result.written || !closed) {
        std::fprintf(stderr, "dvrfs: cannot write %s: %s\n", output, std::strerror(errno));
        return kOutputFailed;
    }
    // On standard output the stream is the output: the count goes to standard error.
    std::fprintf(toStdout ? stderr : stdout, "%lld frames, %lld bytes written to %s\n", result.frames, result.bytes,
                 output);
    if (result.skippedFrames + result.skippedBlocks > 0)
        std::fprintf(stderr, "dvrfs: warning: %lld damaged frame(s) and %lld damaged block(s) left out\n",
                     result.skippedFrames, result.skippedBlocks);
    return kOk;
}

int Report(const std::string& disk, const std::string& folder, bool hash)
{
    std::error_code error;
    std::filesystem::create_directories(folder, error);
    dvrfstool::ReportRequest request{disk, folder, kVersion, hash};
    request.toolVersion.pop_back();  // the version line's newline
    const std::string why = dvrfstool::WriteReport(request);
    if (!why.empty()) {
        std::fprintf(stderr, "dvrfs: %s: %s\n", disk.c_str(), why.c_str());
        return kDiskUnreadable;
    }
    std::printf("%s/report.html, report.json and report.csv written\n", folder.c_str());
    return kOk;
}

}  // namespace

int main(int argc, char** argv)
{
    CommandLine line;
    if (!ParseCommandLine(argc, argv, &line))
        return kUsageError;
    if (line.Has("--version")) {
        std::fputs(kVersion, stdout);
        return kOk;
    }
    if (line.command.empty() || (line.Has("--help") && !kCommandHelp.count(line.command))) {
        if (!line.Has("--help") && line.command.empty())
            return UsageError("expected a command and a disk");
        std::fputs(kHelp, stdout);
        return kOk;
    }
    if (!kCommandHelp.count(line.command))
        return UsageError("no command '" + line.command + "'");
    if (line.Has("--help")) {
        std::fputs(kCommandHelp.at(line.command).c_str(), stdout);
        return kOk;
    }
    static const std::map<std::string, std::set<std::string>> kFlags = {
        {"info", {"--dump", "--json"}}, {"list", {"--json", "--local"}}, {"verify", {"--json"}},
        {"extract", {"--force"}}, {"export", {"--force", "--merge", "--local"}}, {"hash", {}},
        {"recover", {"--json", "--local"}}, {"report", {"--hash"}},
    };
    for (const std::string& flag : line.flags)
        if (!kFlags.at(line.command).count(flag))
            return UsageError("'" + line.command + "' takes no option " + flag);
    if (line.operands.empty())
        return UsageError("'" + line.command + "' needs a disk");
    if (line.Has("--local"))
        SetTextZone(Zone::kLocal);
    const std::string& disk = line.operands[0];
    const std::size_t operands = line.operands.size();
    if (line.command == "info" && operands == 1)
        return Info(disk.c_str(), line.Has("--dump"), line.Has("--json"));
    if (line.command == "list" && operands == 1)
        return List(disk.c_str(), line.Has("--json"));
    if (line.command == "verify" && operands == 1)
        return Verify(disk.c_str(), line.Has("--json"));
    if (line.command == "extract" && operands == 2 && line.Value("-o") && !line.Value("--blocks"))
        return Extract(disk.c_str(), line.operands[1].c_str(), line.Value("-o")->c_str(), line.Has("--force"));
    if (line.command == "extract" && operands == 1 && line.Value("-o") && line.Value("--blocks"))
        return Extract(disk.c_str(), nullptr, line.Value("-o")->c_str(), line.Has("--force"), *line.Value("--blocks"));
    if (line.command == "export")
        return ExportCommand(line);
    if (line.command == "hash" && operands == 1)
        return HashCommand(disk);
    if (line.command == "recover" && operands == 1)
        return RecoverCommand(disk, line.Has("--json"));
    if (line.command == "report" && operands == 1)
        return Report(disk, line.Value("-o") ? *line.Value("-o") : ".", line.Has("--hash"));
    return UsageError("cannot make sense of the arguments of '" + line.command + "'");
}
