#include "builtin/video/frames/bobrows.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "core/measure/fourcc.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/video/frames/bobrows.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

// Samples are bit fields of lanes that have room for a sample times 256.
#ifndef QV_BOB_FIELDS
#define QV_BOB_FIELDS
namespace qvbob {

template <int bitShift, uint32_t bitMask>
struct BitField {
    static constexpr int shift = bitShift;
    static constexpr uint32_t mask = bitMask;
    static constexpr uint32_t motion = 12 * (bitMask + 1) / 256;
};
constexpr uint32_t roomPerStep = 32;

template <class LaneType, class... Fields>
struct Layout {
    using Lane = LaneType;
};

using ByteLayout = Layout<uint16_t, BitField<0, 255>, BitField<8, 255>>;
using WordLayout = Layout<uint32_t, BitField<0, 65535>, BitField<16, 65535>>;
using TenLayout = Layout<uint32_t, BitField<0, 1023>, BitField<10, 1023>, BitField<20, 1023>>;
using Rgb555Layout = Layout<uint16_t, BitField<0, 31>, BitField<5, 31>, BitField<10, 31>>;
using Rgb565Layout = Layout<uint16_t, BitField<0, 31>, BitField<5, 63>, BitField<11, 31>>;

template <class Field>
uint32_t fieldOf(uint32_t lane) {
    return lane >> Field::shift & Field::mask;
}

struct LaneTriple {
    uint32_t above = 0, at = 0, below = 0;
};

template <class Field>
uint32_t changeOf(uint32_t now, uint32_t before) {
    const uint32_t a = fieldOf<Field>(now), b = fieldOf<Field>(before);
    return std::max(a, b) - std::min(a, b);
}

template <class Field>
uint32_t roomOf(const LaneTriple& now, const LaneTriple& before) {
    const uint32_t change =
        std::max({changeOf<Field>(now.above, before.above), changeOf<Field>(now.at, before.at),
                  changeOf<Field>(now.below, before.below)});
    return std::min(Field::mask, (Field::motion - std::min(change, Field::motion)) * roomPerStep);
}

template <class Field>
uint32_t fillField(const LaneTriple& now, uint32_t room, uint32_t w) {
    const uint32_t a = fieldOf<Field>(now.above), b = fieldOf<Field>(now.below);
    const uint32_t low = std::min(a, b), high = std::max(a, b);
    const uint32_t woven = std::clamp(fieldOf<Field>(now.at), std::max(low, room) - room, high + room);
    return (((a + b + 1) / 2 * (256 - w) + woven * w + 128) >> 8) << Field::shift;
}

template <class Lane>
LaneTriple loadTriple(const Triple& rows, size_t i, size_t size) {
    Lane above = 0, at = 0, below = 0;
    std::memcpy(&above, rows.above + i, size);
    std::memcpy(&at, rows.at + i, size);
    std::memcpy(&below, rows.below + i, size);
    return {above, at, below};
}

// The reference, and the end of a row, where a lane may be cut off.
template <class Lane, class... Fields>
void fillLanes(Layout<Lane, Fields...>, Byte* row, const Triple& now, const Triple& before, uint32_t w,
               size_t from, size_t bytes) {
    for (size_t i = from; i < bytes; i += sizeof(Lane)) {
        const size_t size = std::min(sizeof(Lane), bytes - i);
        const auto lanes = loadTriple<Lane>(now, i, size);
        uint32_t filled = 0;
        if (before.at) {
            const auto old = loadTriple<Lane>(before, i, size);
            filled = (fillField<Fields>(lanes, roomOf<Fields>(lanes, old), w) | ...);
        } else {
            filled = (fillField<Fields>(lanes, 0, w) | ...);
        }
        const auto lane = static_cast<Lane>(filled);
        std::memcpy(row + i, &lane, size);
    }
}

}  // namespace qvbob
#endif

HWY_BEFORE_NAMESPACE();
namespace qvbob {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// Each works on whole vectors and returns how many bytes it has done.
#if HWY_TARGET == HWY_SCALAR

template <class AnyLayout>
size_t fillVectors(AnyLayout, Byte*, const Triple&, const Triple&, uint32_t, size_t) {
    return 0;
}

template <class Sample>
size_t fillWholeVectors(Byte*, const Triple&, const Triple&, bool, size_t) {
    return 0;
}

#else

template <class V>
struct VectorTriple {
    V above, at, below;
};

template <class D, class V = hn::Vec<D>>
HWY_INLINE VectorTriple<V> loadTriple(D d, const Triple& rows, size_t i) {
    const hn::Repartition<uint8_t, D> d8;
    return {hn::BitCast(d, hn::LoadU(d8, rows.above + i)), hn::BitCast(d, hn::LoadU(d8, rows.at + i)),
            hn::BitCast(d, hn::LoadU(d8, rows.below + i))};
}

template <class Field, class D, class V>
HWY_INLINE V fieldOf(D d, V lanes) {
    return hn::And(hn::ShiftRight<Field::shift>(lanes), hn::Set(d, static_cast<hn::TFromD<D>>(Field::mask)));
}

template <class Field, class D, class V>
HWY_INLINE V changeOf(D d, V now, V before) {
    const auto a = fieldOf<Field>(d, now), b = fieldOf<Field>(d, before);
    return hn::Sub(hn::Max(a, b), hn::Min(a, b));
}

template <class Field, class D, class V>
HWY_INLINE V roomOf(D d, const VectorTriple<V>& now, const VectorTriple<V>& before) {
    using T = hn::TFromD<D>;
    const auto motion = hn::Set(d, static_cast<T>(Field::motion));
    const auto change = hn::Max(
        hn::Max(changeOf<Field>(d, now.above, before.above), changeOf<Field>(d, now.below, before.below)),
        changeOf<Field>(d, now.at, before.at));
    const auto room = hn::Mul(hn::Sub(motion, hn::Min(change, motion)), hn::Set(d, T{roomPerStep}));
    return hn::Min(room, hn::Set(d, static_cast<T>(Field::mask)));
}

template <class Field, class D, class V>
HWY_INLINE V fillField(D d, const VectorTriple<V>& now, V room, V w) {
    const auto a = fieldOf<Field>(d, now.above), b = fieldOf<Field>(d, now.below);
    const auto low = hn::Sub(hn::Max(hn::Min(a, b), room), room), high = hn::Add(hn::Max(a, b), room);
    const auto woven = hn::Max(low, hn::Min(high, fieldOf<Field>(d, now.at)));
    const auto mean = hn::ShiftRight<1>(hn::Add(hn::Add(a, b), hn::Set(d, 1)));
    const auto kept = hn::Mul(mean, hn::Sub(hn::Set(d, 256), w));
    const auto sum = hn::Add(hn::Add(kept, hn::Mul(woven, w)), hn::Set(d, 128));
    return hn::ShiftLeft<Field::shift>(hn::ShiftRight<8>(sum));
}

template <class Lane, class... Fields>
size_t fillVectors(Layout<Lane, Fields...>, Byte* row, const Triple& now, const Triple& before, uint32_t w,
                   size_t bytes) {
    const hn::ScalableTag<uint8_t> d8;
    const hn::Repartition<Lane, decltype(d8)> d;
    const auto weight = hn::Set(d, static_cast<Lane>(w));
    const size_t step = hn::Lanes(d8);
    size_t i = 0;
    for (; i + step <= bytes; i += step) {
        const auto lanes = loadTriple(d, now, i);
        auto sum = hn::Zero(d);
        if (before.at) {
            const auto old = loadTriple(d, before, i);
            ((sum = hn::Or(sum, fillField<Fields>(d, lanes, roomOf<Fields>(d, lanes, old), weight))), ...);
        } else {
            ((sum = hn::Or(sum, fillField<Fields>(d, lanes, hn::Zero(d), weight))), ...);
        }
        hn::StoreU(hn::BitCast(d8, sum), d8, row + i);
    }
    return i;
}

// Samples that fill their lanes, one guess alone: saturating arithmetic needs no room above them.
template <class V, class D>
HWY_INLINE V wholeRoom(D d, const VectorTriple<V>& now, const VectorTriple<V>& before) {
    using T = hn::TFromD<D>;
    constexpr unsigned levels = 1u << 8 * sizeof(T);
    const auto change = [](V a, V b) HWY_ATTR { return hn::Sub(hn::Max(a, b), hn::Min(a, b)); };
    const auto most = hn::Max(hn::Max(change(now.above, before.above), change(now.below, before.below)),
                              change(now.at, before.at));
    const auto left = hn::SaturatedSub(hn::Set(d, static_cast<T>(12 * levels / 256)), most);
    const auto isFull = hn::Eq(hn::Max(left, hn::Set(d, static_cast<T>(levels / roomPerStep))), left);
    return hn::IfThenElse(isFull, hn::Set(d, static_cast<T>(levels - 1)), hn::ShiftLeft<5>(left));
}
static_assert(roomPerStep == 1 << 5);

template <class Sample>
size_t fillWholeVectors(Byte* row, const Triple& now, const Triple& before, bool isWoven, size_t bytes) {
    const hn::ScalableTag<uint8_t> d8;
    const hn::Repartition<Sample, decltype(d8)> d;
    const size_t step = hn::Lanes(d8);
    size_t i = 0;
    for (; i + step <= bytes; i += step) {
        const auto lanes = loadTriple(d, now, i);
        auto filled = hn::AverageRound(lanes.above, lanes.below);
        if (isWoven) {
            const auto room = before.at ? wholeRoom(d, lanes, loadTriple(d, before, i)) : hn::Zero(d);
            const auto low = hn::SaturatedSub(hn::Min(lanes.above, lanes.below), room);
            const auto high = hn::SaturatedAdd(hn::Max(lanes.above, lanes.below), room);
            filled = hn::Max(low, hn::Min(high, lanes.at));
        }
        hn::StoreU(hn::BitCast(d8, filled), d8, row + i);
    }
    return i;
}

#endif

template <class Sample, class AnyLayout>
void fillWhole(AnyLayout layout, Byte* row, const Triple& now, const Triple& before, uint32_t w,
               size_t bytes) {
    const bool isMixed = w != 0 && w != 256;
    const size_t done = isMixed ? fillVectors(layout, row, now, before, w, bytes)
                                : fillWholeVectors<Sample>(row, now, before, w != 0, bytes);
    fillLanes(layout, row, now, before, w, done, bytes);
}

template <class AnyLayout>
void fill(AnyLayout layout, Byte* row, const Triple& now, const Triple& before, uint32_t w, size_t bytes) {
    fillLanes(layout, row, now, before, w, fillVectors(layout, row, now, before, w, bytes), bytes);
}

void fillRow(Samples samples, Byte* row, const Triple& now, const Triple& before, uint32_t w, size_t bytes) {
    switch (samples) {
        case Samples::words: return fillWhole<uint16_t>(WordLayout(), row, now, before, w, bytes);
        case Samples::tens: return fill(TenLayout(), row, now, before, w, bytes);
        case Samples::rgb555: return fill(Rgb555Layout(), row, now, before, w, bytes);
        case Samples::rgb565: return fill(Rgb565Layout(), row, now, before, w, bytes);
        default: return fillWhole<uint8_t>(ByteLayout(), row, now, before, w, bytes);
    }
}

}  // namespace HWY_NAMESPACE
}  // namespace qvbob
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace qvbob {

HWY_EXPORT(fillRow);

Samples samplesOf(unsigned fourcc) {
    switch (fourcc) {
        case QvFourcc::v210: return Samples::tens;
        case QvFourcc::R555: return Samples::rgb555;
        case QvFourcc::R565: return Samples::rgb565;
        default: {
            const auto* format = qvPixelFormat(fourcc);
            return format && format->sampleBytes == 2 ? Samples::words : Samples::bytes;
        }
    }
}

void fillRow(Samples samples, Byte* row, const Triple& now, const Triple& before, int w, std::size_t bytes) {
    HWY_DYNAMIC_DISPATCH(fillRow)(samples, row, now, before, static_cast<uint32_t>(w), bytes);
}

}  // namespace qvbob
#endif
