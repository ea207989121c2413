#include "catalog/build_summary.h"
#include "catalog/time_text.h"

#include <algorithm>

namespace {

std::string Count(std::size_t n, const char* one, const char* many)
{
    return std::to_string(n) + " " + (n == 1 ? one : many);
}

std::string LocalMinute(std::uint32_t seconds)
{
    return TimeText(seconds, "%Y-%m-%d %H:%M", Zone::kLocal);
}

std::string Listed(const CatalogReader& reader)
{
    std::string text = "no recordings";
    if (reader.m_recordCount > 0) {
        const CatalogEntry* entries = reader.Catalog()->Entries;
        std::uint32_t first = entries[0].StartSeconds();
        std::uint32_t last = entries[0].EndSeconds();
        for (int i = 1; i < reader.m_recordCount; ++i) {
            first = std::min(first, entries[i].StartSeconds());
            last = std::max(last, entries[i].EndSeconds());
        }
        text = Count(static_cast<std::size_t>(reader.m_recordCount), "recording", "recordings") + ", " +
               LocalMinute(first) + " to " + LocalMinute(last) + " (local time)";
    }
    if (!reader.m_skippedPositions.empty())
        text += "; " + Count(reader.m_skippedPositions.size(), "damaged entry", "damaged entries") + " skipped";
    if (!reader.m_unwrittenPositions.empty())
        text += "; " + Count(reader.m_unwrittenPositions.size(), "entry", "entries") + " never written";
    switch (reader.Status().copyInUse) {
    case SuperBlockCopy::kPrimary: break;
    case SuperBlockCopy::kBackupSuperBlock: text += "; primary superblock damaged, backup used"; break;
    case SuperBlockCopy::kBackupTable: text += "; primary block table damaged, backup used"; break;
    }
    if (reader.m_newestBlockUnreadableRow >= 0)
        text += "; the newest recording's newest block is unreadable";
    return text + dvrfs::TruncationNote(reader.Status());
}

}  // namespace

std::string DescribeBuild(const CatalogReader& reader)
{
    if (!reader.Status().Ready())
        return dvrfs::DescribeFailure(reader.Status());
    return Listed(reader);
}

std::string PositionsText(const std::vector<std::int32_t>& positions, std::size_t maxRuns)
{
    std::string text;
    std::size_t runs = 0;
    for (std::size_t i = 0; i < positions.size();) {
        std::size_t end = i + 1;
        while (end < positions.size() && positions[end] == positions[end - 1] + 1)
            ++end;
        if (runs == maxRuns)
            return text + ", ... (" + std::to_string(positions.size()) + " in all)";
        text += (runs++ ? ", " : "") + std::to_string(positions[i]);
        if (end - i > 1)
            text += "-" + std::to_string(positions[end - 1]);
        i = end;
    }
    return text;
}
