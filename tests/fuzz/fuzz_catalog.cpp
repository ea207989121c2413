// Fuzz target: the catalogue build exactly as the panel runs it (open,
// configured recorder, adapter search, Setplaylist), then every information
// query, on any disk.
#include <cstdint>
#include <cstdio>

#include "catalog/catalog_reader.h"
#include "tests/fuzz/extent_image.h"

// The adapter dump writes to standard output: let it, but not into the log.
extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    return std::freopen("/dev/null", "w", stdout) ? 0 : 1;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string path = fuzzdisk::WriteImage(data, size);
    CatalogReader reader;
    if (reader.BuildCatalog(path) == CatalogBuild::kBuilt) {
        for (int selector = 0; selector < 128; ++selector)
            reader.GetInfo(static_cast<char>(selector));
        reader.DumpAdapter();
    }
    return 0;
}
