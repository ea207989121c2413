// The open volume: what the reader holds of a disk between open and close.
#ifndef DVRFS_DVR_VOLUME_H
#define DVRFS_DVR_VOLUME_H

#include <array>
#include <cstdint>
#include <memory>
#include <vector>

#include "dvrfs/dvrfs_records.h"

// Which copy of the superblock and block table the volume was opened on.
enum class SuperBlockCopy {
    kPrimary,
    kBackupSuperBlock,  // the primary superblock is damaged
    kBackupTable,       // the primary superblock is sound, its block table damaged
};

struct DvrVolume {
    // Copy of the superblock in use: the primary, or the backup copy when
    // the primary or its block table is damaged.
    _H264SuperBlock_t superBlock{};
    // BlockTableCount + 1 entries, zero-filled before loading; the extra entry
    // stays zero. Empty until a superblock has been loaded.
    std::vector<_H264BlockTable_t> blockTable;
    SuperBlockCopy copyInUse = SuperBlockCopy::kPrimary;
    // The current adapter; null until the adapter search succeeds.
    std::unique_ptr<_HisiAdapter_t> adapter;
    // List positions of the adapter's span that the adapter refresh could read
    // in neither the list ring nor its mirror (damaged), in the order it met
    // them.
    std::vector<std::int32_t> unreadableListPositions;
    // Those whose two copies hold only zero bytes: entries never written.
    std::vector<std::int32_t> unwrittenListPositions;
    // The newest recording's newest block could not be read: the refresh
    // kept the span and times it found.
    bool newestBlockUnreadable = false;
    // The second partition slot of sector 0; null until the device opens.
    std::unique_ptr<std::array<char, kPartitionSlotSize>> partitionEntry;
};

#endif
