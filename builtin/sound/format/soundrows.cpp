#include "builtin/sound/format/soundrows.h"

#include <algorithm>
#include <bit>
#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/sound/format/soundrows.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

HWY_BEFORE_NAMESPACE();
namespace snd {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

static_assert(std::endian::native == std::endian::little, "samples are stored as they are in memory");

constexpr int32_t low24 = -(1 << 23), high24 = (1 << 23) - 1;

// As std::clamp, by value: a choice between references keeps loops from becoming vectors.
HWY_INLINE int32_t bound(int32_t value, int32_t low, int32_t high) {
    return value < low ? low : value > high ? high : value;
}

// Plain loops that compilers turn into vectors of each unit.

void widen8(int32_t* HWY_RESTRICT to, const unsigned char* HWY_RESTRICT from, size_t count) {
    for (size_t i = 0; i < count; ++i) to[i] = (from[i] - 128) * 65536;
}

void widen16(int32_t* HWY_RESTRICT to, const unsigned char* HWY_RESTRICT from, size_t count) {
    for (size_t i = 0; i < count; ++i) {
        int16_t value;
        std::memcpy(&value, from + 2 * i, 2);
        to[i] = value * 256;
    }
}

bool narrow8(unsigned char* HWY_RESTRICT to, const int32_t* HWY_RESTRICT from, size_t count) {
    int32_t clipped = 0;
    for (size_t i = 0; i < count; ++i) {
        const int32_t value = from[i] >> 16, bounded = bound(value, -128, 127);
        clipped |= value ^ bounded;
        to[i] = static_cast<unsigned char>(bounded + 128);
    }
    return clipped != 0;
}

bool narrow16(unsigned char* HWY_RESTRICT to, const int32_t* HWY_RESTRICT from, size_t count) {
    int32_t clipped = 0;
    for (size_t i = 0; i < count; ++i) {
        const int32_t value = from[i] >> 8, bounded = bound(value, -32768, 32767);
        clipped |= value ^ bounded;
        const auto narrow = static_cast<int16_t>(bounded);
        std::memcpy(to + 2 * i, &narrow, 2);
    }
    return clipped != 0;
}

// The difference of two random numbers of 0 to 2^bits - 1, scrambled out of the place.
HWY_INLINE int32_t noiseAt(uint32_t place, int bits) {
    uint32_t x = place * 0x9E3779B9u;  // 2^32 by the golden ratio
    x ^= x >> 15;
    x *= 0xB504F333u;  // 2^31.5
    x ^= x >> 14;
    x *= 0x93CD3A2Du;  // 2^32 by the root of 3
    x ^= x >> 16;
    return static_cast<int32_t>((x & 0xFFFF) >> (16 - bits)) - static_cast<int32_t>(x >> (32 - bits));
}

template <int bits>
HWY_INLINE bool dithered(unsigned char* HWY_RESTRICT to, const int32_t* HWY_RESTRICT from, size_t count,
                         uint32_t place) {
    constexpr int32_t low = low24 >> bits, high = high24 >> bits, half = 1 << (bits - 1);
    int32_t clipped = 0;
    for (size_t i = 0; i < count; ++i) {
        const int32_t was = from[i], bounded = bound(was, low24, high24);
        clipped |= was ^ bounded;
        const int32_t moved = (bounded + half + noiseAt(place + static_cast<uint32_t>(i), bits)) >> bits;
        const int32_t value = bound(moved, low, high);
        if constexpr (bits == 16) {
            to[i] = static_cast<unsigned char>(value + 128);
        } else {
            const auto narrow = static_cast<int16_t>(value);
            std::memcpy(to + 2 * i, &narrow, 2);
        }
    }
    return clipped != 0;
}

bool dither8(unsigned char* to, const int32_t* from, size_t count, uint32_t place) {
    return dithered<16>(to, from, count, place);
}

bool dither16(unsigned char* to, const int32_t* from, size_t count, uint32_t place) {
    return dithered<8>(to, from, count, place);
}

template <class Multiply>
HWY_INLINE void multiply(int32_t* HWY_RESTRICT to, const int32_t* HWY_RESTRICT from, size_t count,
                         const int32_t* HWY_RESTRICT gains, size_t period, Multiply product) {
    while (count > 0) {
        const size_t part = std::min(count, period);
        for (size_t i = 0; i < part; ++i) to[i] = product(from[i], gains[i]);
        to += part;
        from += part;
        count -= part;
    }
}

void gain5(int32_t* to, const int32_t* from, size_t count, const int32_t* gains, size_t period) {
    multiply(to, from, count, gains, period, [](int32_t value, int32_t gain) {
        return static_cast<int32_t>(static_cast<uint32_t>(value) * static_cast<uint32_t>(gain)) >> 5;
    });
}

void gain16(int32_t* to, const int32_t* from, size_t count, const int32_t* gains, size_t period) {
    multiply(to, from, count, gains, period, [](int32_t value, int32_t gain) {
        const int64_t product = (int64_t{value} * gain + 0x8000) >> 16;
        return static_cast<int32_t>(std::clamp<int64_t>(product, INT32_MIN, INT32_MAX));
    });
}

// Three bytes a value: four values are shuffled at a time. A store writes four bytes more than it has to,
// which the next one replaces; the last values are done one by one.

#if HWY_TARGET != HWY_SCALAR
const hn::FixedTag<uint8_t, 16> bytes16;
const hn::FixedTag<int32_t, 4> ints4;
#endif

void widen24(int32_t* HWY_RESTRICT to, const unsigned char* HWY_RESTRICT from, size_t count) {
    size_t i = 0;
#if HWY_TARGET != HWY_SCALAR
    HWY_ALIGN constexpr uint8_t places[16] = {0, 0, 1, 2, 3, 3, 4, 5, 6, 6, 7, 8, 9, 9, 10, 11};
    const auto order = hn::Load(bytes16, places);
    for (; i + 6 <= count; i += 4) {
        const auto packed = hn::LoadU(bytes16, from + 3 * i);
        const auto upper = hn::BitCast(ints4, hn::TableLookupBytes(packed, order));
        hn::StoreU(hn::ShiftRight<8>(upper), ints4, to + i);
    }
#endif
    for (; i < count; ++i) {
        const unsigned char* b = from + 3 * i;
        to[i] = static_cast<int32_t>(uint32_t{b[0]} << 8 | uint32_t{b[1]} << 16 | uint32_t{b[2]} << 24) >> 8;
    }
}

bool narrow24(unsigned char* HWY_RESTRICT to, const int32_t* HWY_RESTRICT from, size_t count) {
    size_t i = 0;
    int32_t clipped = 0;
#if HWY_TARGET != HWY_SCALAR
    HWY_ALIGN constexpr uint8_t places[16] = {0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, 3, 3, 3, 3};
    const auto order = hn::Load(bytes16, places);
    const auto low = hn::Set(ints4, low24), high = hn::Set(ints4, high24);
    auto differences = hn::Zero(ints4);
    for (; i + 6 <= count; i += 4) {
        const auto value = hn::LoadU(ints4, from + i);
        const auto bounded = hn::Min(hn::Max(value, low), high);
        differences = hn::Or(differences, hn::Xor(value, bounded));
        hn::StoreU(hn::TableLookupBytes(hn::BitCast(bytes16, bounded), order), bytes16, to + 3 * i);
    }
    clipped = hn::AllFalse(ints4, hn::Ne(differences, hn::Zero(ints4))) ? 0 : 1;
#endif
    for (; i < count; ++i) {
        const int32_t bounded = bound(from[i], low24, high24);
        clipped |= from[i] ^ bounded;
        std::memcpy(to + 3 * i, &bounded, 3);
    }
    return clipped != 0;
}

const char* soundRowsUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace snd
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace snd {

// NOLINTBEGIN(bugprone-macro-parentheses)
#define QV_SOUND_ROW(result, name, parameters, arguments) \
    HWY_EXPORT(name);                                     \
    result name parameters { return HWY_DYNAMIC_DISPATCH(name) arguments; }
// NOLINTEND(bugprone-macro-parentheses)

using Byte = unsigned char;
QV_SOUND_ROW(void, widen8, (int32_t * to, const Byte* from, size_t count), (to, from, count))
QV_SOUND_ROW(void, widen16, (int32_t * to, const Byte* from, size_t count), (to, from, count))
QV_SOUND_ROW(void, widen24, (int32_t * to, const Byte* from, size_t count), (to, from, count))
QV_SOUND_ROW(bool, narrow8, (Byte * to, const int32_t* from, size_t count), (to, from, count))
QV_SOUND_ROW(bool, narrow16, (Byte * to, const int32_t* from, size_t count), (to, from, count))
QV_SOUND_ROW(bool, narrow24, (Byte * to, const int32_t* from, size_t count), (to, from, count))
QV_SOUND_ROW(bool, dither8, (Byte * to, const int32_t* from, size_t count, uint32_t place),
             (to, from, count, place))
QV_SOUND_ROW(bool, dither16, (Byte * to, const int32_t* from, size_t count, uint32_t place),
             (to, from, count, place))
QV_SOUND_ROW(void, gain5,
             (int32_t * to, const int32_t* from, size_t count, const int32_t* gains, size_t period),
             (to, from, count, gains, period))
QV_SOUND_ROW(void, gain16,
             (int32_t * to, const int32_t* from, size_t count, const int32_t* gains, size_t period),
             (to, from, count, gains, period))
QV_SOUND_ROW(const char*, soundRowsUnit, (), ())

}  // namespace snd
#endif
