#include "host/recording_timeline.h"

#include "catalog/time_text.h"

#include <algorithm>

RecordingTimeline::RecordingTimeline(CatalogReader& reader) : m_reader(reader)
{
    if (!reader.Adapter())
        return;
    m_ringSize = reader.Adapter()->DataBlockMax;
    reader.Setplaylist();
    for (std::int32_t position : reader.m_rowPositions) {
        _HisiList_t entry{};
        if (reader.ReadListEntries(position, 1, reinterpret_cast<char*>(&entry)) < 0)
            entry = _HisiList_t{};  // an entry gone bad since: it holds no block
        m_rows.push_back({entry.StartBlock, entry.EndBlock, entry.StartTime, entry.EndTime});
    }
}

long long RecordingTimeline::PlaceInRow(int row, long long block) const
{
    if (m_ringSize <= 0)
        return -1;
    const Span& span = m_rows[static_cast<std::size_t>(row)];
    if (span.startBlock < 0 || span.startBlock >= m_ringSize || span.endBlock < 0 || span.endBlock >= m_ringSize)
        return -1;
    const long long length = (span.endBlock - span.startBlock + m_ringSize) % m_ringSize + 1;
    const long long place = ((block % m_ringSize) - span.startBlock + m_ringSize) % m_ringSize;
    return place < length ? place : -1;
}

// The newest recording holding the block: a block written again belongs to
// the recording that wrote it last.
int RecordingTimeline::RowOfBlock(long long block) const
{
    for (int row = static_cast<int>(m_rows.size()) - 1; row >= 0; --row) {
        if (PlaceInRow(row, block) >= 0)
            return row;
    }
    return -1;
}

// The frame counts of the recording's blocks, read once when playback enters
// it; a block whose header cannot be read counts no frame. Past the first
// kCountedBlocks blocks (hours of video) a block counts as many frames as the
// counted ones on average, so that no recording, however long it claims to
// be, costs more header reads than that.
void RecordingTimeline::LoadFrameCounts(int row)
{
    m_countedRow = row;
    m_framesBefore.clear();
    m_frames = 0;
    const Span& span = m_rows[static_cast<std::size_t>(row)];
    m_length = (span.endBlock - span.startBlock + m_ringSize) % m_ringSize + 1;
    const long long counted = std::min(m_length, kCountedBlocks);
    for (long long place = 0; place < counted; ++place) {
        m_framesBefore.push_back(m_frames);
        _HisiBlockHeader_t header{};
        const long long block = (span.startBlock + place) % m_ringSize;
        if (m_reader.ReadBlockHeaders(block, 1, reinterpret_cast<char*>(&header)) > 0)
            m_frames += std::clamp(header.FrameCount, 0, 262142);
    }
    m_averageFrames = m_frames / std::max<long long>(counted, 1);
}

long long RecordingTimeline::FramesBefore(long long place) const
{
    const long long counted = static_cast<long long>(m_framesBefore.size());
    if (place < counted)
        return m_framesBefore[static_cast<std::size_t>(place)];
    return m_frames + (place - counted) * m_averageFrames;
}

FrameTime RecordingTimeline::Locate(long long block, int entry)
{
    FrameTime time;
    if (m_countedRow < 0 || PlaceInRow(m_countedRow, block) < 0) {
        const int row = RowOfBlock(block);
        if (row < 0)
            return time;
        LoadFrameCounts(row);
    }
    const Span& span = m_rows[static_cast<std::size_t>(m_countedRow)];
    const long long index = FramesBefore(PlaceInRow(m_countedRow, block)) + entry;
    const long long duration = span.endTime >= span.startTime ? span.endTime - span.startTime : 0;
    const long long last = std::max<long long>(FramesBefore(m_length) - 1, 1);
    time.row = m_countedRow;
    time.seconds = span.startTime + static_cast<std::uint32_t>(duration * std::clamp<long long>(index, 0, last) / last);
    return time;
}

std::string RecordingTimeline::LocalText(std::uint32_t seconds)
{
    return TimeText(seconds, "%Y-%m-%d %H:%M:%S (local time)", Zone::kLocal);
}
