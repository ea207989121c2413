// Watches what the reader asks of the operating system: every open of a
// file and every read from it, with the file offset the read started at. It
// interposes open64 and read for the whole test binary, so it sees the
// reader's real system calls through wxFile; it can also make chosen reads
// fail, the way a failing disk would.
#ifndef TESTS_SUPPORT_IO_TRACE_H
#define TESTS_SUPPORT_IO_TRACE_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace iotrace {

struct OpenCall {
    std::string path;
    int flags;
};

struct ReadCall {
    std::int64_t offset;  // file position when the read started
    std::size_t count;    // bytes asked for
};

// Forgets every call and every fault.
void Reset();

std::vector<OpenCall> Opens(const std::string& path);
std::vector<ReadCall> Reads(const std::string& path);
// How many reads of `path` there were; counted also while reads are not kept.
std::size_t ReadCount(const std::string& path);
// Whether each read is kept (the default) or only counted: millions of them
// would measure the trace instead of the reader.
void KeepReads(bool keep);

// Reads of `path` that overlap [offset, offset + length) fail with EIO.
void FailReads(const std::string& path, std::int64_t offset, std::int64_t length);

}  // namespace iotrace

#endif
