#include "host/h264_decoder.h"

#include <algorithm>
#include <climits>

extern "C" {
#include <libavcodec/avcodec.h>
#include <libswscale/swscale.h>
}

H264Decoder::H264Decoder(int threads)
{
    const AVCodec* codec = avcodec_find_decoder(AV_CODEC_ID_H264);
    if (!codec)
        return;
    m_context = avcodec_alloc_context3(codec);
    m_context->thread_count = threads;
    if (threads == 1)
        m_context->flags |= AV_CODEC_FLAG_LOW_DELAY;  // a picture as soon as its frame is in
    else
        m_context->thread_type = FF_THREAD_FRAME | FF_THREAD_SLICE;
    if (avcodec_open2(m_context, codec, nullptr) < 0) {
        avcodec_free_context(&m_context);
        return;
    }
    m_parser = av_parser_init(AV_CODEC_ID_H264);
    m_frame = av_frame_alloc();
    m_packet = av_packet_alloc();
}

H264Decoder::~H264Decoder()
{
    sws_freeContext(m_scaler);
    av_packet_free(&m_packet);
    av_frame_free(&m_frame);
    if (m_parser)
        av_parser_close(m_parser);
    avcodec_free_context(&m_context);
}

void H264Decoder::Reset()
{
    if (!Ok())
        return;
    avcodec_flush_buffers(m_context);
    av_parser_close(m_parser);
    m_parser = av_parser_init(AV_CODEC_ID_H264);
    m_positions.clear();
}

bool H264Decoder::IsKeyFrame(const std::uint8_t* data, std::size_t size)
{
    for (std::size_t i = 0; i + 3 < size; ++i)
        if (data[i] == 0 && data[i + 1] == 0 && data[i + 2] == 1 && (data[i + 3] & 0x1F) == 5)
            return true;
    return false;
}

std::vector<Picture> H264Decoder::Decode(const std::uint8_t* data, std::size_t size, long long block, int entry,
                                         bool flush)
{
    std::vector<Picture> out;
    if (!Ok())
        return out;
    const long long sequence = ++m_sequence;
    m_positions[sequence] = {block, entry, IsKeyFrame(data, size)};
    while (!m_positions.empty() && m_positions.begin()->first < sequence - 64)
        m_positions.erase(m_positions.begin());
    while (size > 0) {
        std::uint8_t* parsed = nullptr;
        int parsedSize = 0;
        const int used = av_parser_parse2(m_parser, m_context, &parsed, &parsedSize, data,
                                          static_cast<int>(std::min<std::size_t>(size, INT32_MAX)), sequence,
                                          sequence, 0);
        if (used < 0)
            break;
        data += used;
        size -= static_cast<std::size_t>(used);
        SendParsed(parsed, parsedSize, out);
    }
    if (flush) {
        std::uint8_t* parsed = nullptr;
        int parsedSize = 0;
        av_parser_parse2(m_parser, m_context, &parsed, &parsedSize, nullptr, 0, AV_NOPTS_VALUE, AV_NOPTS_VALUE, 0);
        SendParsed(parsed, parsedSize, out);
    }
    return out;
}

void H264Decoder::SendParsed(const std::uint8_t* data, int size, std::vector<Picture>& out)
{
    if (size <= 0)
        return;
    m_packet->data = const_cast<std::uint8_t*>(data);
    m_packet->size = size;
    m_packet->pts = m_parser->pts;
    m_packet->dts = m_parser->dts;
    if (avcodec_send_packet(m_context, m_packet) < 0)
        return;
    for (Picture& p : Receive())
        out.push_back(std::move(p));
}

std::vector<Picture> H264Decoder::Receive()
{
    std::vector<Picture> pictures;
    while (avcodec_receive_frame(m_context, m_frame) == 0) {
        Picture picture;
        auto it = m_positions.find(m_frame->pts);
        if (it != m_positions.end()) {
            picture.block = it->second.block;
            picture.entry = it->second.entry;
            picture.key = it->second.key;
        }
        if (ToRgb(&picture))
            pictures.push_back(std::move(picture));
        av_frame_unref(m_frame);
    }
    return pictures;
}

bool H264Decoder::ToRgb(Picture* picture)
{
    if (m_frame->width <= 0 || m_frame->height <= 0)
        return false;
    m_scaler = sws_getCachedContext(m_scaler, m_frame->width, m_frame->height,
                                    static_cast<AVPixelFormat>(m_frame->format), m_frame->width, m_frame->height,
                                    AV_PIX_FMT_RGB24, SWS_BILINEAR, nullptr, nullptr, nullptr);
    if (!m_scaler)
        return false;
    picture->width = m_frame->width;
    picture->height = m_frame->height;
    picture->rgb.resize(static_cast<std::size_t>(picture->width) * picture->height * 3);
    std::uint8_t* planes[4] = {picture->rgb.data(), nullptr, nullptr, nullptr};
    int strides[4] = {picture->width * 3, 0, 0, 0};
    sws_scale(m_scaler, m_frame->data, m_frame->linesize, 0, m_frame->height, planes, strides);
    return true;
}
