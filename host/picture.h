// A decoded picture on its way from a decoder thread to a canvas.
#ifndef HOST_PICTURE_H
#define HOST_PICTURE_H

#include <cstdint>
#include <vector>

struct Picture {
    int width = 0;
    int height = 0;
    std::vector<std::uint8_t> rgb;  // width x height x 3 bytes, rows top first
    // Where its frame lies on the disk: data block (as the stream cursor
    // counts it) and index entry; and whether it was a key frame.
    long long block = 0;
    int entry = 0;
    bool key = false;
};

#endif
