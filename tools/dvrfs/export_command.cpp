// dvrfs export and dvrfs hash: recordings handed on as files a player opens,
// each with its SHA-256, and the SHA-256 of the whole disk.
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <fstream>

#include "catalog/time_text.h"
#include "tools/dvrfs/command_line.h"
#include "tools/dvrfs/export.h"
#include "tools/dvrfs/recover.h"

namespace dvrfscli {
namespace {

// Seconds since 1970, or YYYY-MM-DDTHH:MM:SS with an optional Z (UTC).
bool ParseTime(const std::string& text, std::uint32_t* seconds)
{
    char* end = nullptr;
    const unsigned long long plain = std::strtoull(text.c_str(), &end, 10);
    if (!text.empty() && *end == '\0' && plain <= UINT32_MAX) {
        *seconds = static_cast<std::uint32_t>(plain);
        return true;
    }
    std::tm tm{};
    const char* rest = strptime(text.c_str(), "%Y-%m-%dT%H:%M:%S", &tm);
    if (!rest || (*rest != '\0' && std::strcmp(rest, "Z") != 0))
        return false;
    const std::time_t t = timegm(&tm);
    if (t < 0 || t > static_cast<std::time_t>(UINT32_MAX))
        return false;
    *seconds = static_cast<std::uint32_t>(t);
    return true;
}

// "row3-20231115T021320Z.mp4", or for rows merged "rows1-3-20231115T021320Z.mp4"
std::string FileName(const std::vector<int>& rows, std::uint32_t start, dvrfstool::ExportFormat format)
{
    const std::string which = rows.size() == 1 ? "row" + std::to_string(rows.front())
                                               : "rows" + std::to_string(rows.front()) + "-" + std::to_string(rows.back());
    return which + "-" + TimeText(start, "%Y%m%dT%H%M%SZ", Zone::kUtc) + "." + dvrfstool::Extension(format);
}

bool IsDirectory(const std::string& path)
{
    struct stat info {};
    return (!path.empty() && path.back() == '/') || (::stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode));
}

std::string BaseName(const std::string& path)
{
    const std::size_t slash = path.rfind('/');
    return slash == std::string::npos ? path : path.substr(slash + 1);
}

// The rows to export: those named, or those whose recording overlaps the range.
bool ChooseRows(const CommandLine& line, const CatalogReader& reader, const dvrfstool::ExportRequest& request,
                std::vector<int>* rows)
{
    for (std::size_t i = 1; i < line.operands.size(); ++i) {
        char* end = nullptr;
        const long row = std::strtol(line.operands[i].c_str(), &end, 10);
        if (line.operands[i].empty() || *end != '\0' || row < 0) {
            UsageError("not a row number: " + line.operands[i]);
            return false;
        }
        if (row >= reader.m_recordCount) {
            UsageError("no row " + std::to_string(row) + ": the disk lists " + std::to_string(reader.m_recordCount) +
                       " recording(s)");
            return false;
        }
        rows->push_back(static_cast<int>(row));
    }
    if (!request.from)
        return true;
    for (int row = 0; row < reader.m_recordCount; ++row) {
        const CatalogEntry& entry = reader.Catalog()->Entries[row];
        if (entry.EndSeconds() >= *request.from && entry.StartSeconds() < *request.to)
            rows->push_back(row);
    }
    return true;
}

// Names each stretch that was left out, with the time it covers; those
// wholly outside the time range asked for are no loss and go unnamed.
// Whether anything was left out.
bool WarnLeftOut(int row, const dvrfstool::ExportOutcome& outcome, std::uint32_t start,
                 const dvrfstool::ExportRequest& request)
{
    const double fps = outcome.framesPerSecond > 0 ? outcome.framesPerSecond : 25.0;
    auto seconds = [&](long long place) { return start + place / fps; };
    auto time = [&](long long place) { return TextTime(seconds(place)); };
    // Past the stretches kept, the rest are only counted: they count.
    bool leftOut = outcome.extracted.leftOut.size() >= dvrfstool::kMaxLeftOutKept || outcome.framesBeforeAKeyFrame > 0;
    for (const dvrfstool::LeftOut& gap : outcome.extracted.leftOut) {
        if (request.from &&
            (seconds(gap.firstFrame) >= *request.to || seconds(gap.firstFrame + gap.frames) < *request.from))
            continue;
        leftOut = true;
        if (gap.block >= 0)
            std::fprintf(stderr, "dvrfs: warning: row %d: data block %lld left out (header damaged), after %s\n", row,
                         gap.block, time(gap.firstFrame).c_str());
        else
            std::fprintf(stderr, "dvrfs: warning: row %d: %lld frame(s) left out (damaged), %s to %s\n", row,
                         gap.frames, time(gap.firstFrame).c_str(), time(gap.firstFrame + gap.frames).c_str());
    }
    if (outcome.framesBeforeAKeyFrame > 0)
        std::fprintf(stderr, "dvrfs: warning: row %d: %lld frame(s) before the first key frame left out\n", row,
                     outcome.framesBeforeAKeyFrame);
    return leftOut;
}

// Exports rows into one file (one row, or all of them with --merge); kOk,
// kLeftOut or kOutputFailed.
int ExportRows(CatalogReader& reader, const std::string& disk, const std::vector<int>& rows,
               const std::string& output, bool force, dvrfstool::ExportRequest request)
{
    std::vector<_HisiList_t> recordings;
    std::vector<int> readable;
    int status = kOk;
    for (int row : rows) {
        _HisiList_t recording{};
        if (!dvrfstool::RecordingOfRow(reader, row, &recording)) {
            std::fprintf(stderr, "dvrfs: %s: row %d: its recording entry cannot be read any more\n", disk.c_str(), row);
            status = kLeftOut;
            continue;
        }
        recordings.push_back(recording);
        readable.push_back(row);
    }
    if (recordings.empty())
        return status;
    if (output != "-") {
        if (const int checked = CheckOutput(disk, output, force); checked != kOk)
            return checked;
    }
    request.output = output;
    std::vector<dvrfstool::ExportOutcome> outcomes;
    {
        ProgressBar bar;
        outcomes = dvrfstool::ExportRecordings(reader, recordings, request, [&bar](double f) { bar.Show(f); });
    }
    for (const dvrfstool::ExportOutcome& outcome : outcomes) {
        if (!outcome.error.empty()) {
            std::fprintf(stderr, "dvrfs: cannot write %s: %s\n", output.c_str(), outcome.error.c_str());
            return kOutputFailed;
        }
    }
    FILE* say = output == "-" ? stderr : stdout;
    long long frames = 0;
    double seconds = 0;
    const dvrfstool::ExportOutcome* first = &outcomes.front();  // the first that wrote a frame, if any did
    for (const dvrfstool::ExportOutcome& outcome : outcomes) {
        if (first->framesWritten == 0 && outcome.framesWritten > 0)
            first = &outcome;
        frames += outcome.framesWritten;
        seconds = std::max(seconds, outcome.seconds);
    }
    // "row 1", "rows 1, 3", or for many "rows 1 to 30 (25 recordings)"
    std::string which = readable.size() == 1 ? "row " : "rows ";
    if (readable.size() <= 8) {
        for (std::size_t i = 0; i < readable.size(); ++i)
            which += (i ? ", " : "") + std::to_string(readable[i]);
    } else {
        which += std::to_string(readable.front()) + " to " + std::to_string(readable.back()) + " (" +
                 std::to_string(readable.size()) + " recordings)";
    }
    std::fprintf(say, "%s: %s, %lld frames, %.1f s from %s, %.3g frames/s (%s)\n", output.c_str(), which.c_str(),
                 frames, seconds, TextTime(first->firstTime).c_str(), first->framesPerSecond,
                 first->timingFromStream ? "the stream's timing" : "the recording's times");
    if (output != "-") {
        const std::string digest = dvrfstool::Sha256OfFile(output);
        std::ofstream sidecar(output + ".sha256");
        sidecar << digest << "  " << BaseName(output) << "\n";
        if (digest.empty() || !sidecar.flush()) {
            std::fprintf(stderr, "dvrfs: cannot write %s.sha256\n", output.c_str());
            return kOutputFailed;
        }
        std::printf("sha256 %s  %s\n", digest.c_str(), output.c_str());
    }
    for (std::size_t i = 0; i < outcomes.size(); ++i)
        if (WarnLeftOut(readable[i], outcomes[i], recordings[i].StartTime, request))
            status = kLeftOut;
    return status;
}

// Exports a run of blocks no list entry describes, as recover lists them:
// timed by the stream alone, with no creation time claimed.
int ExportBlocks(const CommandLine& line, const std::string& disk, const std::string& blocks,
                 dvrfstool::ExportRequest request)
{
    std::int32_t first = 0;
    std::int32_t last = 0;
    if (!ParseBlocks(blocks, &first, &last) || line.operands.size() > 1 || line.Value("--from"))
        return UsageError("--blocks takes FIRST:LAST, and no rows or time range beside it");
    CatalogReader reader;
    if (const int status = BuildCatalog(reader, disk); status != kOk)
        return status;
    const std::string target = line.Value("-o") ? *line.Value("-o") : ".";
    const std::string name = "blocks" + std::to_string(first) + "-" + std::to_string(last) + "." +
                             dvrfstool::Extension(request.format);
    const std::string output = IsDirectory(target) ? target + (target.back() == '/' ? "" : "/") + name : target;
    if (output != "-") {
        if (const int status = CheckOutput(disk, output, line.Has("--force")); status != kOk)
            return status;
    }
    request.output = output;
    const dvrfstool::ExportOutcome outcome =
        dvrfstool::ExportRecording(reader, dvrfstool::RecordingOfBlocks(first, last), request);
    if (!outcome.error.empty()) {
        std::fprintf(stderr, "dvrfs: cannot write %s: %s\n", output.c_str(), outcome.error.c_str());
        return kOutputFailed;
    }
    std::fprintf(output == "-" ? stderr : stdout, "%s: blocks %d to %d, %lld frames, %.1f s, %.3g frames/s\n",
                 output.c_str(), first, last, outcome.framesWritten, outcome.seconds, outcome.framesPerSecond);
    return outcome.extracted.skippedFrames + outcome.extracted.skippedBlocks > 0 ? kLeftOut : kOk;
}

}  // namespace

bool ParseBlocks(const std::string& text, std::int32_t* first, std::int32_t* last)
{
    char* end = nullptr;
    const long a = std::strtol(text.c_str(), &end, 10);
    if (end == text.c_str() || *end != ':')
        return false;
    const char* second = end + 1;
    const long b = std::strtol(second, &end, 10);
    if (end == second || *end != '\0' || a < 0 || b < 0 || a > INT32_MAX || b > INT32_MAX)
        return false;
    *first = static_cast<std::int32_t>(a);
    *last = static_cast<std::int32_t>(b);
    return true;
}

int RecoverCommand(const std::string& disk, bool json)
{
    CatalogReader reader;
    if (const int status = BuildCatalog(reader, disk); status != kOk)
        return status;
    const dvrfstool::RecoverResult result = dvrfstool::FindUnlistedRuns(reader);
    auto when = [json](const std::optional<std::uint32_t>& t) {
        if (!t)
            return std::string(json ? "null" : "-");
        return json ? "\"" + dvrfstool::IsoUtc(*t) + "\"" : TextTime(*t);
    };
    if (json) {
        std::printf("{\"blocks_scanned\": %lld, \"headers_read\": %lld, \"runs\": [",
                    static_cast<long long>(result.blocksScanned), static_cast<long long>(result.headersRead));
        for (std::size_t i = 0; i < result.runs.size(); ++i) {
            const dvrfstool::UnlistedRun& run = result.runs[i];
            std::printf("%s{\"first_block\": %lld, \"last_block\": %lld, \"blocks\": %lld, \"frames\": %lld, "
                        "\"after\": %s, \"before\": %s}",
                        i ? ", " : "", static_cast<long long>(run.firstBlock), static_cast<long long>(run.lastBlock),
                        static_cast<long long>(run.blocks), run.frames, when(run.after).c_str(),
                        when(run.before).c_str());
        }
        std::printf("]}\n");
        return kOk;
    }
    for (const dvrfstool::UnlistedRun& run : result.runs)
        std::printf("blocks %lld:%lld\t%lld blocks\t%lld frames\tafter %s\tbefore %s\n",
                    static_cast<long long>(run.firstBlock), static_cast<long long>(run.lastBlock),
                    static_cast<long long>(run.blocks), run.frames, when(run.after).c_str(), when(run.before).c_str());
    std::fprintf(stderr, "dvrfs: %zu run(s) of unlisted blocks; %lld blocks scanned, %lld headers read (%s)\n",
                 result.runs.size(), static_cast<long long>(result.blocksScanned),
                 static_cast<long long>(result.headersRead), TextZoneName());
    return kOk;
}

int ExportCommand(const CommandLine& line)
{
    const std::string& disk = line.operands[0];
    dvrfstool::ExportRequest request;
    if (const std::string* format = line.Value("--format"); format && !ParseExportFormat(*format, &request.format))
        return UsageError("no format '" + *format + "': mp4, mkv or h264");
    if (const std::string* blocks = line.Value("--blocks"))
        return ExportBlocks(line, disk, *blocks, request);
    const std::string* from = line.Value("--from");
    const std::string* to = line.Value("--to");
    if ((from != nullptr) != (to != nullptr))
        return UsageError("--from and --to go together");
    if (from) {
        std::uint32_t a = 0;
        std::uint32_t b = 0;
        if (!ParseTime(*from, &a) || !ParseTime(*to, &b) || b <= a)
            return UsageError("--from and --to take two times, the first before the second");
        if (line.operands.size() > 1)
            return UsageError("export takes rows or a time range, not both");
        request.from = a;
        request.to = b;
    } else if (line.operands.size() < 2) {
        return UsageError("export needs the rows to export, or --from and --to");
    }

    CatalogReader reader;
    if (const int status = BuildCatalog(reader, disk); status != kOk)
        return status;
    std::vector<int> rows;
    if (!ChooseRows(line, reader, request, &rows))
        return kUsageError;
    if (rows.empty()) {
        std::fprintf(stderr, "dvrfs: %s: no recording lies in that time range\n", disk.c_str());
        return kOk;
    }
    const std::string target = line.Value("-o") ? *line.Value("-o") : ".";
    if (target.size() > 1 && target.back() == '/') {
        std::error_code error;
        std::filesystem::create_directories(target, error);  // a folder named as one is made
    }
    const bool intoFolder = IsDirectory(target);
    const bool merge = line.Has("--merge");
    if (!intoFolder && rows.size() > 1 && !merge)
        return UsageError(target + " is no folder: several recordings need one, or --merge");
    // One file for all the rows with --merge, else one for each.
    std::vector<std::vector<int>> files;
    if (merge) {
        // In the order the recorder wrote them, each once.
        std::sort(rows.begin(), rows.end());
        rows.erase(std::unique(rows.begin(), rows.end()), rows.end());
        files.push_back(rows);
    } else
        for (int row : rows)
            files.push_back({row});
    int status = kOk;
    for (const std::vector<int>& file : files) {
        const std::uint32_t start = reader.Catalog()->Entries[file.front()].StartSeconds();
        const std::string output =
            intoFolder ? target + (target.back() == '/' ? "" : "/") + FileName(file, start, request.format) : target;
        const int result = ExportRows(reader, disk, file, output, line.Has("--force"), request);
        if (result == kOutputFailed || result == kUsageError)
            return result;
        status = std::max(status, result);
    }
    return status;
}

int HashCommand(const std::string& disk)
{
    struct stat info {};
    std::uint64_t size = 0;
    if (::stat(disk.c_str(), &info) == 0)
        size = static_cast<std::uint64_t>(info.st_size);
    std::string digest;
    {
        ProgressBar bar;
        digest = dvrfstool::Sha256OfFile(disk, [&bar, size](std::uint64_t done) {
            if (size > 0)
                bar.Show(static_cast<double>(done) / static_cast<double>(size));
        });
    }
    if (digest.empty()) {
        std::fprintf(stderr, "dvrfs: %s: cannot read: %s\n", disk.c_str(), std::strerror(errno ? errno : EIO));
        return kDiskUnreadable;
    }
    std::printf("%s  %s\n", digest.c_str(), disk.c_str());
    return kOk;
}

}  // namespace dvrfscli
