#include "builtin/kernels/lines/rows8.h"

#include <algorithm>
#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/lines/rows8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

#if QV_VECTORS
HWY_INLINE size_t lanes() { return hn::Lanes(d8); }
HWY_INLINE V8 load(const Byte* from) { return hn::LoadU(d8, from); }
HWY_INLINE void put(V8 v, Byte* to) { hn::StoreU(v, d8, to); }
#endif

HWY_INLINE Byte clampByte(int value) { return static_cast<Byte>(std::clamp(value, 0, 255)); }

void split4(const Byte* from, Byte* a, Byte* b, Byte* c, Byte* d, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() <= n; i += lanes()) {
        V8 va, vb, vc, vd;
        hn::LoadInterleaved4(d8, from + 4 * i, va, vb, vc, vd);
        put(va, a + i);
        put(vb, b + i);
        put(vc, c + i);
        if (d) put(vd, d + i);
    }
#endif
    for (; i < n; ++i) {
        a[i] = from[4 * i];
        b[i] = from[4 * i + 1];
        c[i] = from[4 * i + 2];
        if (d) d[i] = from[4 * i + 3];
    }
}

void join4(Byte* to, const Byte* a, const Byte* b, const Byte* c, const Byte* d, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() <= n; i += lanes())
        hn::StoreInterleaved4(load(a + i), load(b + i), load(c + i), d ? load(d + i) : hn::Set(d8, 255), d8,
                              to + 4 * i);
#endif
    for (; i < n; ++i) {
        to[4 * i] = a[i];
        to[4 * i + 1] = b[i];
        to[4 * i + 2] = c[i];
        to[4 * i + 3] = d ? d[i] : 255;
    }
}

void split3(const Byte* from, Byte* a, Byte* b, Byte* c, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() <= n; i += lanes()) {
        V8 va, vb, vc;
        hn::LoadInterleaved3(d8, from + 3 * i, va, vb, vc);
        put(va, a + i);
        put(vb, b + i);
        put(vc, c + i);
    }
#endif
    for (; i < n; ++i) {
        a[i] = from[3 * i];
        b[i] = from[3 * i + 1];
        c[i] = from[3 * i + 2];
    }
}

void join3(Byte* to, const Byte* a, const Byte* b, const Byte* c, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() <= n; i += lanes())
        hn::StoreInterleaved3(load(a + i), load(b + i), load(c + i), d8, to + 3 * i);
#endif
    for (; i < n; ++i) {
        to[3 * i] = a[i];
        to[3 * i + 1] = b[i];
        to[3 * i + 2] = c[i];
    }
}

// Pixels of three bytes are moved in blocks of 16 bytes, of which 12 count; what comes after them is written
// next, so all but the last blocks of a line go this way.
#if QV_VECTORS
const hn::Full128<uint8_t> block8;
alignas(16) constexpr Byte dropFourth[16] = {0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, 255, 255, 255, 255};
alignas(16) constexpr Byte spreadThree[16] = {0, 1, 2, 255, 3, 4, 5, 255, 6, 7, 8, 255, 9, 10, 11, 255};
alignas(16) constexpr Byte fourth[16] = {0, 0, 0, 255, 0, 0, 0, 255, 0, 0, 0, 255, 0, 0, 0, 255};
#endif

// In place the blocks' spare bytes would be read later: source and target of a line differ then, as the
// target comes after the source.
void pack4to3(Byte* to, const Byte* from, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    const auto order = hn::Load(block8, dropFourth);
    for (; i + 6 <= n; i += 4)
        hn::StoreU(hn::TableLookupBytesOr0(hn::LoadU(block8, from + 4 * i), order), block8, to + 3 * i);
#endif
    for (; i < n; ++i) {
        const Byte b = from[4 * i], g = from[4 * i + 1], r = from[4 * i + 2];
        to[3 * i] = b;
        to[3 * i + 1] = g;
        to[3 * i + 2] = r;
    }
}

void pack3to4(Byte* to, const Byte* from, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    const auto order = hn::Load(block8, spreadThree), opaque = hn::Load(block8, fourth);
    for (; i + 6 <= n; i += 4)
        hn::StoreU(hn::Or(hn::TableLookupBytesOr0(hn::LoadU(block8, from + 3 * i), order), opaque), block8,
                   to + 4 * i);
#endif
    for (; i < n; ++i) {
        std::memcpy(to + 4 * i, from + 3 * i, 3);
        to[4 * i + 3] = 255;
    }
}

// Fields of 5 and 6 bits spread over 8, and round(value * most / 255).
HWY_INLINE Byte five(unsigned value) { return static_cast<Byte>((value & 31) << 3 | (value & 31) >> 2); }
HWY_INLINE Byte six(unsigned value) { return static_cast<Byte>((value & 63) << 2 | (value & 63) >> 4); }
HWY_INLINE unsigned toBits(unsigned value, unsigned most) { return (value * most + 127) / 255; }

#if QV_VECTORS
using VU16 = hn::Vec<decltype(hn::Repartition<uint16_t, D8>())>;
const hn::Rebind<uint8_t, decltype(hn::Repartition<uint16_t, D8>())> halfBytes;
HWY_INLINE void putNarrow(VU16 words, Byte* to) {
    hn::StoreU(hn::DemoteTo(halfBytes, hn::BitCast(d16, words)), halfBytes, to);
}
HWY_INLINE VU16 loadWide(const Byte* from) { return hn::PromoteTo(du16, hn::LoadU(halfBytes, from)); }
HWY_INLINE VU16 fiveWords(VU16 word) {
    const auto value = hn::And(word, hn::Set(du16, 31));
    return hn::Or(hn::ShiftLeft<3>(value), hn::ShiftRight<2>(value));
}
// x / 255 = (x + 1 + (x >> 8)) >> 8 below 65535
HWY_INLINE VU16 bitsOf(VU16 value, unsigned most) {
    const auto x = hn::Add(hn::Mul(value, hn::Set(du16, static_cast<uint16_t>(most))), hn::Set(du16, 128));
    return hn::ShiftRight<8>(hn::Add(x, hn::ShiftRight<8>(hn::Sub(x, hn::Set(du16, 1)))));
}
#endif

void split565(const Byte* from, Byte* b, Byte* g, Byte* r, size_t n, bool green6) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() / 2 <= n; i += lanes() / 2) {
        const auto word = hn::BitCast(du16, load(from + 2 * i));
        const auto green = hn::And(hn::ShiftRight<5>(word), hn::Set(du16, 63));
        putNarrow(fiveWords(word), b + i);
        putNarrow(green6 ? hn::Or(hn::ShiftLeft<2>(green), hn::ShiftRight<4>(green)) : fiveWords(green),
                  g + i);
        putNarrow(fiveWords(green6 ? hn::ShiftRight<11>(word) : hn::ShiftRight<10>(word)), r + i);
    }
#endif
    for (; i < n; ++i) {
        uint16_t word;
        std::memcpy(&word, from + 2 * i, 2);
        b[i] = five(word);
        g[i] = green6 ? six(word >> 5u) : five(word >> 5u);
        r[i] = five(word >> (green6 ? 11u : 10u));
    }
}

void join565(Byte* to, const Byte* b, const Byte* g, const Byte* r, size_t n, bool green6) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() / 2 <= n; i += lanes() / 2) {
        const auto green = hn::ShiftLeft<5>(bitsOf(loadWide(g + i), green6 ? 63 : 31));
        const auto red = bitsOf(loadWide(r + i), 31);
        const auto upper = hn::Or(green, green6 ? hn::ShiftLeft<11>(red) : hn::ShiftLeft<10>(red));
        put(hn::BitCast(d8, hn::Or(bitsOf(loadWide(b + i), 31), upper)), to + 2 * i);
    }
#endif
    for (; i < n; ++i) {
        const unsigned green = toBits(g[i], green6 ? 63 : 31) << 5;
        const unsigned red = toBits(r[i], 31) << (green6 ? 11 : 10);
        const auto word = static_cast<uint16_t>(toBits(b[i], 31) | green | red);
        std::memcpy(to + 2 * i, &word, 2);
    }
}

void splitYuyv(const Byte* from, Byte* y, Byte* u, Byte* v, size_t n, bool lumaFirst) {
    const size_t pairs = n / 2, at = lumaFirst ? 0 : 1;
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() <= pairs; i += lanes()) {
        const auto a = load(from + 4 * i), b = load(from + 4 * i + lanes());
        const auto c = load(from + 4 * i + 2 * lanes()), d = load(from + 4 * i + 3 * lanes());
        const auto evenAb = hn::ConcatEven(d8, b, a), oddAb = hn::ConcatOdd(d8, b, a);
        const auto evenCd = hn::ConcatEven(d8, d, c), oddCd = hn::ConcatOdd(d8, d, c);
        put(lumaFirst ? evenAb : oddAb, y + 2 * i);
        put(lumaFirst ? evenCd : oddCd, y + 2 * i + lanes());
        const auto low = lumaFirst ? oddAb : evenAb, high = lumaFirst ? oddCd : evenCd;
        put(hn::ConcatEven(d8, high, low), u + i);
        put(hn::ConcatOdd(d8, high, low), v + i);
    }
#endif
    for (; i < pairs; ++i) {
        y[2 * i] = from[4 * i + at];
        y[2 * i + 1] = from[4 * i + 2 + at];
        u[i] = from[4 * i + 1 - at];
        v[i] = from[4 * i + 3 - at];
    }
    if (n & 1) y[n - 1] = from[4 * pairs + at];
}

void joinYuyv(Byte* to, const Byte* y, const Byte* u, const Byte* v, size_t n, bool lumaFirst) {
    const size_t pairs = n / 2, at = lumaFirst ? 0 : 1;
    size_t i = 0;
#if QV_VECTORS
    const hn::Half<D8> half;
    for (; i + lanes() / 2 <= pairs; i += lanes() / 2) {
        // Words of U below V, then bytes of luma between.
        const hn::Rebind<uint8_t, decltype(du16)> narrowTag;
        static_assert(sizeof(half) == sizeof(narrowTag));
        const auto wu = hn::PromoteTo(du16, hn::LoadU(narrowTag, u + i)),
                   wv = hn::PromoteTo(du16, hn::LoadU(narrowTag, v + i));
        const auto chroma = hn::BitCast(d8, hn::Or(wu, hn::ShiftLeft<8>(wv)));
        const auto luma = load(y + 2 * i);
        if (lumaFirst)
            hn::StoreInterleaved2(luma, chroma, d8, to + 4 * i);
        else
            hn::StoreInterleaved2(chroma, luma, d8, to + 4 * i);
    }
#endif
    for (; i < pairs; ++i) {
        to[4 * i + at] = y[2 * i];
        to[4 * i + 2 + at] = y[2 * i + 1];
        to[4 * i + 1 - at] = u[i];
        to[4 * i + 3 - at] = v[i];
    }
    if (n & 1) {
        to[4 * pairs + at] = y[n - 1];
        to[4 * pairs + 1 - at] = pairs ? u[pairs - 1] : 128;
    }
}

#if QV_VECTORS
// The weights as vectors, two 16-bit lanes a pixel: blue and red; green and 0.
struct YuvRow {
    V16 blueRed, green;
    V32 add;
};

HWY_INLINE YuvRow rowOf(const int16_t m[3], int add) {
    return {pairOf(m[0], m[2]), pairOf(m[1], 0), hn::Set(d32, add)};
}

HWY_INLINE V32 rowSum(const YuvRow& row, V16 blueRed, V16 green) {
    return hn::ShiftRight<15>(
        hn::Add(hn::Add(pairDot(blueRed, row.blueRed), pairDot(green, row.green)), row.add));
}

// Words with zeros between.
HWY_INLINE V16 lowPairs(V16 words) { return hn::InterleaveLower(d16, words, hn::Zero(d16)); }
HWY_INLINE V16 highPairs(V16 words) { return hn::InterleaveUpper(d16, words, hn::Zero(d16)); }

// Pixels as 32-bit lanes in four vectors of one block order to bytes in that order.
HWY_INLINE V8 rowBytes(const YuvRow& row, const V16 blueRed[4], const V16 green[4]) {
    const auto low =
        hn::ReorderDemote2To(d16, rowSum(row, blueRed[0], green[0]), rowSum(row, blueRed[1], green[1]));
    const auto high =
        hn::ReorderDemote2To(d16, rowSum(row, blueRed[2], green[2]), rowSum(row, blueRed[3], green[3]));
    return joinWords(low, high);
}
#endif

HWY_INLINE int rowSumOne(const int16_t m[3], int add, const Byte* bgr) {
    return (m[0] * bgr[0] + m[1] * bgr[1] + m[2] * bgr[2] + add) >> 15;
}

HWY_INLINE void yuvOne(const ToYuv& rows, const Byte* bgr, Byte* y, Byte* u, Byte* v) {
    *y = clampByte(rowSumOne(rows.y, rows.yAdd, bgr));
    if (!u) return;
    *u = clampByte(rowSumOne(rows.u, rows.chromaAdd, bgr));
    *v = clampByte(rowSumOne(rows.v, rows.chromaAdd, bgr));
}

void rgb4ToYuv(const ToYuv& rows, const Byte* from, Byte* y, Byte* u, Byte* v, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    const auto ry = rowOf(rows.y, rows.yAdd), ru = rowOf(rows.u, rows.chromaAdd),
               rv = rowOf(rows.v, rows.chromaAdd);
    const auto low = hn::Set(d16, 255);
    const size_t quarter = lanes() / 4;
    for (; i + lanes() <= n; i += lanes()) {
        V16 blueRed[4], green[4];
        // The packs that follow take block by block; pixels are picked up so that they end in order.
        for (size_t k = 0; k < 4; ++k) {
#if HWY_TARGET <= HWY_AVX2
            const hn::Half<D8> half;
            const size_t first = i + k * 4;  // 4 pixels of the lower block, 4 of the upper one
            const auto pixels = hn::BitCast(d16, hn::Combine(d8, hn::LoadU(half, from + 4 * (first + 16)),
                                                             hn::LoadU(half, from + 4 * first)));
#else
            const auto pixels = hn::BitCast(d16, load(from + 4 * (i + k * quarter)));
#endif
            blueRed[k] = hn::And(pixels, low);
            green[k] = hn::BitCast(d16, hn::ShiftRight<8>(hn::BitCast(du16, pixels)));
        }
        (void)quarter;
        put(rowBytes(ry, blueRed, green), y + i);
        if (!u) continue;
        put(rowBytes(ru, blueRed, green), u + i);
        put(rowBytes(rv, blueRed, green), v + i);
    }
#endif
    for (; i < n; ++i) yuvOne(rows, from + 4 * i, y + i, u ? u + i : nullptr, u ? v + i : nullptr);
}

void rgbToYuv(const ToYuv& rows, const Byte* b, const Byte* g, const Byte* r, Byte* y, Byte* u, Byte* v,
              size_t n) {
    size_t i = 0;
#if QV_VECTORS
    const auto ry = rowOf(rows.y, rows.yAdd), ru = rowOf(rows.u, rows.chromaAdd),
               rv = rowOf(rows.v, rows.chromaAdd);
    for (; i + lanes() <= n; i += lanes()) {
        const auto vb = load(b + i), vg = load(g + i), vr = load(r + i);
        const auto pair = hn::InterleaveLower(d8, vb, vr), pairUp = hn::InterleaveUpper(d8, vb, vr);
        const auto single = lowWords(vg), singleUp = highWords(vg);
        // B R as bytes become B 0 R 0; G 0 become G 0 0 0.
        const V16 blueRed[4] = {lowWords(pair), highWords(pair), lowWords(pairUp), highWords(pairUp)};
        const V16 green[4] = {lowPairs(single), highPairs(single), lowPairs(singleUp), highPairs(singleUp)};
        put(rowBytes(ry, blueRed, green), y + i);
        if (!u) continue;
        put(rowBytes(ru, blueRed, green), u + i);
        put(rowBytes(rv, blueRed, green), v + i);
    }
#endif
    for (; i < n; ++i) {
        const Byte bgr[3] = {b[i], g[i], r[i]};
        yuvOne(rows, bgr, y + i, u ? u + i : nullptr, u ? v + i : nullptr);
    }
}

#if QV_VECTORS
HWY_INLINE V16 otherWords(const int16_t m[3], V16 y, V16 u, V16 v, int centre) {
    // Pairs of Y U, and of V with the rounding.
    const auto one = hn::Set(d16, 1);
    const auto mYu = pairOf(m[0], m[1]), mV = pairOf(m[2], 8192);
    const auto low =
        hn::Add(pairDot(hn::InterleaveLower(d16, y, u), mYu), pairDot(hn::InterleaveLower(d16, v, one), mV));
    const auto high =
        hn::Add(pairDot(hn::InterleaveUpper(d16, y, u), mYu), pairDot(hn::InterleaveUpper(d16, v, one), mV));
    const auto sum = hn::ReorderDemote2To(d16, hn::ShiftRight<14>(low), hn::ShiftRight<14>(high));
    return hn::Add(sum, hn::Set(d16, static_cast<int16_t>(centre)));
}
#endif

HWY_INLINE Byte otherOne(const int16_t m[3], int y, int u, int v, int centre) {
    return clampByte(((m[0] * y + m[1] * u + m[2] * v + 8192) >> 14) + centre);
}

void yuvToOther(const ToOther& rows, Byte* y, Byte* u, Byte* v, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    constexpr int zero[3] = {16, 128, 128};
    const auto black = hn::Set(d16, 16), centre = hn::Set(d16, 128);
    for (; i + lanes() <= n; i += lanes()) {
        const auto vy = load(y + i), vu = load(u + i), vv = load(v + i);
        const V16 yl = hn::Sub(lowWords(vy), black), yh = hn::Sub(highWords(vy), black);
        const V16 ul = hn::Sub(lowWords(vu), centre), uh = hn::Sub(highWords(vu), centre);
        const V16 vl = hn::Sub(lowWords(vv), centre), vh = hn::Sub(highWords(vv), centre);
        Byte* const to[3] = {y, u, v};
        for (int k = 0; k < 3; ++k)
            put(joinWords(otherWords(rows.m[k], yl, ul, vl, zero[k]),
                          otherWords(rows.m[k], yh, uh, vh, zero[k])),
                to[k] + i);
    }
#endif
    for (; i < n; ++i) {
        const int a = y[i] - 16, b = u[i] - 128, c = v[i] - 128;
        y[i] = otherOne(rows.m[0], a, b, c, 16);
        u[i] = otherOne(rows.m[1], a, b, c, 128);
        v[i] = otherOne(rows.m[2], a, b, c, 128);
    }
}

#if QV_VECTORS
// (x * scale + add) >> 14 on 16-bit lanes by 32-bit products.
HWY_INLINE V16 scaledWords(V16 x, V16 factors) {
    const auto one = hn::Set(d16, 1);
    const auto low = pairDot(hn::InterleaveLower(d16, x, one), factors),
               high = pairDot(hn::InterleaveUpper(d16, x, one), factors);
    return hn::ReorderDemote2To(d16, hn::ShiftRight<14>(low), hn::ShiftRight<14>(high));
}
#endif

HWY_INLINE void levels(Byte* to, const Byte* from, size_t n, int scale, int before, int after) {
    size_t i = 0;
#if QV_VECTORS
    const auto factors = pairOf(scale, 8192);
    const auto sub = hn::Set(d16, static_cast<int16_t>(before)),
               plus = hn::Set(d16, static_cast<int16_t>(after));
    for (; i + lanes() <= n; i += lanes()) {
        const auto x = load(from + i);
        put(joinWords(hn::Add(scaledWords(hn::Sub(lowWords(x), sub), factors), plus),
                      hn::Add(scaledWords(hn::Sub(highWords(x), sub), factors), plus)),
            to + i);
    }
#endif
    for (; i < n; ++i) to[i] = clampByte((((from[i] - before) * scale + 8192) >> 14) + after);
}

constexpr int videoScale = 14071;  // 219 / 255 and 255 / 219 in 1/16384
constexpr int fullScale = 19077;

void toVideoLevels(Byte* to, const Byte* from, size_t n) { levels(to, from, n, videoScale, 0, 16); }
void toFullLevels(Byte* to, const Byte* from, size_t n) { levels(to, from, n, fullScale, 16, 0); }

void widen(uint16_t* to, const Byte* from, size_t n, bool full) {
    size_t i = 0;
#if QV_VECTORS
    const hn::Rebind<uint8_t, decltype(hn::Repartition<uint16_t, D8>())> half;
    const size_t step = lanes() / 2;
    for (; i + step <= n; i += step) {
        const auto x = hn::PromoteTo(du16, hn::LoadU(half, from + i));
        const auto high = hn::ShiftLeft<8>(x);
        hn::StoreU(full ? hn::Or(high, x) : high, du16, to + i);
    }
#endif
    for (; i < n; ++i) to[i] = static_cast<uint16_t>(full ? from[i] * 257 : from[i] * 256);
}

void narrow(Byte* to, const uint16_t* from, size_t n, bool full) {
    size_t i = 0;
#if QV_VECTORS
    // round(x / 257) = (x + 128 - (x >> 8)) >> 8; both keep within 16 bits by adding with saturation.
    const auto half = hn::Set(du16, 128);
    const hn::Rebind<uint8_t, decltype(hn::Repartition<uint16_t, D8>())> bytes;
    const size_t step = lanes() / 2;
    for (; i + step <= n; i += step) {
        auto x = hn::LoadU(du16, from + i);
        if (full) x = hn::Sub(x, hn::ShiftRight<8>(x));
        const auto y = hn::ShiftRight<8>(hn::SaturatedAdd(x, half));
        hn::StoreU(hn::DemoteTo(bytes, hn::BitCast(d16, y)), bytes, to + i);
    }
#endif
    for (; i < n; ++i) {
        const int x = full ? from[i] - (from[i] >> 8) : from[i];
        to[i] = static_cast<Byte>(std::min(x + 128, 65535) >> 8);
    }
}

void twice(Byte* to, const Byte* from, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() <= n; i += lanes()) {
        const auto x = load(from + i);
        hn::StoreInterleaved2(x, x, d8, to + 2 * i);
    }
#endif
    for (; i < n; ++i) to[2 * i] = to[2 * i + 1] = from[i];
}

void evens(Byte* to, const Byte* from, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() <= n; i += lanes())
        put(hn::ConcatEven(d8, load(from + 2 * i + lanes()), load(from + 2 * i)), to + i);
#endif
    for (; i < n; ++i) to[i] = from[2 * i];
}

void doubleLine(Byte* to, const Byte* from, size_t n) {
    const size_t samples = n / 2;
    size_t i = 0;
#if QV_VECTORS
    for (; i + lanes() + 1 <= samples; i += lanes()) {
        const auto x = load(from + i);
        hn::StoreInterleaved2(x, hn::AverageRound(x, load(from + i + 1)), d8, to + 2 * i);
    }
#endif
    for (; i < samples; ++i) {
        to[2 * i] = from[i];
        to[2 * i + 1] = static_cast<Byte>((from[i] + from[std::min(i + 1, samples - 1)] + 1) >> 1);
    }
    if (n & 1) to[n - 1] = samples ? from[samples - 1] : 128;
}

const char* rows8Unit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

QV_KERNEL(split4, (const Byte* from, Byte* a, Byte* b, Byte* c, Byte* d, size_t n), (from, a, b, c, d, n))
QV_KERNEL(join4, (Byte * to, const Byte* a, const Byte* b, const Byte* c, const Byte* d, size_t n),
          (to, a, b, c, d, n))
QV_KERNEL(split3, (const Byte* from, Byte* a, Byte* b, Byte* c, size_t n), (from, a, b, c, n))
QV_KERNEL(join3, (Byte * to, const Byte* a, const Byte* b, const Byte* c, size_t n), (to, a, b, c, n))
QV_KERNEL(pack4to3, (Byte * to, const Byte* from, size_t n), (to, from, n))
QV_KERNEL(pack3to4, (Byte * to, const Byte* from, size_t n), (to, from, n))
QV_KERNEL(split565, (const Byte* from, Byte* b, Byte* g, Byte* r, size_t n, bool green6),
          (from, b, g, r, n, green6))
QV_KERNEL(join565, (Byte * to, const Byte* b, const Byte* g, const Byte* r, size_t n, bool green6),
          (to, b, g, r, n, green6))
QV_KERNEL(splitYuyv, (const Byte* from, Byte* y, Byte* u, Byte* v, size_t n, bool lumaFirst),
          (from, y, u, v, n, lumaFirst))
QV_KERNEL(joinYuyv, (Byte * to, const Byte* y, const Byte* u, const Byte* v, size_t n, bool lumaFirst),
          (to, y, u, v, n, lumaFirst))
QV_KERNEL(rgbToYuv,
          (const ToYuv& rows, const Byte* b, const Byte* g, const Byte* r, Byte* y, Byte* u, Byte* v,
           size_t n),
          (rows, b, g, r, y, u, v, n))
QV_KERNEL(rgb4ToYuv, (const ToYuv& rows, const Byte* from, Byte* y, Byte* u, Byte* v, size_t n),
          (rows, from, y, u, v, n))
QV_KERNEL(yuvToOther, (const ToOther& rows, Byte* y, Byte* u, Byte* v, size_t n), (rows, y, u, v, n))
QV_KERNEL(toVideoLevels, (Byte * to, const Byte* from, size_t n), (to, from, n))
QV_KERNEL(toFullLevels, (Byte * to, const Byte* from, size_t n), (to, from, n))
QV_KERNEL(widen, (uint16_t * to, const Byte* from, size_t n, bool full), (to, from, n, full))
QV_KERNEL(narrow, (Byte * to, const uint16_t* from, size_t n, bool full), (to, from, n, full))
QV_KERNEL(twice, (Byte * to, const Byte* from, size_t n), (to, from, n))
QV_KERNEL(evens, (Byte * to, const Byte* from, size_t n), (to, from, n))
QV_KERNEL(doubleLine, (Byte * to, const Byte* from, size_t n), (to, from, n))

HWY_EXPORT(rows8Unit);
const char* rows8Unit() { return HWY_DYNAMIC_DISPATCH(rows8Unit)(); }

}  // namespace srk
#endif
