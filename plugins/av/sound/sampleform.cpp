#include "plugins/av/sound/sampleform.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>

namespace av {

namespace {

constexpr std::int32_t most24 = (1 << 23) - 1, least24 = -(1 << 23);

template <class Sample>
std::int32_t as24(Sample value) {
    if constexpr (std::is_floating_point_v<Sample>) {
        if (std::isnan(value)) return 0;
        const double scaled = std::nearbyint(static_cast<double>(value) * 8388608.0);
        return static_cast<std::int32_t>(std::clamp(scaled, double{least24}, double{most24}));
    } else {
        constexpr int shift = 8 * static_cast<int>(sizeof(Sample)) - 24;
        const std::int64_t half = std::int64_t{1} << (shift - 1);
        const std::int64_t wide = value;
        const std::int64_t up = wide > INT64_MAX - half ? wide >> shift : (wide + half) >> shift;
        return static_cast<std::int32_t>(std::min<std::int64_t>(up, most24));
    }
}

template <class Sample>
Sample at(const AVFrame& from, int channels, int sample, int channel) {
    const bool planar = av_sample_fmt_is_planar(static_cast<AVSampleFormat>(from.format)) != 0;
    const std::uint8_t* const data = planar ? from.extended_data[channel] : from.extended_data[0];
    const auto index = static_cast<std::size_t>(planar ? sample : sample * channels + channel);
    Sample value;
    std::memcpy(&value, data + index * sizeof(Sample), sizeof value);
    return value;
}

template <class Sample>
void copy(const AVFrame& from, int channels, int first, int count, unsigned char* to) {
    for (int i = first; i < first + count; ++i)
        for (int c = 0; c < channels; ++c, to += sizeof(Sample)) {
            const Sample value = at<Sample>(from, channels, i, c);
            std::memcpy(to, &value, sizeof value);
        }
}

template <class Sample>
void narrow(const AVFrame& from, int channels, int first, int count, unsigned char* to) {
    for (int i = first; i < first + count; ++i)
        for (int c = 0; c < channels; ++c, to += 3) {
            const auto value = static_cast<std::uint32_t>(as24(at<Sample>(from, channels, i, c)));
            to[0] = static_cast<unsigned char>(value);
            to[1] = static_cast<unsigned char>(value >> 8);
            to[2] = static_cast<unsigned char>(value >> 16);
        }
}

}  // namespace

int bitsOf(AVSampleFormat format) {
    switch (av_get_packed_sample_fmt(format)) {
        case AV_SAMPLE_FMT_U8: return 8;
        case AV_SAMPLE_FMT_S16: return 16;
        case AV_SAMPLE_FMT_S32:
        case AV_SAMPLE_FMT_S64:
        case AV_SAMPLE_FMT_FLT:
        case AV_SAMPLE_FMT_DBL: return 24;
        default: return 0;
    }
}

void interleave(const AVFrame& from, int first, int count, std::vector<unsigned char>& to) {
    const auto format = static_cast<AVSampleFormat>(from.format);
    const int channels = from.ch_layout.nb_channels;
    to.resize(static_cast<std::size_t>(count) * static_cast<std::size_t>(channels) *
              static_cast<std::size_t>(bitsOf(format) / 8));
    switch (av_get_packed_sample_fmt(format)) {
        case AV_SAMPLE_FMT_U8: copy<std::uint8_t>(from, channels, first, count, to.data()); break;
        case AV_SAMPLE_FMT_S16: copy<std::int16_t>(from, channels, first, count, to.data()); break;
        case AV_SAMPLE_FMT_S32: narrow<std::int32_t>(from, channels, first, count, to.data()); break;
        case AV_SAMPLE_FMT_S64: narrow<std::int64_t>(from, channels, first, count, to.data()); break;
        case AV_SAMPLE_FMT_FLT: narrow<float>(from, channels, first, count, to.data()); break;
        case AV_SAMPLE_FMT_DBL: narrow<double>(from, channels, first, count, to.data()); break;
        default: break;
    }
}

}  // namespace av
