#include "core/compose/mixkernels_p.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "core/compose/mixkernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

HWY_BEFORE_NAMESPACE();
namespace qvmix {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// x * weight >> 16 in parts that need 32 bits each: x is high * 65536 + low, so the product's upper bits are
// x * whole + high * fraction + (low * fraction >> 16).
inline uint32_t weighted(int32_t x, Weight weight) {
    const auto bits = static_cast<uint32_t>(x);
    const auto high = static_cast<uint32_t>(x >> 16);
    return bits * weight.whole + high * weight.fraction + ((bits & 0xFFFF) * weight.fraction >> 16);
}

void AddWeighted(int32_t* sum, const int32_t* from, size_t step, size_t count, Weight weight) {
    size_t i = 0;
#if HWY_TARGET != HWY_SCALAR
    const hn::ScalableTag<uint32_t> u32;
    const hn::RebindToSigned<decltype(u32)> s32;
    const size_t lanes = hn::Lanes(u32);
    const auto whole = hn::Set(u32, weight.whole), fraction = hn::Set(u32, weight.fraction);
    const auto lowMask = hn::Set(u32, 0xFFFF);
    const auto add = [&](size_t at, auto value) HWY_ATTR {
        hn::StoreU(hn::Add(hn::LoadU(s32, sum + at), hn::BitCast(s32, value)), s32, sum + at);
    };
    if (step == 1 && weight.whole == 1 && weight.fraction == 0) {
        for (; i + lanes <= count; i += lanes) add(i, hn::LoadU(s32, from + i));
    } else if (step == 1) {
        for (; i + lanes <= count; i += lanes) {
            const auto x = hn::LoadU(s32, from + i);
            const auto bits = hn::BitCast(u32, x);
            const auto high = hn::BitCast(u32, hn::ShiftRight<16>(x));
            const auto low = hn::ShiftRight<16>(hn::Mul(hn::And(bits, lowMask), fraction));
            add(i, hn::Add(hn::Add(hn::Mul(bits, whole), hn::Mul(high, fraction)), low));
        }
    }
#endif
    for (; i < count; ++i)
        sum[i] = static_cast<int32_t>(static_cast<uint32_t>(sum[i]) + weighted(from[i * step], weight));
}

}  // namespace HWY_NAMESPACE
}  // namespace qvmix
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace qvmix {

HWY_EXPORT(AddWeighted);

void addWeighted(std::int32_t* sum, const std::int32_t* from, std::size_t step, std::size_t count,
                 Weight weight) {
    HWY_DYNAMIC_DISPATCH(AddWeighted)(sum, from, step, count, weight);
}

}  // namespace qvmix
#endif
