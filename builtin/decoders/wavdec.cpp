#include "builtin/decoders/wavdec.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <string>
#include <utility>

#include "builtin/creators.h"
#include "builtin/decoders/sourceparam.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
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

using Settings = WavDec::Settings;
constexpr QvParamRow<Settings> rows[] = {
    sourceRow<Settings>,
    {.name = "extended",
     .member = &Settings::extended,
     .flags = qvParamStored,
     .help = "1: also floating point, 32 bits, A-law, mu-law, up to 256 channels, RF64 and RIFX"},
};
static_assert(qvParamTableOk<Settings>(rows));

// Null for values that are delivered as they are.
wav::Convert converterOf(const WavHeader& header) {
    switch (header.coding) {
        case WavCoding::floating: return header.bitsPerSample == 64 ? wav::narrowFloat64 : wav::narrowFloat32;
        case WavCoding::aLaw: return wav::expandALaw;
        case WavCoding::muLaw: return wav::expandMuLaw;
        case WavCoding::integer: break;
    }
    return header.valueBytes() == 4 ? wav::narrowInt32 : nullptr;
}

// Bits of the values that are delivered.
int deliveredBits(const WavHeader& header) {
    if (header.coding == WavCoding::aLaw || header.coding == WavCoding::muLaw) return 16;
    return std::min(8 * header.valueBytes(), 24);
}

std::string describe(const WavHeader& header) {
    std::string text;
    switch (header.coding) {
        case WavCoding::integer: text = std::to_string(header.bitsPerSample) + "-bit PCM"; break;
        case WavCoding::floating: text = std::to_string(header.bitsPerSample) + "-bit float"; break;
        case WavCoding::aLaw: text = "A-law"; break;
        case WavCoding::muLaw: text = "mu-law"; break;
    }
    return header.bigEndian ? text + ", big-endian" : text;
}

}  // namespace

WavStream::WavStream(InputFile file, const WavHeader& header, bool extended)
    : header_(header), file_(std::move(file)), convert_(converterOf(header)) {
    const int bits = deliveredBits(header);
    params.set("codec", Any("WAV"));
    params.set("channels", Any(header.channels));
    params.set("samplerate", Any(header.samplerate));
    params.set("samples", Any(header.samples));
    params.set("bitsPerSample", Any(bits));
    params.set("bytesPerSample", Any(bits / 8));
    params.set("duration", Any(static_cast<double>(header.samples) / header.samplerate));
    if (header.truncated()) {
        params.set("truncated", Any(1));
        params.set("samplesExpected", Any(header.samplesAnnounced));
    }
    if (extended && (convert_ || header.bigEndian || bits != header.bitsPerSample))
        params.set("sourceFormat", Any(describe(header).c_str()));
    if (extended && header.channelMask)
        params.set("channelMask", Any(static_cast<long long>(header.channelMask)));
    pcm = std::make_unique<QvPcm>();
    pcm->init(initialSamples, header.channels, bits / 8, header.samplerate);
    if (convert_)
        stored_.resize(std::max<std::size_t>(readAhead, static_cast<std::size_t>(header.frameBytes())));
}

int WavStream::read(int count) {
    const long long left = header_.samples - pcm->position();
    if (count <= 0 || left <= 0) {
        pcm->setSamples(0);
        return QvStatus::endOfStream;
    }
    // A buffer has 31 bits of bytes.
    const int most = std::numeric_limits<int>::max() / (pcm->channels() * pcm->bytesPerSample());
    count = static_cast<int>(std::min<long long>({count, left, most}));
    if (count > pcm->size() && pcm->grow(count - pcm->size()) < 0) return QvStatus::outOfMemory;
    pcm->setSamples(convert_ ? readConverted(count) : readPlain(count));
    pcm->setPosition(pcm->position() + pcm->samples());
    return pcm->samples() > 0 ? pcm->samples() : QvStatus::cannotParse;
}

// Number of samples that were read.
int WavStream::readPlain(int count) {
    const auto channels = static_cast<std::size_t>(header_.channels);
    const auto values = static_cast<std::size_t>(count) * channels;
    const std::size_t got = file_.read(pcm->ptr(0), static_cast<std::size_t>(pcm->bytesPerSample()), values);
    if (header_.bigEndian) wav::swapBytes(pcm->ptr(0), pcm->bytesPerSample(), got);
    return static_cast<int>(got / channels);
}

// In pieces that stay in the cache. A piece lies on one side of where counting begins and ends.
int WavStream::readConverted(int count) {
    const auto frameBytes = static_cast<std::size_t>(header_.frameBytes());
    const auto channels = static_cast<std::size_t>(header_.channels);
    const long long before = clipped_;
    int done = 0;
    while (done < count) {
        const long long position = pcm->position() + done;
        auto piece = std::min<long long>(count - done, static_cast<long long>(stored_.size() / frameBytes));
        for (const long long bound : {counted_, countEnd_})
            if (bound > position) piece = std::min(piece, bound - position);
        const std::size_t got = file_.read(stored_.data(), frameBytes, static_cast<std::size_t>(piece));
        if (header_.bigEndian) wav::swapBytes(stored_.data(), header_.valueBytes(), got * channels);
        const std::size_t clipped = got > 0 ? convert_(pcm->ptr(done), stored_.data(), got * channels) : 0;
        if (position >= counted_ && position < countEnd_) {
            clipped_ += static_cast<long long>(clipped);
            counted_ = position + static_cast<long long>(got);
        }
        done += static_cast<int>(got);
        if (static_cast<long long>(got) < piece) break;
    }
    if (clipped_ != before) params.set("clippedSamples", Any(clipped_));
    return done;
}

void WavStream::countClippedWithin(long long from, long long to) {
    clipped_ = 0;
    counted_ = from;
    countEnd_ = to;
}

int WavStream::seek(long long sample) {
    pcm->setSamples(0);
    // After the end there is nothing to read, so the file is left where it is.
    const long long within = std::min(sample, header_.samples);
    if (within < 0 || !file_.seek(header_.dataOffset + within * header_.frameBytes()))
        return QvStatus::endOfStream;
    pcm->setPosition(sample);
    return QvStatus::ok;
}

// Parameters in a dictionary, as an application opens or restores with. The first failure counts.
int WavDec::setAll(const Any& value) {
    if (!value.isDict()) return QvStatus::invalidParam;
    int result = QvStatus::ok;
    for (const auto [key, entry] : value.asDict())
        if (const int status = setParam(key, *entry); result == QvStatus::ok) result = status;
    return result;
}

int WavDec::setClipRange(const Any& value) {
    if (!value.isVector() || value.asVector().size() != 2) return QvStatus::invalidParam;
    const Any &from = value.asVector().at(0), &to = value.asVector().at(1);
    if (!from.isInt() || !to.isInt()) return QvStatus::invalidParam;
    for (const auto& stream : streams())
        static_cast<WavStream&>(*stream).countClippedWithin(from.toInt64(), to.toInt64());
    return QvStatus::ok;
}

int WavDec::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "openParameters") == 0 || std::strcmp(name, "settings") == 0) return setAll(value);
    if (std::strcmp(name, "clipRange") == 0) return setClipRange(value);
    if (auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return BaseDecodePipe::setParam(name, value);
}

void WavDec::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "filesize") == 0) {
        value = fileSize_;
    } else if (std::strcmp(name, "store") == 0) {
        value = AnyDict("settings", AnyDict("extended", settings_.extended ? 1 : 0));
    } else if (std::strcmp(name, "chunks") == 0) {
        AnyVector list;
        for (const WavChunk& chunk : chunks_)
            list.append(AnyDict(
                "id", chunk.id.c_str(), "data",
                Any(static_cast<const void*>(chunk.data.data()), static_cast<int>(chunk.data.size()))));
        value = list;
    } else if (std::strcmp(name, "otherChunks") == 0) {
        AnyVector list;
        for (const std::string& id : otherChunks_) list.append(Any(id.c_str()));
        value = list;
    } else if (!qvGetParamRow<Settings>(rows, settings_, name, value)) {
        BaseDecodePipe::getParam(name, value);
    }
}

int WavDec::open() {
    if (getState() == stateOpen) close();
    InputFile file;
    WavHeader header;
    const bool extended = settings_.extended;
    const auto status = file.open(filename(), readAhead, settings_.source) == QvStatus::ok
                            ? readWavHeader(file, header, extended)
                            : WavStatus::cannotOpen;
    if (status != WavStatus::ok) {
        const Refusal refusal = refusalFor(status);
        return setError(refusal.code, "%s%s", refusal.text, file.problem().c_str());
    }
    chunks_.clear();
    otherChunks_.clear();
    if (extended) readWavChunks(file, header, chunks_, otherChunks_);
    auto stream = std::make_unique<WavStream>(std::move(file), header, extended);
    if (!stream->pcm->inited()) return setError(QvStatus::outOfMemory, "No memory for samples");
    if (const int result = stream->seek(0); result != QvStatus::ok)
        return setError(QvStatus::cannotParse, "Failed to open file for reading%s",
                        stream->problem().c_str());
    addStream(std::move(stream));
    fileSize_ = header.fileSize;
    return QvDecodePipe::open();
}

int WavDec::close() {
    for (const auto& stream : streams())
        if (const long long clipped = static_cast<const WavStream&>(*stream).clipped(); clipped > 0)
            qv_log()->warning("%lld samples beyond full scale were clipped", clipped);
    chunks_.clear();
    otherChunks_.clear();
    return BaseDecodePipe::close();
}

WavStream& WavDec::wavStream(int stream) const {
    DPipeStream* found = findStream(qvAudioStream, stream);
    QV_ASSERT_MSG(found, "WavDec: invalid stream");
    return static_cast<WavStream&>(*found);
}

int WavDec::readSamples(int count, int stream) {
    if (count == 0) return 0;
    WavStream& sound = wavStream(stream);
    const int result = sound.read(count);
    return result == QvStatus::cannotParse
               ? setError(result, "read samples failed%s", sound.problem().c_str())
               : result;
}

int WavDec::seekToSample(long long sample, int stream) { return wavStream(stream).seek(sample); }

QvPcm* WavDec::getAudioPtr(int stream) { return wavStream(stream).pcm.get(); }

QvCodec* newWavdec() { return new WavDec; }
