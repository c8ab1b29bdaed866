// What a segment takes of one stream, and how much of the output that makes. Internal to this folder.
//
//     input    0 . . first |<----- count ----->| . . end of the stream
//     output               |<--- owed --->|
#pragma once

#include "core/decode/qvinputstream.h"
#include "core/measure/qvratio.h"

struct SegmentSpan {
    MediaTime in;
    MediaTime out;        // the end of the stream, if that is earlier than the out point
    long long first = 0;  // frame or sample of the input
    long long count = 0;  // of the input
    long long owed = 0;   // of the output, at its rate

    MediaTime duration() const { return out - in; }
};

// Where both points lie on frames (samples) of the input, `owed` follows from their count alone, so no
// rounding of times to ticks can lose one. Nothing for a rate that is not above 0.
SegmentSpan qvSegmentSpan(const QvIStream& stream, const QvRatio& inRate, const QvRatio& outRate);
