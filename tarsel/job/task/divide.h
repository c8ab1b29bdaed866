// Filters of a whole output, as those of one of its segments.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

// Throws Failure for a filter of --filter that does not work on each frame or sample by itself: it would
// begin anew in each segment. A module of a plug-in says that it does by the attribute "divisible".
void requireDivisible(const std::string& filter);

struct SegmentPlace {
    long long before = 0;  // frames of the output in front of the segment
    long long first = 0;   // the number that its first frame comes with
    QvFramerate rate{QvRatio(25, 1)};
    bool ofCuts = false;  // see Join
};

// Makes texts and timecodes continue from segment to segment. In cuts, those of the input stay with it.
void moveTexts(FiltersState& filters, const SegmentPlace& place);
