// The 32-bit values of a sound between the stages of a chain.
#pragma once

#include <algorithm>
#include <climits>

#include "core/media/qvpcm.h"

// The values from a filled sample on, interleaved.
inline const int* soundValues(const QvPcm& pcm, int sample = 0) {
    return reinterpret_cast<const int*>(pcm.ptr(sample));
}

// Without its fraction, at the nearest end of the range if it lies outside. Not for NaN.
inline int saturated(double value) { return static_cast<int>(std::clamp<double>(value, INT_MIN, INT_MAX)); }

inline int saturated(long long value) {
    return static_cast<int>(std::clamp<long long>(value, INT_MIN, INT_MAX));
}
