// What a link is opened with, read once from the dictionary that a task makes for it.
#pragma once

#include <optional>

#include "core/job/jobdescription.h"
#include "core/job/processparams.h"
#include "core/value/anycontainer.h"

struct LinkOpen {
    LinkOpen() = default;
    // "inOutPoints", "chapters", "effects", "audioEffects", "connMatrix", "audioConversion", "holdLast",
    // "smartRender", "qualityStats"; what is absent or of another type counts as not given. Null gives
    // nothing.
    explicit LinkOpen(const AnyDict* params);
    void takeAudioEffects(const AnyDict& filters);  // a FiltersState

    bool frameNumbers = false;          // "startFrame" or "stopFrame", which are refused
    std::optional<InOutPoints> points;  // at least one pair
    AnyVector chapters;                 // frame numbers of the input
    AnyDict effects;                    // a FiltersState
    AnyVector audioFilters;             // stored filters, in order
    AnyVector connMatrix;               // one entry an output channel; empty: not given
    AudioConversion conversion;
    bool holdLast = false;  // pictures
    AnyVector qualityStats;
    // Sound has several modes and takes an Int32 alone; for a picture anything true is on.
    int smartRender = 0;
    bool passPicture = false;
};
