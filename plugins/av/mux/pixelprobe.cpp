#include "plugins/av/mux/pixelprobe.h"

#include "plugins/av/source/avheaders.h"

namespace av {

namespace {

// Of most codecs the parser knows, without decoding.
int parsedFormat(AVCodecContext& context, const AVPacket& unit) {
    AVCodecParserContext* const parser = av_parser_init(context.codec_id);
    if (!parser) return -1;
    parser->flags |= PARSER_FLAG_COMPLETE_FRAMES;
    std::uint8_t* data = nullptr;
    int bytes = 0;
    parser->format = -1;
    av_parser_parse2(parser, &context, &data, &bytes, unit.data, unit.size, unit.pts, unit.dts, 0);
    const int format = parser->format;
    av_parser_close(parser);
    return format;
}

int decodedFormat(AVCodecContext& context, const AVCodec& codec, const AVPacket& unit) {
    const FramePtr frame(av_frame_alloc());
    context.thread_count = 1;
    if (!frame || avcodec_open2(&context, &codec, nullptr) < 0) return -1;
    if (avcodec_send_packet(&context, &unit) >= 0 && avcodec_send_packet(&context, nullptr) >= 0 &&
        avcodec_receive_frame(&context, frame.get()) >= 0)
        return frame->format;
    return context.pix_fmt;
}

}  // namespace

void probePixels(AVCodecParameters& parameters, const AVPacket& unit) {
    const AVCodec* const codec = avcodec_find_decoder(parameters.codec_id);
    const CodecPtr context(codec ? avcodec_alloc_context3(codec) : nullptr);
    if (!context || avcodec_parameters_to_context(context.get(), &parameters) < 0) return;
    int format = parsedFormat(*context, unit);
    if (format < 0) format = decodedFormat(*context, *codec, unit);
    if (format >= 0) parameters.format = format;
    if (parameters.profile == FF_PROFILE_UNKNOWN) parameters.profile = context->profile;
}

}  // namespace av
