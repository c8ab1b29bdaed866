#include "plugins/av/picture/picturewords.h"

#include <cmath>

#include "core/media/qvframe.h"

namespace av {

namespace {

struct Named {
    AVCodecID codec;
    const char* name;
};

constexpr Named names[] = {
    {AV_CODEC_ID_MPEG1VIDEO, "MPEG-1"},
    {AV_CODEC_ID_MPEG2VIDEO, "MPEG-2"},
    {AV_CODEC_ID_MPEG4, "MPEG-4"},
    {AV_CODEC_ID_H263, "H.263"},
    {AV_CODEC_ID_H264, "H.264"},
    {AV_CODEC_ID_HEVC, "H.265"},
    {AV_CODEC_ID_VP8, "VP8"},
    {AV_CODEC_ID_VP9, "VP9"},
    {AV_CODEC_ID_AV1, "AV1"},
    {AV_CODEC_ID_THEORA, "Theora"},
    {AV_CODEC_ID_PRORES, "ProRes"},
    {AV_CODEC_ID_DNXHD, "DNxHD"},
    {AV_CODEC_ID_DVVIDEO, "DV"},
    {AV_CODEC_ID_MJPEG, "Motion JPEG"},
    {AV_CODEC_ID_JPEG2000, "JPEG 2000"},
    {AV_CODEC_ID_FFV1, "FFV1"},
    {AV_CODEC_ID_HUFFYUV, "HuffYUV"},
    {AV_CODEC_ID_RAWVIDEO, "uncompressed"},
    {AV_CODEC_ID_PNG, "PNG"},
    {AV_CODEC_ID_TIFF, "TIFF"},
    {AV_CODEC_ID_DPX, "DPX"},
    {AV_CODEC_ID_EXR, "OpenEXR"},
    {AV_CODEC_ID_VC1, "VC-1"},
    {AV_CODEC_ID_WMV3, "WMV 9"},
    {AV_CODEC_ID_AIC, "Apple Intermediate Codec"},
};

}  // namespace

std::string codecName(AVCodecID codec) {
    for (const Named& row : names)
        if (row.codec == codec) return row.name;
    return avcodec_get_name(codec);
}

int fieldOrderOf(const AVFrame& picture) {
    if (!picture.interlaced_frame) return 0;
    return picture.top_field_first ? 1 : 2;
}

int matrixOf(const AVFrame& picture) {
    switch (picture.colorspace) {
        case AVCOL_SPC_BT709: return qvMatrixBT709;
        case AVCOL_SPC_BT470BG:
        case AVCOL_SPC_SMPTE170M: return qvMatrixBT601;
        default: return qvMatrixNotSet;
    }
}

int codePoint(int value) {
    constexpr int unspecified = 2;
    return value > 0 && value < 256 && value != unspecified ? value : 0;
}

Turn turnOf(const AVStream& stream, const AVFrame& picture) {
    std::size_t bytes = 0;
    const std::uint8_t* matrix = av_stream_get_side_data(&stream, AV_PKT_DATA_DISPLAYMATRIX, &bytes);
    if (const auto* own = av_frame_get_side_data(&picture, AV_FRAME_DATA_DISPLAYMATRIX)) {
        matrix = own->data;
        bytes = own->size;
    }
    const auto* data = reinterpret_cast<const std::int32_t*>(matrix);
    if (!data || bytes < 9 * sizeof(std::int32_t)) return {};
    Turn turn;
    const auto product = [data](int a, int b) { return static_cast<double>(data[a]) * data[b]; };
    turn.mirrored = product(0, 4) - product(1, 3) < 0;
    const double counterClockwise = av_display_rotation_get(data);
    if (std::isnan(counterClockwise)) return turn;
    const int quarters = static_cast<int>(std::lround(-counterClockwise / 90));
    turn.clockwise = 90 * ((quarters % 4 + 4) % 4);
    return turn;
}

}  // namespace av
