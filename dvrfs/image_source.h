// Where the bytes of a disk come from, under the reader's raw read: the
// device or raw image file itself (read through the reader's own file, as
// ever), the numbered pieces of a split raw image (disk.001, disk.002, ...),
// or an Expert Witness image (case.E01, case.E02, ...) read with libewf.
// Everything is read-only; the format code above never knows which it is.
#ifndef DVRFS_IMAGE_SOURCE_H
#define DVRFS_IMAGE_SOURCE_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace dvrfs {

class ImageSource {
public:
    virtual ~ImageSource() = default;
    // Reads up to `size` bytes at `offset` of the disk the image holds: the
    // bytes read (fewer at its end, 0 past it), or -1 when they cannot be
    // read (a chunk libewf cannot read or finds damaged, a piece gone).
    virtual long long Read(std::uint64_t offset, char* dest, std::size_t size) = 0;
    // The size of the disk the image holds.
    virtual std::uint64_t Size() const = 0;
    // What kind of image it is, in words: "split raw image, 3 pieces".
    virtual std::string Kind() const = 0;
    // What the image says of its acquisition (E01: the hash stored in it,
    // sizes, dates), as key and value.
    virtual std::vector<std::pair<std::string, std::string>> Facts() const { return {}; }
};

// The source for `path` when it names a split raw image (its first piece,
// ending in .001) or an E01 image (its first segment, ending in .E01);
// null for anything else, which the reader reads as a raw device or file.
// `error` says why an image of those kinds could not be opened.
std::unique_ptr<ImageSource> OpenImageSource(const std::string& path, std::string* error);

}  // namespace dvrfs

#endif
