#include "tests/host/clip_disk.h"


dvrimage::DiskImage WriteClipDisk(const std::string& path, const std::vector<ClipRecording>& recordings,
                                  int dataBlocks, const std::string& clip)
{
    const std::vector<std::vector<std::uint8_t>> frames =
        dvrimage::AccessUnitsOfFile(MORVANE_SOURCE_DIR "/samples/" + clip);
    dvrimage::Layout layout;
    layout.dataBlockMax = dataBlocks;
    dvrimage::DiskImage image(layout);
    std::size_t next = 0;
    for (const ClipRecording& c : recordings) {
        dvrimage::Recording r;
        r.listIdx = c.listIdx;
        r.startBlock = c.startBlock;
        r.endBlock = c.endBlock;
        r.startTime = c.startTime;
        r.endTime = c.startTime + c.duration;
        const int blocks = c.endBlock >= c.startBlock ? c.endBlock - c.startBlock + 1
                                                      : c.endBlock + dataBlocks - c.startBlock + 1;
        for (int b = 0; b < blocks; ++b) {
            r.blocks.emplace_back();
            for (int k = 0; k < 25; ++k, next = (next + 1) % frames.size())
                r.blocks.back().push_back(dvrimage::Frame{frames[next], 1});
        }
        image.Add(r);
    }
    image.Write(path);
    return image;
}
