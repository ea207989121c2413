// Fuzz target: what an investigator runs on any disk: the recovery scan,
// and the export of recordings and recovered runs to MP4.
#include <unistd.h>

#include <cstdint>

extern "C" {
#include <libavutil/log.h>
}

#include "tests/fuzz/extent_image.h"
#include "tools/dvrfs/export.h"
#include "tools/dvrfs/recover.h"

extern "C" int LLVMFuzzerInitialize(int*, char***)
{
    av_log_set_level(AV_LOG_QUIET);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    static const std::string output = "/dev/shm/morvane-fuzz-export-" + std::to_string(::getpid()) + ".mp4";
    const std::string path = fuzzdisk::WriteImage(data, size);
    CatalogReader reader;
    if (reader.BuildCatalog(path) != CatalogBuild::kBuilt)
        return 0;
    dvrfstool::ExportRequest request;
    request.output = output;
    for (int row = 0; row < std::min(reader.m_recordCount, 2); ++row) {
        _HisiList_t recording{};
        if (dvrfstool::RecordingOfRow(reader, row, &recording))
            dvrfstool::ExportRecording(reader, recording, request);
    }
    const dvrfstool::RecoverResult recovered = dvrfstool::FindUnlistedRuns(reader);
    if (!recovered.runs.empty()) {
        const dvrfstool::UnlistedRun& run = recovered.runs.front();
        dvrfstool::ExportRecording(reader,
                                   dvrfstool::RecordingOfBlocks(static_cast<std::int32_t>(run.firstBlock),
                                                                static_cast<std::int32_t>(run.lastBlock)),
                                   request);
    }
    ::unlink(output.c_str());
    return 0;
}
