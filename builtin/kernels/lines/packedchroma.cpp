#include "builtin/kernels/lines/packedchroma.h"

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/lines/packedchroma.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

#if QV_VECTORS
template <bool lumaFirst>
size_t lumaOf(const Byte* from, Byte* y, size_t n) {
    const size_t step = hn::Lanes(d8);
    size_t i = 0;
    for (; i + step <= n; i += step) {
        const auto a = hn::LoadU(d8, from + 2 * i), b = hn::LoadU(d8, from + 2 * i + step);
        hn::StoreU(lumaFirst ? hn::ConcatEven(d8, b, a) : hn::ConcatOdd(d8, b, a), d8, y + i);
    }
    return i;
}
#endif

void packedToLuma(const Byte* from, Byte* y, size_t n, bool lumaFirst) {
    size_t i = 0;
#if QV_VECTORS
    i = lumaFirst ? lumaOf<true>(from, y, n) : lumaOf<false>(from, y, n);
#endif
    for (; i < n; ++i) y[i] = from[2 * i + (lumaFirst ? 0 : 1)];
}

#if QV_WIDE
template <bool lumaFirst, bool weighed>
size_t chromaOf(const Byte* const lines[4], const Byte* weights, Byte* u, Byte* v, size_t n) {
    const auto low = hn::Set(huWords, 255);
    const auto shift = hn::Set(hWords, 256);
    // Luma has no weight.
    HV8 of[4];
    for (int t = 0; t < 4; ++t)
        of[t] = hn::BitCast(
            hBytes, hn::Set(huWords, static_cast<uint16_t>(weighed ? weights[t] << (lumaFirst ? 8 : 0) : 0)));
    const auto words = [&](size_t at) HWY_ATTR {
        const auto first = hn::LoadU(hBytes, lines[0] + at);
        if (!weighed) {
            const auto pairs = hn::BitCast(huWords, first);
            return hn::BitCast(hWords, lumaFirst ? hn::ShiftRight<8>(pairs) : hn::And(pairs, low));
        }
        const auto outer = hn::Add(dotBytes(first, of[0]), dotBytes(hn::LoadU(hBytes, lines[3] + at), of[3]));
        const auto inner = hn::Add(dotBytes(hn::LoadU(hBytes, lines[1] + at), of[1]),
                                   dotBytes(hn::LoadU(hBytes, lines[2] + at), of[2]));
        // (sum * 256 + 16384) >> 15
        return hn::MulFixedPoint15(hn::Add(outer, inner), shift);
    };
    const Packer pack;
    size_t i = 0;
    for (; i + byteLanes() <= n; i += byteLanes()) {
        const size_t at = 4 * i, step = byteLanes();
        const auto near = hn::BitCast(huWords, clampBytes(words(at), words(at + step)));
        const auto far = hn::BitCast(huWords, clampBytes(words(at + 2 * step), words(at + 3 * step)));
        hn::StoreU(pack.ordered(clampBytes(hn::BitCast(hWords, hn::And(near, low)),
                                           hn::BitCast(hWords, hn::And(far, low)))),
                   hBytes, u + i);
        hn::StoreU(pack.ordered(clampBytes(hn::BitCast(hWords, hn::ShiftRight<8>(near)),
                                           hn::BitCast(hWords, hn::ShiftRight<8>(far)))),
                   hBytes, v + i);
    }
    return i;
}
#endif

void packedToChroma(const Byte* const lines[4], const Byte* weights, Byte* u, Byte* v, size_t n,
                    bool lumaFirst) {
    size_t i = 0;
#if QV_WIDE
    if (lumaFirst)
        i = weights ? chromaOf<true, true>(lines, weights, u, v, n)
                    : chromaOf<true, false>(lines, nullptr, u, v, n);
    else
        i = weights ? chromaOf<false, true>(lines, weights, u, v, n)
                    : chromaOf<false, false>(lines, nullptr, u, v, n);
#endif
    for (; i < n; ++i)
        for (const size_t second : {size_t{0}, size_t{1}}) {
            const size_t at = 4 * i + 2 * second + (lumaFirst ? 1 : 0);
            int sum = weights ? 64 : lines[0][at] << 7;
            for (size_t t = 0; weights && t < 4; ++t) sum += lines[t][at] * weights[t];
            (second ? v : u)[i] = static_cast<Byte>(sum >> 7);
        }
}

const char* packedChromaUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

QV_KERNEL(packedToLuma, (const Byte* from, Byte* y, size_t n, bool lumaFirst), (from, y, n, lumaFirst))
QV_KERNEL(packedToChroma,
          (const Byte* const lines[4], const Byte* weights, Byte* u, Byte* v, size_t n, bool lumaFirst),
          (lines, weights, u, v, n, lumaFirst))

HWY_EXPORT(packedChromaUnit);
const char* packedChromaUnit() { return HWY_DYNAMIC_DISPATCH(packedChromaUnit)(); }

}  // namespace srk
#endif
