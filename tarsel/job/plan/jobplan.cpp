#include "tarsel/job/plan/jobplan.h"

#include <algorithm>
#include <new>

#include "tarsel/job/plan/filmtags.h"
#include "tarsel/job/plan/filters.h"
#include "tarsel/job/plan/lengths.h"
#include "tarsel/job/plan/points.h"
#include "tarsel/job/plan/presetplan.h"
#include "tarsel/job/plan/soundplan.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

// By --no-video and --no-audio.
bool unwanted(const PlanOptions& options, int type) {
    return type == qvVideoStream ? options.noVideo : options.noAudio;
}

SoundFormat soundFormat(const PlanOptions& options, const SoundFormat& in) {
    return {options.samplerate.value_or(in.samplerate), options.channels.value_or(in.channels),
            options.bits.value_or(in.bits)};
}

bool holdsSoundAlone(const OutputForm& output) { return output.kind == OutputKind::wav || output.soundOnly; }

// Whether the preset has no stream of that type: the input's are left out then, with a warning.
bool lacks(JobPlan& plan, const JobInput& input, int type) {
    if (!plan.preset || plan.preset->has(type)) return false;
    if (!input.streams(type).empty())
        plan.warnings.push_back(
            lineOf(Msg::presetLeavesOut, {plan.preset->name(), type == qvVideoStream ? "picture" : "sound"}));
    return true;
}

void takeStreams(JobPlan& plan, const PlanOptions& options, const KnownFormats* known) {
    for (size_t input = 0; input < plan.inputs.size(); ++input) {
        if (plan.inputs[input].joined) continue;
        for (const int type : {qvVideoStream, qvAudioStream}) {
            if (unwanted(options, type) || (type == qvVideoStream && holdsSoundAlone(plan.output))) continue;
            if (lacks(plan, plan.inputs[input], type)) continue;
            // --map chooses one of the sounds.
            const bool chosen = !options.sound.map.empty() && type == qvAudioStream && !plan.hasVideo();
            if (plan.output.takesOneStream() && !plan.streams.empty() && !chosen) continue;
            const auto& streams = plan.inputs[input].streams(type);
            for (size_t i = 0; i < streams.size(); ++i) {
                PlannedStream stream;
                stream.type = type;
                stream.number = plan.count(type);
                stream.part.input = static_cast<int>(input);
                stream.part.stream = static_cast<int>(i);
                stream.picture = streams[i].picture;
                stream.language = streams[i].language;
                stream.title = streams[i].title;
                const auto number = static_cast<size_t>(stream.number);
                stream.sound = known && number < known->sounds.size()
                                   ? known->sounds[number]
                                   : soundFormat(options, streams[i].sound);
                plan.streams.push_back(std::move(stream));
            }
        }
    }
}

void checkKinds(JobPlan& plan, const PlanOptions& options) {
    OutputForm& output = plan.output;
    if (plan.streams.empty() && (options.noVideo || options.noAudio))
        throw failure(Msg::inputUnwanted, {options.noAudio ? "--no-audio" : "--no-video", output.name});
    if (plan.preset && !plan.preset->has(qvVideoStream) && !plan.preset->has(qvAudioStream))
        throw failure(Msg::presetEmpty, {plan.preset->name(), output.name});
    if (plan.streams.empty())
        throw failure(holdsSoundAlone(output) ? Msg::inputNoSound : Msg::inputNoStreams, {output.name});
    for (const int type : {qvVideoStream, qvAudioStream})
        if (const std::string option = options.encoders.given(type); !option.empty() && plan.count(type) == 0)
            throw failure(Msg::encoderNoStream, {option, type == qvVideoStream ? "picture" : "sound"});
    if (output.kind == OutputKind::byInput) output.kind = plan.hasVideo() ? OutputKind::raw : OutputKind::wav;
    const bool sound = output.kind == OutputKind::wav || output.kind == OutputKind::nothing ||
                       output.kind == OutputKind::module;
    if (sound || plan.hasVideo()) return;
    if (options.noVideo) throw failure(Msg::inputUnwanted, {"--no-video", output.name});
    throw failure(Msg::inputNoPicture, {output.name});
}

// A number that --channels gives is checked where the encoder is set up.
void checkChannels(const JobPlan& plan, const PlanOptions& options) {
    constexpr int most = 32;  // of an output
    for (const PlannedStream& s : plan.streams)
        if (!s.isVideo() && !options.channels && s.sound.channels > most)
            throw failure(Msg::outputChannels,
                          {plan.output.name, std::to_string(most), std::to_string(s.sound.channels)});
}

// Where each stream has a file of its own there is one of a type, unless the output's name has numbers.
void checkCounts(const JobPlan& plan) {
    const OutputForm& output = plan.output;
    if (!output.isFiles() || output.isOneFile()) return;
    for (const int type : {qvVideoStream, qvAudioStream}) {
        const int streams = plan.count(type);
        if (streams < 2) continue;
        const char* what = type == qvVideoStream ? "picture" : "sound";
        if (output.kind == OutputKind::pictures || output.splitChannels)
            throw failure(Msg::outputTakesOne, {output.name, what, std::to_string(streams)});
        if (!output.numbered)
            throw failure(Msg::outputHoldsOne,
                          {output.name, what, std::to_string(streams), numberedLike(output.name)});
    }
}

void checkFit(const JobPlan& plan, const PlanOptions& options) {
    checkCounts(plan);
    checkChannels(plan, options);
}

// Warns of inputs of which nothing is used, such as captions for raw pictures.
void warnOfUnused(JobPlan& plan, const PlanOptions& options) {
    const auto isLeft = [&](const JobInput& input, int type) {
        return unwanted(options, type) && !input.streams(type).empty();
    };
    for (const JobInput& input : plan.inputs)
        if (!input.joined && !input.joins && !isLeft(input, qvVideoStream) && !isLeft(input, qvAudioStream) &&
            std::none_of(plan.streams.begin(), plan.streams.end(),
                         [&](const auto& s) { return &plan.input(s) == &input; }))
            plan.warnings.push_back(lineOf(Msg::inputUnused, {input.name}));
}

std::string formatOf(const PlannedStream& stream) {
    if (stream.isVideo())
        return std::to_string(stream.picture.width) + "x" + std::to_string(stream.picture.height) + " " +
               fourccText(stream.picture.fourcc) + " " + formatRate(stream.picture.rate);
    return std::to_string(stream.sound.samplerate) + " Hz, " + std::to_string(stream.sound.channels) +
           " ch, " + std::to_string(stream.sound.bits) + " bit";
}

}  // namespace

long long PlannedStream::bytes(long long units) const {
    if (!isRaw()) return 0;
    if (!isVideo()) return units * sound.channels * ((sound.bits + 7) / 8);
    QvFrame shape;
    if (shape.init(picture.fourcc, picture.width, picture.height) != QvStatus::ok) throw std::bad_alloc();
    return units * shape.total_bytes();
}

ProcessParams PlannedStream::params() const {
    ProcessParams params;
    if (!part.whole || delayed > MediaTime()) params.setInOutPoints(InOutPoints(part.in, part.out + delayed));
    if (!filters.empty()) params.setFilters(filters);
    if (hold) params.setHoldLast(true);
    if (isVideo()) return params;
    if (!channelMap.empty()) params.setAudioChannelMap(channelMap);
    params.setAudioConversion(conversion);
    return params;
}

int JobPlan::count(int type) const {
    return static_cast<int>(
        std::count_if(streams.begin(), streams.end(), [&](const auto& s) { return s.type == type; }));
}

bool JobPlan::hasVideo() const { return count(qvVideoStream) > 0; }

const PlannedStream* JobPlan::firstVideo() const {
    const auto found = std::ranges::find_if(streams, &PlannedStream::isVideo);
    return found != streams.end() ? &*found : nullptr;
}

const PlannedStream* JobPlan::lastVideo() const {
    const auto found =
        std::find_if(streams.rbegin(), streams.rend(), [](const auto& s) { return s.isVideo(); });
    return found != streams.rend() ? &*found : nullptr;
}

const JobInput& JobPlan::input(const PlannedStream& stream) const {
    return inputs[static_cast<size_t>(stream.part.input)];
}

const InputStream& JobPlan::source(const PlannedStream& stream) const {
    return input(stream).streams(stream.type)[static_cast<size_t>(stream.part.stream)];
}

long long JobPlan::bytes() const {
    long long total = 0;
    for (const PlannedStream& stream : streams) total += stream.bytes(stream.expected);
    return total;
}

void checkDamage(JobPlan& plan, bool acceptPartial) {
    for (const JobInput& input : plan.inputs) {
        if (input.damage.empty()) continue;
        if (!acceptPartial) throw failure(Msg::inputDamaged, {input.name, input.damage});
        plan.warnings.push_back(lineOf(Msg::inputDamagedTaken, {input.name, input.damage}));
    }
}

void checkOutput(JobPlan& plan, const PlanOptions& options) {
    checkKinds(plan, options);
    checkFit(plan, options);
}

JobPlan planJob(const PlanOptions& options, const OutputForm& output, std::vector<JobInput> inputs,
                const KnownFormats* known) {
    JobPlan plan;
    plan.output = output;
    plan.inputs = std::move(inputs);
    plan.preset = options.preset;
    checkDamage(plan, options.acceptPartial);
    takeStreams(plan, options, known);
    EffectOptions effects = options.effects;
    effects.pixel = output.pixel;
    PresetPlanner preset(plan, options, effects, known);
    FilterPlanner filters(plan, effects, preset.pictures());
    if (!known) checkKinds(plan, options);
    if (plan.streams.empty()) throw failure(Msg::segmentNoStreams, {plan.inputs.front().name});
    SoundPlanner sounds(plan, options);  // its map decides which sounds there are
    preset.takeSounds();
    if (!known) checkFit(plan, options);
    if (!known) warnOfUnused(plan, options);
    planPoints(plan, {options.from, options.to, options.duration, options.segment});
    sounds.planDelays();
    planEnds(plan, options.shortest, options.longest);
    planFrames(plan);
    planSamples(plan);
    if (!known) checkEffects(plan, effects);
    filters.plan();
    sounds.planFilters();
    preset.settle();
    if (known) return plan;
    checkTags(plan.output, options.tags);
    planLanguages(plan.streams, options.tags);
    plan.tags = filmTags({&plan}, options.tags);
    return plan;
}

std::string planText(const JobPlan& plan) {
    std::string text;
    for (const JobInput& input : plan.inputs)
        if (!input.joined)
            text += "input   " + inQuotes(input.name) + "  " + formatTime(input.duration) + "\n";
    for (const PlannedStream& stream : plan.streams) {
        text += std::string("stream  ") + (stream.isVideo() ? "video " : "audio ") +
                std::to_string(stream.part.stream) + " of " + inQuotes(plan.input(stream).name) + ", " +
                formatTime(stream.part.in.seconds()) + " to " + formatTime(stream.part.out.seconds()) + "\n";
        for (const std::string& filter : stream.chain) text += "filter  " + filter + "\n";
        text += std::string("encoder ") + stream.encoder() + ": " + formatOf(stream) +
                (stream.set.empty() ? "" : ", " + stream.set) + "\n";
        text += "expect  " + std::to_string(stream.expected) + " " + stream.unit();
        if (stream.isRaw()) text += ", " + std::to_string(stream.bytes(stream.expected)) + " bytes";
        text += "\n";
    }
    if ((plan.output.kind == OutputKind::module || plan.output.kind == OutputKind::wav) && plan.tags &&
        !plan.tags->empty())
        text += "meta    " + tagsText(*plan.tags) + "\n";
    if (plan.preset && !plan.preset->reason().empty())
        text += "preset  " + inQuotes(plan.preset->name()) + ", " + plan.preset->reason() + "\n";
    const bool nowhere = plan.output.place == OutputPlace::nowhere;
    text += "output  " + (nowhere ? "nothing" : inQuotes(plan.output.name)) + " by " + plan.output.muxer();
    // The size of compressed streams is not known.
    if (std::ranges::all_of(plan.streams, &PlannedStream::isRaw)) text += ", " + formatBytes(plan.bytes());
    return text + "\n";
}
