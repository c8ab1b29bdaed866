#include "builtin/kernels/lines/rgbchroma.h"

#include <algorithm>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/lines/rgbchroma.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

HWY_INLINE Byte toByte(int value) { return static_cast<Byte>(std::clamp(value, 0, 255)); }

void rgb4ToLuma(const ToYuv& rows, const Byte* from, Byte* y, size_t n) {
    size_t i = 0;
#if QV_WIDE
    const auto blueRed = pairWeights(rows.y[0], rows.y[2]), green = pairWeights(rows.y[1], 0);
    const auto add = hn::Set(hInts, rows.yAdd);
    const auto low = hn::Set(hWords, 255);
    const Packer pack;
    for (; i + byteLanes() <= n; i += byteLanes()) {
        HV32 sums[4];
        for (size_t k = 0; k < 4; ++k) {
            const auto pixels = hn::LoadU(hBytes, from + 4 * i + k * byteLanes());
            const auto odd = hn::BitCast(hWords, hn::ShiftRight<8>(hn::BitCast(huWords, pixels)));
            const auto sum =
                hn::Add(dot(hn::And(hn::BitCast(hWords, pixels), low), blueRed), dot(odd, green));
            sums[k] = hn::ShiftRight<15>(hn::Add(sum, add));
        }
        hn::StoreU(pack(sums), hBytes, y + i);
    }
#endif
    for (; i < n; ++i) {
        const Byte* p = from + 4 * i;
        y[i] = toByte((rows.y[0] * p[0] + rows.y[1] * p[1] + rows.y[2] * p[2] + rows.yAdd) >> 15);
    }
}

// Of the sums: 16 for the lines, 4 for the pixels.
constexpr int chromaShift = 15 + 6;

struct ChromaLines {
    const Byte* line[4];
    Byte weight[4];
    // The weighted sum of a byte of all lines.
    HWY_INLINE int down(size_t at) const {
        return line[0][at] * weight[0] + line[1][at] * weight[1] + line[2][at] * weight[2] +
               line[3][at] * weight[3];
    }
};

#if QV_WIDE
const hn::RepartitionToWide<decltype(hn::Repartition<int32_t, HB>())> hLongs;

// The upper 64 bits of `before` and all but those of `now`.
HWY_INLINE HV16 carryPixel(HV16 now, HV16 before) {
#if HWY_TARGET <= HWY_AVX3
    return HV16{_mm512_alignr_epi64(now.raw, before.raw, 7)};
#elif HWY_TARGET <= HWY_AVX2
    return HV16{_mm256_alignr_epi8(now.raw, _mm256_permute2x128_si256(before.raw, now.raw, 0x21), 8)};
#else
    return HV16{_mm_alignr_epi8(now.raw, before.raw, 8)};
#endif
}

HWY_INLINE HV16 evenPixels(HV16 low, HV16 high) {
    return hn::BitCast(hWords,
                       hn::InterleaveLower(hLongs, hn::BitCast(hLongs, low), hn::BitCast(hLongs, high)));
}
HWY_INLINE HV16 oddPixels(HV16 low, HV16 high) {
    return hn::BitCast(hWords,
                       hn::InterleaveUpper(hLongs, hn::BitCast(hLongs, low), hn::BitCast(hLongs, high)));
}

template <bool filtered, int lines>
size_t eachChroma(const ToYuv& rows, const ChromaLines& from, Byte* u, Byte* v, size_t n) {
    const auto rowOf = [](const int16_t m[3]) HWY_ATTR {
        return hn::BitCast(hWords, hn::OddEven(hn::BitCast(hInts, pairWeights(m[2], 0)),
                                               hn::BitCast(hInts, pairWeights(m[0], m[1]))));
    };
    const auto rowU = rowOf(rows.u), rowV = rowOf(rows.v);
    const auto add = hn::Set(hInts, rows.chromaAdd << 6);
    const auto lowByte = hn::Set(huWords, 255);
    const auto pairOfLines = [&](int t) HWY_ATTR {
        return hn::BitCast(hBytes,
                           hn::Set(hWords, static_cast<int16_t>(from.weight[t] | from.weight[t + 1] << 8)));
    };
    const auto first = pairOfLines(0), second = pairOfLines(2);
    const hn::Rebind<uint8_t, decltype(hn::Repartition<int16_t, HB>())> narrow;
    const Packer pack;
    int64_t edge = 0;
    for (size_t c = 0; c < 4; ++c) edge |= static_cast<int64_t>(from.down(c)) << 16 * c;
    auto before = hn::BitCast(hWords, hn::Set(hLongs, edge));
    size_t i = 0;
    // A vector of pixels gives a quarter of one of each chroma; four of them are packed together.
    for (; i + byteLanes() / 2 <= n; i += byteLanes() / 2) {
        HV32 both[4];
        for (size_t k = 0; k < 4; ++k) {
            const size_t at = 8 * i + k * byteLanes();
            const auto a = hn::LoadU(hBytes, from.line[0] + at), b = hn::LoadU(hBytes, from.line[1] + at);
            auto low = dotBytes(hn::InterleaveLower(hBytes, a, b), first);
            auto high = dotBytes(hn::InterleaveUpper(hBytes, a, b), first);
            if (lines > 2) {
                const auto c = hn::LoadU(hBytes, from.line[2] + at), d = hn::LoadU(hBytes, from.line[3] + at);
                low = hn::Add(low, dotBytes(hn::InterleaveLower(hBytes, c, d), second));
                high = hn::Add(high, dotBytes(hn::InterleaveUpper(hBytes, c, d), second));
            }
            const auto even = evenPixels(low, high);
            auto sum = hn::ShiftLeft < filtered ? 1 : 2 > (even);
            if (filtered) {
                const auto odd = oddPixels(low, high);
                sum = hn::Add(hn::Add(sum, odd), carryPixel(odd, before));
                before = odd;
            }
            const auto su = dot(sum, rowU), sv = dot(sum, rowV);
            // One vector pairs U's sum of blue and green with V's share of red, the other V's with U's: their
            // sum has U and V in turns.
            const auto added = hn::Add(hn::OddEven(sv, su), hn::Shuffle2301(hn::OddEven(su, sv)));
            both[k] = hn::ShiftRight<chromaShift>(hn::Add(added, add));
        }
        const auto pairs = hn::BitCast(huWords, pack(both));
        hn::StoreU(hn::DemoteTo(narrow, hn::BitCast(hWords, hn::And(pairs, lowByte))), narrow, u + i);
        hn::StoreU(hn::DemoteTo(narrow, hn::BitCast(hWords, hn::ShiftRight<8>(pairs))), narrow, v + i);
    }
    return i;
}
#endif

void rgb4ToChroma(const ToYuv& rows, const Byte* const lines[4], const Byte weights[4], bool filtered,
                  Byte* u, Byte* v, size_t n) {
    ChromaLines from;
    std::copy_n(lines, 4, from.line);
    std::copy_n(weights, 4, from.weight);
    const size_t samples = n / 2;
    size_t i = 0;
#if QV_WIDE
    const bool two = weights[2] == 0 && weights[3] == 0;
    if (filtered)
        i = two ? eachChroma<true, 2>(rows, from, u, v, samples)
                : eachChroma<true, 4>(rows, from, u, v, samples);
    else
        i = two ? eachChroma<false, 2>(rows, from, u, v, samples)
                : eachChroma<false, 4>(rows, from, u, v, samples);
#endif
    for (; i < samples; ++i) {
        int bgr[3];
        for (size_t c = 0; c < 3; ++c) {
            const size_t at = 8 * i + c;
            bgr[c] = filtered ? from.down(i ? at - 4 : at) + 2 * from.down(at) + from.down(at + 4)
                              : 4 * from.down(at);
        }
        const int add = rows.chromaAdd << 6;
        u[i] = toByte((rows.u[0] * bgr[0] + rows.u[1] * bgr[1] + rows.u[2] * bgr[2] + add) >> chromaShift);
        v[i] = toByte((rows.v[0] * bgr[0] + rows.v[1] * bgr[1] + rows.v[2] * bgr[2] + add) >> chromaShift);
    }
}

const char* rgbChromaUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

HWY_EXPORT(rgb4ToLuma);
HWY_EXPORT(rgb4ToChroma);
HWY_EXPORT(rgbChromaUnit);

void rgb4ToLuma(const ToYuv& rows, const Byte* from, Byte* y, size_t n) {
    HWY_DYNAMIC_DISPATCH(rgb4ToLuma)(rows, from, y, n);
}
void rgb4ToChroma(const ToYuv& rows, const Byte* const lines[4], const Byte weights[4], bool filtered,
                  Byte* u, Byte* v, size_t n) {
    HWY_DYNAMIC_DISPATCH(rgb4ToChroma)(rows, lines, weights, filtered, u, v, n);
}
const char* rgbChromaUnit() { return HWY_DYNAMIC_DISPATCH(rgbChromaUnit)(); }

}  // namespace srk
#endif
