// The parameters of a transcoder.
#pragma once

#include <optional>

#include "core/value/any.h"
#include "core/value/anycontainer.h"

struct TranscoderSettings {
    AnyVector chapters;    // frame numbers of the input
    AnyVector connMatrix;  // of the sound: see AudioJobDescription
    AnyDict progress;      // how often cbProgress comes
    AnyDict effects;       // a FiltersState
    AnyDict audioEffects;  // a FiltersState
    Any metaName{"metadata"};
    int getOut = 0;
    int timecodeOffset = 0;  // stored only
    int startDelay = 250;    // milliseconds
    bool closeEncoder = true;
    bool twoPass = false;
    bool writeLogfile = false;
    bool smartRender = false;

    // A status; empty for any other name.
    std::optional<int> setParam(const char* name, const Any& value);
    void getParam(const char* name, Any& value) const;
};
