// H.264 decoding with FFmpeg's libavcodec: access units in, RGB pictures out.
#ifndef HOST_H264_DECODER_H
#define HOST_H264_DECODER_H

#include <cstddef>
#include <cstdint>
#include <map>
#include <vector>

#include "host/picture.h"

struct AVCodecContext;
struct AVCodecParserContext;
struct AVFrame;
struct AVPacket;
struct SwsContext;

class H264Decoder {
public:
    // `threads` 1 decodes on the calling thread alone, with a picture out as
    // soon as its frame is in (what a playing channel wants); more, or 0 for
    // as many as there are cores, lets libavcodec decode several frames at
    // once, each picture then coming out some frames later.
    explicit H264Decoder(int threads = 1);
    ~H264Decoder();
    H264Decoder(const H264Decoder&) = delete;
    H264Decoder& operator=(const H264Decoder&) = delete;

    bool Ok() const { return m_context != nullptr; }

    // Feeds the bytes of one frame (an access unit, or any piece of the
    // stream: the parser finds the units) and returns the pictures that came
    // out, each with the position given for the bytes it was made from.
    // `flush` pushes out what the parser still holds (the end of a run).
    std::vector<Picture> Decode(const std::uint8_t* data, std::size_t size, long long block, int entry, bool flush);
    // Forgets everything before: the next picture needs a key frame.
    void Reset();

    // Whether an access unit holds an IDR slice (a frame that needs no other).
    static bool IsKeyFrame(const std::uint8_t* data, std::size_t size);

private:
    std::vector<Picture> Receive();
    bool ToRgb(Picture* picture);
    void SendParsed(const std::uint8_t* data, int size, std::vector<Picture>& out);

    AVCodecContext* m_context = nullptr;
    AVCodecParserContext* m_parser = nullptr;
    AVFrame* m_frame = nullptr;
    AVPacket* m_packet = nullptr;
    SwsContext* m_scaler = nullptr;
    struct Position {
        long long block;
        int entry;
        bool key;
    };
    // Each unit fed gets a sequence number that travels with it as its
    // timestamp through parser and decoder, and finds its position again.
    long long m_sequence = 0;
    std::map<long long, Position> m_positions;
};

#endif
