// Any file opens or is refused with a status; what opened delivers exactly the samples that it promises.
#include <algorithm>

#include "builtin/decoders/wavdec.h"
#include "core/media/qvbuffer.h"
#include "tests/fuzz/fuzz.h"

namespace {

void checkReading(WavDec& decoder, std::size_t fileSize) {
    const long long samples = decoder.nrSamples(0);
    const long long frame =
        decoder.getAudioParam(0, "channels").toInt32() * decoder.getAudioParam(0, "bytesPerSample").toInt32();
    require(samples >= 0 && samples * frame <= static_cast<long long>(fileSize));
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
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const MemoryFile file(data, size);
    WavDec decoder;
    decoder.init();
    decoder.setParam("filename", file.name());
    const int status = decoder.open();
    require(status == 0 || status == -15);
    if (status == 0) checkReading(decoder, size);
    decoder.close();
    return 0;
}
