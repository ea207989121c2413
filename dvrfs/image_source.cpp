#include "dvrfs/image_source.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdio>

#include <libewf.h>

namespace dvrfs {
namespace {

bool EndsWith(const std::string& text, const std::string& tail)
{
    if (text.size() < tail.size())
        return false;
    return std::equal(tail.rbegin(), tail.rend(), text.rbegin(),
                      [](char a, char b) { return std::tolower(a) == std::tolower(b); });
}

// pread until `size` bytes or the end of the file: the bytes read, or -1
// when the first of them cannot be read.
long long ReadAt(int fd, std::uint64_t offset, char* dest, std::size_t size)
{
    long long done = 0;
    while (size > 0) {
        const ssize_t got = ::pread(fd, dest, size, static_cast<off_t>(offset));
        if (got < 0 && errno == EINTR)
            continue;
        if (got < 0)
            return done > 0 ? done : -1;
        if (got == 0)
            break;
        done += got;
        dest += got;
        offset += static_cast<std::uint64_t>(got);
        size -= static_cast<std::size_t>(got);
    }
    return done;
}

// A device or a raw image file. A block device's size comes from the
// device: its file size is 0.
class RawSource : public ImageSource {
public:
    ~RawSource() override
    {
        if (m_fd >= 0)
            ::close(m_fd);
    }

    bool Open(const std::string& path, SourceError* error)
    {
        m_path = path;
        m_fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
        struct stat info {};
        if (m_fd < 0 || ::fstat(m_fd, &info) != 0) {
            error->systemError = errno;
            return false;
        }
        if (S_ISDIR(info.st_mode)) {
            error->systemError = EISDIR;
            return false;
        }
        m_device = S_ISBLK(info.st_mode) || S_ISCHR(info.st_mode);
        std::uint64_t deviceSize = 0;
        if (S_ISBLK(info.st_mode) && ::ioctl(m_fd, BLKGETSIZE64, &deviceSize) == 0)
            m_size = deviceSize;
        else if (S_ISREG(info.st_mode))
            m_size = static_cast<std::uint64_t>(info.st_size);
        return true;
    }

    long long Read(std::uint64_t offset, char* dest, std::size_t size) override
    {
        return ReadAt(m_fd, offset, dest, size);
    }

    std::uint64_t Size() const override { return m_size; }
    SourceKind Type() const override { return SourceKind::kRaw; }
    std::string Kind() const override { return m_device ? "raw device" : "raw"; }
    std::vector<std::string> Pieces() const override { return {m_path}; }
    bool IsDevice() const override { return m_device; }

private:
    int m_fd = -1;
    std::string m_path;
    std::uint64_t m_size = 0;
    bool m_device = false;
};

// The pieces of a split raw image, one after the other: piece k holds the
// bytes from the sum of the sizes before it.
class SplitRawSource : public ImageSource {
public:
    ~SplitRawSource() override
    {
        for (const Piece& piece : m_pieces)
            ::close(piece.fd);
    }

    bool Add(const std::string& path)
    {
        const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
        struct stat info {};
        if (fd < 0 || ::fstat(fd, &info) != 0 || !S_ISREG(info.st_mode)) {
            if (fd >= 0)
                ::close(fd);
            return false;
        }
        m_pieces.push_back({fd, m_size, static_cast<std::uint64_t>(info.st_size), path});
        m_size += static_cast<std::uint64_t>(info.st_size);
        return true;
    }

    long long Read(std::uint64_t offset, char* dest, std::size_t size) override
    {
        long long done = 0;
        for (const Piece& piece : m_pieces) {
            if (size == 0)
                break;
            if (offset >= piece.start + piece.size || offset < piece.start)
                continue;
            const std::size_t wanted =
                static_cast<std::size_t>(std::min<std::uint64_t>(size, piece.start + piece.size - offset));
            const long long got = ReadAt(piece.fd, offset - piece.start, dest, wanted);
            if (got < 0)
                return done > 0 ? done : -1;
            done += got;
            if (static_cast<std::size_t>(got) < wanted)
                break;  // the piece is shorter than it was: the rest is not there
            dest += got;
            offset += static_cast<std::uint64_t>(got);
            size -= static_cast<std::size_t>(got);
        }
        return done;
    }

    std::uint64_t Size() const override { return m_size; }
    SourceKind Type() const override { return SourceKind::kSplitRaw; }

    std::vector<std::string> Pieces() const override
    {
        std::vector<std::string> paths;
        for (const Piece& piece : m_pieces)
            paths.push_back(piece.path);
        return paths;
    }

    std::string Kind() const override
    {
        return "split raw image, " + std::to_string(m_pieces.size()) + (m_pieces.size() == 1 ? " piece" : " pieces");
    }

private:
    struct Piece {
        int fd;
        std::uint64_t start;
        std::uint64_t size;
        std::string path;
    };
    std::vector<Piece> m_pieces;
    std::uint64_t m_size = 0;
};

std::unique_ptr<ImageSource> OpenSplitRaw(const std::string& first, SourceError* error)
{
    auto source = std::make_unique<SplitRawSource>();
    const std::string base = first.substr(0, first.size() - 3);
    for (int k = 1; k <= 999; ++k) {
        char number[8];
        std::snprintf(number, sizeof number, "%03d", k);
        if (!source->Add(base + number)) {
            if (k == 1) {
                error->systemError = errno;
                error->detail = "the first piece cannot be read";
                return nullptr;
            }
            break;
        }
    }
    return source;
}

std::string EwfError(libewf_error_t* error)
{
    char text[512] = "unknown error";
    if (error) {
        libewf_error_sprint(error, text, sizeof text);
        libewf_error_free(&error);
    }
    return text;
}

// An Expert Witness image through libewf, which finds its segments from the
// first one's name; each chunk is checked against its checksum as it is read.
class EwfSource : public ImageSource {
public:
    ~EwfSource() override
    {
        if (m_handle) {
            libewf_handle_close(m_handle, nullptr);
            libewf_handle_free(&m_handle, nullptr);
        }
    }

    bool Open(const std::string& first, std::string* message)
    {
        libewf_error_t* error = nullptr;
        char** names = nullptr;
        int count = 0;
        if (libewf_glob(first.c_str(), first.size(), LIBEWF_FORMAT_UNKNOWN, &names, &count, &error) != 1) {
            *message = EwfError(error);
            return false;
        }
        m_segments.assign(names, names + count);
        const bool opened = libewf_handle_initialize(&m_handle, &error) == 1 &&
                            libewf_handle_open(m_handle, names, count, LIBEWF_OPEN_READ, &error) == 1 &&
                            libewf_handle_get_media_size(m_handle, &m_size, &error) == 1 &&
                            libewf_handle_get_chunk_size(m_handle, &m_chunkSize, &error) == 1;
        libewf_glob_free(names, count, nullptr);
        if (!opened) {
            *message = EwfError(error);
            return false;
        }
        if (m_chunkSize == 0 || m_chunkSize > kMaxChunkSize) {
            *message = "its chunk size (" + std::to_string(m_chunkSize) + " bytes) is beyond what this tool reads";
            return false;
        }
        m_stored.resize(m_chunkSize + kChunkSlack);
        m_chunk.resize(m_chunkSize + kChunkSlack);
        return true;
    }

    long long Read(std::uint64_t offset, char* dest, std::size_t size) override
    {
        long long done = 0;
        while (size > 0 && offset < m_size) {
            const std::uint64_t index = offset / m_chunkSize;
            if (!LoadChunk(index))
                return done > 0 ? done : -1;
            const std::size_t within = static_cast<std::size_t>(offset - index * m_chunkSize);
            if (within >= m_chunkLength)
                break;  // a chunk shorter than the media says: the rest is not there
            const std::size_t piece = std::min(size, m_chunkLength - within);
            std::copy_n(m_chunkData + within, piece, dest);
            done += static_cast<long long>(piece);
            dest += piece;
            offset += piece;
            size -= piece;
        }
        return done;
    }

    std::uint64_t Size() const override { return m_size; }
    SourceKind Type() const override { return SourceKind::kE01; }
    std::vector<std::string> Pieces() const override { return m_segments; }

    std::string Kind() const override
    {
        return "E01 image, " + std::to_string(m_segments.size()) + (m_segments.size() == 1 ? " segment" : " segments");
    }

    std::vector<std::pair<std::string, std::string>> Facts() const override
    {
        std::vector<std::pair<std::string, std::string>> facts = {{"media_size", std::to_string(m_size)}};
        std::uint8_t md5[16];
        if (libewf_handle_get_md5_hash(m_handle, md5, sizeof md5, nullptr) == 1) {
            std::string hex;
            for (std::uint8_t byte : md5) {
                char two[3];
                std::snprintf(two, sizeof two, "%02x", byte);
                hex += two;
            }
            facts.push_back({"stored_md5", hex});
        }
        for (const char* name : {"acquiry_date", "case_number", "examiner_name", "acquiry_software_version"}) {
            std::uint8_t value[256] = {};
            if (libewf_handle_get_utf8_header_value(m_handle, reinterpret_cast<const std::uint8_t*>(name),
                                                    std::char_traits<char>::length(name), value, sizeof value,
                                                    nullptr) == 1)
                facts.push_back({name, reinterpret_cast<const char*>(value)});
        }
        return facts;
    }

private:
    // Chunks are read whole, stored bytes first, then unpacked and checked
    // against their checksum. This libewf's own buffered read keeps the
    // buffer of every chunk it fails to read (a damaged image read that way
    // costs memory without bound) and hands on a stored chunk whose checksum
    // fails. The last chunk read is kept for the reads that follow it.
    bool LoadChunk(std::uint64_t index)
    {
        if (index == m_chunkIndex)
            return true;
        m_chunkIndex = kNoChunk;
        libewf_error_t* error = nullptr;
        std::int8_t compressed = 0;
        std::int8_t checksumRead = 0;
        std::uint32_t checksum = 0;
        std::uint8_t storedChecksum[4];
        ssize_t stored = -1;
        if (libewf_handle_seek_offset(m_handle, static_cast<off64_t>(index * m_chunkSize), SEEK_SET, &error) >= 0)
            stored = libewf_handle_read_chunk(m_handle, m_stored.data(), m_stored.size(), &compressed, storedChecksum,
                                              &checksum, &checksumRead, &error);
        std::size_t length = m_chunk.size();
        if (stored < 0 || libewf_handle_prepare_read_chunk(m_handle, m_stored.data(), static_cast<std::size_t>(stored),
                                                           m_chunk.data(), &length, compressed, checksum,
                                                           checksumRead, &error) < 0) {
            libewf_error_free(&error);
            return false;
        }
        // A compressed chunk is unpacked into the second buffer; a stored one
        // is checked where it lies.
        m_chunkData = compressed ? m_chunk.data() : m_stored.data();
        m_chunkLength = std::min<std::size_t>(length, m_chunkSize);
        m_chunkIndex = index;
        return true;
    }

    // The largest chunk an acquisition tool writes: 32,768 sectors of 4096 bytes.
    static constexpr std::uint32_t kMaxChunkSize = 128u << 20;
    static constexpr std::size_t kChunkSlack = 4096;  // a stored chunk may be a little larger than its data
    static constexpr std::uint64_t kNoChunk = ~0ull;

    libewf_handle_t* m_handle = nullptr;
    size64_t m_size = 0;
    std::uint32_t m_chunkSize = 0;
    std::vector<std::string> m_segments;
    std::vector<std::uint8_t> m_stored;
    std::vector<std::uint8_t> m_chunk;
    std::uint64_t m_chunkIndex = kNoChunk;
    const std::uint8_t* m_chunkData = nullptr;
    std::size_t m_chunkLength = 0;
};

}  // namespace

// Whether the path opens for reading at all, whatever it holds: an image
// whose first file is missing is said to be missing, not to be no image.
bool Opens(const std::string& path, SourceError* error)
{
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        error->systemError = errno;
        return false;
    }
    ::close(fd);
    return true;
}

std::unique_ptr<ImageSource> OpenImageSource(const std::string& path, SourceError* error)
{
    const bool split = EndsWith(path, ".001");
    if ((split || EndsWith(path, ".e01")) && !Opens(path, error))
        return nullptr;
    if (split)
        return OpenSplitRaw(path, error);
    if (EndsWith(path, ".e01")) {
        auto source = std::make_unique<EwfSource>();
        if (source->Open(path, &error->detail))
            return source;
        return nullptr;
    }
    auto source = std::make_unique<RawSource>();
    if (source->Open(path, error))
        return source;
    return nullptr;
}

}  // namespace dvrfs
