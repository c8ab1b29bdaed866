#include "builtin/kernels/lines/yuvrgb.h"

#include <algorithm>
#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/lines/yuvrgb.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

// Words are in 1/64 of a code value: a sample 256 times as large, times a coefficient in 1/16384, of which
// the upper half is taken.
constexpr int fraction = 6;

// What luma of 0 stands for, and half of the last place.
HWY_INLINE int blackOf(const ToRgb& rows) {
    return (1 << (fraction - 1)) - ((rows.yOffset * rows.y + 128) >> 8);
}

HWY_INLINE int upperHalf(int sample, int coefficient) { return (sample * 256 * coefficient) >> 16; }

HWY_INLINE Byte codeOf(int value) { return static_cast<Byte>(std::clamp(value >> fraction, 0, 255)); }

HWY_INLINE void rgbOne(const ToRgb& rows, int y, int u, int v, Byte* bgr) {
    const int luma = upperHalf(y, rows.y) + blackOf(rows);
    const int cb = u - 128, cr = v - 128;
    bgr[0] = codeOf(luma + 2 * upperHalf(cb, rows.cbToB));
    bgr[1] = codeOf(luma + upperHalf(cb, rows.cbToG) + upperHalf(cr, rows.crToG));
    bgr[2] = codeOf(luma + upperHalf(cr, rows.crToR));
}

#if QV_WIDE
using HVU16 = hn::Vec<hn::RepartitionToWide<HB>>;

// What chroma adds to each colour.
struct Terms {
    HV16 b, g, r;
};
struct TermsPair {
    Terms low, high;
};

struct RgbRows {
    HVU16 y;
    HV16 black, cbToB, cbToG, crToG, crToR;
    explicit RgbRows(const ToRgb& rows)
        : y(hn::Set(huWords, static_cast<uint16_t>(rows.y))),
          black(hn::Set(hWords, static_cast<int16_t>(blackOf(rows)))),
          cbToB(hn::Set(hWords, rows.cbToB)),
          cbToG(hn::Set(hWords, rows.cbToG)),
          crToG(hn::Set(hWords, rows.crToG)),
          crToR(hn::Set(hWords, rows.crToR)) {}

    HWY_INLINE Terms terms(HV16 cb, HV16 cr) const {
        return {hn::ShiftLeft<1>(hn::MulHigh(cb, cbToB)),
                hn::Add(hn::MulHigh(cb, cbToG), hn::MulHigh(cr, crToG)), hn::MulHigh(cr, crToR)};
    }
    HWY_INLINE HV16 luma(HV8 upper) const {
        return hn::Add(hn::BitCast(hWords, hn::MulHigh(hn::BitCast(huWords, upper), y)), black);
    }
};

HWY_INLINE HV16 wordsBelow(HV8 bytes) {
    return hn::BitCast(hWords, hn::InterleaveLower(hBytes, hn::Zero(hBytes), bytes));
}
HWY_INLINE HV16 wordsAbove(HV8 bytes) {
    return hn::BitCast(hWords, hn::InterleaveUpper(hBytes, hn::Zero(hBytes), bytes));
}

HWY_INLINE TermsPair termsOfAll(const RgbRows& rows, const Byte* u, const Byte* v) {
    const auto centre = hn::Set(hBytes, 128);
    const auto cb = hn::Xor(hn::LoadU(hBytes, u), centre), cr = hn::Xor(hn::LoadU(hBytes, v), centre);
    return {rows.terms(wordsBelow(cb), wordsBelow(cr)), rows.terms(wordsAbove(cb), wordsAbove(cr))};
}

HWY_INLINE TermsPair termsOfHalf(const RgbRows& rows, const Byte* u, const Byte* v) {
    const hn::Rebind<uint8_t, hn::RepartitionToWide<HB>> half;
    const auto centre = hn::Set(huWords, 0x8000);
    const auto wordsOf = [&](const Byte* from) HWY_ATTR {
        const auto words = hn::ShiftLeft<8>(hn::PromoteTo(huWords, hn::LoadU(half, from)));
        return hn::BitCast(hWords, hn::Xor(words, centre));
    };
    const Terms t = rows.terms(wordsOf(u), wordsOf(v));
    return {{hn::InterleaveLower(hWords, t.b, t.b), hn::InterleaveLower(hWords, t.g, t.g),
             hn::InterleaveLower(hWords, t.r, t.r)},
            {hn::InterleaveUpper(hWords, t.b, t.b), hn::InterleaveUpper(hWords, t.g, t.g),
             hn::InterleaveUpper(hWords, t.r, t.r)}};
}

struct Colours {
    HV8 b, g, r;
};

HWY_INLINE HV8 coloursOf(HV16 lumaLow, HV16 low, HV16 lumaHigh, HV16 high) {
    return clampBytes(hn::ShiftRight<fraction>(hn::SaturatedAdd(lumaLow, low)),
                      hn::ShiftRight<fraction>(hn::SaturatedAdd(lumaHigh, high)));
}

HWY_INLINE Colours coloursOf(const RgbRows& rows, const Byte* y, const TermsPair& terms) {
    const auto bytes = hn::LoadU(hBytes, y);
    const auto low = rows.luma(hn::InterleaveLower(hBytes, hn::Zero(hBytes), bytes));
    const auto high = rows.luma(hn::InterleaveUpper(hBytes, hn::Zero(hBytes), bytes));
    return {coloursOf(low, terms.low.b, high, terms.high.b), coloursOf(low, terms.low.g, high, terms.high.g),
            coloursOf(low, terms.low.r, high, terms.high.r)};
}
#endif

// Where RGB goes, by vectors and by single pixels.
struct ToPlanes {
    Byte *b, *g, *r;
    void one(size_t i, const Byte* p) const {
        b[i] = p[0];
        g[i] = p[1];
        r[i] = p[2];
    }
#if QV_WIDE
    HWY_INLINE void all(size_t i, const Colours& p) const {
        hn::StoreU(p.b, hBytes, b + i);
        hn::StoreU(p.g, hBytes, g + i);
        hn::StoreU(p.r, hBytes, r + i);
    }
#endif
};

#if QV_WIDE
// A picture is written once, in order: asking for its memory a little before it is written keeps more of it
// under way than the processor does by itself. Addresses past the picture do no harm.
HWY_INLINE void soonWritten(const Byte* to, size_t bytes) {
    constexpr size_t cacheLine = 64, ahead = 2048;
    for (size_t i = 0; i < bytes; i += cacheLine) __builtin_prefetch(to + ahead + i, 1);
}
#endif

struct ToFours {
    Byte* to;
    void one(size_t i, const Byte* p) const {
        std::memcpy(to + 4 * i, p, 3);
        to[4 * i + 3] = 255;
    }
#if QV_WIDE
    HWY_INLINE void all(size_t i, const Colours& p) const {
        soonWritten(to + 4 * i, 4 * byteLanes());
        hn::StoreInterleaved4(p.b, p.g, p.r, hn::Set(hBytes, 255), hBytes, to + 4 * i);
    }
#endif
};

struct ToThrees {
    Byte* to;
    void one(size_t i, const Byte* p) const { std::memcpy(to + 3 * i, p, 3); }
#if QV_WIDE
    HWY_INLINE void all(size_t i, const Colours& p) const {
        soonWritten(to + 3 * i, 3 * byteLanes());
        hn::StoreInterleaved3(p.b, p.g, p.r, hBytes, to + 3 * i);
    }
#endif
};

template <bool repeated, class To>
HWY_INLINE void eachRgb(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, size_t n,
                        const To& to) {
    size_t i = 0;
#if QV_WIDE
    const RgbRows k(rows);
    for (; i + byteLanes() <= n; i += byteLanes())
        to.all(i, coloursOf(k, y + i,
                            repeated ? termsOfHalf(k, u + i / 2, v + i / 2) : termsOfAll(k, u + i, v + i)));
#endif
    for (; i < n; ++i) {
        const size_t at = repeated ? std::min(i / 2, n / 2 - 1) : i;
        Byte bgr[3];
        rgbOne(rows, y[i], u[at], v[at], bgr);
        to.one(i, bgr);
    }
}

void yuvToRgb(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* b, Byte* g, Byte* r,
              size_t n) {
    eachRgb<false>(rows, y, u, v, n, ToPlanes{b, g, r});
}

void yuvToRgb4(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* to, size_t n,
               bool repeated) {
    if (repeated) return eachRgb<true>(rows, y, u, v, n, ToFours{to});
    eachRgb<false>(rows, y, u, v, n, ToFours{to});
}

void yuvToRgb3(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* to, size_t n,
               bool repeated) {
    if (repeated) return eachRgb<true>(rows, y, u, v, n, ToThrees{to});
    eachRgb<false>(rows, y, u, v, n, ToThrees{to});
}

const char* yuvRgbUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

HWY_EXPORT(yuvToRgb);
HWY_EXPORT(yuvToRgb4);
HWY_EXPORT(yuvToRgb3);
HWY_EXPORT(yuvRgbUnit);

void yuvToRgb(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* b, Byte* g, Byte* r,
              size_t n) {
    HWY_DYNAMIC_DISPATCH(yuvToRgb)(rows, y, u, v, b, g, r, n);
}
void yuvToRgb4(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* to, size_t n,
               bool repeated) {
    HWY_DYNAMIC_DISPATCH(yuvToRgb4)(rows, y, u, v, to, n, repeated);
}
void yuvToRgb3(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* to, size_t n,
               bool repeated) {
    HWY_DYNAMIC_DISPATCH(yuvToRgb3)(rows, y, u, v, to, n, repeated);
}
const char* yuvRgbUnit() { return HWY_DYNAMIC_DISPATCH(yuvRgbUnit)(); }

}  // namespace srk
#endif
