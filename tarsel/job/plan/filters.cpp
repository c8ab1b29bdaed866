#include "tarsel/job/plan/filters.h"

#include <algorithm>

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/words/messages.h"

FilterPlanner::FilterPlanner(JobPlan& plan, const EffectOptions& options) : plan_(plan), options_(options) {
    for (PlannedStream& stream : plan.streams) {
        if (!stream.isVideo()) continue;
        pictures_.emplace_back(options, stream.picture, plan.output.kind == OutputKind::pictures);
        stream.picture = pictures_.back().out();
    }
}

void FilterPlanner::plan() {
    checkEffects();
    for (PlannedStream& stream : plan_.streams)
        if (stream.isVideo()) planPicture(stream);
}

// What was asked for has to have something that it works on.
void FilterPlanner::checkEffects() const {
    const bool sound = plan_.count(qvAudioStream) > 0;
    const std::string option = options_.given();
    if (!option.empty() && !plan_.hasVideo() && !(sound && option == "--fade"))
        throw failure(Msg::effectNoPicture, {option});
    for (const auto& spec : options_.filters) {
        const int type = filterType(spec);
        if (std::any_of(plan_.streams.begin(), plan_.streams.end(),
                        [&](const auto& s) { return s.type == type; }))
            continue;
        throw failure(Msg::filterNoStream,
                      {spec.substr(0, spec.find(':')), type == qvVideoStream ? "picture" : "sound"});
    }
}

void FilterPlanner::planPicture(PlannedStream& stream) {
    if (plan_.output.kind == OutputKind::pictures) makeAnyCodec("scaler", QvModuleType::videoFilter);
    const PictureEffects& effects = pictures_[static_cast<size_t>(stream.number)];
    stream.filters = effects.filters(stream.expected, false);
    const auto pipe = tryPipe(effects.job(stream.filters));
    if (pipe) {
        FilterFiles& all = plan_.filterFiles;
        const FilterFiles files = filterFiles(*pipe);
        all.read.insert(all.read.end(), files.read.begin(), files.read.end());
        all.written.insert(all.written.end(), files.written.begin(), files.written.end());
    }
    stream.chain = describe(pipe.get());
}
