#include "builtin/sound/format/chconvert.h"

#include <algorithm>
#include <cstring>
#include <optional>

#include "builtin/creators.h"
#include "builtin/sound/soundvalues.h"

namespace {

using Settings = ChConvertSettings;

constexpr QvParamRow<Settings> rows[] = {
    {.name = "connMatrix",
     .member = &Settings::matrix,
     .flags = qvParamStored,
     .help =
         "for each output channel an input channel from 0 on, -1 for silence, or several whose mean it is"},
};
static_assert(qvParamTableOk<Settings>(rows));

constexpr int mostChannels = 16, mostSources = 16;

bool isSilent(int channel) { return channel == -1 || channel == -2; }

// The input channels that an entry names; none: silence. Several may have silent ones among them, as those of
// a sound that is not there. nullopt for what is no entry.
std::optional<std::vector<int>> sourcesOf(const Any& entry) {
    if (entry.isInt32() && isSilent(entry.asInt32())) return std::vector<int>();
    if (entry.isInt32() && entry.asInt32() >= 0) return std::vector<int>{entry.asInt32()};
    if (!entry.isVector() || entry.asVector().size() > mostSources) return std::nullopt;
    std::vector<int> sources;
    for (const Any& channel : entry.asVector()) {
        if (!channel.isInt32() || (channel.asInt32() < 0 && !isSilent(channel.asInt32())))
            return std::nullopt;
        sources.push_back(channel.asInt32());
    }
    if (std::all_of(sources.begin(), sources.end(), isSilent)) sources.clear();
    return sources;
}

// Interleaved values: `channels` of them are a sample.
struct In {
    const int32_t* first;
    size_t channels;
};
struct Out {
    int32_t* first;
    size_t channels;
};

void copyChannel(Out to, In from, size_t samples) {
    for (size_t i = 0; i < samples; ++i) to.first[i * to.channels] = from.first[i * from.channels];
}

int32_t wrapped(uint32_t sum) { return static_cast<int32_t>(sum); }

uint32_t valueOf(In from, int source, size_t sample) {
    return isSilent(source)
               ? 0U
               : static_cast<uint32_t>(from.first[sample * from.channels + static_cast<size_t>(source)]);
}

void meanOfTwo(Out to, In a, In b, size_t samples) {
    for (size_t i = 0; i < samples; ++i) {
        const auto x = static_cast<uint32_t>(a.first[i * a.channels]);
        const auto y = static_cast<uint32_t>(b.first[i * b.channels]);
        to.first[i * to.channels] = wrapped(x + y) >> 1;
    }
}

// The mean of a channel and silence.
void halfOf(Out to, In from, size_t samples) {
    for (size_t i = 0; i < samples; ++i) to.first[i * to.channels] = from.first[i * from.channels] >> 1;
}

void meanOfMore(Out to, In from, const std::vector<int>& sources, size_t samples) {
    const auto count = static_cast<int32_t>(sources.size());
    for (size_t i = 0; i < samples; ++i) {
        uint32_t sum = 0;
        for (const int source : sources) sum += valueOf(from, source, i);
        to.first[i * to.channels] = wrapped(sum) / count;
    }
}

void makeChannel(Out to, In from, const std::vector<int>& sources, size_t samples) {
    const auto channel = [&](size_t i) { return In{from.first + sources[i], from.channels}; };
    switch (sources.size()) {
        case 0: return;
        case 1: return copyChannel(to, channel(0), samples);
        case 2:
            if (isSilent(sources[0])) return halfOf(to, channel(1), samples);
            if (isSilent(sources[1])) return halfOf(to, channel(0), samples);
            return meanOfTwo(to, channel(0), channel(1), samples);
        default: return meanOfMore(to, from, sources, samples);
    }
}

}  // namespace

QvCodec* newChconvert() { return new ChConvert; }

ChConvert::ChConvert() : StoredFilterOf("ChConvert::writepcm", rows) {}

int ChConvert::readMatrix() {
    const AnyVector& matrix = settings_.matrix;
    sources_.clear();
    highest_ = -1;
    if (matrix.empty() || matrix.size() > mostChannels)
        return setError(QvStatus::failed, "the channel matrix has %d output channels, not 1 to %d",
                        matrix.size(), mostChannels);
    for (int i = 0; i < matrix.size(); ++i) {
        const auto sources = sourcesOf(matrix.at(i));
        if (!sources)
            return setError(
                QvStatus::failed,
                "the channel matrix has an invalid entry for output channel %d: a channel from 0 on, "
                "-1 for silence, or at most %d of these whose mean it is",
                i, mostSources);
        sources_.push_back(*sources);
        for (const int source : *sources) highest_ = std::max(highest_, source);
    }
    return QvStatus::ok;
}

int ChConvert::open() {
    requireInited();
    if (const int result = readMatrix()) return result;
    return StoredFilterOf::open();
}

int ChConvert::write(QvPcm& pcm) {
    requireWide(pcm);
    if (pcm.samples() < 1) return QvStatus::ok;
    if (highest_ >= pcm.channels())
        return setError(QvStatus::failed, "the channel matrix names input channel %d, but the sound has %d",
                        highest_, pcm.channels());
    const auto outChannels = static_cast<int>(sources_.size());
    int32_t* room = nullptr;
    if (const int result = makeWideRoom(pcm, outChannels, room)) return result;
    output_.copyMeta(pcm);
    const auto isEmpty = [](const Sources& sources) { return sources.empty(); };
    const bool silence = std::any_of(sources_.begin(), sources_.end(), isEmpty);
    constexpr int part = 1024;  // samples, which stay in the cache from channel to channel
    for (int at = 0; at < pcm.samples(); at += part) {
        const auto samples = static_cast<size_t>(std::min(part, pcm.samples() - at));
        const In from{soundValues(pcm, at), static_cast<size_t>(pcm.channels())};
        Out to{room + ptrdiff_t{at} * outChannels, static_cast<size_t>(outChannels)};
        if (silence) std::memset(to.first, 0, samples * to.channels * sizeof(int32_t));
        for (const Sources& sources : sources_) {
            makeChannel(to, from, sources, samples);
            ++to.first;
        }
    }
    return QvStatus::ok;
}
