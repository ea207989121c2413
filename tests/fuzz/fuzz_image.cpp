// Fuzz target: the catalogue build and the verification walk through the
// forensic image sources. An input that starts with the Expert Witness
// signature is written as it stands to case.E01 and read through libewf; any
// other input is a disk (as extents) cut into the pieces of a split raw image at byte
// offsets the input chooses, so that records straddle the pieces.
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>

#include "catalog/catalog_reader.h"
#include "tests/fuzz/extent_image.h"
#include "tools/dvrfs/disk_check.h"

namespace {

constexpr std::uint8_t kEwfSignature[8] = {'E', 'V', 'F', 0x09, 0x0d, 0x0a, 0xff, 0x00};
constexpr int kMaxPieces = 4;

std::string Scratch(const char* tail)
{
    return "/dev/shm/morvane-fuzz-" + std::to_string(::getpid()) + tail;
}

// Copies bytes [begin, end) of `from` into a new sparse file, hole by hole.
void WritePiece(int from, const std::string& path, std::uint64_t begin, std::uint64_t end)
{
    const int to = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    if (to < 0)
        return;
    (void)::ftruncate(to, static_cast<off_t>(end - begin));
    off_t at = ::lseek(from, static_cast<off_t>(begin), SEEK_DATA);
    while (at >= 0 && static_cast<std::uint64_t>(at) < end) {
        const off_t hole = std::min<off_t>(::lseek(from, at, SEEK_HOLE), static_cast<off_t>(end));
        char buffer[65536];
        while (at < hole) {
            const ssize_t n = ::pread(from, buffer, std::min<off_t>(sizeof buffer, hole - at), at);
            if (n <= 0)
                break;
            (void)::pwrite(to, buffer, static_cast<std::size_t>(n), at - static_cast<off_t>(begin));
            at += n;
        }
        at = ::lseek(from, hole, SEEK_DATA);
    }
    ::close(to);
}

// The disk as pieces .001, .002, ...: the cuts fall in the first 64 MiB,
// where the superblocks, tables, list and first data blocks lie, at places
// taken from the input's last bytes.
std::string WriteSplitImage(const std::uint8_t* data, std::size_t size)
{
    const std::string disk = fuzzdisk::WriteImage(data, size);
    const std::string base = Scratch(".");
    for (int k = 1; k <= kMaxPieces; ++k)
        ::unlink((base + "00" + std::to_string(k)).c_str());
    const int from = ::open(disk.c_str(), O_RDONLY | O_CLOEXEC);
    if (from < 0)
        return base + "001";
    const std::uint64_t length = static_cast<std::uint64_t>(::lseek(from, 0, SEEK_END));
    std::uint64_t cuts[kMaxPieces] = {};
    int count = 0;
    std::uint32_t seed = 0;
    std::memcpy(&seed, data + size - std::min<std::size_t>(size, 4), std::min<std::size_t>(size, 4));
    for (int k = 0; k + 1 < kMaxPieces && (seed >> (8 * k)) != 0; ++k)
        cuts[count++] = std::min<std::uint64_t>(length, ((seed >> (8 * k)) & 0xff) * 262139ull);
    cuts[count++] = length;
    std::sort(cuts, cuts + count);
    std::uint64_t begin = 0;
    for (int k = 0; k < count; ++k) {
        WritePiece(from, base + "00" + std::to_string(k + 1), begin, cuts[k]);
        begin = cuts[k];
    }
    ::close(from);
    ::unlink(disk.c_str());
    return base + "001";
}

std::string WriteEwfImage(const std::uint8_t* data, std::size_t size)
{
    const std::string path = Scratch(".E01");
    const int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    if (fd >= 0) {
        (void)::write(fd, data, size);
        ::close(fd);
    }
    return path;
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    return std::freopen("/dev/null", "w", stdout) ? 0 : 1;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const bool ewf = size >= sizeof kEwfSignature && std::memcmp(data, kEwfSignature, sizeof kEwfSignature) == 0;
    const std::string path = ewf ? WriteEwfImage(data, size) : WriteSplitImage(data, size);
    CatalogReader reader;
    if (reader.BuildCatalog(path) == CatalogBuild::kBuilt)
        for (int selector = 0; selector < 128; ++selector)
            reader.GetInfo(static_cast<char>(selector));
    CatalogReader verifier;
    dvrfstool::VerifyDisk(verifier, path, [](const std::string&) {});
    return 0;
}
