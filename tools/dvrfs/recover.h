// Finding what the disk's index lost: data blocks whose header is sound but
// which no listed recording covers, as the recorder leaves them when its
// list ring has written over their entries, or when an entry is damaged.
#ifndef TOOLS_DVRFS_RECOVER_H
#define TOOLS_DVRFS_RECOVER_H

#include <cstdint>
#include <optional>
#include <vector>

#include "catalog/catalog_reader.h"

namespace dvrfstool {

// Consecutive unlisted blocks with sound headers, in the order the recorder
// wrote the ring (oldest first), and the time they must lie in: after the
// end of the listed recording before them, before the start of the one after.
struct UnlistedRun {
    std::int64_t firstBlock = 0;
    std::int64_t lastBlock = 0;  // below firstBlock when the run crosses the end of the ring
    std::int64_t blocks = 0;
    long long frames = 0;
    std::optional<std::uint32_t> after;
    std::optional<std::uint32_t> before;
};

struct RecoverResult {
    std::vector<UnlistedRun> runs;
    std::int64_t blocksScanned = 0;
    std::int64_t headersRead = 0;  // one per block that no listed recording covers, at most
};

// Scans the data ring of a built catalogue once, from the block after the
// newest recording's last (where the recorder writes next, so the oldest
// data) round to it.
RecoverResult FindUnlistedRuns(CatalogReader& reader);

// A recording made of data blocks first .. last (around the ring), to
// extract or export a run that no list entry describes.
_HisiList_t RecordingOfBlocks(std::int32_t first, std::int32_t last);

}  // namespace dvrfstool

#endif
