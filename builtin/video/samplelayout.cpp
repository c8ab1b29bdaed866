#include "builtin/video/samplelayout.h"

#include <algorithm>
#include <cstring>

#include "builtin/kernels/lines/samplerows.h"
#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/media/rows_p.h"

namespace {

using enum SampleRole;
using Roles = std::array<SampleRole, 4>;

constexpr Roles allColour{colour, colour, colour, colour}, colourFirst{colour, colour, colour, keep};
constexpr Roles allLuma{luma, luma, luma, luma}, lumaFirst{luma, chroma, luma, chroma};
constexpr Roles chromaFirst{chroma, luma, chroma, luma};

// clang-format off
constexpr SampleLayout layouts[] = {
    {QvFourcc::GRAY, SampleLayout::bytes,  8, 1, allLuma},
    {QvFourcc::I420, SampleLayout::bytes,  8, 1, allLuma},
    {QvFourcc::YV12, SampleLayout::bytes,  8, 1, allLuma},
    {QvFourcc::I422, SampleLayout::bytes,  8, 1, allLuma},
    {QvFourcc::W016, SampleLayout::words, 16, 1, allLuma},
    {QvFourcc::YUY2, SampleLayout::bytes,  8, 2, lumaFirst},
    {QvFourcc::YUYV, SampleLayout::bytes,  8, 2, lumaFirst},
    {QvFourcc::UYVY, SampleLayout::bytes,  8, 2, chromaFirst},
    {QvFourcc::Y216, SampleLayout::words, 16, 2, lumaFirst},
    {QvFourcc::v210, SampleLayout::v210,  10, 2, chromaFirst},
    {QvFourcc::BGR3, SampleLayout::bytes,  8, 3, allColour},
    {QvFourcc::BGR4, SampleLayout::bytes,  8, 4, colourFirst},
    {QvFourcc::BGRA, SampleLayout::bytes,  8, 4, colourFirst},
    {QvFourcc::ARGB, SampleLayout::bytes,  8, 4, {keep, colour, colour, colour}},
    {QvFourcc::R32C, SampleLayout::bytes,  8, 4, {video, video, video, keep}},
    {QvFourcc::b64a, SampleLayout::words, 16, 4, colourFirst},
    {QvFourcc::R555, SampleLayout::r555,   5, 3, allColour},
    {QvFourcc::R565, SampleLayout::r565,   5, 3, allColour},
};
// clang-format on

constexpr size_t groupSamples = 12, groupBytes = 16;  // of v210: six pixels
constexpr size_t pixelSamples = 3;                    // of R555 and R565

uint32_t word32(const unsigned char* from) {
    uint32_t word;
    std::memcpy(&word, from, 4);
    return word;
}

}  // namespace

const SampleLayout& sampleLayout(unsigned fourcc) {
    for (const auto& layout : layouts)
        if (layout.fourcc == fourcc) return layout;
    QV_FAIL("no layout of this pixel format");
}

uint32_t SampleLayout::black(SampleRole role) const {
    const bool levels = role == luma || role == SampleRole::video;
    return role == chroma ? 128u << (bits - 8) : levels ? 16u << (bits - 8) : 0;
}

uint32_t SampleLayout::white(SampleRole role) const {
    const bool levels = role == luma || role == SampleRole::video;
    return role == chroma ? 240u << (bits - 8) : levels ? 235u << (bits - 8) : (1u << bits) - 1;
}

size_t SampleLayout::rowSamples(const QvFrame& frame, int plane) const {
    if (store == v210) return (static_cast<size_t>(frame.width()) + 5) / 6 * groupSamples;
    return samples(plane, frame.width(plane));
}

uint32_t SampleLayout::largest(size_t sample) const {
    return store == r565 && sample % pixelSamples == 1 ? 63 : (1u << bits) - 1;
}

std::ptrdiff_t SampleLayout::byteOffset(int plane, int pixel) const {
    const std::ptrdiff_t at = pixel;
    if (store == v210) return at / 6 * std::ptrdiff_t{groupBytes};
    if (store == r565 || store == r555) return 2 * at;
    return at * (plane ? 1 : perPixel) * (store == words ? 2 : 1);
}

unsigned SampleLayout::chosen(SampleRole role) const {
    unsigned bits4 = 0;
    for (unsigned i = 0; i < 4; ++i) bits4 |= unsigned{first4[i] == role} << i;
    return bits4;
}

int sampleRows(const QvFrame& frame, int plane) {
    return frame.stride(plane) > 0 ? frame.plane_bytes(plane) / frame.stride(plane) : 0;
}

int takeShape(QvFrame& out, const QvFrame& like) {
    if (out.inited() && out.four_cc() == like.four_cc() && out.width() == like.width() &&
        out.height() == like.height())
        return QvStatus::ok;
    return out.init(like.four_cc(), like.width(), like.height());
}

void copySamples(QvFrame& to, const QvFrame& from, int first) {
    if (&to == &from) return;
    for (int p = first; p < from.planes(); ++p)
        qvrows::copy(to.plane(p), to.stride(p), from.plane(p), from.stride(p),
                     std::min(to.stride(p), from.stride(p)), sampleRows(from, p));
}

void SampleWeights::resize(const SampleLayout& layout, size_t samples) {
    layout_ = &layout;
    if (layout.wide()) {
        scale16_.resize(samples);
        add16_.resize(samples);
    } else {
        scale8_.resize(samples);
        add8_.resize(samples);
    }
}

void SampleWeights::fade(size_t i, uint32_t level, uint32_t share) {
    if (layout_->wide()) {
        scale16_[i] = share;
        add16_[i] = level * (65536 - share) + 32768;
    } else {
        const uint32_t share8 = (share + 128) >> 8;
        scale8_[i] = static_cast<uint16_t>(share8);
        add8_[i] = static_cast<uint16_t>(level * (256 - share8) + 128);
    }
}

// What is added can leave its range by the rounding of `laid` alone: the sum stays a sample.
void SampleWeights::cover(size_t i, uint32_t laid, uint32_t black, uint32_t weight) {
    const bool wide = layout_->wide();
    const int64_t one = wide ? 65536 : 256, top = layout_->largest(i);
    const int64_t share = wide ? 65536 - int64_t{weight} : 256 - int64_t{(weight + 128) >> 8};
    const int64_t most = (top + 1) * one - 1 - top * share;
    const int64_t add = std::clamp<int64_t>(int64_t{laid} * one - int64_t{black} * share + one / 2, 0, most);
    if (wide) {
        scale16_[i] = static_cast<uint32_t>(share);
        add16_[i] = static_cast<uint32_t>(add);
    } else {
        scale8_[i] = static_cast<uint16_t>(share);
        add8_[i] = static_cast<uint16_t>(add);
    }
}

void SampleWeights::apply(unsigned char* to, const unsigned char* from, size_t first, size_t samples) {
    switch (layout_->store) {
        case SampleLayout::bytes:
            return srk::weighBytes(to, from, scale8_.data() + first, add8_.data() + first, samples);
        case SampleLayout::words:
            return srk::weighWords(to, from, scale16_.data() + first, add16_.data() + first, samples);
        case SampleLayout::v210:
            return srk::weighTens(to, from, scale16_.data() + first, add16_.data() + first, samples / 3);
        default: break;
    }
    apart_.resize(samples);
    layout_->read(from, apart_.data(), samples);
    auto* words = reinterpret_cast<unsigned char*>(apart_.data());
    srk::weighWords(words, words, scale16_.data() + first, add16_.data() + first, samples);
    layout_->write(apart_.data(), to, samples);
}

void SampleLayout::read(const unsigned char* from, uint16_t* to, size_t samples) const {
    switch (store) {
        case bytes: std::copy_n(from, samples, to); return;
        case words: std::memcpy(to, from, 2 * samples); return;
        case v210:
            for (size_t i = 0; i < samples; i += 3, from += 4) {
                const uint32_t three = word32(from);
                for (unsigned k = 0; k < 3; ++k) to[i + k] = static_cast<uint16_t>(three >> 10 * k & 1023);
            }
            return;
        case r555:
        case r565: break;
    }
    const unsigned greenBits = store == r565 ? 6 : 5;
    for (size_t i = 0; i < samples; i += pixelSamples, from += 2) {
        const unsigned pixel = from[0] | unsigned{from[1]} << 8;
        to[i] = pixel & 31;
        to[i + 1] = static_cast<uint16_t>(pixel >> 5 & ((1u << greenBits) - 1));
        to[i + 2] = pixel >> (5 + greenBits) & 31;
    }
}

void SampleLayout::write(const uint16_t* from, unsigned char* to, size_t samples) const {
    switch (store) {
        case bytes:
            for (size_t i = 0; i < samples; ++i) to[i] = static_cast<unsigned char>(from[i]);
            return;
        case words: std::memcpy(to, from, 2 * samples); return;
        case v210:
            for (size_t i = 0; i < samples; i += 3, to += 4) {
                const uint32_t three = from[i] | uint32_t{from[i + 1]} << 10 | uint32_t{from[i + 2]} << 20;
                std::memcpy(to, &three, 4);
            }
            return;
        case r555:
        case r565: break;
    }
    const unsigned greenBits = store == r565 ? 6 : 5;
    for (size_t i = 0; i < samples; i += pixelSamples, to += 2) {
        const unsigned pixel =
            from[i] | unsigned{from[i + 1]} << 5 | unsigned{from[i + 2]} << (5 + greenBits);
        to[0] = static_cast<unsigned char>(pixel);
        to[1] = static_cast<unsigned char>(pixel >> 8);
    }
}
