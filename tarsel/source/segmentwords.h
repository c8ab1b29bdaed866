// Segments of inputs as they are typed.
#pragma once

#include <string>
#include <vector>

// A part of a time, "FROM-TO": "10-20", "10-" (to the end), "-20" (from the start), "10--5" (to 5 s before
// the end). The times are those of --from and --to.
struct TimeRange {
    std::string from, to;  // empty for the start and the end
};

// Throws Failure (usage) with `option` in the line for a text without a dash, or with nothing else.
TimeRange parseRange(const std::string& text, const std::string& option);

struct SegmentWords {
    std::vector<std::string> inputs;  // read side by side
    TimeRange range;
    std::string typed;  // for messages
};

// "NAME[@FROM-TO]", where NAME is that of an input, or several with "+" between them: "a.yuv+a.wav@10-20".
// The name of a file that exists is taken as a whole, whatever is in it.
SegmentWords parseSegment(const std::string& word);
