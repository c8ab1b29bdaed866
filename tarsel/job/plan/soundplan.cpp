#include "tarsel/job/plan/soundplan.h"

#include <algorithm>
#include <cstdio>

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr const char* kDelay = "adelay";

std::unique_ptr<QvCodec> audioFilter(const std::string& module) {
    return makeAnyCodec(module, QvModuleType::audioFilter);
}

std::string nameOf(const std::string& spec) { return spec.substr(0, spec.find(':')); }

// How many channels a filter can work on. It would leave further ones silent.
int mostChannels(const AnyDict& filter, int channels) {
    return audioFilter(filter.getString("name", ""))->getParam("_maxChannels").asInt32(channels);
}

std::string decimal(double value) {
    char text[32];
    std::snprintf(text, sizeof text, "%g", value);
    return text;
}

// Conversions of the rate in the best quality that this installation has.
std::string bestRateQuality() {
    const char* const best = "high";
    return audioFilter("srconvert")->setParam("quality", best) == QvStatus::ok
               ? best
               : AudioConversion().rateQuality;
}

}  // namespace

MediaTime skippedSound(const AnyVector& filters, const SoundFormat& in, const SoundFormat& out) {
    AudioJobDescription job;
    job.inSamplerate = in.samplerate;
    job.inChannels = in.channels;
    job.inBitsPerSample = in.bits;
    job.outSamplerate = out.samplerate;
    job.outChannels = out.channels;
    job.outBitsPerSample = out.bits;
    job.filters = filters;
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

void checkChannels(const AnyDict& filter, const SoundFormat& in, const SoundFormat& out) {
    const int channels = filter.get("_front").isTrue() ? in.channels : out.channels;
    if (const int most = mostChannels(filter, channels); channels > most)
        throw failure(Msg::filterChannels,
                      {filter.getString("name", ""), std::to_string(channels), std::to_string(most)});
}

SoundPlanner::SoundPlanner(JobPlan& plan, const PlanOptions& options)
    : plan_(plan), options_(options), volumes_(parseVolumes(options.sound.volumes)) {
    checkOptions();
    if (!options.sound.map.empty()) takeMap();
}

// Throws for options without a sound that they work on, and for those that exclude each other.
void SoundPlanner::checkOptions() const {
    const int sounds = plan_.count(qvAudioStream);
    const std::string given = options_.sound.given();
    if (!given.empty() && sounds == 0) throw failure(Msg::effectNoSound, {given});
    const int last = options_.sound.map.empty() ? sounds - 1 : 0;
    if (volumes_.highest() > last)
        throw failure(Msg::volumeSoundNone, {std::to_string(volumes_.highest()), std::to_string(last)});
    if (!options_.sound.map.empty() && options_.channels)
        throw failure(Msg::optionsExclude, {"--map", "--channels"});
    const auto& filters = options_.effects.filters;
    const bool delays =
        std::any_of(filters.begin(), filters.end(), [](const auto& spec) { return nameOf(spec) == kDelay; });
    if (delays && !options_.sound.delay.empty())
        throw failure(Msg::optionsExclude, {"--delay", std::string("--filter ") + kDelay});
}

// Throws if the map names a sound or a channel that is not there.
void SoundPlanner::checkMap(const ChannelMap& map, const std::vector<const PlannedStream*>& sounds) const {
    for (const auto& row : map.rows)
        for (const auto& [sound, channel] : row) {
            if (sound >= static_cast<int>(sounds.size()))
                throw failure(Msg::mapSoundNone, {std::to_string(sound), std::to_string(sounds.size() - 1)});
            const PlannedStream& stream = *sounds[static_cast<size_t>(sound)];
            const int channels = plan_.source(stream).sound.channels;
            if (channel >= channels)
                throw failure(Msg::mapChannelNone, {std::to_string(channel), plan_.input(stream).name,
                                                    std::to_string(channels - 1)});
        }
}

void SoundPlanner::takeMap() {
    const ChannelMap map = parseChannelMap(options_.sound.map);
    std::vector<const PlannedStream*> sounds;
    for (const PlannedStream& stream : plan_.streams)
        if (!stream.isVideo()) sounds.push_back(&stream);
    checkMap(map, sounds);
    const std::vector<int> parts = map.sounds();
    std::vector<int> first;
    int channels = 0;
    for (const int part : parts) {
        const PlannedStream& stream = *sounds[static_cast<size_t>(part)];
        plan_.inputs[static_cast<size_t>(stream.part.input)].joins = parts.size() > 1;
        first.push_back(channels);
        channels += plan_.source(stream).sound.channels;
    }
    PlannedStream stream = *sounds[static_cast<size_t>(parts.front())];
    if (parts.size() > 1) {
        if (!options_.saveTask.empty()) throw failure(Msg::mapNoTask);
        stream.part.input = static_cast<int>(plan_.inputs.size()) - 1;
        stream.part.stream = 0;
        if (!options_.bits) stream.sound.bits = plan_.source(stream).sound.bits;
    }
    stream.number = 0;
    stream.sound.channels = static_cast<int>(map.rows.size());
    stream.channelMap = map.matrix(first);
    mapCopies_ = map.copies();
    std::erase_if(plan_.streams, [](const auto& s) { return !s.isVideo(); });
    plan_.streams.push_back(std::move(stream));
}

void SoundPlanner::planDelays() {
    for (PlannedStream& stream : plan_.streams)
        if (!stream.isVideo()) planDelay(stream);
}

void SoundPlanner::planDelay(PlannedStream& stream) const {
    AnyVector delays;
    for (const auto& spec : options_.effects.filters)
        if (nameOf(spec) == kDelay) delays.append(Any(filterState(spec)));
    const std::string& given = options_.sound.delay;
    if (!given.empty()) {
        std::optional<QvFramerate> rate;
        if (const PlannedStream* const video = plan_.firstVideo()) rate = video->picture.rate;
        const AnyDict state = delayState(parseDelay(given, rate));
        delays.append(Any(state));
        // A sound that comes later keeps its end, which needs a longer part. An empty part stays empty.
        const int ms = state.getInt32("delay", 0);
        if (ms > 0 && stream.part.in < stream.part.out) stream.delayed = MediaTime(ms / 1000.0);
    }
    if (delays.empty()) return;
    stream.skipped = skippedSound(delays, plan_.source(stream).sound, stream.sound);
    const MediaTime end = plan_.source(stream).end();
    if (!given.empty() && stream.skipped > MediaTime() && stream.part.in + stream.skipped >= end)
        throw failure(Msg::delayAll, {plan_.input(stream).name});
}

void SoundPlanner::planFilters() {
    for (PlannedStream& stream : plan_.streams)
        if (!stream.isVideo()) planFilters(stream);
}

void SoundPlanner::planFilters(PlannedStream& stream) const {
    addGiven(stream);
    addOptions(stream);
    planConversion(stream);
    const SoundFormat &in = plan_.source(stream).sound, &out = stream.sound;
    // Filters work on 32 bits.
    if (in.bits != out.bits || !stream.filters.empty()) audioFilter("aquant");
    if (!stream.filters.empty())
        skippedSound(stream.filters.getVector("customFilters"), in, out);  // which tries the chain
}

void SoundPlanner::addGiven(PlannedStream& stream) const {
    for (const auto& spec : options_.effects.filters) {
        if (filterType(spec) != qvAudioStream) continue;
        const AnyDict filter = filterState(spec);
        checkChannels(filter, plan_.source(stream).sound, stream.sound);
        stream.filters.appendFilter(spec.c_str(), filter);
        stream.chain.push_back(spec);
    }
}

// Normalizing comes last, as its level is that of the output.
void SoundPlanner::addOptions(PlannedStream& stream) const {
    const auto add = [&](const char* option, const AnyDict& filter, const std::string& settings) {
        const int channels = stream.sound.channels, most = mostChannels(filter, channels);
        if (channels > most)
            throw failure(Msg::soundChannels,
                          {option, plan_.input(stream).name, std::to_string(channels), std::to_string(most)});
        AnyDict last = filter;
        last.set("_position", stream.filters.count() + 1);
        const std::string name = filter.getString("name", "");
        stream.filters.appendFilter(name.c_str(), last);
        stream.chain.push_back(name + " " + settings);
    };
    if (const double volume = volumes_.of(stream.number); volume != 0)
        add("--volume", volumeState(volume), "volume=" + decimal(volume));
    if (!options_.sound.delay.empty()) {
        const MediaTime delay = stream.delayed > MediaTime() ? stream.delayed : MediaTime() - stream.skipped;
        const AnyDict state = delayState(delay);
        add("--delay", state, "delay=" + std::to_string(state.getInt32("delay", 0)));
    }
    if (!options_.effects.fade.empty()) {
        const SoundFade fade = fadeOf(stream);
        add("--fade", soundFadeState(fade, std::min(stream.sound.channels, 8)),
            "in=" + decimal(fade.in) + " out=" + decimal(fade.out));
    }
    if (const auto number = static_cast<size_t>(stream.number); number < options_.sound.gains.size()) {
        for (const AnyDict& state : gainStates(options_.sound.gains[number]))
            add("--normalize", state, "volume=" + decimal(state.getFloat("volume", 0)));
    } else if (!options_.sound.normalize.empty()) {
        const SoundTarget target = parseTarget(options_.sound.normalize);
        add("--normalize", normalizerState(target),
            "mode=" + target.mode + " target=" + decimal(target.level));
    }
}

// Next to a picture the fades of the sound have the length of those of the picture, in whole frames.
SoundFade SoundPlanner::fadeOf(const PlannedStream& stream) const {
    const std::string& spec = options_.effects.fade;
    const size_t comma = std::min(spec.find(','), spec.size());
    const std::string in = spec.substr(0, comma), out = comma < spec.size() ? spec.substr(comma + 1) : in;
    const PlannedStream* const picture = plan_.lastVideo();
    if (!picture) {
        const auto seconds = [](const std::string& text) {
            return parseTime(text, std::nullopt, "--fade").seconds();
        };
        return {seconds(in), seconds(out), static_cast<double>(stream.expected) / stream.sound.samplerate};
    }
    const QvFramerate& rate = picture->picture.rate;
    const auto ofFrames = [&](long long frames) {
        return static_cast<double>(frames) / static_cast<double>(rate.rate());
    };
    const auto seconds = [&](const std::string& text) {
        return ofFrames(parseTime(text, rate, "--fade").position(rate));
    };
    return {seconds(in), seconds(out), ofFrames(picture->expected)};
}

void SoundPlanner::planConversion(PlannedStream& stream) const {
    const SoundFormat &in = plan_.source(stream).sound, &out = stream.sound;
    AudioConversion& conversion = stream.conversion;
    conversion.clipWarning = false;  // the tool counts what is clipped
    conversion.padEnd = plan_.hasVideo() || stream.delayed > MediaTime();
    if (in.samplerate != out.samplerate) {
        conversion.rateQuality = bestRateQuality();
        if (conversion.rateQuality == AudioConversion().rateQuality)
            plan_.warnings.push_back(lineOf(Msg::rateQualityNone, {plan_.input(stream).name}));
        stream.chain.push_back("srconvert quality=" + conversion.rateQuality);
    }
    if (stream.channelMap.empty() && in.channels != out.channels) checkMix(stream);
    if (in.channels != out.channels || !mapCopies_) audioFilter("chconvert");
    // Delaying and copying samples needs no rounding.
    const bool moves = std::all_of(stream.chain.begin(), stream.chain.end(),
                                   [](const auto& line) { return line.starts_with(kDelay); });
    const bool mixes = stream.channelMap.empty() ? out.channels < in.channels : !mapCopies_;
    const bool rounds = in.bits > out.bits || mixes || !moves;
    constexpr int mostDithered = 16;  // bits
    if (rounds && out.bits <= mostDithered && options_.sound.dither != "none") {
        conversion.dither = "triangular";
        stream.chain.push_back("aquant dither=" + conversion.dither);
    }
}

// Without a map the input channels go to the output channels in turn, and each output is the mean of its
// inputs.
void SoundPlanner::checkMix(const PlannedStream& stream) const {
    const int in = plan_.source(stream).sound.channels, out = stream.sound.channels;
    if ((in + out - 1) / out <= ChannelMap::most) return;
    throw failure(Msg::channelsMix,
                  {std::to_string(in), std::to_string(out), std::to_string(ChannelMap::most)});
}
