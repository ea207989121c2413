// The open volume: what the reader holds of a disk between open and close.
#ifndef DVRFS_DVR_VOLUME_H
#define DVRFS_DVR_VOLUME_H

#include <array>
#include <memory>
#include <vector>

#include "dvrfs/dvrfs_records.h"

struct DvrVolume {
    // Copy of the superblock that was loaded last (primary, or backup on the
    // way back to the primary).
    _H264SuperBlock_t superBlock{};
    // BlockTableCount + 1 entries, zero-filled before loading; the extra entry
    // stays zero. Empty until a superblock has been loaded.
    std::vector<_H264BlockTable_t> blockTable;
    // The current adapter; null until the adapter search succeeds.
    std::unique_ptr<_HisiAdapter_t> adapter;
    // The second partition slot of sector 0; null until the device opens.
    std::unique_ptr<std::array<char, kPartitionSlotSize>> partitionEntry;
};

#endif
