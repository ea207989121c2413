#include "tools/dvrfs/report.h"

#include <sys/stat.h>

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <ctime>
#include <fstream>
#include <set>
#include <thread>
#include <vector>

#include "catalog/build_summary.h"
#include "catalog/time_text.h"
#include "tools/dvrfs/disk_check.h"
#include "tools/dvrfs/export.h"
#include "tools/dvrfs/json_text.h"

namespace dvrfstool {
namespace {

constexpr int kThumbnailWidth = 160;

struct ReportRow {
    int row;
    std::int32_t idx;
    std::int32_t position;
    std::uint32_t start;
    std::uint32_t end;
    bool repaired;
    std::string keyFrame;   // the first key frame's access unit
    std::string thumbnail;  // PNG
};

std::string Html(const std::string& text)
{
    std::string out;
    for (const char c : PrintableName(text)) {
        switch (c) {
        case '<': out += "&lt;"; break;
        case '>': out += "&gt;"; break;
        case '&': out += "&amp;"; break;
        case '"': out += "&quot;"; break;
        default: out += c;
        }
    }
    return out;
}

std::string Base64(const std::string& bytes)
{
    static const char kDigits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string out;
    for (std::size_t i = 0; i < bytes.size(); i += 3) {
        const std::uint32_t a = static_cast<unsigned char>(bytes[i]);
        const std::uint32_t b = i + 1 < bytes.size() ? static_cast<unsigned char>(bytes[i + 1]) : 0;
        const std::uint32_t c = i + 2 < bytes.size() ? static_cast<unsigned char>(bytes[i + 2]) : 0;
        const std::uint32_t n = a << 16 | b << 8 | c;
        out += kDigits[n >> 18 & 63];
        out += kDigits[n >> 12 & 63];
        out += i + 1 < bytes.size() ? kDigits[n >> 6 & 63] : '=';
        out += i + 2 < bytes.size() ? kDigits[n & 63] : '=';
    }
    return out;
}

std::string Local(std::uint32_t seconds)
{
    return TimeText(seconds, "%Y-%m-%d %H:%M:%S", Zone::kLocal);
}

// The first key frame of the recording: the extraction stops at it.
std::string FirstKeyFrame(CatalogReader& reader, const _HisiList_t& recording)
{
    std::string frame;
    ExtractRecording(reader, recording, [&frame](const ExtractedFrame& f) {
        if (!IsKeyFrame(f.data, f.size))
            return true;
        frame.assign(reinterpret_cast<const char*>(f.data), f.size);
        return false;
    });
    return frame;
}

// Thumbnails decoded on every core: the frames are read first, one disk
// reader being one file position, then decoded in parallel.
void MakeThumbnails(std::vector<ReportRow>& rows)
{
    std::atomic<std::size_t> next{0};
    std::vector<std::thread> workers;
    const unsigned cores = std::max(1u, std::thread::hardware_concurrency());
    for (unsigned w = 0; w < cores; ++w)
        workers.emplace_back([&rows, &next] {
            for (std::size_t i = next++; i < rows.size(); i = next++)
                if (!rows[i].keyFrame.empty())
                    rows[i].thumbnail = Thumbnail(rows[i].keyFrame, kThumbnailWidth);
        });
    for (std::thread& worker : workers)
        worker.join();
}

struct Findings {
    VerifyResult result;
    std::vector<std::string> lines;
    std::set<std::int64_t> repairedEntries;
};

Findings Verify(const std::string& disk)
{
    Findings findings;
    CatalogReader reader;
    findings.result = VerifyDisk(reader, disk, [&findings](const std::string& line) {
        findings.lines.push_back(line);
        long long entry = 0;
        if (std::sscanf(line.c_str(), "repaired: list entry %lld", &entry) == 1)
            findings.repairedEntries.insert(entry);
    });
    return findings;
}

void WriteJsonText(const std::string& path, const ReportRequest& request, const std::string& made,
               const std::string& summary, const std::string& digest, const Findings& findings,
               const std::vector<ReportRow>& rows, const std::vector<std::int32_t>& skipped)
{
    std::ofstream out(path);
    out << "{\"tool\": " << JsonText(request.toolVersion) << ", \"disk\": " << JsonText(request.disk)
        << ", \"made_utc\": " << JsonText(made) << ", \"summary\": " << JsonText(summary);
    if (!digest.empty())
        out << ", \"sha256\": " << JsonText(digest);
    out << ", \"verify\": {\"checked\": " << findings.result.checked << ", \"damaged\": " << findings.result.damaged
        << ", \"repaired\": " << findings.result.repaired << ", \"findings\": [";
    for (std::size_t i = 0; i < findings.lines.size(); ++i)
        out << (i ? ", " : "") << JsonText(findings.lines[i]);
    out << "]}, \"skipped\": [";
    for (std::size_t i = 0; i < skipped.size(); ++i)
        out << (i ? ", " : "") << skipped[i];
    out << "], \"recordings\": [";
    for (std::size_t i = 0; i < rows.size(); ++i) {
        const ReportRow& r = rows[i];
        out << (i ? ", " : "") << "{\"row\": " << r.row << ", \"idx\": " << r.idx << ", \"start\": " << r.start
            << ", \"end\": " << r.end << ", \"start_utc\": " << JsonText(IsoUtc(r.start))
            << ", \"end_utc\": " << JsonText(IsoUtc(r.end)) << ", \"start_local\": " << JsonText(Local(r.start))
            << ", \"end_local\": " << JsonText(Local(r.end))
            << ", \"seconds\": " << (r.end >= r.start ? r.end - r.start : 0)
            << ", \"repaired\": " << (r.repaired ? "true" : "false")
            << ", \"thumbnail\": " << (r.thumbnail.empty() ? "null" : JsonText("report-row" + std::to_string(r.row) + ".png"))
            << "}";
    }
    out << "]}\n";
}

void WriteCsv(const std::string& path, const std::vector<ReportRow>& rows)
{
    std::ofstream out(path);
    out << "row,idx,start_utc,end_utc,start_local,end_local,seconds,repaired\n";
    for (const ReportRow& r : rows)
        out << r.row << "," << r.idx << "," << IsoUtc(r.start) << "," << IsoUtc(r.end) << "," << Local(r.start) << ","
            << Local(r.end) << "," << (r.end >= r.start ? r.end - r.start : 0) << "," << (r.repaired ? "yes" : "no")
            << "\n";
}

void WriteHtml(const std::string& path, const ReportRequest& request, const std::string& made,
               const std::string& summary, const std::string& digest, const Findings& findings,
               const std::vector<ReportRow>& rows, const std::vector<std::int32_t>& skipped)
{
    std::ofstream out(path);
    out << "<!DOCTYPE html>\n<html lang=\"en\"><head><meta charset=\"utf-8\"><title>Recorder disk report: "
        << Html(request.disk) << "</title>\n<style>body{font-family:sans-serif;margin:2em}"
        << "table{border-collapse:collapse}td,th{border:1px solid #999;padding:4px 8px;text-align:left}"
        << ".damaged{color:#a00}</style></head><body>\n";
    out << "<h1>Recorder disk report</h1>\n<table>\n<tr><th>Disk</th><td>" << Html(request.disk) << "</td></tr>\n"
        << "<tr><th>Made</th><td>" << Html(made) << " (UTC) by " << Html(request.toolVersion) << "</td></tr>\n"
        << "<tr><th>What it holds</th><td>" << Html(summary) << "</td></tr>\n";
    if (!digest.empty())
        out << "<tr><th>SHA-256</th><td><code>" << digest << "</code></td></tr>\n";
    out << "</table>\n<h2>Verification</h2>\n<p>" << findings.result.checked << " records checked, "
        << findings.result.damaged << " damaged, " << findings.result.repaired << " repaired.</p>\n<ul>\n";
    for (const std::string& line : findings.lines)
        out << "<li class=\"damaged\">" << Html(line) << "</li>\n";
    out << "</ul>\n";
    if (!skipped.empty()) {
        out << "<p class=\"damaged\">List entries damaged in both copies, without a row: "
            << PositionsText(skipped) << "</p>\n";
    }
    out << "<h2>Recordings</h2>\n<table>\n<tr><th>Row</th><th>List index</th><th>Start (UTC)</th><th>End (UTC)</th>"
        << "<th>Start (local time)</th><th>End (local time)</th><th>Seconds</th><th>Picture</th></tr>\n";
    for (const ReportRow& r : rows) {
        out << "<tr><td>" << r.row << (r.repaired ? " (entry repaired from its mirror)" : "") << "</td><td>" << r.idx
            << "</td><td>" << IsoUtc(r.start) << "</td><td>" << IsoUtc(r.end) << "</td><td>" << Html(Local(r.start))
            << "</td><td>" << Html(Local(r.end)) << "</td><td>" << (r.end >= r.start ? r.end - r.start : 0)
            << "</td><td>";
        if (!r.thumbnail.empty())
            out << "<img alt=\"row " << r.row << "\" src=\"data:image/png;base64," << Base64(r.thumbnail) << "\">";
        out << "</td></tr>\n";
    }
    out << "</table>\n</body></html>\n";
}

}  // namespace

std::string WriteReport(const ReportRequest& request)
{
    CatalogReader reader;
    const CatalogBuild result = reader.BuildCatalog(request.disk);
    const std::string summary = DescribeBuild(reader);
    if (result != CatalogBuild::kBuilt)
        return summary;
    std::vector<ReportRow> rows;
    const Findings findings = Verify(request.disk);
    for (int row = 0; row < reader.m_recordCount; ++row) {
        const CatalogEntry& entry = reader.Catalog()->Entries[row];
        const std::int32_t position = reader.m_rowPositions[static_cast<std::size_t>(row)];
        ReportRow r{row, entry.Idx, position, entry.StartSeconds(), entry.EndSeconds(), findings.repairedEntries.count(position) != 0, {}, {}};
        _HisiList_t recording{};
        if (RecordingOfRow(reader, row, &recording))
            r.keyFrame = FirstKeyFrame(reader, recording);
        rows.push_back(std::move(r));
    }
    MakeThumbnails(rows);
    for (ReportRow& r : rows) {
        if (r.thumbnail.empty())
            continue;
        std::ofstream(request.folder + "/report-row" + std::to_string(r.row) + ".png", std::ios::binary) << r.thumbnail;
        r.keyFrame.clear();
    }
    const std::string digest = request.hash ? Sha256OfFile(request.disk) : "";
    const std::string made = IsoUtc(static_cast<double>(std::time(nullptr)));
    WriteJsonText(request.folder + "/report.json", request, made, summary, digest, findings, rows,
              reader.m_skippedPositions);
    WriteCsv(request.folder + "/report.csv", rows);
    WriteHtml(request.folder + "/report.html", request, made, summary, digest, findings, rows,
              reader.m_skippedPositions);
    return "";
}

}  // namespace dvrfstool
