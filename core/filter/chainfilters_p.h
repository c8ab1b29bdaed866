// How the chain builders come by their filters. Internal to this folder.
#pragma once

#include <memory>
#include <vector>

#include "core/filter/qvfilter.h"

class QvFramerate;

namespace qvchain {

using VideoFilters = std::vector<std::unique_ptr<QvVideoFilter>>;
using AudioFilters = std::vector<std::unique_ptr<QvAudioFilter>>;

// An initialised filter of that module, or null when there is none of that kind.
std::unique_ptr<QvVideoFilter> newVideoFilter(const char* name);
std::unique_ptr<QvAudioFilter> newAudioFilter(const char* name);

// Converters that a chain can't do without: asserts when the module is missing.
std::unique_ptr<QvAudioFilter> requireAudioFilter(const char* name);
// The same; a module of that name from outside the library comes before the built-in one. `what` names it in
// the log.
std::unique_ptr<QvVideoFilter> requireConverter(const char* name, const char* what);

// The filters of stored states, in order. One that can't be made or restored is logged and left out.
VideoFilters restoreVideoFilters(const AnyVector& states);
AudioFilters restoreAudioFilters(const AnyVector& states);

// Stages of a rate conversion: `pre`, if any, runs before `main`; both null without a conversion.
struct RateStages {
    std::unique_ptr<QvVideoFilter> pre;
    std::unique_ptr<QvVideoFilter> main;
    bool afterScaler = false;  // must not run before the scaler, also when it reduces the rate
};

RateStages chooseRateStages(const QvFramerate& in, const QvFramerate& out);

// Frames that leave these filters for each one that enters: a filter that makes several progressive frames of
// one answers with their number to "_rateFactor".
int rateFactor(const VideoFilters& filters);
// The rate times `by` / `over`, with its flags.
QvFramerate scaledRate(const QvFramerate& rate, int by, int over);

}  // namespace qvchain
