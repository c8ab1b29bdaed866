// The frames that a video link takes from its input and owes to its output.
//
//     input   0 . . . start . . . . . . stop . .      stop is taken, the out point is one frame later
//                     |<---- in frames ---->|
#pragma once

#include "core/measure/qvgeometry.h"

struct FrameRange {
    FrameRange() = default;
    // From the in point up to, and without, the out point, in frames of the input.
    FrameRange(const MediaTime& inPoint, const MediaTime& outPoint, const QvFramerate& inRate);

    bool empty() const { return stop < start; }
    // Sets `out`. Where the rate is halved and the count is odd, the range becomes one frame longer.
    void convert(const QvFramerate& inRate, const QvFramerate& outRate);

    int start = 0;
    int stop = 0;                // inclusive
    int in = 0;                  // frames to read
    int out = 0;                 // frames that the encoder is to get
    bool pairCompleted = false;  // `in` is one more than the points give
};
