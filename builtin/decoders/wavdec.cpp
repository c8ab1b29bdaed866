#include "builtin/decoders/wavdec.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <utility>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"

namespace {

constexpr int initialSamples = 4096;
constexpr std::size_t readAhead = 64 * 1024;

struct Refusal {
    int code;
    const char* text;
};

Refusal refusalFor(WavStatus status) {
    switch (status) {
        case WavStatus::cannotOpen: return {QvStatus::cannotParse, "Failed to open file for reading"};
        case WavStatus::cannotParse:
        case WavStatus::noData: return {QvStatus::noSegment, "Failed to parse WAV file"};
        default: return {QvStatus::noSegment, "WAV format not supported"};
    }
}

}  // namespace

WavStream::WavStream(InputFile file, const WavHeader& header) : header_(header), file_(std::move(file)) {
    const int valueBytes = (header.bitsPerSample + 7) / 8;
    params.set("codec", Any("WAV"));
    params.set("channels", Any(header.channels));
    params.set("samplerate", Any(header.samplerate));
    params.set("samples", Any(header.samples));
    params.set("bitsPerSample", Any(header.bitsPerSample));
    params.set("bytesPerSample", Any(valueBytes));
    params.set("duration", Any(static_cast<double>(header.samples) / header.samplerate));
    if (header.truncated()) {
        params.set("truncated", Any(1));
        params.set("samplesExpected", Any(header.samplesAnnounced));
    }
    pcm = std::make_unique<QvPcm>();
    pcm->init(initialSamples, header.channels, valueBytes, header.samplerate);
}

int WavStream::read(int count) {
    const long long left = header_.samples - pcm->position();
    if (count <= 0 || left <= 0) {
        pcm->setSamples(0);
        return QvStatus::endOfStream;
    }
    const int most = std::numeric_limits<int>::max() / header_.frameBytes();  // a buffer has 31 bits of bytes
    count = static_cast<int>(std::min<long long>({count, left, most}));
    if (count > pcm->size() && pcm->grow(count - pcm->size()) < 0) return QvStatus::outOfMemory;
    const auto channels = static_cast<std::size_t>(header_.channels);
    const auto values = static_cast<std::size_t>(count) * channels;
    const std::size_t got = file_.read(pcm->ptr(0), static_cast<std::size_t>(pcm->bytesPerSample()), values);
    pcm->setSamples(static_cast<int>(got / channels));
    pcm->setPosition(pcm->position() + pcm->samples());
    return pcm->samples() > 0 ? pcm->samples() : QvStatus::cannotParse;
}

int WavStream::seek(long long sample) {
    pcm->setSamples(0);
    // Behind the end there is nothing to read, so the file need not move.
    const long long within = std::min(sample, header_.samples);
    if (within < 0 || !file_.seek(header_.dataOffset + within * header_.frameBytes()))
        return QvStatus::endOfStream;
    pcm->setPosition(sample);
    return QvStatus::ok;
}

void WavDec::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "filesize") == 0)
        value = fileSize_;
    else
        BaseDecodePipe::getParam(name, value);
}

int WavDec::open() {
    if (getState() == stateOpen) close();
    InputFile file;
    WavHeader header;
    const auto status = file.open(filename(), readAhead) == QvStatus::ok ? readWavHeader(file, header)
                                                                         : WavStatus::cannotOpen;
    if (status != WavStatus::ok) {
        const Refusal refusal = refusalFor(status);
        return setError(refusal.code, "%s", refusal.text);
    }
    auto stream = std::make_unique<WavStream>(std::move(file), header);
    if (const int result = stream->seek(0); result != QvStatus::ok)
        return setError(QvStatus::cannotParse, "Failed to open file for reading");
    addStream(std::move(stream));
    fileSize_ = header.fileSize;
    return QvDecodePipe::open();
}

WavStream& WavDec::wavStream(int stream) const {
    DPipeStream* found = findStream(qvAudioStream, stream);
    QV_ASSERT_MSG(found, "WavDec: invalid stream");
    return static_cast<WavStream&>(*found);
}

int WavDec::readSamples(int count, int stream) {
    if (count == 0) return 0;
    const int result = wavStream(stream).read(count);
    return result == QvStatus::cannotParse ? setError(result, "read samples failed") : result;
}

int WavDec::seekToSample(long long sample, int stream) { return wavStream(stream).seek(sample); }

QvPcm* WavDec::getAudioPtr(int stream) { return wavStream(stream).pcm.get(); }

QvCodec* newWavdec() { return new WavDec; }
