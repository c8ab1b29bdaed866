// Filters of a whole output, as those of one of its segments.
#pragma once

#include <qvplugcore/qvplugcore.h>

struct SegmentPlace {
    int index = 0, count = 1;  // the segment, among so many
    long long before = 0;      // frames of the output in front of it
    long long frames = 0;      // its own
    long long first = 0;       // the number that its first frame comes with
    QvFramerate rate{QvRatio(25, 1)};
    bool ofCuts = false;  // see Join
};

// Fades go to the first and the last segment; texts and timecodes are moved; what works on each frame or
// sample by itself stays. Throws Failure for any other filter, which would begin anew in each segment.
void divideFilters(FiltersState& filters, const SegmentPlace& place);
