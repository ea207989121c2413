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
        dvrimage::FillWithFrames(r, dataBlocks, 25, frames, next);
        image.Add(r);
    }
    image.Write(path);
    return image;
}
