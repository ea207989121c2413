#include "catalog/build_summary.h"
#include "catalog/time_text.h"
#include "dvrfs/error_places.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>

namespace {

std::string Count(std::size_t n, const char* one, const char* many)
{
    return std::to_string(n) + " " + (n == 1 ? one : many);
}

std::string LocalMinute(std::uint32_t seconds)
{
    return TimeText(seconds, "%Y-%m-%d %H:%M", Zone::kLocal);
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

// The system's reason a path cannot be read, asked again of the system: the
// reader's own open reports only that it failed.
std::string WhyNotOpened(const std::string& path)
{
    std::string imageError;
    if (!dvrfs::OpenImageSource(path, &imageError) && !imageError.empty())
        return "cannot open the image: " + imageError;
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    const int error = fd < 0 ? errno : 0;
    if (fd >= 0)
        ::close(fd);
    std::string text = "cannot open: " + std::string(error ? std::strerror(error) : "the device did not open");
    if (error == EACCES)
        text += " \u2014 reading a raw disk needs membership of the disk group";
    return text;
}

std::string WhyNotARecorderDisk(const CatalogReader& reader, const std::string& path)
{
    struct stat info {};
    const bool known = ::stat(path.c_str(), &info) == 0;
    if (known && S_ISDIR(info.st_mode))
        return std::string("cannot read: ") + std::strerror(EISDIR);
    if (known && S_ISREG(info.st_mode) && info.st_size == 0)
        return "not a recorder disk (the image is empty)";
    switch (reader.m_errorCode) {
    case kErrBlockTable:
    case kErrTableSize: return "not a recorder disk (both block tables damaged)";
    case kErrTableLimit:
    case kErrGeometry: return "not a recorder disk (its superblock describes an impossible layout)";
    default: break;
    }
    // A header of the wrong size or magic in both places is no superblock at
    // all (another file system, zeros, random bytes); a header that is there
    // but fails its sum is a damaged one.
    const std::string text = reader.m_errorText;
    auto refusedAt = [&text](int place) {
        return text.rfind(std::string(dvrfs::kFunctionWord) + "[" + std::to_string(place) + "]", 0) == 0;
    };
    if (reader.m_errorCode == kErrSuperBlock && (refusedAt(dvrfs::kAtHeaderSize) || refusedAt(dvrfs::kAtMagic)))
        return "not a recorder disk: no superblock at the start";
    return "not a recorder disk (both superblocks damaged)";
}

// An image file shorter than the disk its superblock describes was cut short
// when it was copied: say so, since that explains every read past the cut.
std::string TruncationNote(const CatalogReader& reader, const std::string& path)
{
    struct stat info {};
    if (!reader.m_volume || ::stat(path.c_str(), &info) != 0 || !S_ISREG(info.st_mode))
        return "";
    const _H264SuperBlock_t& super = reader.m_volume->superBlock;
    if (super.BlockCount <= 0 || super.BlockSize <= 0)
        return "";
    const long double blocks = static_cast<long double>(super.BlockCount) + (super.BlockCount - 1) / 512;
    const long double disk = static_cast<long double>(super.OffsetBlockSpace) + blocks * super.BlockSize;
    const long double image = static_cast<long double>(info.st_size);
    if (image >= disk)
        return "";
    return "; the image is " + Size(image) + " but the disk it holds is " + Size(disk) + ": truncated?";
}

std::string WhyNoIndex(const CatalogReader& reader)
{
    const DvrVolume& volume = *reader.m_volume;
    if (!volume.adapter)
        return "no valid state record of the recorder found";
    if (volume.adapter->FirstList.Idx < 0 && !volume.unreadableListPositions.empty())
        return "no recording entry can be read (" +
               Count(volume.unreadableListPositions.size(), "entry", "entries") + " damaged)";
    return "the recorder's newest data block cannot be read";
}

std::string Listed(const CatalogReader& reader)
{
    std::string text = "no recordings";
    if (reader.m_recordCount > 0) {
        const CatalogEntry* entries = reader.m_catalog->Entries;
        std::uint32_t first = static_cast<std::uint32_t>(entries[0].StartTime);
        std::uint32_t last = static_cast<std::uint32_t>(entries[0].EndTime);
        for (int i = 1; i < reader.m_recordCount; ++i) {
            first = std::min(first, static_cast<std::uint32_t>(entries[i].StartTime));
            last = std::max(last, static_cast<std::uint32_t>(entries[i].EndTime));
        }
        text = Count(static_cast<std::size_t>(reader.m_recordCount), "recording", "recordings") + ", " +
               LocalMinute(first) + " to " + LocalMinute(last) + " (local time)";
    }
    if (!reader.m_skippedPositions.empty())
        text += "; " + Count(reader.m_skippedPositions.size(), "damaged entry", "damaged entries") + " skipped";
    switch (reader.m_volume->copyInUse) {
    case SuperBlockCopy::kPrimary: break;
    case SuperBlockCopy::kBackupSuperBlock: text += "; primary superblock damaged, backup used"; break;
    case SuperBlockCopy::kBackupTable: text += "; primary block table damaged, backup used"; break;
    }
    return text;
}

}  // namespace

std::string DescribeBuild(CatalogBuild result, const CatalogReader& reader, const std::string& path)
{
    switch (result) {
    case CatalogBuild::kBuilt: return Listed(reader);
    case CatalogBuild::kNotOpened:
        return reader.m_diskFile ? WhyNotOpened(path) : WhyNotARecorderDisk(reader, path);
    case CatalogBuild::kNotConfigured:
        return "no recorder was ever configured on this disk" + TruncationNote(reader, path);
    case CatalogBuild::kNoAdapter: return WhyNoIndex(reader) + TruncationNote(reader, path);
    }
    return "";
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
