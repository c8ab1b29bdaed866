#include "builtin/decoders/wavvalues.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/decoders/wavvalues.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

HWY_BEFORE_NAMESPACE();
namespace wav {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

using std::size_t;

static_assert(std::endian::native == std::endian::little, "values are stored as they are in memory");

constexpr double low24 = -(1 << 23), high24 = (1 << 23) - 1;
// From here on the upper 24 bits would be rounded to one more than they hold.
constexpr int32_t highestRounded = 0x7FFFFF00;

HWY_INLINE void put24(unsigned char* to, int32_t value) { std::memcpy(to, &value, 3); }

HWY_INLINE int32_t rounded(int32_t value) {
    const int32_t upper = std::min(value, highestRounded);
    return (upper + 127 + (upper >> 8 & 1)) >> 8;
}

template <class Float>
HWY_INLINE size_t narrowOne(unsigned char* to, const unsigned char* from) {
    Float value;
    std::memcpy(&value, from, sizeof value);
    const bool inside = value >= -1 && value <= 1;
    const Float scaled = std::isnan(value) ? 0 : value * static_cast<Float>(1 << 23);
    const Float bounded = std::clamp(scaled, static_cast<Float>(low24), static_cast<Float>(high24));
    put24(to, static_cast<int32_t>(std::lrint(bounded)));
    return inside ? 0 : 1;
}

// Three bytes a value: four values are shuffled at a time. A store writes four bytes more than it has to,
// which the next one replaces; the last values are done one by one.
#if HWY_TARGET != HWY_SCALAR
const hn::FixedTag<uint8_t, 16> bytes16;
const hn::FixedTag<int32_t, 4> ints4;
const hn::FixedTag<int32_t, 2> ints2;
const hn::FixedTag<int64_t, 2> longs2;
const hn::FixedTag<float, 4> floats4;
const hn::FixedTag<double, 2> doubles2;
constexpr size_t step = 4, room = 6;

HWY_INLINE void store24(unsigned char* to, hn::VFromD<decltype(ints4)> values) {
    HWY_ALIGN static constexpr uint8_t places[16] = {0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, 3, 3, 3, 3};
    hn::StoreU(hn::TableLookupBytes(hn::BitCast(bytes16, values), hn::Load(bytes16, places)), bytes16, to);
}

template <class D>
HWY_INLINE hn::VFromD<D> scaled(D tag, hn::VFromD<D> value) {
    using Float = hn::TFromD<D>;
    const auto number = hn::IfThenElseZero(hn::Eq(value, value), value);
    const auto wide = hn::Mul(number, hn::Set(tag, static_cast<Float>(1 << 23)));
    return hn::Min(hn::Max(wide, hn::Set(tag, static_cast<Float>(low24))),
                   hn::Set(tag, static_cast<Float>(high24)));
}

// -1 for each value beyond full scale.
template <class D, class Count>
HWY_INLINE hn::VFromD<Count> beyond(D tag, hn::VFromD<D> value, Count counts) {
    const auto inside = hn::Le(hn::Abs(value), hn::Set(tag, hn::TFromD<D>{1}));
    return hn::BitCast(counts, hn::VecFromMask(tag, hn::Not(inside)));
}

// Two values as integers; those beyond full scale are counted in `outside`.
HWY_INLINE hn::VFromD<decltype(ints2)> pair(const unsigned char* from,
                                            hn::VFromD<decltype(longs2)>& outside) {
    const auto value = hn::BitCast(doubles2, hn::LoadU(bytes16, from));
    outside = hn::Add(outside, beyond(doubles2, value, longs2));
    return hn::DemoteTo(ints2, hn::Round(scaled(doubles2, value)));
}
#endif

size_t narrowInt32(unsigned char* HWY_RESTRICT to, const unsigned char* HWY_RESTRICT from, size_t count) {
    size_t i = 0;
#if HWY_TARGET != HWY_SCALAR
    const auto high = hn::Set(ints4, highestRounded), half = hn::Set(ints4, 127), one = hn::Set(ints4, 1);
    for (; i + room <= count; i += step) {
        const auto upper = hn::Min(hn::BitCast(ints4, hn::LoadU(bytes16, from + 4 * i)), high);
        const auto odd = hn::And(hn::ShiftRight<8>(upper), one);
        store24(to + 3 * i, hn::ShiftRight<8>(hn::Add(hn::Add(upper, half), odd)));
    }
#endif
    for (; i < count; ++i) {
        int32_t value;
        std::memcpy(&value, from + 4 * i, 4);
        put24(to + 3 * i, rounded(value));
    }
    return 0;
}

size_t narrowFloat32(unsigned char* HWY_RESTRICT to, const unsigned char* HWY_RESTRICT from, size_t count) {
    size_t i = 0, clipped = 0;
#if HWY_TARGET != HWY_SCALAR
    auto outside = hn::Zero(ints4);
    for (; i + room <= count; i += step) {
        const auto value = hn::BitCast(floats4, hn::LoadU(bytes16, from + 4 * i));
        store24(to + 3 * i, hn::NearestInt(scaled(floats4, value)));
        outside = hn::Add(outside, beyond(floats4, value, ints4));
    }
    int32_t counts[4];
    hn::StoreU(outside, ints4, counts);
    for (const int32_t lane : counts) clipped += static_cast<size_t>(-lane);
#endif
    for (; i < count; ++i) clipped += narrowOne<float>(to + 3 * i, from + 4 * i);
    return clipped;
}

size_t narrowFloat64(unsigned char* HWY_RESTRICT to, const unsigned char* HWY_RESTRICT from, size_t count) {
    size_t i = 0, clipped = 0;
#if HWY_TARGET != HWY_SCALAR
    auto outside = hn::Zero(longs2);
    for (; i + room <= count; i += step) {
        const auto lower = pair(from + 8 * i, outside);
        const auto upper = pair(from + 8 * i + 16, outside);
        store24(to + 3 * i, hn::Combine(ints4, upper, lower));
    }
    int64_t counts[2];
    hn::StoreU(outside, longs2, counts);
    for (const int64_t lane : counts) clipped += static_cast<size_t>(-lane);
#endif
    for (; i < count; ++i) clipped += narrowOne<double>(to + 3 * i, from + 8 * i);
    return clipped;
}

}  // namespace HWY_NAMESPACE
}  // namespace wav
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace wav {

using Byte = unsigned char;
HWY_EXPORT(narrowInt32);
HWY_EXPORT(narrowFloat32);
HWY_EXPORT(narrowFloat64);

std::size_t narrowInt32(Byte* to, const Byte* from, std::size_t count) {
    return HWY_DYNAMIC_DISPATCH(narrowInt32)(to, from, count);
}
std::size_t narrowFloat32(Byte* to, const Byte* from, std::size_t count) {
    return HWY_DYNAMIC_DISPATCH(narrowFloat32)(to, from, count);
}
std::size_t narrowFloat64(Byte* to, const Byte* from, std::size_t count) {
    return HWY_DYNAMIC_DISPATCH(narrowFloat64)(to, from, count);
}

namespace {

using Codes = std::array<std::int16_t, 256>;

// A code has a sign, three bits of exponent and four of mantissa. Of A-law every second bit is inverted, the
// sign bit means positive, and there are 13 bits; of mu-law all are inverted, and there are 14.
constexpr Codes aLaw = [] {
    Codes codes{};
    for (int code = 0; code < 256; ++code) {
        const int plain = code ^ 0x55, exponent = plain >> 4 & 7, mantissa = plain & 15;
        const int size = exponent == 0 ? 2 * mantissa + 1 : (2 * mantissa + 33) << (exponent - 1);
        codes[static_cast<std::size_t>(code)] =
            static_cast<std::int16_t>(plain & 0x80 ? 8 * size : -8 * size);
    }
    return codes;
}();
constexpr Codes muLaw = [] {
    Codes codes{};
    for (int code = 0; code < 256; ++code) {
        const int plain = code ^ 0xFF, exponent = plain >> 4 & 7, mantissa = plain & 15;
        const int size = ((2 * mantissa + 33) << exponent) - 33;
        codes[static_cast<std::size_t>(code)] =
            static_cast<std::int16_t>(plain & 0x80 ? -4 * size : 4 * size);
    }
    return codes;
}();

std::size_t expand(Byte* to, const Byte* from, std::size_t count, const Codes& codes) {
    for (std::size_t i = 0; i < count; ++i) std::memcpy(to + 2 * i, &codes[from[i]], 2);
    return 0;
}

template <class Value>
void swapAll(Byte* values, std::size_t count) {
    for (std::size_t i = 0; i < count; ++i) {
        Value value;
        std::memcpy(&value, values + i * sizeof value, sizeof value);
        if constexpr (sizeof value == 2) value = static_cast<Value>(__builtin_bswap16(value));
        if constexpr (sizeof value == 4) value = __builtin_bswap32(value);
        if constexpr (sizeof value == 8) value = __builtin_bswap64(value);
        std::memcpy(values + i * sizeof value, &value, sizeof value);
    }
}

}  // namespace

std::size_t expandALaw(Byte* to, const Byte* from, std::size_t count) {
    return expand(to, from, count, aLaw);
}
std::size_t expandMuLaw(Byte* to, const Byte* from, std::size_t count) {
    return expand(to, from, count, muLaw);
}

void swapBytes(Byte* values, int width, std::size_t count) {
    switch (width) {
        case 1: return;
        case 2: return swapAll<std::uint16_t>(values, count);
        case 4: return swapAll<std::uint32_t>(values, count);
        case 8: return swapAll<std::uint64_t>(values, count);
        default:
            for (std::size_t i = 0; i < count; ++i)
                std::reverse(values + i * static_cast<std::size_t>(width),
                             values + (i + 1) * static_cast<std::size_t>(width));
    }
}

}  // namespace wav
#endif
