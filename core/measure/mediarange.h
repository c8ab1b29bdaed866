// What lies between an in point and an out point, counted in frames or samples, and how much of an output it
// makes. The links of a transcoding count by these, so an application that does as well knows beforehand what
// will be written.
#pragma once

#include "core/arch/api.h"
#include "core/measure/mediatime.h"
#include "core/measure/qvframerate.h"
#include "core/measure/qvratio.h"

// An instant within frame (or sample) number `unit` at a rate: its start, at the default timescale. Not every
// rate divides that; where the start lies between two ticks the later one is taken, as the earlier one is
// still in the unit before. So the instant of a count is the end of a stream that has so many units.
QV_API MediaTime qvInstantOf(long long unit, const QvRatio& rate);

// The frames that are read, and those that are owed to the output.
//
//     input   0 . . . start . . . . . . stop . .      stop is taken, the out point is one frame later
//                     |<---- in frames ---->|
struct QV_API QvFrameRange {
    QvFrameRange() = default;
    // From the in point up to, and without, the out point, in frames of the input.
    QvFrameRange(const MediaTime& inPoint, const MediaTime& outPoint, const QvFramerate& inRate);

    bool empty() const { return stop < start; }
    // Sets `out`. Where the rate is halved and the count is odd, the range becomes one frame longer.
    void convert(const QvFramerate& inRate, const QvFramerate& outRate);

    int start = 0;
    int stop = 0;                // inclusive
    int in = 0;                  // frames to read
    int out = 0;                 // frames that the encoder is to get
    bool pairCompleted = false;  // `in` is one more than the points give
};

// The samples that are read, and those that they make at the output's rate. One sample is one of every
// channel.
//
//     input    0 . . inStart . . . . . . . . . inEnd . . . length
//     output   0 . . outStart |<--- out --->|
struct QV_API QvSampleRange {
    QvSampleRange() = default;
    // Rates in samples a second.
    QvSampleRange(const MediaTime& inPoint, const MediaTime& outPoint, int inRate, int outRate);

    long long inStart = 0;
    long long inEnd = 0;     // exclusive
    long long outStart = 0;  // sample of the output's rate at the in point
    long long out = 0;       // samples of the output
};
