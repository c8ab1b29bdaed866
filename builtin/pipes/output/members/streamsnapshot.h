// A stream as it was before its encoder and its place in a multiplexer were taken from it.
#pragma once

#include <string>
#include <vector>

#include "core/job/filtersstate.h"

class OutputStreams;
class QvMuxer;

struct StreamSnapshot {
    int type;
    std::string codec;  // module name; "" for a stream without encoder
    AnyDict settings;   // what the encoder stored
    AnyDict params;     // of the stream in the multiplexer
    FiltersState filters;
    bool enabled;

    // All streams in their order. `muxer` may be null when there are none.
    static std::vector<StreamSnapshot> all(const OutputStreams& streams, const QvMuxer* muxer);
};
