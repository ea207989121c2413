// Fuzz target: the stream extraction over the recordings of any disk,
// forward and backward, and runs of frames of a block.
#include <cstdint>
#include <vector>

#include "catalog/catalog_reader.h"
#include "tests/fuzz/extent_image.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static std::vector<unsigned char> payload(static_cast<std::size_t>(kPayloadAreaSize));
    const std::string path = fuzzdisk::WriteImage(data, size);
    CatalogReader reader;
    if (reader.BuildCatalog(path) != CatalogBuild::kBuilt)
        return 0;
    const _HisiAdapter_t adapter = *reader.Adapter();
    const int recordings = std::min(reader.m_recordCount, 4);
    for (int row = 0; row < recordings; ++row) {
        _HisiList_t recording{};
        const std::int64_t position = adapter.ListMax > 0 ? reader.Catalog()->Entries[row].Idx % adapter.ListMax : 0;
        if (reader.ReadListEntries(position, 1, reinterpret_cast<char*>(&recording)) < 0)
            continue;
        for (int direction : {1, 0}) {
            reader.SetStreamCursor(recording.StartBlock, direction ? 0 : 2);
            for (int i = 0; i < 48; ++i) {
                _HisiHeader_t header{};
                if (reader.NextFrame(payload.data(), &header, adapter.FirstList, adapter.LastList, direction) < 0)
                    break;
            }
        }
        _HisiHeader_t entries[8];
        for (int count = 1; count <= 8; count *= 2)
            reader.ReadFrameRun(3, recording.StartBlock, 0, count, entries, payload.data());
    }
    return 0;
}
