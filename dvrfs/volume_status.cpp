#include "dvrfs/volume_status.h"

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "dvrfs/dvr_disk_reader.h"

namespace dvrfs {
namespace {

std::string Count(std::size_t n, const char* one, const char* many)
{
    return std::to_string(n) + " " + (n == 1 ? one : many);
}

std::string Size(long double bytes)
{
    char text[32];
    if (bytes >= 1e9L)
        std::snprintf(text, sizeof text, "%.1Lf GB", bytes / 1e9L);
    else if (bytes >= 1e6L)
        std::snprintf(text, sizeof text, "%.0Lf MB", bytes / 1e6L);
    else
        std::snprintf(text, sizeof text, "%.0Lf KB", bytes / 1e3L);
    return text;
}

std::string WhySourceDidNotOpen(const VolumeStatus& status)
{
    if (status.systemError == EISDIR)
        return std::string("cannot read: ") + std::strerror(EISDIR);
    if (status.systemError == 0 && !status.detail.empty())
        return "cannot open the image: " + status.detail;
    std::string text =
        "cannot open: " + std::string(status.systemError ? std::strerror(status.systemError) : "the device did not open");
    if (status.systemError == EACCES)
        text += " \u2014 reading a raw disk needs membership of the disk group";
    return text;
}

bool SuperBlockGone(CopyState copy)
{
    return copy == CopyState::kNoSuperBlock || copy == CopyState::kSuperBlockDamaged;
}

// Neither copy opened: what each one is, the backup as the last word, as the
// open read it last.
std::string WhyNoCopyOpened(const VolumeStatus& status)
{
    if (!status.device && status.sourceSize == 0)
        return "not a recorder disk (the image is empty)";
    const CopyState primary = status.primary;
    const CopyState backup = status.backup;
    if (backup == CopyState::kImpossibleLayout)
        return "not a recorder disk (its superblock describes an impossible layout)";
    if (backup == CopyState::kTableDamaged)
        return SuperBlockGone(primary) ? "not a recorder disk (primary superblock and backup block table damaged)"
                                       : "not a recorder disk (both block tables damaged)";
    if (primary == CopyState::kTableDamaged && SuperBlockGone(backup))
        return "not a recorder disk (primary block table and backup superblock damaged)";
    // A header of the wrong size or magic is no superblock at all (another
    // file system, zeros, random bytes); a header that is there but fails
    // its sum is a damaged one.
    if (primary == CopyState::kNoSuperBlock || backup == CopyState::kNoSuperBlock)
        return "not a recorder disk: no superblock at the start";
    return "not a recorder disk (both superblocks damaged)";
}

std::string WhyNoAdapter(const VolumeStatus& status)
{
    if (status.code == kErrAdapterRings)
        return "the recorder's rings are larger than this reader accepts (list ring above 1,048,576 entries or "
               "data ring above 4,194,304 blocks)";
    return "no valid state record of the recorder found";
}

std::string WhyNoEntry(const VolumeStatus& status)
{
    if (status.listRingSize <= 0)
        return "no recording entry can be read (the list ring holds no entry)";
    std::string counts;
    if (status.damagedEntries > 0)
        counts = Count(status.damagedEntries, "entry", "entries") + " damaged";
    if (status.unwrittenEntries > 0)
        counts += (counts.empty() ? "" : ", ") + Count(status.unwrittenEntries, "entry", "entries") + " never written";
    return "no recording entry can be read" + (counts.empty() ? "" : " (" + counts + ")");
}

}  // namespace

std::string TruncationText(const VolumeStatus& status)
{
    if (!status.Truncated())
        return "";
    return "the image is " + Size(status.sourceSize) + " but the disk it holds is " + Size(status.claimedSize) +
           ": truncated?";
}

std::string TruncationNote(const VolumeStatus& status)
{
    return status.Truncated() ? "; " + TruncationText(status) : "";
}

std::string DescribeFailure(const VolumeStatus& status)
{
    switch (status.stage) {
    case OpenStage::kSource: return WhySourceDidNotOpen(status);
    case OpenStage::kSuperBlock: return WhyNoCopyOpened(status);
    case OpenStage::kConfiguration:
        return "no recorder was ever configured on this disk" + TruncationNote(status);
    case OpenStage::kAdapter: return WhyNoAdapter(status) + TruncationNote(status);
    case OpenStage::kRefresh: return WhyNoEntry(status) + TruncationNote(status);
    case OpenStage::kReady: break;
    }
    return "";
}

}  // namespace dvrfs
