// What opening a path as a volume found: how far the open got, and where and
// why it stopped. Every front (the panel's line, the command-line tool, the
// report, the host's playback) opens through the one open and words its
// status from the one table here.
#ifndef DVRFS_VOLUME_STATUS_H
#define DVRFS_VOLUME_STATUS_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "dvrfs/dvr_volume.h"
#include "dvrfs/image_source.h"

namespace dvrfs {

// The stages of an open, in order; an open that fails stops at its stage.
enum class OpenStage {
    kSource,         // the path does not open as a device or image
    kSuperBlock,     // neither superblock copy with its block table is sound
    kConfiguration,  // adapter slot 0 carries no configured recorder
    kAdapter,        // no current adapter, or one whose rings are too large
    kRefresh,        // no recording entry of the adapter's span can be read
    kReady,          // the volume is open with its current adapter
};

// What one copy of the superblock and its block table was found to be.
enum class CopyState {
    kUnread,             // the open did not need to read it
    kSound,
    kNoSuperBlock,       // no superblock there at all: wrong header size or magic
    kSuperBlockDamaged,  // a superblock header that fails its XOR sum
    kTableDamaged,       // a sound superblock whose block table fails (or is too large)
    kImpossibleLayout,   // a sound superblock whose values describe no disk
};

struct VolumeStatus {
    OpenStage stage = OpenStage::kSource;
    // The error register when the open stopped: its code, the place its
    // text names (FUNCTION[place]) and the text itself.
    std::int32_t code = 0;
    int place = 0;
    std::string registerText;
    // Why the source did not open: the system's error, and what was wrong
    // with an image of a known kind.
    int systemError = 0;
    std::string detail;

    CopyState primary = CopyState::kUnread;
    CopyState backup = CopyState::kUnread;
    SuperBlockCopy copyInUse = SuperBlockCopy::kPrimary;

    // The source: its kind in words, its files, its size.
    bool sourceOpened = false;
    std::string sourceKind;
    std::vector<std::string> pieces;
    std::uint64_t sourceSize = 0;
    bool device = false;
    // The size of the disk the superblock describes; 0 when unknown.
    std::uint64_t claimedSize = 0;

    // The adapter refresh: the newest recording's newest block could not be
    // read (the span and times stand as found), and how many entries of the
    // span could be read in neither copy (damaged) or were never written.
    bool newestBlockUnreadable = false;
    std::size_t damagedEntries = 0;
    std::size_t unwrittenEntries = 0;
    std::int32_t listRingSize = 0;

    bool Ready() const { return stage == OpenStage::kReady; }
    // The image (or a device of known size) is shorter than the disk its
    // superblock describes.
    bool Truncated() const
    {
        return claimedSize > 0 && sourceSize < claimedSize && (sourceSize > 0 || !device);
    }
};

// Why an open that did not reach kReady stopped, in plain words for the
// person holding the disk: "cannot open: Permission denied — reading a raw
// disk needs membership of the disk group", "not a recorder disk (both
// superblocks damaged)". Empty for a ready volume.
std::string DescribeFailure(const VolumeStatus& status);

// "the image is 600 KB but the disk it holds is 1.1 GB: truncated?" for a
// truncated image, else empty; the note, the same after "; ".
std::string TruncationText(const VolumeStatus& status);
std::string TruncationNote(const VolumeStatus& status);

}  // namespace dvrfs

#endif
