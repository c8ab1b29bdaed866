// Which preset an output is made by: the one that was named, or one that joins the codecs asked for with the
// multiplexer of the output's extension.
#pragma once

#include <memory>
#include <string>

#include "tarsel/presets/codecwords.h"
#include "tarsel/presets/outputpreset.h"

// What the user says of an output.
struct OutputWish {
    bool namesCodecs() const { return !video.modules.empty() || !audio.modules.empty(); }

    std::string preset;     // a name or a symbol; empty for any
    std::string output;     // as it was given, for messages
    std::string extension;  // of the output or --format; empty where nothing is written
    bool own = false;       // the tool writes such files without a preset
    std::string muxer;      // of --muxer; empty for that of the extension
    CodecWords video, audio;
};

// Null where nothing asks for a preset. Throws Failure for codecs that the preset or the multiplexer do not
// take, with those that they do, and for modules that are missing.
std::shared_ptr<const OutputPreset> outputPreset(const OutputWish& wish);
