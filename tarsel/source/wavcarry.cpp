#include "tarsel/source/wavcarry.h"

#include <algorithm>
#include <vector>

#include "tarsel/source/source.h"
#include "tarsel/source/wavwords.h"

namespace {

constexpr int kAudio = 2;
constexpr long long kMono = 0x4, kStereo = 0x3;  // the places that one and two channels have anyhow

std::string idOf(std::string id) {
    while (!id.empty() && id.back() == ' ') id.pop_back();
    return id;
}

std::string listed(const std::vector<std::string>& names) {
    std::string text;
    for (size_t i = 0; i < names.size(); ++i)
        text += (i == 0 ? "" : i + 1 < names.size() ? ", " : " and ") + names[i];
    return text;
}

void add(std::vector<std::string>& names, const std::string& name) {
    if (std::find(names.begin(), names.end(), name) == names.end()) names.push_back(name);
}

// What an application has no parameter for is not there.
Any askedOf(const QvDecodePipe& decoder, const char* name) {
    return static_cast<const QvCodec&>(decoder).getParam(name);
}

}  // namespace

std::string carryWavChunks(const Source& source, int stream, const WavPart& part, QvBufStream* output) {
    const QvDecodePipe& decoder = source.decoder();
    std::vector<std::string> lost;
    const Any chunks = askedOf(decoder, "chunks"), others = askedOf(decoder, "otherChunks");
    const int fromRate = decoder.getStreamParam(kAudio, stream, "samplerate").toInt32();
    AnyVector kept = chunks.isVector() ? chunks.asVector() : AnyVector();
    if (!kept.empty() && output)
        kept = QvWavChunks::ofPart(kept, {.first = part.first,
                                          .samples = part.samples,
                                          .fromRate = fromRate,
                                          .toRate = part.samplerate,
                                          .bits = part.bits,
                                          .changed = part.changed});
    if (output && part.words) kept = withWavWords(kept, *part.words);
    if (output && !kept.empty()) output->setParam("chunks", kept);
    if (!output)
        for (const Any& chunk : kept)
            if (!part.isFilm || !isOfWavWords(chunk)) add(lost, idOf(chunk.asDict().getString("id", "")));
    if (others.isVector())
        for (const Any& id : others.asVector()) add(lost, idOf(id.asString("")));

    const Any mask = decoder.getStreamParam(kAudio, stream, "channelMask");
    const bool sameChannels = decoder.getStreamParam(kAudio, stream, "channels") == Any(part.channels);
    const bool said = mask.isInt() && sameChannels && mask.toInt64() != 0 &&
                      !(part.channels == 1 && mask.toInt64() == kMono) &&
                      !(part.channels == 2 && mask.toInt64() == kStereo);
    const bool keeps = output && !part.isRf64;
    if (said && keeps) output->setParam("channelMask", mask);
    if (said && !keeps) add(lost, "the places of its channels");
    return listed(lost);
}

void countClippedWithin(const Source& source, long long from, long long to) {
    try {
        source.decoder().setParam("clipRange", AnyVector(Any(from), Any(to)));
    } catch (const QvParamException&) {  // not one of its parameters
    }
}

long long clippedSamples(const Source& source, int stream) {
    return source.decoder().getStreamParam(kAudio, stream, "clippedSamples").asInt64(0);
}
