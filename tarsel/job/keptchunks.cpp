#include "tarsel/job/keptchunks.h"

#include <algorithm>

#include "tarsel/source/wavcarry.h"
#include "tarsel/words/messages.h"

namespace {

constexpr long long kMostRiff = 0xFFFFFFFF - 80;  // bytes after the header

WavPart partOf(const JobPlan& plan, const PlannedStream& stream) {
    WavPart part;
    part.samplerate = stream.sound.samplerate;
    part.channels = stream.sound.channels;
    part.bits = stream.sound.bits;
    const SoundFormat& in = plan.source(stream).sound;
    part.changed = !stream.filters.empty() || !stream.channelMap.empty() || in.channels != part.channels;
    const long long files = plan.output.splitChannels ? stream.sound.channels : 1;
    part.isRf64 = stream.bytes(stream.expected) / files > kMostRiff;
    // A delay puts silence before the sound, as if the part began so much earlier.
    const long long delayed = stream.delayed.position(in.samplerate);
    const MediaTime &from = stream.part.in, &to = stream.part.out;
    part.first = (from + stream.skipped).position(in.samplerate) - delayed;
    if (!stream.part.whole)
        part.samples = to.position(in.samplerate) - from.position(in.samplerate) + delayed;
    return part;
}

// What becomes one sound has no room for the words and marks of each.
void nameLostOfJoined(const JobParts& parts, const WavPart& part, Warnings& warnings) {
    const JobPlan& plan = parts.plan;
    for (size_t i = 0; i < plan.inputs.size(); ++i) {
        if (!plan.inputs[i].joins) continue;
        const std::string lost = carryWavChunks(*parts.sources[i], 0, part, nullptr);
        if (!lost.empty()) warnings.add(lineOf(Msg::inputChunksLost, {plan.inputs[i].name, lost}));
    }
}

}  // namespace

// Conversions read on beyond the end of what is taken, and measuring reads all of it.
void countClipping(const JobParts& parts) {
    const JobPlan& plan = parts.plan;
    for (const PlannedStream& stream : plan.streams) {
        if (stream.isVideo()) continue;
        const QvRatio in(plan.source(stream).sound.samplerate, 1), out(stream.sound.samplerate, 1);
        const long long first = partOf(plan, stream).first;
        const long long taken = QvRatio::multyplyByRatio(stream.expected, in, out);
        countClippedWithin(parts.source(stream), std::max(first, 0LL), first + taken);
    }
}

// The words of the output are those of the input of its first stream. Only a WAV file has room for them. A
// stream ends with its samples, and not every reader of a pipe knows RF64.
void carryChunks(const JobParts& parts, Warnings& warnings) {
    const JobPlan& plan = parts.plan;
    if (plan.output.writesNothing()) return;
    const bool isWav = plan.output.kind != OutputKind::avi && !plan.output.isStream();
    for (const PlannedStream& stream : plan.streams) {
        if (stream.isVideo()) continue;
        QvBufStream* const file = isWav ? parts.file(stream) : nullptr;
        if (file) file->setParam("rf64", 1);
        WavPart part = partOf(plan, stream);
        part.isFilm = plan.output.kind == OutputKind::module;
        if (plan.tags && stream.part.input == plan.streams.front().part.input) part.words = &*plan.tags;
        if (plan.input(stream).joined) nameLostOfJoined(parts, part, warnings);
        const std::string lost = carryWavChunks(parts.source(stream), stream.part.stream, part, file);
        if (!lost.empty()) warnings.add(lineOf(Msg::inputChunksLost, {plan.input(stream).name, lost}));
    }
}
