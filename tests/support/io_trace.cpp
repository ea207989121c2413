#include "tests/support/io_trace.h"

#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstdarg>
#include <map>
#include <mutex>

namespace {

// Reads of `path` that overlap [offset, offset + length) fail.
struct Fault {
    std::string path;
    std::int64_t offset;
    std::int64_t length;
};

struct State {
    std::mutex mutex;
    std::map<int, std::string> pathOfFd;
    std::vector<iotrace::OpenCall> opens;
    std::map<std::string, std::vector<iotrace::ReadCall>> reads;
    std::map<std::string, std::size_t> readCounts;
    bool keepReads = true;
    std::vector<Fault> failures;
};

State& TheState()
{
    static State* state = new State;  // outlives every static destructor that might read
    return *state;
}

template <typename Fn>
Fn Real(const char* name)
{
    return reinterpret_cast<Fn>(dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" int open64(const char* path, int flags, ...)
{
    mode_t mode = 0;
    if (flags & (O_CREAT | O_TMPFILE)) {
        va_list args;
        va_start(args, flags);
        mode = static_cast<mode_t>(va_arg(args, int));
        va_end(args);
    }
    static auto real = Real<int (*)(const char*, int, ...)>("open64");
    const int fd = real(path, flags, mode);
    if (fd >= 0) {
        State& s = TheState();
        std::lock_guard<std::mutex> lock(s.mutex);
        s.pathOfFd[fd] = path;
        s.opens.push_back({path, flags});
    }
    return fd;
}

extern "C" int close(int fd)
{
    static auto real = Real<int (*)(int)>("close");
    {
        State& s = TheState();
        std::lock_guard<std::mutex> lock(s.mutex);
        s.pathOfFd.erase(fd);
    }
    return real(fd);
}

namespace {

// Notes a read of `count` bytes at `offset` of a traced file; false when it
// is to fail. Reads of files the trace did not see opened pass untouched.
bool NoteRead(int fd, std::int64_t offset, std::size_t count)
{
    State& s = TheState();
    std::lock_guard<std::mutex> lock(s.mutex);
    auto it = s.pathOfFd.find(fd);
    if (it == s.pathOfFd.end())
        return true;
    const std::string& path = it->second;
    ++s.readCounts[path];
    if (s.keepReads)
        s.reads[path].push_back({offset, count});
    for (const Fault& f : s.failures) {
        if (f.path == path && offset < f.offset + f.length && f.offset < offset + static_cast<std::int64_t>(count)) {
            errno = EIO;
            return false;
        }
    }
    return true;
}

}  // namespace

extern "C" ssize_t read(int fd, void* buffer, size_t count)
{
    static auto real = Real<ssize_t (*)(int, void*, size_t)>("read");
    bool traced = false;
    {
        State& s = TheState();
        std::lock_guard<std::mutex> lock(s.mutex);
        traced = s.pathOfFd.count(fd) != 0;
    }
    if (traced && !NoteRead(fd, lseek64(fd, 0, SEEK_CUR), count))
        return -1;
    return real(fd, buffer, count);
}

extern "C" ssize_t pread64(int fd, void* buffer, size_t count, off64_t offset)
{
    static auto real = Real<ssize_t (*)(int, void*, size_t, off64_t)>("pread64");
    if (!NoteRead(fd, offset, count))
        return -1;
    return real(fd, buffer, count, offset);
}

#if !defined(_FILE_OFFSET_BITS) || _FILE_OFFSET_BITS != 64
// Where files have 64-bit offsets, pread is pread64 already.
extern "C" ssize_t pread(int fd, void* buffer, size_t count, off_t offset)
{
    return pread64(fd, buffer, count, offset);
}
#endif

namespace iotrace {

void Reset()
{
    State& s = TheState();
    std::lock_guard<std::mutex> lock(s.mutex);
    s.opens.clear();
    s.reads.clear();
    s.readCounts.clear();
    s.keepReads = true;
    s.failures.clear();
}

std::vector<OpenCall> Opens(const std::string& path)
{
    State& s = TheState();
    std::lock_guard<std::mutex> lock(s.mutex);
    std::vector<OpenCall> result;
    for (const OpenCall& call : s.opens)
        if (call.path == path)
            result.push_back(call);
    return result;
}

std::vector<ReadCall> Reads(const std::string& path)
{
    State& s = TheState();
    std::lock_guard<std::mutex> lock(s.mutex);
    return s.reads[path];
}

std::size_t ReadCount(const std::string& path)
{
    State& s = TheState();
    std::lock_guard<std::mutex> lock(s.mutex);
    return s.readCounts[path];
}

void KeepReads(bool keep)
{
    State& s = TheState();
    std::lock_guard<std::mutex> lock(s.mutex);
    s.keepReads = keep;
}

void FailReads(const std::string& path, std::int64_t offset, std::int64_t length)
{
    State& s = TheState();
    std::lock_guard<std::mutex> lock(s.mutex);
    s.failures.push_back({path, offset, length});
}

}  // namespace iotrace
