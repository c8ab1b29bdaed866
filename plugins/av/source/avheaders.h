// The headers of the codec libraries, which are C, and owners for what they allocate.
#pragma once

#include <memory>
#include <string>

// Their macros and inline functions convert as C does.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wconversion"
#pragma GCC diagnostic ignored "-Wsign-conversion"
extern "C" {
#include <libavcodec/avcodec.h>
#include <libavcodec/vorbis_parser.h>
#include <libavformat/avformat.h>
#include <libavutil/avstring.h>
#include <libavutil/avutil.h>
#include <libavutil/display.h>
#include <libavutil/imgutils.h>
#include <libavutil/intreadwrite.h>
#include <libavutil/mem.h>
#include <libavutil/opt.h>
#include <libavutil/parseutils.h>
#include <libavutil/pixdesc.h>
}
#pragma GCC diagnostic pop

namespace av {

struct Free {
    void operator()(AVPacket* packet) const { av_packet_free(&packet); }
    void operator()(AVFrame* frame) const { av_frame_free(&frame); }
    void operator()(AVCodecContext* context) const { avcodec_free_context(&context); }
};
using PacketPtr = std::unique_ptr<AVPacket, Free>;
using FramePtr = std::unique_ptr<AVFrame, Free>;
using CodecPtr = std::unique_ptr<AVCodecContext, Free>;

// A part of a sentence. The libraries' own texts for these speak of the libraries.
inline std::string errorText(int code) {
    switch (code) {
        case -1:  // not the one of the system with that number
        case AVERROR_BUG:
        case AVERROR_BUG2:
        case AVERROR_EXTERNAL:
        case AVERROR_UNKNOWN: return "no reason is given";
        case AVERROR_PATCHWELCOME: return "this form of it is not supported";
        case AVERROR_INVALIDDATA: return "its data are invalid";
        default: break;
    }
    char text[AV_ERROR_MAX_STRING_SIZE] = {};
    av_strerror(code, text, sizeof text);
    return text;
}

}  // namespace av
