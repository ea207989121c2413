// Fuzz inputs are disk images written as extents: a disk is mostly holes
// (data blocks are 16 MiB apart), so an input lists only the pieces that
// hold bytes. Each extent is an 8-byte little-endian offset, a 2-byte
// length, then that many bytes.
#ifndef TESTS_FUZZ_EXTENT_IMAGE_H
#define TESTS_FUZZ_EXTENT_IMAGE_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace fuzzdisk {

// Offsets beyond this are dropped: a disk of 1 TiB is plenty to reach every
// structure, and the file system holding the image takes it.
constexpr std::uint64_t kMaxOffset = 1ull << 40;

// Writes the image the extents describe to a sparse file of this process
// (replacing the previous one) and returns its path. For an input of even
// length every record it holds then has its XOR sum made right (superblock
// headers, block tables, adapter slots, list entries and their mirror copies,
// data block headers, index entries), so that mutated values get past the
// sums into the code behind them; odd inputs keep their sums as mutated, so
// that the damage paths stay covered. Fuzz builds only.
std::string WriteImage(const std::uint8_t* data, std::size_t size);

}  // namespace fuzzdisk

#endif
