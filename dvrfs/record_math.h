// Arithmetic on values read from the disk: nothing a disk holds may overflow
// or divide by zero on its way to a comparison.
#ifndef DVRFS_RECORD_MATH_H
#define DVRFS_RECORD_MATH_H

#include <climits>
#include <cstdint>
#include <cstring>

namespace dvrfs {

// A position in a ring of `size` entries. An empty or negative ring leaves the
// value as it is, so that the bounds test of the read that follows refuses it.
inline std::int64_t ReduceInRing(std::int64_t value, std::int64_t size)
{
    return size > 0 ? value % size : value;
}

// base + index * stride + extra as a logical position, or -1 (which every read
// refuses as a negative position) when the result does not fit.
inline std::int64_t RecordPosition(std::uint64_t base, std::int64_t index, std::int64_t stride,
                                   std::int64_t extra)
{
    if (base > static_cast<std::uint64_t>(INT64_MAX))
        return -1;
    std::int64_t scaled = 0;
    std::int64_t position = 0;
    if (__builtin_mul_overflow(index, stride, &scaled) ||
        __builtin_add_overflow(static_cast<std::int64_t>(base), scaled, &position) ||
        __builtin_add_overflow(position, extra, &position))
        return -1;
    return position;
}

// count records of `size` bytes as a read length, or -1 (refused by the read
// as an unusable length) when that many bytes do not fit an int.
inline int RecordBytes(std::int64_t count, int size)
{
    const std::int64_t bytes = count * size;
    return bytes > INT_MAX || bytes < INT_MIN ? -1 : static_cast<int>(bytes);
}

// A record as the raw bytes the reads deliver into.
inline char* Bytes(void* record)
{
    return static_cast<char*>(record);
}

// Clears the buffer a read is about to fill.
inline void ClearRecords(char* buffer, int bytes)
{
    if (buffer && bytes > 0)
        std::memset(buffer, 0, static_cast<std::size_t>(bytes));
}

}  // namespace dvrfs

#endif
