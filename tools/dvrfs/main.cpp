// dvrfs: looks at a recorder's disk without the host application: what its
// superblock and adapter say, the recordings on it, whether its records are
// sound, and a recording taken off it as an elementary stream.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "catalog/catalog_reader.h"
#include "tools/dvrfs/disk_check.h"

namespace {

enum ExitStatus { kOk = 0, kDiskUnreadable = 1, kUsageError = 2, kDamageFound = 3 };

const char kHelp[] = R"(Usage: dvrfs COMMAND DISK [OPTION]...
Look at a recorder's disk (a device or an image file), read-only.

Commands:
  info DISK [--dump]          the superblock and the current adapter, one
                              key=value a line; --dump adds the adapter dump
  list DISK [--json]          the recordings, as the playback panel lists them:
                              ROW, IDX, START, END (seconds since 1970, UTC),
                              DATE TIME (UTC), tab-separated; or one JSON object
  verify DISK                 read every record once and report each damaged
                              or repaired one, then a summary
  extract DISK ROW -o FILE [--force]
                              write the frames of recording ROW (as listed) to
                              FILE, in order; an existing FILE is replaced only
                              with --force

Exit status: 0 success; 1 the disk cannot be opened or read as a recorder
disk; 2 usage error; 3 verify found damage.
)";

int UsageError(const std::string& message)
{
    std::fprintf(stderr, "dvrfs: %s\nTry 'dvrfs --help'.\n", message.c_str());
    return kUsageError;
}

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
    std::fprintf(stderr, "dvrfs: %s: %s: %s (code %d%s%s)\n", disk, what, PlainWords(reader.m_errorCode),
                 reader.m_errorCode, reader.m_errorText[0] ? ": " : "", reader.m_errorText);
    return kDiskUnreadable;
}

int NotConfigured(const char* disk)
{
    std::fflush(stdout);
    std::fprintf(stderr, "dvrfs: %s: no recorder was ever configured on this disk\n", disk);
    return kDiskUnreadable;
}

// Builds the catalogue as the panel does; a status other than kOk when the
// disk cannot be read as a recorder disk.
int BuildCatalog(CatalogReader& reader, const char* disk)
{
    switch (reader.BuildCatalog(wxString::FromUTF8(disk))) {
    case CatalogBuild::kBuilt: return kOk;
    case CatalogBuild::kNotOpened: return CannotRead(disk, "not a recorder disk", reader);
    case CatalogBuild::kNotConfigured: return NotConfigured(disk);
    case CatalogBuild::kNoAdapter: return CannotRead(disk, "no current state record", reader);
    }
    return kDiskUnreadable;
}

int Info(const char* disk, bool dump)
{
    CatalogReader reader;
    if (reader.OpenDVRFS(wxString::FromUTF8(disk)) <= 0)
        return CannotRead(disk, "not a recorder disk", reader);
    const _H264SuperBlock_t& super = reader.m_volume->superBlock;
    std::printf("magic=0x%04X\n", super.Magic);
    std::printf("header_size=%u\n", super.HeaderSize);
    std::printf("block_size=%d\n", super.BlockSize);
    std::printf("block_count=%d\n", super.BlockCount);
    std::printf("block_table_count=%u\n", super.BlockTableCount);
    std::printf("offset_block_space=%llu\n", static_cast<unsigned long long>(super.OffsetBlockSpace));
    std::printf("super_offset=%llu\n", static_cast<unsigned long long>(super.SuperOffset));
    std::printf("super_offset_backup=%llu\n", static_cast<unsigned long long>(super.SuperOffsetBackup));
    const bool onBackup = reader.m_volume->copyInUse != SuperBlockCopy::kPrimary;
    std::printf("superblock_copy=%s\n", onBackup ? "backup" : "primary");

    if (reader.Checkconfig() <= 0)
        return NotConfigured(disk);
    if (reader.BlockOpe(reader.m_diskFile, 2, nullptr, 0, 0) < 0 && !reader.m_volume->adapter)
        return CannotRead(disk, "no current state record", reader);
    const _HisiAdapter_t& adapter = *reader.m_volume->adapter;
    std::printf("adapter_slot=%d\n", adapter.Idx);
    std::printf("adapter_version=%d\n", adapter.Version);
    std::printf("list_max=%d\n", adapter.ListMax);
    std::printf("data_block_max=%d\n", adapter.DataBlockMax);
    std::printf("first_list=%d\n", adapter.FirstList.Idx);
    std::printf("last_list=%d\n", adapter.LastList.Idx);
    std::printf("record_sum=%u\n", adapter.RecordSum);
    std::printf("start_time=%u\n", adapter.StartTime);
    std::printf("end_time=%u\n", adapter.EndTime);
    for (char selector : {1, 3, 17, 19, 33, 35, 49, 50})
        std::printf("info_%d=%lld\n", selector, static_cast<long long>(reader.GetInfo(selector)));
    std::fflush(stdout);
    if (dump)
        reader.BlockOpe(reader.m_diskFile, 5, nullptr, 0, 0);
    return kOk;
}

std::string JsonString(const char* text)
{
    std::string out = "\"";
    for (const char* p = text; *p; ++p) {
        const unsigned char c = static_cast<unsigned char>(*p);
        if (c == '"' || c == '\\') {
            out += '\\';
            out += static_cast<char>(c);
        } else if (c < 0x20 || c >= 0x7F) {
            char escaped[8];
            std::snprintf(escaped, sizeof escaped, "\\u%04x", c);
            out += escaped;
        } else {
            out += static_cast<char>(c);
        }
    }
    return out + "\"";
}

// Says on standard error which entries of the disk's list have no row.
void ReportSkipped(const CatalogReader& reader)
{
    const std::vector<std::int32_t>& skipped = reader.m_skippedPositions;
    if (skipped.empty())
        return;
    std::string positions;
    for (std::int32_t position : skipped)
        positions += (positions.empty() ? "" : ", ") + std::to_string(position);
    std::fflush(stdout);
    std::fprintf(stderr, "dvrfs: %zu damaged recording entr%s skipped (list position%s %s)\n", skipped.size(),
                 skipped.size() == 1 ? "y" : "ies", skipped.size() == 1 ? "" : "s", positions.c_str());
}

int List(const char* disk, bool json)
{
    CatalogReader reader;
    if (const int status = BuildCatalog(reader, disk); status != kOk)
        return status;
    ReportSkipped(reader);
    const RecordCatalog& catalog = *reader.m_catalog;
    if (!json) {
        for (int row = 0; row < reader.m_recordCount; ++row) {
            const CatalogEntry& e = catalog.Entries[row];
            std::printf("%d\t%d\t%u\t%u\t%s %s\n", row, e.Idx, static_cast<std::uint32_t>(e.StartTime),
                        static_cast<std::uint32_t>(e.EndTime), e.DateText, e.TimeText);
        }
        return kOk;
    }
    std::printf("{\"span_count\": %u, \"recordings\": [", catalog.SpanCount);
    for (int row = 0; row < reader.m_recordCount; ++row) {
        const CatalogEntry& e = catalog.Entries[row];
        std::printf("%s{\"row\": %d, \"idx\": %d, \"start\": %u, \"end\": %u, \"date\": %s, \"time\": %s}",
                    row ? ", " : "", row, e.Idx, static_cast<std::uint32_t>(e.StartTime),
                    static_cast<std::uint32_t>(e.EndTime), JsonString(e.DateText).c_str(),
                    JsonString(e.TimeText).c_str());
    }
    std::printf("], \"skipped\": [");
    for (std::size_t i = 0; i < reader.m_skippedPositions.size(); ++i)
        std::printf("%s%d", i ? ", " : "", reader.m_skippedPositions[i]);
    if (reader.m_errorCode == kErrNone && reader.m_errorText[0] == '\0')
        std::printf("], \"error\": null}\n");
    else
        std::printf("], \"error\": {\"code\": %d, \"text\": %s}}\n", reader.m_errorCode,
                    JsonString(reader.m_errorText).c_str());
    return kOk;
}

int Verify(const char* disk)
{
    CatalogReader reader;
    const dvrfstool::VerifyResult result = dvrfstool::VerifyDisk(
        reader, wxString::FromUTF8(disk), [](const std::string& line) { std::printf("%s\n", line.c_str()); });
    std::printf("summary: %lld records checked, %lld damaged, %lld repaired\n", result.checked, result.damaged,
                result.repaired);
    switch (result.stage) {
    case dvrfstool::VerifyStage::kNotOpened: return CannotRead(disk, "not a recorder disk", reader);
    case dvrfstool::VerifyStage::kNotConfigured: return NotConfigured(disk);
    case dvrfstool::VerifyStage::kNoAdapter: return CannotRead(disk, "no current state record", reader);
    case dvrfstool::VerifyStage::kComplete: break;
    }
    return result.damaged + result.repaired > 0 ? kDamageFound : kOk;
}

// A progress bar on standard error, redrawn at most ten times a second, and
// only when standard error is a terminal.
class ProgressBar {
public:
    ProgressBar() : shown_(isatty(STDERR_FILENO) != 0) {}
    void Show(double fraction)
    {
        const auto now = std::chrono::steady_clock::now();
        if (!shown_ || (fraction < 1.0 && now - last_ < std::chrono::milliseconds(100)))
            return;
        last_ = now;
        const int width = 40;
        const int done = static_cast<int>(fraction * width);
        std::fprintf(stderr, "\r[%s%s] %3d%%", std::string(done, '#').c_str(), std::string(width - done, ' ').c_str(),
                     static_cast<int>(fraction * 100));
        drawn_ = true;
    }
    ~ProgressBar()
    {
        if (drawn_)
            std::fputc('\n', stderr);
    }

private:
    bool shown_;
    bool drawn_ = false;
    std::chrono::steady_clock::time_point last_{};
};

// Opens the output file; refuses the disk itself, any block device and,
// without --force, an existing file.
int OpenOutput(const char* disk, const char* output, bool force, int* fd)
{
    struct stat diskInfo {};
    struct stat outputInfo {};
    if (::stat(output, &outputInfo) == 0) {
        if (::stat(disk, &diskInfo) == 0 && diskInfo.st_dev == outputInfo.st_dev &&
            diskInfo.st_ino == outputInfo.st_ino)
            return UsageError(std::string("refusing to write into the disk itself: ") + output);
        if (S_ISBLK(outputInfo.st_mode) || S_ISCHR(outputInfo.st_mode))
            return UsageError(std::string("refusing to write to a device: ") + output);
        if (!force)
            return UsageError(std::string(output) + " exists; add --force to replace it");
    }
    *fd = ::open(output, O_WRONLY | O_CREAT | O_CLOEXEC | (force ? O_TRUNC : O_EXCL), 0644);
    if (*fd < 0) {
        std::fprintf(stderr, "dvrfs: cannot write %s: %s\n", output, std::strerror(errno));
        return kDiskUnreadable;
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

int Extract(const char* disk, const char* rowText, const char* output, bool force)
{
    char* end = nullptr;
    const long row = std::strtol(rowText, &end, 10);
    if (*rowText == '\0' || *end != '\0' || row < 0)
        return UsageError(std::string("not a row number: ") + rowText);
    CatalogReader reader;
    if (const int status = BuildCatalog(reader, disk); status != kOk)
        return status;
    if (row >= reader.m_recordCount)
        return UsageError("no row " + std::to_string(row) + ": the disk lists " +
                          std::to_string(reader.m_recordCount) + " recording(s)");
    _HisiList_t recording{};
    if (!dvrfstool::RecordingOfRow(reader, static_cast<int>(row), &recording))
        return CannotRead(disk, "the recording's entry cannot be read", reader);

    int fd = -1;
    if (const int status = OpenOutput(disk, output, force, &fd); status != kOk)
        return status;
    dvrfstool::ExtractResult result;
    {
        ProgressBar bar;
        result = dvrfstool::ExtractRecording(
            reader, recording, [fd](const dvrfstool::ExtractedFrame& f) { return WriteAll(fd, f.data, f.size); },
            [&bar](double fraction) { bar.Show(fraction); });
    }
    const bool closed = ::close(fd) == 0;
    if (!result.written || !closed) {
        std::fprintf(stderr, "dvrfs: cannot write %s: %s\n", output, std::strerror(errno));
        return kDiskUnreadable;
    }
    std::printf("%lld frames, %lld bytes written to %s\n", result.frames, result.bytes, output);
    if (result.skippedFrames + result.skippedBlocks > 0)
        std::fprintf(stderr, "dvrfs: warning: %lld damaged frame(s) and %lld damaged block(s) left out\n",
                     result.skippedFrames, result.skippedBlocks);
    return kOk;
}

}  // namespace

int main(int argc, char** argv)
{
    const std::vector<std::string> args(argv + 1, argv + argc);
    if (!args.empty() && (args[0] == "--help" || args[0] == "-h")) {
        std::fputs(kHelp, stdout);
        return kOk;
    }
    if (args.size() < 2)
        return UsageError("expected a command and a disk");
    const std::string& command = args[0];
    const char* disk = argv[2];
    if (command == "info" && (args.size() == 2 || (args.size() == 3 && args[2] == "--dump")))
        return Info(disk, args.size() == 3);
    if (command == "list" && (args.size() == 2 || (args.size() == 3 && args[2] == "--json")))
        return List(disk, args.size() == 3);
    if (command == "verify" && args.size() == 2)
        return Verify(disk);
    if (command == "extract" && args.size() >= 5) {
        const char* output = nullptr;
        bool force = false;
        for (std::size_t i = 3; i < args.size(); ++i) {
            if (args[i] == "--force")
                force = true;
            else if (args[i] == "-o" && i + 1 < args.size())
                output = argv[1 + ++i];
            else
                return UsageError("unexpected argument: " + args[i]);
        }
        if (output)
            return Extract(disk, argv[3], output, force);
    }
    return UsageError("cannot make sense of the arguments");
}
