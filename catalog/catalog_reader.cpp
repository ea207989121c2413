#include "catalog/catalog_reader.h"

#include <algorithm>
#include <cstdio>
#include <ctime>

CatalogBuild CatalogReader::BuildCatalog(const wxString& path)
{
    CatalogBuild result = CatalogBuild::kBuilt;
    if (OpenDVRFS(path) <= 0)
        result = CatalogBuild::kNotOpened;
    else if (Checkconfig() <= 0)
        result = CatalogBuild::kNotConfigured;
    else if (BlockOpe(m_diskFile, 2, nullptr, 0, 0) < 0)
        result = CatalogBuild::kNoAdapter;
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
    if (!m_catalog)
        return;
    for (CatalogEntry& entry : m_catalog->Entries) {
        entry.Idx = -1;
        entry.StartTime = 0;
        entry.EndTime = 0;
    }
}

void CatalogReader::Setplaylist()
{
    if (!m_catalog || !m_volume || !m_volume->adapter)
        return;
    ClearEntries();

    // The list is a ring: a newest position below the oldest has wrapped.
    const _HisiAdapter_t& adapter = *m_volume->adapter;
    const std::int64_t ringSize = adapter.ListMax;
    const std::int64_t first = adapter.FirstList.Idx;
    std::int64_t last = adapter.LastList.Idx;
    if (last < first)
        last += ringSize;
    if (last >= 0)
        m_catalog->SpanCount = static_cast<std::uint16_t>(last - first + 1);
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
        const std::int64_t position = p % ringSize;
        _HisiList_t record{};
        if (BlockOpe(m_diskFile, 33, &record, position, 1) < 0) {
            m_skippedPositions.push_back(static_cast<std::int32_t>(position));
            continue;
        }
        FillEntry(m_catalog->Entries[m_recordCount], record);
        m_rowPositions.push_back(static_cast<std::int32_t>(position));
        ++m_recordCount;
    }
    CollectSkippedPositions();
}

// Adds the damaged entries the adapter refresh met at either end of the
// recorder's span: the refresh narrowed the span to its readable entries, so
// the walk above never reaches them, but they are recordings all the same.
void CatalogReader::CollectSkippedPositions()
{
    const std::vector<std::int32_t>& unreadable = m_volume->unreadableListPositions;
    m_skippedPositions.reserve(m_skippedPositions.size() + unreadable.size());
    m_skippedPositions.insert(m_skippedPositions.end(), unreadable.begin(), unreadable.end());
    std::sort(m_skippedPositions.begin(), m_skippedPositions.end());
    m_skippedPositions.erase(std::unique(m_skippedPositions.begin(), m_skippedPositions.end()),
                             m_skippedPositions.end());
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
