#include "tarsel/job/keptchunks.h"

#include "tarsel/source/wavcarry.h"
#include "tarsel/words/messages.h"

namespace {

constexpr long long kMostRiff = 0xFFFFFFFF - 80;  // bytes after the header

WavPart partOf(const JobPlan& plan, const PlannedStream& stream) {
    WavPart part;
    part.samplerate = stream.sound.samplerate;
    part.channels = stream.sound.channels;
    part.bits = stream.sound.bits;
    part.changed = !stream.filters.empty();
    const long long files = plan.output.splitChannels ? stream.sound.channels : 1;
    part.isRf64 = stream.bytes(stream.expected) / files > kMostRiff;
    if (stream.part.whole) return part;
    const int rate = plan.source(stream).sound.samplerate;
    part.first = (stream.part.in + stream.skipped).position(rate);
    part.samples = stream.part.out.position(rate) - part.first;
    return part;
}

}  // namespace

// Only a WAV file has room for them. A stream ends with its samples, and not every reader of a pipe knows
// RF64.
void carryChunks(const JobParts& parts, Warnings& warnings) {
    const JobPlan& plan = parts.plan;
    if (plan.output.writesNothing()) return;
    const bool isWav = plan.output.kind != OutputKind::avi && !plan.output.takesOneStream();
    for (const PlannedStream& stream : plan.streams) {
        if (stream.isVideo()) continue;
        QvBufStream* const file = isWav ? parts.file(stream) : nullptr;
        if (file) file->setParam("rf64", 1);
        const std::string lost =
            carryWavChunks(parts.source(stream), stream.part.stream, partOf(plan, stream), file);
        if (!lost.empty()) warnings.add(lineOf(Msg::inputChunksLost, {plan.input(stream).name, lost}));
    }
}
