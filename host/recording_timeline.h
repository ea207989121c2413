// Where a frame of a disk playback lies in time: the recording whose data
// blocks hold it (its row in the list, as the panel numbers them) and the
// frame's place among that recording's frames, spread evenly between the
// recording's start and end times.
#ifndef HOST_RECORDING_TIMELINE_H
#define HOST_RECORDING_TIMELINE_H

#include <cstdint>
#include <string>
#include <vector>

#include "catalog/catalog_reader.h"

struct FrameTime {
    int row = -1;               // -1: the block lies in no listed recording
    std::uint32_t seconds = 0;  // since 1970, UTC
};

class RecordingTimeline {
public:
    // `reader` holds the open disk with its current adapter; the timeline
    // lists its recordings once, as the panel does.
    explicit RecordingTimeline(CatalogReader& reader);

    // The time of frame `entry` of data block `block` (the stream cursor's
    // count, not reduced to the ring).
    FrameTime Locate(long long block, int entry);

    // "2023-11-14 22:13:20 (local time)".
    static std::string LocalText(std::uint32_t seconds);

private:
    struct Span {
        std::int32_t startBlock;
        std::int32_t endBlock;
        std::uint32_t startTime;
        std::uint32_t endTime;
    };
    // The block's place in the row's recording, or -1 when it is not one of its blocks.
    long long PlaceInRow(int row, long long block) const;
    int RowOfBlock(long long block) const;
    void LoadFrameCounts(int row);
    long long FramesBefore(long long place) const;

    static constexpr long long kCountedBlocks = 16384;

    CatalogReader& m_reader;
    long long m_ringSize = 0;
    std::vector<Span> m_rows;
    int m_countedRow = -1;
    long long m_length = 0;                 // blocks of the counted row's recording
    std::vector<long long> m_framesBefore;  // per counted block of it: the frames before it
    long long m_frames = 0;                 // in its counted blocks
    long long m_averageFrames = 0;          // per counted block
};

#endif
