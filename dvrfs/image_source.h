// Where the bytes of a disk come from, under the reader's raw read: a device
// or raw image file (read with pread), the numbered pieces of a split raw
// image (disk.001, disk.002, ...), or an Expert Witness image (case.E01,
// case.E02, ...) read with libewf. Every read of every kind goes through
// this one interface; everything is read-only, and the format code above
// never knows which kind it is.
#ifndef DVRFS_IMAGE_SOURCE_H
#define DVRFS_IMAGE_SOURCE_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace dvrfs {

enum class SourceKind {
    kRaw,       // a device or a raw image file
    kSplitRaw,  // numbered pieces, .001 first
    kE01,       // Expert Witness segments, .E01 first
};

class ImageSource {
public:
    virtual ~ImageSource() = default;
    // Reads up to `size` bytes at `offset` of the disk the image holds: the
    // bytes read (fewer at its end, 0 past it), or -1 when they cannot be
    // read (a sector the device fails, a chunk libewf cannot read or finds
    // damaged, a piece gone).
    virtual long long Read(std::uint64_t offset, char* dest, std::size_t size) = 0;
    // The size of the disk the image holds (a block device's from the device).
    virtual std::uint64_t Size() const = 0;
    virtual SourceKind Type() const = 0;
    // What kind of image it is, in words: "raw", "split raw image, 3 pieces".
    virtual std::string Kind() const = 0;
    // The files read, in order.
    virtual std::vector<std::string> Pieces() const = 0;
    // True for a block or character device rather than a file.
    virtual bool IsDevice() const { return false; }
    // What the image says of its acquisition (E01: the hash stored in it,
    // sizes, dates), as key and value.
    virtual std::vector<std::pair<std::string, std::string>> Facts() const { return {}; }
};

// Why a path did not open as a source: the system's error (0 when it was
// not the system's), and for an image of a known kind what was wrong with it.
struct SourceError {
    int systemError = 0;
    std::string detail;
};

// The source for `path`, opened as the bytes given: a split raw image by its
// first piece (ending in .001), an E01 image by its first segment (.E01),
// anything else as a raw device or file. Null, with `error` filled, when it
// cannot be opened or is no file or device (a folder).
std::unique_ptr<ImageSource> OpenImageSource(const std::string& path, SourceError* error);

}  // namespace dvrfs

#endif
