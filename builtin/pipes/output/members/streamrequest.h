// What a stream is asked to be: the argument of QvEncodePipe::addStream, read once.
#pragma once

#include <optional>
#include <string>

#include "core/value/anycontainer.h"

struct StreamDefaults;

struct StreamRequest {
    std::string codec;              // module name; "" for the preset's choice
    AnyDict settings;               // of the encoder, for its restore(); empty for none
    std::optional<AnyDict> params;  // of the stream in the multiplexer

    // A text is the codec. A dictionary holds "codec" (a text, or settings with "name") and "stream"
    // (params). Any other key, and a codec without name, is an assertion. Anything else than these two asks
    // for nothing.
    static StreamRequest read(const Any& argument);
    // For a stream without encoder: only "stream" counts.
    static StreamRequest readParams(const Any& argument);

    // Fills what is not given.
    void complete(const StreamDefaults& defaults);
};
