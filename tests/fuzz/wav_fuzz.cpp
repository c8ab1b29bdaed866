// Any file opens or is refused with a status; what opened delivers exactly the samples that it promises.
#include <algorithm>

#include "builtin/decoders/wavdec.h"
#include "core/media/qvbuffer.h"
#include "core/split/wavchunks.h"
#include "tests/fuzz/fuzz.h"

namespace {

void checkReading(WavDec& decoder, std::size_t fileSize, bool extended) {
    const long long samples = decoder.nrSamples(0);
    const long long channels = decoder.getAudioParam(0, "channels").toInt32();
    // A value of the extended reading may have been stored in one byte.
    const long long bytes = extended ? 1 : decoder.getAudioParam(0, "bytesPerSample").toInt32();
    require(samples >= 0 && samples * channels * bytes <= static_cast<long long>(fileSize));
    long long total = 0;
    int count = 0;
    while ((count = decoder.readSamples(1000, 0)) > 0) total += count;
    require(count == -4 && total == samples);
    for (const long long sample : {samples / 2, samples - 1, samples + 1}) {
        if (sample < 0) continue;
        require(decoder.seekToSample(sample, 0) == 0);
        const long long left = std::clamp(samples - sample, 0LL, 7LL);
        require(decoder.readSamples(7, 0) == (left > 0 ? static_cast<int>(left) : -4));
    }
    require(decoder.getAudioParam(0, "clippedSamples").asInt64(0) <= samples * channels);
}

void checkChunks(const WavDec& decoder, std::size_t fileSize) {
    std::size_t bytes = 0;
    const Any chunks = decoder.getParam("chunks");
    for (const Any& chunk : chunks.asVector())
        bytes += static_cast<std::size_t>(chunk.asDict().get("data").size());
    require(bytes <= fileSize);
    QvWavChunks::describe(chunks.asVector());
    for (const long long first : {0LL, 1000LL, 1LL << 62}) {
        const QvWavChunks::Part part = {first, 48000, 44100, 48000, 24, first == 0};
        require(QvWavChunks::ofPart(chunks.asVector(), part).size() <= chunks.asVector().size());
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const MemoryFile file(data, size);
    for (const bool extended : {false, true}) {
        WavDec decoder;
        decoder.init();
        decoder.setParam("extended", extended ? 1 : 0);
        decoder.setParam("filename", file.name());
        const int status = decoder.open();
        require(status == 0 || status == -15);
        if (status == 0) checkReading(decoder, size, extended);
        if (status == 0) checkChunks(decoder, size);
        decoder.close();
    }
    return 0;
}
