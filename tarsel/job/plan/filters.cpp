#include "tarsel/job/plan/filters.h"

#include <algorithm>

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/words/messages.h"

namespace {

// Filters of so many channels leave others silent, which no one means.
void requireChannels(const AnyDict& filter, int channels) {
    const std::string name = filter.getString("name", "");
    const int most =
        makeAnyCodec(name, QvModuleType::audioFilter)->getParam("_maxChannels").asInt32(channels);
    if (channels > most)
        throw failure(Msg::filterChannels, {name, std::to_string(channels), std::to_string(most)});
}

}  // namespace

MediaTime skippedSound(const FiltersState& filters, const SoundFormat& in, const SoundFormat& out) {
    AudioJobDescription job;
    job.inSamplerate = in.samplerate;
    job.inChannels = in.channels;
    job.inBitsPerSample = in.bits;
    job.outSamplerate = out.samplerate;
    job.outChannels = out.channels;
    job.outBitsPerSample = out.bits;
    job.filters = filters.getVector("customFilters");
    MediaTime skipped;
    try {
        const std::unique_ptr<QvAProcessPipe> pipe(QvProcessUtil::createAudioPipe(job, skipped));
    } catch (const QvMemoryFailure&) {
        throw;
    } catch (const QvAssertFailure& failure) {
        throw ::failure(Msg::chainRefused, {failure.what()});
    }
    return skipped;
}

FilterPlanner::FilterPlanner(JobPlan& plan, const EffectOptions& options) : plan_(plan), options_(options) {
    for (PlannedStream& stream : plan.streams) {
        if (!stream.isVideo()) continue;
        pictures_.emplace_back(options, stream.picture, plan.output.kind == OutputKind::pictures);
        stream.picture = pictures_.back().out();
    }
}

void FilterPlanner::plan() {
    checkEffects();
    for (PlannedStream& stream : plan_.streams) stream.isVideo() ? planPicture(stream) : planSound(stream);
}

// What was asked for has to have something that it works on.
void FilterPlanner::checkEffects() const {
    if (const std::string option = options_.given(); !option.empty() && !plan_.hasVideo())
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

void FilterPlanner::planSound(PlannedStream& stream) const {
    const SoundFormat &in = plan_.source(stream).sound, &out = stream.sound;
    for (const auto& spec : options_.filters) {
        if (filterType(spec) != qvAudioStream) continue;
        const AnyDict filter = filterState(spec);
        requireChannels(filter, filter.get("_front").isTrue() ? in.channels : out.channels);
        stream.filters.appendFilter(spec.c_str(), filter);
        stream.chain.push_back(spec);
    }
    const auto require = [](const char* module) { makeAnyCodec(module, QvModuleType::audioFilter); };
    if (in.samplerate != out.samplerate) require("srconvert");
    if (in.channels != out.channels) require("chconvert");
    // Filters work on 32 bits.
    if (in.bits != out.bits || !stream.filters.empty()) require("aquant");
    if (!stream.filters.empty()) stream.skipped = skippedSound(stream.filters, in, out);
}
