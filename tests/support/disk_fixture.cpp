#include "tests/support/disk_fixture.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <vector>

#include "tests/support/io_trace.h"

std::string FileFingerprint(const std::string& path)
{
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0)
        return "missing";
    const off_t size = ::lseek(fd, 0, SEEK_END);
    std::uint64_t hash = 1469598103934665603ull;
    std::vector<unsigned char> buffer(1 << 16);
    for (off_t at = ::lseek(fd, 0, SEEK_DATA); at >= 0 && at < size; at = ::lseek(fd, at, SEEK_DATA)) {
        const off_t end = ::lseek(fd, at, SEEK_HOLE);
        hash = (hash ^ static_cast<std::uint64_t>(at)) * 1099511628211ull;
        while (at < end) {
            // Straight from the kernel: the read trace neither counts nor fails these.
            const ssize_t n = ::syscall(SYS_pread64, fd, buffer.data(), std::min<off_t>(end - at, buffer.size()), at);
            if (n <= 0)
                break;
            for (ssize_t i = 0; i < n; ++i)
                hash = (hash ^ buffer[i]) * 1099511628211ull;
            at += n;
        }
    }
    ::close(fd);
    return std::to_string(size) + ":" + std::to_string(hash);
}

void PatchSuperBlocks(dvrimage::DiskImage& image, const std::string& path, std::size_t at, const void* bytes,
                      std::size_t size)
{
    for (std::uint64_t copy : {std::uint64_t{0}, image.layout().superOffsetBackup}) {
        unsigned char header[252];
        const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
        ASSERT_EQ(::pread(fd, header, sizeof header, static_cast<off_t>(copy)), 252);
        ::close(fd);
        std::memcpy(header + at, bytes, size);
        header[251] = 0;
        unsigned char sum = 0;
        for (unsigned char b : header)
            sum ^= b;
        header[251] = sum;
        image.WritePhysical(copy, header, sizeof header);
    }
}

dvrimage::Layout SmallLayout()
{
    dvrimage::Layout layout;
    layout.listMax = 16;
    layout.dataBlockMax = 8;
    return layout;
}

void DiskTest::SetUp()
{
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    // One folder per test, removed whole afterwards: parameterised names hold
    // slashes, which must not make nested folders.
    std::string name = std::string("dvrfs-test-") + std::to_string(::getpid()) + "-" + info->test_suite_name() +
                       "-" + info->name();
    std::replace(name.begin(), name.end(), '/', '_');
    const std::filesystem::path dir = std::filesystem::temp_directory_path() / name;
    std::filesystem::remove_all(dir);
    std::filesystem::create_directories(dir);
    dir_ = dir.string();
    iotrace::Reset();
}

void DiskTest::TearDown()
{
    reader_.CloseDVRFS();
    for (const auto& [path, fingerprint] : fingerprints_) {
        EXPECT_EQ(FileFingerprint(path), fingerprint) << path << " changed while the reader had it";
        for (const iotrace::OpenCall& call : iotrace::Opens(path))
            EXPECT_EQ(call.flags & (O_ACCMODE | O_CREAT | O_TRUNC | O_APPEND), O_RDONLY)
                << path << " was opened for more than reading";
    }
    iotrace::Reset();
    KeepDisks();
    std::filesystem::remove_all(dir_);
}

// With MORVANE_KEEP_DISKS naming a folder, each image this test wrote stays
// there as a hard link (sparse as written) for the golden answers' capture.
void DiskTest::KeepDisks()
{
    const char* keep = std::getenv("MORVANE_KEEP_DISKS");
    if (!keep || !*keep)
        return;
    const std::string prefix = "dvrfs-test-" + std::to_string(::getpid()) + "-";
    const std::string test = std::filesystem::path(dir_).filename().string().substr(prefix.size());
    for (const auto& entry : fingerprints_) {
        const std::string name = test + "-" + std::filesystem::path(entry.first).filename().string();
        ::link(entry.first.c_str(), (std::string(keep) + "/" + name).c_str());
    }
}

std::string DiskTest::WriteImage(dvrimage::DiskImage& image, const std::string& name)
{
    const std::string path = dir_ + "/" + name;
    image.Write(path);
    Refingerprint(path);
    return path;
}

std::string DiskTest::WriteDamaged(dvrimage::DiskImage& image, const std::vector<Damage>& damage,
                                   const std::string& name)
{
    const std::string path = WriteImage(image, name);
    for (const Damage& d : damage)
        image.Damage(d.target, d.a, d.b);
    Refingerprint(path);
    return path;
}

std::string DiskTest::WriteDisk(const dvrimage::Layout& layout, const std::vector<dvrimage::Recording>& recordings,
                                const std::vector<Damage>& damage, const std::string& name)
{
    image_ = std::make_unique<dvrimage::DiskImage>(layout);
    for (const dvrimage::Recording& r : recordings)
        image_->Add(r);
    return WriteDamaged(*image_, damage, name);
}

std::vector<unsigned char> Extracted(CatalogReader& reader, const _HisiList_t& recording,
                                     dvrfstool::ExtractResult* result)
{
    std::vector<unsigned char> stream;
    const dvrfstool::ExtractResult r =
        dvrfstool::ExtractRecording(reader, recording, [&stream](const dvrfstool::ExtractedFrame& f) {
            stream.insert(stream.end(), f.data, f.data + f.size);
            return true;
        });
    if (result)
        *result = r;
    return stream;
}

void DiskTest::Refingerprint(const std::string& path)
{
    fingerprints_[path] = FileFingerprint(path);
}

int DiskTest::Open(const std::string& path)
{
    return reader_.OpenDisk(path);
}

int DiskTest::OpenAndSearch(const std::string& path)
{
    if (Open(path) <= 0 || reader_.ConfiguredVersion() <= 0)
        return -1;
    return reader_.FindAdapter();
}
