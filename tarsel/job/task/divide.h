// Filters of a whole output, as those of one of its segments.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

// Whether its result depends on one frame or sample and nothing else. A module of a plug-in says so by the
// attribute "divisible".
bool isDivisible(const std::string& filter);
// Throws Failure for a filter of --filter that is not: it would begin anew in each segment.
void requireDivisible(const std::string& filter);

struct SegmentPlace {
    long long before = 0;  // frames of the output in front of the segment
    long long first = 0;   // the number that its first frame comes with
    QvFramerate rate{QvRatio(25, 1)};
    bool ofCuts = false;  // see Join
};

// Makes texts and timecodes continue from segment to segment. In cuts, those of the input stay with it.
void moveTexts(FiltersState& filters, const SegmentPlace& place);
