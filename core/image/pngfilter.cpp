#include "core/image/pngfilter_p.h"

#include <cstdint>
#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "core/image/pngfilter.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#ifndef QV_PNG_FILTERS
#define QV_PNG_FILTERS
namespace {
constexpr size_t filters = 5;
constexpr size_t roomStep = 64;  // bytes; candidates begin at its multiples
}  // namespace
#endif

HWY_BEFORE_NAMESPACE();
namespace {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

constexpr size_t pixelBytes = 3;

const hn::ScalableTag<uint8_t> d8;
const hn::Repartition<uint64_t, decltype(d8)> d64;
using V8 = hn::Vec<decltype(hn::ScalableTag<uint8_t>())>;
using V64 = hn::Vec<decltype(hn::Repartition<uint64_t, hn::ScalableTag<uint8_t>>())>;

// How far a difference is from 0, whichever way: what the choice of a filter adds up.
HWY_INLINE uint32_t weigh(uint8_t difference) { return difference < 128 ? difference : 256U - difference; }

HWY_INLINE uint8_t predict(int left, int above, int corner) {
    const int byLeft = above > corner ? above - corner : corner - above;
    const int byAbove = left > corner ? left - corner : corner - left;
    const int sum = left + above - 2 * corner;
    const int byCorner = sum < 0 ? -sum : sum;
    return static_cast<uint8_t>(byLeft <= byAbove && byLeft <= byCorner ? left
                                : byAbove <= byCorner                   ? above
                                                                        : corner);
}

HWY_INLINE V8 distance(V8 a, V8 b) { return hn::Or(hn::SaturatedSub(a, b), hn::SaturatedSub(b, a)); }

// a <= b: there is no such instruction for bytes.
HWY_INLINE hn::Mask<decltype(hn::ScalableTag<uint8_t>())> atMost(V8 a, V8 b) {
    return hn::Eq(hn::Min(a, b), a);
}

// The Paeth predictor. With p = above - corner and q = left - corner the distance of left + above - corner
// from the corner is |p + q|: the sum of the two distances if both have one sign, else their difference.
HWY_INLINE V8 predictAll(V8 left, V8 above, V8 corner) {
    const V8 byLeft = distance(above, corner), byAbove = distance(left, corner);
    // A sum above 255 is cut: neither of the two is larger than that.
    const V8 bySum = hn::SaturatedAdd(byLeft, byAbove);
    const V8 byCorner = hn::IfThenElse(hn::Xor(atMost(corner, left), atMost(corner, above)),
                                       distance(byLeft, byAbove), bySum);
    return hn::IfThenElse(atMost(byLeft, hn::Min(byAbove, byCorner)), left,
                          hn::IfThenElse(atMost(byAbove, byCorner), above, corner));
}

// Each: the filtered row to `to`; the result is its weight. `above` is the unfiltered row above.
template <class One, class All>
HWY_INLINE uint64_t filterRow(uint8_t* to, const uint8_t* row, const uint8_t* above, size_t n, const One& one,
                              const All& all) {
    uint64_t weight = 0;
    size_t i = 0;
    for (; i < pixelBytes && i < n; ++i) {
        to[i] = static_cast<uint8_t>(row[i] - one(0, above[i], 0));
        weight += weigh(to[i]);
    }
    const size_t lanes = hn::Lanes(d8);
    V64 sums = hn::Zero(d64);
    for (; i + lanes <= n; i += lanes) {
        const V8 difference =
            hn::Sub(hn::LoadU(d8, row + i), all(hn::LoadU(d8, row + i - pixelBytes), hn::LoadU(d8, above + i),
                                                hn::LoadU(d8, above + i - pixelBytes)));
        hn::StoreU(difference, d8, to + i);
        sums = hn::Add(sums, hn::SumsOf8(hn::Min(difference, hn::Sub(hn::Zero(d8), difference))));
    }
    weight += hn::GetLane(hn::SumOfLanes(d64, sums));
    for (; i < n; ++i) {
        to[i] = static_cast<uint8_t>(row[i] - one(row[i - pixelBytes], above[i], above[i - pixelBytes]));
        weight += weigh(to[i]);
    }
    return weight;
}

// The filters by their numbers: none, to the left, above, the mean of both, the Paeth predictor.
void filterInto(uint8_t* to, const uint8_t* row, const uint8_t* above, size_t n, uint8_t* room) {
    const size_t length = (n + roomStep - 1) / roomStep * roomStep;
    const auto at = [&](size_t i) { return room + i * length; };
    uint64_t least = ~uint64_t{0};
    size_t best = 0;
    const auto compare = [&](size_t number, uint64_t weight) {
        if (weight >= least) return;
        least = weight;
        best = number;
    };
    compare(0, filterRow(
                   at(0), row, above, n, [](int, int, int) { return 0; },
                   [](V8, V8, V8) HWY_ATTR { return hn::Zero(d8); }));
    compare(1, filterRow(
                   at(1), row, above, n, [](int left, int, int) { return left; },
                   [](V8 left, V8, V8) HWY_ATTR { return left; }));
    compare(2, filterRow(
                   at(2), row, above, n, [](int, int up, int) { return up; },
                   [](V8, V8 up, V8) HWY_ATTR { return up; }));
    // The mean of a vector rounds up: where the sum is odd it is one too large.
    compare(3, filterRow(
                   at(3), row, above, n, [](int left, int up, int) { return (left + up) >> 1; },
                   [](V8 left, V8 up, V8) HWY_ATTR {
                       return hn::Sub(hn::AverageRound(left, up), hn::And(hn::Xor(left, up), hn::Set(d8, 1)));
                   }));
    compare(4,
            filterRow(
                at(4), row, above, n, [](int left, int up, int corner) { return predict(left, up, corner); },
                [](V8 left, V8 up, V8 corner) HWY_ATTR { return predictAll(left, up, corner); }));
    to[0] = static_cast<uint8_t>(best);
    std::memcpy(to + 1, at(best), n);
}

void swapRedBlue(uint8_t* to, const uint8_t* from, size_t pixels) {
    size_t i = 0;
    for (; i + hn::Lanes(d8) <= pixels; i += hn::Lanes(d8)) {
        V8 blue, green, red;
        hn::LoadInterleaved3(d8, from + 3 * i, blue, green, red);
        hn::StoreInterleaved3(red, green, blue, d8, to + 3 * i);
    }
    for (; i < pixels; ++i) {
        to[3 * i] = from[3 * i + 2];
        to[3 * i + 1] = from[3 * i + 1];
        to[3 * i + 2] = from[3 * i];
    }
}

}  // namespace HWY_NAMESPACE
}  // namespace
HWY_AFTER_NAMESPACE();

#if HWY_ONCE

namespace {
HWY_EXPORT(filterInto);
HWY_EXPORT(swapRedBlue);
}  // namespace

size_t qvFilterRoom(size_t rowBytes) {
    return (filters + 1) * ((rowBytes + roomStep - 1) / roomStep * roomStep);
}

void qvFilterRow(const PngRows& rows, size_t y, unsigned char* to, unsigned char* room) {
    const unsigned char* above = nullptr;
    if (y > 0) {
        above = rows.row(y - 1) + 1;
    } else {
        unsigned char* const zeros = room + qvFilterRoom(rows.rowBytes) / (filters + 1) * filters;
        std::memset(zeros, 0, rows.rowBytes);
        above = zeros;
    }
    HWY_DYNAMIC_DISPATCH(filterInto)(to, rows.row(y) + 1, above, rows.rowBytes, room);
}

void qvSwapRedBlue(unsigned char* to, const unsigned char* from, size_t pixels) {
    HWY_DYNAMIC_DISPATCH(swapRedBlue)(to, from, pixels);
}

#endif
