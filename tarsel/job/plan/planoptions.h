// What the user asks of a transcode, as far as the plan depends on it. Texts are as they were given; empty
// when they were not.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "tarsel/picture/effects.h"
#include "tarsel/presets/encoderoptions.h"
#include "tarsel/presets/outputpreset.h"
#include "tarsel/sound/soundoptions.h"

enum class OutputKind {
    raw,
    wav,
    pictures,  // a sequence of PNG files
    avi,
    module,  // what the multiplexer of a stored task or a preset writes
    nothing,
    byInput,  // a stream whose name does not say it: raw pictures, or WAV where there is no picture
};

// Metadata of the output.
struct TagOptions {
    std::vector<std::string> given;  // "key=value", in place of the inputs' tags
    std::string languages;           // of the sounds, in order: "eng,fra"
    bool none = false;               // no tags of the inputs
};

struct PlanOptions {
    bool joins() const { return join || !cuts.empty(); }

    std::vector<std::string> inputs;
    std::string output, format, muxer, saveTask;
    std::string from, to, duration;
    std::string segment;             // of a join, as it was typed; for messages
    bool join = false;               // the inputs are segments, one after the other
    std::vector<std::string> cuts;   // parts of the inputs, one after the other
    std::optional<OutputKind> kind;  // of a stored task's output, whatever its name says
    EffectOptions effects;
    SoundOptions sound;
    EncoderOptions encoders;
    TagOptions tags;
    EncoderOptions::Settings muxerSettings;
    std::optional<int> samplerate, channels, bits;
    bool noVideo = false, noAudio = false;
    bool shortest = false, longest = false;
    bool splitChannels = false;
    bool acceptPartial = false;
    std::shared_ptr<const OutputPreset> preset;  // what the output is to be; null for none
    bool match = false;  // --match: fit what the preset leaves open, and what it can do, to the inputs
    // Fits an encoder to a stream of an input, whose number counts those of the plan; null for no fitting.
    std::function<void(int type, int input, int stream, QvEncoder& encoder)> fit;
};
