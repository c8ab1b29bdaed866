#include "builtin/video/bobrows.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "core/media/fourcc.h"

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/video/bobrows.cpp"
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
};

template <class LaneType, class... Fields>
struct Layout {
    using Lane = LaneType;
};

using ByteLayout = Layout<uint16_t, BitField<0, 255>, BitField<8, 255>>;
using WordLayout = Layout<uint32_t, BitField<0, 65535>, BitField<16, 65535>>;
using TenLayout = Layout<uint32_t, BitField<0, 1023>, BitField<10, 1023>, BitField<20, 1023>>;
using Rgb555Layout = Layout<uint16_t, BitField<0, 31>, BitField<5, 31>, BitField<10, 31>>;
using Rgb565Layout = Layout<uint16_t, BitField<0, 31>, BitField<5, 63>, BitField<11, 31>>;

struct Rows {
    Byte* row;
    const Byte *above, *below, *other;
};

template <class Field>
uint32_t fillField(uint32_t above, uint32_t below, uint32_t other, uint32_t w) {
    const uint32_t a = above >> Field::shift & Field::mask, b = below >> Field::shift & Field::mask;
    const uint32_t median = std::clamp(other >> Field::shift & Field::mask, std::min(a, b), std::max(a, b));
    return (((a + b + 1) / 2 * (256 - w) + median * w + 128) >> 8) << Field::shift;
}

// The reference, and the end of a row, where a lane may be cut off.
template <class Lane, class... Fields>
void fillLanes(Layout<Lane, Fields...>, const Rows& rows, uint32_t w, size_t from, size_t bytes) {
    for (size_t i = from; i < bytes; i += sizeof(Lane)) {
        const size_t size = std::min(sizeof(Lane), bytes - i);
        Lane above = 0, below = 0, other = 0;
        std::memcpy(&above, rows.above + i, size);
        std::memcpy(&below, rows.below + i, size);
        std::memcpy(&other, rows.other + i, size);
        const auto row = static_cast<Lane>((fillField<Fields>(above, below, other, w) | ...));
        std::memcpy(rows.row + i, &row, size);
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
size_t fillVectors(AnyLayout, const Rows&, uint32_t, size_t) {
    return 0;
}

#else

template <class Field, class D, class V = hn::Vec<D>>
HWY_INLINE V fillFieldVector(D d, V above, V below, V other, V w) {
    const auto mask = hn::Set(d, static_cast<hn::TFromD<D>>(Field::mask));
    const auto a = hn::And(hn::ShiftRight<Field::shift>(above), mask);
    const auto b = hn::And(hn::ShiftRight<Field::shift>(below), mask);
    const auto o = hn::And(hn::ShiftRight<Field::shift>(other), mask);
    const auto median = hn::Max(hn::Min(a, b), hn::Min(hn::Max(a, b), o));
    const auto mean = hn::ShiftRight<1>(hn::Add(hn::Add(a, b), hn::Set(d, 1)));
    const auto kept = hn::Mul(mean, hn::Sub(hn::Set(d, 256), w));
    const auto sum = hn::Add(hn::Add(kept, hn::Mul(median, w)), hn::Set(d, 128));
    return hn::ShiftLeft<Field::shift>(hn::ShiftRight<8>(sum));
}

template <class Lane, class... Fields>
size_t fillVectors(Layout<Lane, Fields...>, const Rows& rows, uint32_t w, size_t bytes) {
    const hn::ScalableTag<uint8_t> d8;
    const hn::Repartition<Lane, decltype(d8)> d;
    const auto weight = hn::Set(d, static_cast<Lane>(w));
    const size_t step = hn::Lanes(d8);
    size_t i = 0;
    for (; i + step <= bytes; i += step) {
        const auto above = hn::BitCast(d, hn::LoadU(d8, rows.above + i));
        const auto below = hn::BitCast(d, hn::LoadU(d8, rows.below + i));
        const auto other = hn::BitCast(d, hn::LoadU(d8, rows.other + i));
        auto sum = hn::Zero(d);
        ((sum = hn::Or(sum, fillFieldVector<Fields>(d, above, below, other, weight))), ...);
        hn::StoreU(hn::BitCast(d8, sum), d8, rows.row + i);
    }
    return i;
}

#endif

template <class AnyLayout>
void fill(AnyLayout layout, const Rows& rows, uint32_t w, size_t bytes) {
    fillLanes(layout, rows, w, fillVectors(layout, rows, w, bytes), bytes);
}

void fillRow(Samples samples, const Rows& rows, uint32_t w, size_t bytes) {
    switch (samples) {
        case Samples::words: return fill(WordLayout(), rows, w, bytes);
        case Samples::tens: return fill(TenLayout(), rows, w, bytes);
        case Samples::rgb555: return fill(Rgb555Layout(), rows, w, bytes);
        case Samples::rgb565: return fill(Rgb565Layout(), rows, w, bytes);
        default: return fill(ByteLayout(), rows, w, bytes);
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

void fillRow(Samples samples, Byte* row, const Byte* above, const Byte* below, const Byte* other, int w,
             std::size_t bytes) {
    HWY_DYNAMIC_DISPATCH(fillRow)
    (samples, Rows{row, above, below, other}, static_cast<uint32_t>(w), bytes);
}

}  // namespace qvbob
#endif
