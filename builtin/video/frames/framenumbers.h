// Frame numbers of one rate as frame numbers of another. Numbers meet as times at the engine's timescale;
// every step truncates.
#pragma once

#include "core/measure/qvgeometry.h"

struct FrameNumbers {
    QvFramerate in;
    QvFramerate out;

    // The input frame that is on screen when output frame k begins.
    long long source(long long k) const {
        return MediaTime(k, out, MediaTime::defaultTimescale).position(in);
    }
    // The output frame in which input frame n begins.
    long long target(long long n) const {
        return MediaTime(n, in, MediaTime::defaultTimescale).position(out);
    }
    // The first output frame whose source is not before input frame n.
    long long start(long long n) const {
        long long k = target(n);
        while (source(k) < n) ++k;
        return k;
    }
};
