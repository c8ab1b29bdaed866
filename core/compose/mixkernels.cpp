#include "core/compose/mixkernels_p.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "core/compose/mixkernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

HWY_BEFORE_NAMESPACE();
namespace qvmix {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// Bits 16 to 47 of the product depend on no higher ones, so 64 bits that wrap are enough.
inline int32_t weighted(int32_t x, int64_t coefficient) {
    const uint64_t product = static_cast<uint64_t>(int64_t{x}) * static_cast<uint64_t>(coefficient);
    return static_cast<int32_t>(static_cast<uint32_t>(product >> 16));
}

inline int32_t wrapAdd(int32_t a, int32_t b) {
    return static_cast<int32_t>(static_cast<uint32_t>(a) + static_cast<uint32_t>(b));
}

#if HWY_TARGET != HWY_SCALAR

using Lanes = hn::ScalableTag<int32_t>;

// x * coefficient >> 16 of a coefficient of 32 bits: even and odd lanes are multiplied apart. The wanted bits
// of an odd lane are moved up to where it lies.
template <class V>
HWY_INLINE V WeightedLanes(V x, V coefficient) {
    const hn::RepartitionToWide<Lanes> wide;
    const hn::RebindToUnsigned<decltype(wide)> wideBits;
    const Lanes lanes;
    const auto even = hn::BitCast(wideBits, hn::MulEven(x, coefficient));
    const auto odd = hn::BitCast(wideBits, hn::MulEven(hn::Shuffle2301(x), coefficient));
    return hn::OddEven(hn::BitCast(lanes, hn::ShiftLeft<16>(odd)),
                       hn::BitCast(lanes, hn::ShiftRight<16>(even)));
}

// Returns how many samples it has done. `start`: nothing is in the sums yet.
template <bool start>
size_t AddVectors(int32_t* sum, const int32_t* from, size_t count, int64_t coefficient) {
    const Lanes lanes;
    const size_t step = hn::Lanes(lanes);
    const auto add = [&](size_t at, auto values) HWY_ATTR {
        if constexpr (!start) values = hn::Add(hn::LoadU(lanes, sum + at), values);
        hn::StoreU(values, lanes, sum + at);
    };
    size_t i = 0;
    if (coefficient == 65536) {
        for (; i + step <= count; i += step) add(i, hn::LoadU(lanes, from + i));
    } else if (coefficient == static_cast<int32_t>(coefficient)) {
        const auto factor = hn::Set(lanes, static_cast<int32_t>(coefficient));
        for (; i + step <= count; i += step) add(i, WeightedLanes(hn::LoadU(lanes, from + i), factor));
    }
    return i;
}

// Four rows, four samples at a time.
size_t InterleaveFour(int32_t* to, size_t step, const int32_t* rows, size_t length, size_t count) {
    const hn::Full128<int32_t> four;
    const hn::Full128<int64_t> pairs;
    size_t i = 0;
    for (; i + 4 <= count; i += 4) {
        const auto a = hn::LoadU(four, rows + i), b = hn::LoadU(four, rows + length + i);
        const auto c = hn::LoadU(four, rows + 2 * length + i), d = hn::LoadU(four, rows + 3 * length + i);
        const auto ab01 = hn::BitCast(pairs, hn::InterleaveLower(four, a, b));
        const auto ab23 = hn::BitCast(pairs, hn::InterleaveUpper(four, a, b));
        const auto cd01 = hn::BitCast(pairs, hn::InterleaveLower(four, c, d));
        const auto cd23 = hn::BitCast(pairs, hn::InterleaveUpper(four, c, d));
        int32_t* at = to + i * step;
        hn::StoreU(hn::BitCast(four, hn::InterleaveLower(pairs, ab01, cd01)), four, at);
        hn::StoreU(hn::BitCast(four, hn::InterleaveUpper(pairs, ab01, cd01)), four, at + step);
        hn::StoreU(hn::BitCast(four, hn::InterleaveLower(pairs, ab23, cd23)), four, at + 2 * step);
        hn::StoreU(hn::BitCast(four, hn::InterleaveUpper(pairs, ab23, cd23)), four, at + 3 * step);
    }
    return i;
}

// Two rows that are all there is.
size_t InterleaveTwo(int32_t* to, const int32_t* rows, size_t length, size_t count) {
    const Lanes lanes;
    const size_t step = hn::Lanes(lanes);
    size_t i = 0;
    for (; i + step <= count; i += step)
        hn::StoreInterleaved2(hn::LoadU(lanes, rows + i), hn::LoadU(lanes, rows + length + i), lanes,
                              to + 2 * i);
    return i;
}

#else

template <bool start>
size_t AddVectors(int32_t*, const int32_t*, size_t, int64_t) {
    return 0;
}
constexpr auto InterleaveFour = [](auto&&...) -> size_t { return 0; };
constexpr auto InterleaveTwo = InterleaveFour;

#endif

void AddWeighted(int32_t* sum, const int32_t* from, size_t step, size_t count, int64_t coefficient) {
    size_t i = step == 1 ? AddVectors<false>(sum, from, count, coefficient) : 0;
    for (; i < count; ++i) sum[i] = wrapAdd(sum[i], weighted(from[i * step], coefficient));
}

void SetWeighted(int32_t* sum, const int32_t* from, size_t step, size_t count, int64_t coefficient) {
    size_t i = step == 1 ? AddVectors<true>(sum, from, count, coefficient) : 0;
    for (; i < count; ++i) sum[i] = weighted(from[i * step], coefficient);
}

void Interleave(int32_t* to, size_t step, const int32_t* rows, size_t length, int nrRows, size_t count) {
    for (int row = 0; row < nrRows;) {
        const int32_t* from = rows + static_cast<size_t>(row) * length;
        const int left = nrRows - row;
        const int taken = left >= 4 ? 4 : left >= 2 && step == 2 ? 2 : 1;
        size_t done = 0;
        if (taken == 4) done = InterleaveFour(to + row, step, from, length, count);
        if (taken == 2) done = InterleaveTwo(to + row, from, length, count);
        for (size_t i = done; i < count; ++i)
            for (int k = 0; k < taken; ++k)
                to[i * step + static_cast<size_t>(row + k)] = from[static_cast<size_t>(k) * length + i];
        row += taken;
    }
}

}  // namespace HWY_NAMESPACE
}  // namespace qvmix
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace qvmix {

HWY_EXPORT(AddWeighted);
HWY_EXPORT(SetWeighted);
HWY_EXPORT(Interleave);

void addWeighted(std::int32_t* sum, const std::int32_t* from, std::size_t step, std::size_t count,
                 std::int64_t coefficient) {
    HWY_DYNAMIC_DISPATCH(AddWeighted)(sum, from, step, count, coefficient);
}

void setWeighted(std::int32_t* sum, const std::int32_t* from, std::size_t step, std::size_t count,
                 std::int64_t coefficient) {
    HWY_DYNAMIC_DISPATCH(SetWeighted)(sum, from, step, count, coefficient);
}

void interleave(std::int32_t* to, std::size_t step, const std::int32_t* rows, std::size_t length, int nrRows,
                std::size_t count) {
    HWY_DYNAMIC_DISPATCH(Interleave)(to, step, rows, length, nrRows, count);
}

}  // namespace qvmix
#endif
