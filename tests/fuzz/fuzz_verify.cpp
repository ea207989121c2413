// Fuzz target: the verification walk of `dvrfs verify` on any disk.
#include <cstdint>

#include "tests/fuzz/extent_image.h"
#include "tools/dvrfs/disk_check.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    const std::string path = fuzzdisk::WriteImage(data, size);
    CatalogReader reader;
    long long lines = 0;
    dvrfstool::VerifyDisk(reader, path, [&lines](const std::string&) { ++lines; });
    return 0;
}
