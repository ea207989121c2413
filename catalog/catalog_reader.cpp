#include "catalog/catalog_reader.h"

#include <algorithm>
#include <cstdio>
#include <ctime>

CatalogBuild BuildOutcome(const dvrfs::VolumeStatus& status)
{
    switch (status.stage) {
    case dvrfs::OpenStage::kSource:
    case dvrfs::OpenStage::kSuperBlock: return CatalogBuild::kNotOpened;
    case dvrfs::OpenStage::kConfiguration: return CatalogBuild::kNotConfigured;
    case dvrfs::OpenStage::kAdapter:
    case dvrfs::OpenStage::kRefresh: return CatalogBuild::kNoAdapter;
    case dvrfs::OpenStage::kReady: break;
    }
    return CatalogBuild::kBuilt;
}

CatalogBuild CatalogReader::BuildCatalog(const std::string& path)
{
    const CatalogBuild result = BuildOutcome(OpenVolume(path));
    if (result != CatalogBuild::kBuilt) {
        ClearEntries();
        return result;
    }
    Setplaylist();
    return CatalogBuild::kBuilt;
}

// Every entry unfilled and no row: the texts are left as they are.
void CatalogReader::ClearEntries()
{
    m_recordCount = 0;
    m_rowPositions.clear();
    m_skippedPositions.clear();
    m_unwrittenPositions.clear();
    m_newestBlockUnreadableRow = -1;
    RecordCatalog* catalog = MutableCatalog();
    if (!catalog)
        return;
    for (CatalogEntry& entry : catalog->Entries) {
        entry.Idx = -1;
        entry.StartTime = 0;
        entry.EndTime = 0;
    }
}

void CatalogReader::Setplaylist()
{
    RecordCatalog* catalog = MutableCatalog();
    if (!catalog || !Adapter())
        return;
    ClearEntries();

    // The list is a ring: a newest position below the oldest has wrapped.
    const _HisiAdapter_t& adapter = *Adapter();
    const std::int64_t ringSize = adapter.ListMax;
    const std::int64_t first = adapter.FirstList.Idx;
    std::int64_t last = adapter.LastList.Idx;
    if (last < first)
        last += ringSize;
    if (last >= 0)
        catalog->SpanCount = static_cast<std::uint16_t>(last - first + 1);
    m_rowPositions.reserve(kCatalogCapacity);
    if (last < first || ringSize <= 0)
        return;

    // Negative positions are skipped without a read, so the walk starts at
    // the first one that is not; positions repeat around the ring, so it
    // lists each of them once. An entry damaged in both copies is passed
    // over: it costs its own row, not the rows of the recordings after it.
    const std::int64_t from = std::max<std::int64_t>(first, 0);
    const std::int64_t to = std::min(last, from + ringSize - 1);
    for (std::int64_t p = from; p <= to && m_recordCount < kCatalogCapacity; ++p) {
        const std::int32_t position = static_cast<std::int32_t>(p % ringSize);
        _HisiList_t record{};
        const dvrfs::ListEntryState state = ReadListEntry(position, &record);
        if (state == dvrfs::ListEntryState::kUnwritten) {
            m_unwrittenPositions.push_back(position);
            continue;
        }
        if (state != dvrfs::ListEntryState::kSound && state != dvrfs::ListEntryState::kRepaired) {
            m_skippedPositions.push_back(position);
            continue;
        }
        FillEntry(catalog->Entries[m_recordCount], record);
        m_rowPositions.push_back(position);
        ++m_recordCount;
    }
    // A recorder whose newest position is still negative has recorded
    // nothing: the span it names holds no entry, not damaged ones.
    if (adapter.LastList.Idx < 0 && m_recordCount == 0) {
        m_skippedPositions.clear();
        m_unwrittenPositions.clear();
        catalog->SpanCount = 0;
        return;
    }
    CollectSkippedPositions();
    MarkNewestBlockUnreadable();
}

namespace {

void AddSorted(std::vector<std::int32_t>& positions, const std::vector<std::int32_t>& more)
{
    positions.insert(positions.end(), more.begin(), more.end());
    std::sort(positions.begin(), positions.end());
    positions.erase(std::unique(positions.begin(), positions.end()), positions.end());
}

}  // namespace

// Adds the entries the adapter refresh met at either end of the recorder's
// span: the refresh narrowed the span to its readable entries, so the walk
// above never reaches them, but they are recordings (or blank) all the same.
void CatalogReader::CollectSkippedPositions()
{
    AddSorted(m_skippedPositions, Volume()->unreadableListPositions);
    AddSorted(m_unwrittenPositions, Volume()->unwrittenListPositions);
}

void CatalogReader::MarkNewestBlockUnreadable()
{
    if (!Volume()->newestBlockUnreadable)
        return;
    const auto newest = std::find(m_rowPositions.begin(), m_rowPositions.end(), Adapter()->LastList.Idx);
    if (newest != m_rowPositions.end())
        m_newestBlockUnreadableRow = static_cast<std::int32_t>(newest - m_rowPositions.begin());
}

namespace {

// A field of a broken-down time (month, day, hour, minute, second): always
// below 100, and typed so that the compiler sees the texts fit.
unsigned char Field(int value)
{
    return static_cast<unsigned char>(value);
}

}  // namespace

void CatalogReader::FillEntry(CatalogEntry& entry, const _HisiList_t& record)
{
    entry.Idx = record.Idx;
    entry.StartTime = static_cast<std::int32_t>(record.StartTime);
    entry.EndTime = static_cast<std::int32_t>(record.EndTime);

    const std::time_t start = record.StartTime;
    const std::time_t end = record.EndTime;
    std::tm startUtc{};
    std::tm endUtc{};
    gmtime_r(&start, &startUtc);
    gmtime_r(&end, &endUtc);
    std::snprintf(entry.DateText, sizeof entry.DateText, "%04d/%02d/%02d", startUtc.tm_year + 1900,
                  Field(startUtc.tm_mon + 1), Field(startUtc.tm_mday));
    std::snprintf(entry.TimeText, sizeof entry.TimeText, "%02d:%02d:%02d-%02d:%02d:%02d", Field(startUtc.tm_hour),
                  Field(startUtc.tm_min), Field(startUtc.tm_sec), Field(endUtc.tm_hour), Field(endUtc.tm_min),
                  Field(endUtc.tm_sec));
}
