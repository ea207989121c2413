#include "tests/fuzz/extent_image.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

namespace fuzzdisk {
namespace {

// How many records of each kind are sealed: enough for what the seeds hold,
// few enough that one input stays quick.
constexpr int kListEntries = 64;
constexpr int kDataBlocks = 16;
constexpr int kIndexEntries = 64;
constexpr std::uint32_t kTableEntries = 4096;

template <typename T>
T Get(const std::vector<std::uint8_t>& bytes, std::size_t at)
{
    T value{};
    std::memcpy(&value, bytes.data() + at, sizeof value);
    return value;
}

std::vector<std::uint8_t> ReadAt(int fd, std::uint64_t offset, std::size_t size)
{
    std::vector<std::uint8_t> bytes(size, 0);
    if (offset < kMaxOffset)
        (void)::pread(fd, bytes.data(), size, static_cast<off_t>(offset));
    return bytes;
}

void WriteAt(int fd, std::uint64_t offset, const std::vector<std::uint8_t>& bytes)
{
    if (offset < kMaxOffset)
        (void)::pwrite(fd, bytes.data(), bytes.size(), static_cast<off_t>(offset));
}

// Sets bytes[at] so that the XOR of all of them comes out as `sum`.
void Seal(std::vector<std::uint8_t>& bytes, std::size_t length, std::size_t at, std::uint8_t sum)
{
    bytes[at] = 0;
    std::uint8_t x = 0;
    for (std::size_t i = 0; i < length; ++i)
        x ^= bytes[i];
    bytes[at] = static_cast<std::uint8_t>(x ^ sum);
}

bool AllZero(const std::vector<std::uint8_t>& bytes)
{
    for (std::uint8_t b : bytes)
        if (b != 0)
            return false;
    return true;
}

struct Geometry {
    std::uint64_t blockSpace = 0;
    std::int32_t shift = 0;
};

// A logical position of the block space as an offset of the image: one
// physical block is left out after every 512 logical ones.
std::uint64_t Physical(const Geometry& g, std::uint64_t logical)
{
    const std::uint64_t block = logical >> g.shift;
    return g.blockSpace + ((block + block / 512) << g.shift) + (logical & ((1ull << g.shift) - 1));
}

// A superblock copy and its block table: the table's sum stored in the
// superblock, then the header's sum made 0 (byte 0x02 is not interpreted).
Geometry SealSuperBlock(int fd, std::uint64_t at)
{
    std::vector<std::uint8_t> super = ReadAt(fd, at, 508);
    const std::uint32_t count = std::min(Get<std::uint32_t>(super, 0x08), kTableEntries);
    const std::uint64_t tableAt = (at == 0 ? Get<std::uint64_t>(super, 0x2C) : at) + 8192;
    std::uint8_t tableSum = 0;
    for (std::uint8_t b : ReadAt(fd, tableAt, std::size_t{count} * 32))
        tableSum ^= b;
    super[0x16] = tableSum;
    Seal(super, 252, 0x02, 0);
    WriteAt(fd, at, super);
    return {Get<std::uint64_t>(super, 0x3C), Get<std::int32_t>(super, 0x20)};
}

// A record of the block space that the image holds: sealed to `sum`, at a
// byte no reader interprets; a record of zeros (not written) stays a hole.
void SealRecord(int fd, const Geometry& g, std::uint64_t logical, std::size_t size, std::size_t at, std::uint8_t sum)
{
    std::vector<std::uint8_t> record = ReadAt(fd, Physical(g, logical), size);
    if (AllZero(record))
        return;
    Seal(record, size, at, sum);
    WriteAt(fd, Physical(g, logical), record);
}

void SealSums(int fd)
{
    const std::vector<std::uint8_t> primary = ReadAt(fd, 0, 508);
    const Geometry g = SealSuperBlock(fd, 0);
    if (const std::uint64_t backup = Get<std::uint64_t>(primary, 0x34); backup != 0)
        SealSuperBlock(fd, backup);
    if (g.shift < 9 || g.shift > 30)
        return;
    for (int slot = 0; slot < 120; ++slot) {
        const std::uint64_t logical = static_cast<std::uint64_t>(slot) << g.shift;
        std::vector<std::uint8_t> adapter = ReadAt(fd, Physical(g, logical), 512);
        if (Get<std::int32_t>(adapter, 12) != slot)
            continue;
        Seal(adapter, 512, 464, 0);  // byte 464 is not interpreted
        WriteAt(fd, Physical(g, logical), adapter);
        const std::uint8_t sum = adapter[508];
        const auto listMax = std::min(Get<std::int32_t>(adapter, 476), kListEntries);
        for (std::int32_t i = 0; i < listMax; ++i) {
            SealRecord(fd, g, Get<std::uint64_t>(adapter, 484) + i * 128ull, 128, 0, sum);
            SealRecord(fd, g, Get<std::uint64_t>(adapter, 492) + i * 128ull, 128, 0, sum);
        }
        const std::uint64_t dataRing = Get<std::uint64_t>(adapter, 500);
        const auto blocks = std::min(Get<std::int32_t>(adapter, 480), kDataBlocks);
        for (std::int32_t b = 0; b < blocks; ++b) {
            const std::uint64_t start = dataRing + (static_cast<std::uint64_t>(b) << 24);
            SealRecord(fd, g, start, 128, 0, sum);
            for (int k = 0; k < kIndexEntries; ++k)
                SealRecord(fd, g, start + (1ull << 24) - (k + 1) * 64ull, 64, 0, sum);
        }
    }
}

const std::string& ScratchImage()
{
    static const std::string path = "/dev/shm/morvane-fuzz-" + std::to_string(::getpid()) + ".img";
    return path;
}

}  // namespace

std::string WriteImage(const std::uint8_t* data, std::size_t size)
{
    const std::string& path = ScratchImage();
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
    if (size % 2 == 0)
        SealSums(fd);
    ::close(fd);
    return path;
}

}  // namespace fuzzdisk
