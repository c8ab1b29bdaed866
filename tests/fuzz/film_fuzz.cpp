// Any file opens as a film or is refused with a status. What opened delivers the frames and samples that it
// promises, or fails with a reason.
#include <algorithm>
#include <cstdlib>

#include "core/engine/status.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvframe.h"
#include "plugins/av/decoder/avdec.h"
#include "plugins/av/source/librarylog.h"
#include "tests/fuzz/fuzz.h"

namespace {

constexpr int mostFrames = 60;  // of a stream; a film of few bytes may promise millions
constexpr long long mostSamples = 1 << 20;
constexpr int manyPixels = 1 << 21;  // the sanitizer is slow on these

bool isReason(const av::AvDec& decoder, int status) {
    return (status == QvStatus::cannotParse || status == QvStatus::outOfMemory) && *decoder.errorDesc();
}

// Reads from there to the end of the stream, or as much as is tried. False after a failure.
bool readPictures(av::AvDec& decoder, int stream, int from, int frames) {
    const QvFrame& picture = *decoder.getFramePtr(stream);
    const int most = picture.width() * picture.height() > manyPixels ? 2 : mostFrames;
    const int left = std::min(frames - from, most);
    for (int n = 0; n < left; ++n)
        if (const int status = decoder.readFrame(stream); status != QvStatus::ok) {
            require(isReason(decoder, status));
            return false;
        }
    if (left == frames - from) require(decoder.readFrame(stream) == QvStatus::endOfStream);
    return true;
}

void checkPictures(av::AvDec& decoder, int stream) {
    const int frames = decoder.getVideoParam(stream, "frames").toInt32();
    require(frames > 0);
    const double aspect = decoder.getVideoParam(stream, "frameAspect").toDouble();
    require(aspect > 1e-6 && aspect < 1e6);
    for (const int from : {0, frames / 2, frames - 1, frames / 3}) {
        require(decoder.seekToFrame(from, stream) == QvStatus::ok);
        if (!readPictures(decoder, stream, from, frames)) return;
    }
}

void checkSound(av::AvDec& decoder, int stream) {
    constexpr int block = 4000;
    const long long samples = decoder.getAudioParam(stream, "samples").asInt64(0);
    require(samples > 0 && decoder.getAudioParam(stream, "samplerate").toInt32() > 0);
    for (const long long from : {0LL, samples / 2, samples - 1}) {
        require(decoder.seekToSample(from, stream) == QvStatus::ok);
        const long long wanted = std::min(samples - from, mostSamples);
        for (long long done = 0; done < wanted;) {
            const int got = decoder.readSamples(block, stream);
            if (got <= 0) {
                require(isReason(decoder, got));
                return;
            }
            done += got;
            require(done <= samples - from);
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    av::sendLibraryLog();  // as the plug-in does: it bounds allocations
    const MemoryFile file(data, size);
    av::AvDec decoder;
    decoder.init();
    decoder.setParam("threads", 1);
    decoder.setParam("upright", 1);
    decoder.setParam("filename", file.name());
    const int status = decoder.open();
    if (status != QvStatus::ok) {
        require(isReason(decoder, status));
        return 0;
    }
    for (int i = 0; i < decoder.nrStreams(qvVideoStream); ++i) checkPictures(decoder, i);
    for (int i = 0; i < decoder.nrStreams(qvAudioStream); ++i) checkSound(decoder, i);
    for (int i = 0; i < decoder.nrStreams(qvSubpicStream); ++i)
        decoder.getStreamParam(qvSubpicStream, i, "subtitles");
    decoder.close();
    return 0;
}
