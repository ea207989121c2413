// Disk images whose frames are the project's sample clip, 25 frames (one
// second, starting with a key frame) per data block.
#ifndef TESTS_HOST_CLIP_DISK_H
#define TESTS_HOST_CLIP_DISK_H

#include <string>
#include <vector>

#include "tools/dvrimage/dvr_image.h"

struct ClipRecording {
    int listIdx;
    int startBlock;
    int endBlock;
    unsigned startTime;
    unsigned duration = 3600;  // seconds from start to end
};

// Writes the image and returns the writer, for damage after writing.
// `clip` names a stream of samples/.
dvrimage::DiskImage WriteClipDisk(const std::string& path, const std::vector<ClipRecording>& recordings,
                                  int dataBlocks = 16, const std::string& clip = "clip.h264");

#endif
