#include "tarsel/job/plan/filters.h"

#include <algorithm>
#include <cmath>

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

// The options that give a picture this format. A picture of another aspect ratio keeps it and gets bars.
EffectOptions optionsFor(const PictureFormat& format, const PictureFormat& from,
                         const EffectOptions& options) {
    constexpr double alike = 0.01;
    EffectOptions other = options;
    const std::string size = std::to_string(format.width) + "x" + std::to_string(format.height);
    const bool sameShape = std::abs(from.aspect - format.aspect) <= alike * format.aspect;
    const bool shaped = !options.size.empty() || !options.fit.empty() || !options.crop.empty() || sameShape;
    if (options.fit.empty()) other.size = shaped ? size : "";
    if (!shaped) other.fit = size + ",bars";
    other.rate = formatRate(format.rate);
    other.pixel = fourccText(format.fourcc);
    return other;
}

}  // namespace

FilterPlanner::FilterPlanner(JobPlan& plan, const EffectOptions& options,
                             const std::vector<PictureFormat>& known)
    : plan_(plan) {
    for (PlannedStream& stream : plan.streams) {
        if (!stream.isVideo()) continue;
        const auto number = static_cast<size_t>(stream.number);
        if (number < known.size())
            knownOptions_.push_back(optionsFor(known[number], stream.picture, options));
        pictures_.emplace_back(number < known.size() ? knownOptions_.back() : options, stream.picture,
                               plan.output.kind == OutputKind::pictures);
        stream.picture = pictures_.back().out();
    }
}

void FilterPlanner::plan() {
    for (PlannedStream& stream : plan_.streams)
        if (stream.isVideo()) planPicture(stream);
}

void checkEffects(const JobPlan& plan, const EffectOptions& options) {
    const bool sound = plan.count(qvAudioStream) > 0;
    const std::string option = options.given();
    if (!option.empty() && !plan.hasVideo() && !(sound && option == "--fade"))
        throw failure(Msg::effectNoPicture, {option});
    for (const auto& spec : options.filters) {
        const int type = filterType(spec);
        if (std::any_of(plan.streams.begin(), plan.streams.end(),
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
