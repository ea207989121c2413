#!/usr/bin/env bash
# Made the sample disks' video once; kept here to say how. Needs Debian's
# ffmpeg (with libx264), which the build itself does not.
# clip.h264: 8 seconds of FFmpeg's test pattern (moving, with a frame
# counter) at 320 x 240, 25 frames a second, a key frame every second.
# clip1080.h264: 4 seconds of the same pattern at 1920 x 1080, as recorders
# record it (main profile, no B-frames, 3 Mbit/s), for the decode benchmark
# and a sample disk of that size.
# Both carry an access unit delimiter before every frame, so that frames
# split cleanly.
set -euo pipefail
cd "$(dirname "$0")"
ffmpeg -hide_banner -loglevel error -f lavfi -i "testsrc=size=320x240:rate=25:duration=8" \
  -c:v libx264 -profile:v baseline -preset veryfast -g 25 -keyint_min 25 -sc_threshold 0 -b:v 250k \
  -x264-params aud=1 -pix_fmt yuv420p -f h264 -y clip.h264
ffmpeg -hide_banner -loglevel error -f lavfi -i "testsrc=size=1920x1080:rate=25:duration=4" \
  -c:v libx264 -profile:v main -bf 0 -preset veryfast -g 25 -keyint_min 25 -sc_threshold 0 -b:v 3M \
  -x264-params aud=1 -pix_fmt yuv420p -f h264 -y clip1080.h264
