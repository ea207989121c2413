#include "tests/fuzz/extent_image.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstring>

namespace fuzzdisk {

std::string WriteImage(const std::uint8_t* data, std::size_t size)
{
    static const std::string path = "/dev/shm/morvane-fuzz-" + std::to_string(::getpid()) + ".img";
    const int fd = ::open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    if (fd < 0)
        return path;
    std::size_t at = 0;
    while (at + 10 <= size) {
        std::uint64_t offset = 0;
        std::uint16_t length = 0;
        std::memcpy(&offset, data + at, 8);
        std::memcpy(&length, data + at + 8, 2);
        at += 10;
        const std::size_t available = std::min<std::size_t>(length, size - at);
        if (offset < kMaxOffset)
            (void)::pwrite(fd, data + at, available, static_cast<off_t>(offset));
        at += available;
    }
    ::close(fd);
    return path;
}

std::vector<std::uint8_t> ReadExtents(const std::string& path)
{
    std::vector<std::uint8_t> out;
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return out;
    const off_t end = ::lseek(fd, 0, SEEK_END);
    for (off_t at = ::lseek(fd, 0, SEEK_DATA); at >= 0 && at < end; at = ::lseek(fd, at, SEEK_DATA)) {
        const off_t holeAt = ::lseek(fd, at, SEEK_HOLE);
        while (at < holeAt) {
            // Extents of whole zero runs are left out: they read as holes.
            unsigned char piece[4096];
            const ssize_t n = ::pread(fd, piece, std::min<off_t>(sizeof piece, holeAt - at), at);
            if (n <= 0)
                break;
            std::size_t first = 0;
            while (first < static_cast<std::size_t>(n) && piece[first] == 0)
                ++first;
            std::size_t last = static_cast<std::size_t>(n);
            while (last > first && piece[last - 1] == 0)
                --last;
            if (last > first) {
                const std::uint64_t offset = static_cast<std::uint64_t>(at) + first;
                const std::uint16_t length = static_cast<std::uint16_t>(last - first);
                const auto* o = reinterpret_cast<const std::uint8_t*>(&offset);
                const auto* l = reinterpret_cast<const std::uint8_t*>(&length);
                out.insert(out.end(), o, o + 8);
                out.insert(out.end(), l, l + 2);
                out.insert(out.end(), piece + first, piece + last);
            }
            at += n;
        }
    }
    ::close(fd);
    return out;
}

}  // namespace fuzzdisk
