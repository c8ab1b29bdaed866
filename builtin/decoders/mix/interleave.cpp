#include "builtin/decoders/mix/interleave.h"

#include <algorithm>

#include "builtin/decoders/mix/adecstream.h"
#include "builtin/shared/inputnesting.h"
#include "core/arch/qvassert.h"
#include "core/decode/decodefactory.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/job/filtersstate.h"
#include "core/measure/mediatime.h"
#include "core/media/qvpcm.h"

namespace {

constexpr int mixBits = 32;
constexpr const char* mixedCodec = "PCM";

std::string shown(const Any& text) { return text.toString().asString(""); }

}  // namespace

Interleave::Interleave() { pcm = std::make_unique<QvPcm>(); }

Interleave::~Interleave() = default;

void Interleave::release() {
    buffers_.clear();
    inputs_.clear();
    decoders_.clear();
    params.clear();
    pcm->destroy();
    mix_ = QvAudioMix();
    samples_ = 0;
    position_ = -1;
}

int Interleave::fail(int code, const char* text) {
    release();
    error_ = text;
    qv_log()->error("%s", text);
    return code;
}

int Interleave::prepare(int targetRate, const AnyDict& inputParams) {
    release();
    error_.clear();
    inputFailure_.clear();
    const Any params = inputParams;
    if (!openDecoders(inputParams.empty() ? nullptr : &params)) {
        qv_log()->error("[mixadec]Failed to open input file(s)");
        return QvStatus::ok;
    }
    const int rate = chooseRate(targetRate);
    if (const int result = selectStreams(rate); result != QvStatus::ok)
        return fail(result, "[mixadec]Failed to select input streams(s)");
    int result = setUpMix();
    if (result == QvStatus::ok) result = publishParams(rate);
    return result == QvStatus::ok ? result : fail(result, "[mixadec]Failed to setup mixing");
}

// --- The inputs.

std::unique_ptr<QvDecodePipe> Interleave::openDecoder(int file, const Any* params) {
    const Any name = setup.inFileName(file);
    std::string reason;
    auto decoder = InputNesting::open(
        name,
        [&](QvFileOpenCb* callback) {
            const char* module = setup.decoder(file);
            if (!module) return QvDecFactory::decodePipe(name, Any(), callback, params);
            qv_dbg()->info("Using decoder '%s' to open %s", module, shown(name).c_str());
            return QvDecFactory::decodePipeUsing(name, AnyVector(Any(module)), Any(), callback, params);
        },
        reason);
    if (decoder && decoder->nrStreams(qvAudioStream) == 0)
        reason = "it has no sound";
    else if (decoder)
        return decoder;
    if (!QvFile::isFile(name)) reason = "there is no such file";
    inputFailure_ = "input '" + shown(name) + "': " + reason;
    qv_log()->error("[mixadec] Failed to open input file %s", shown(name).c_str());
    return nullptr;
}

bool Interleave::openDecoders(const Any* params) {
    for (int file = 0; file < setup.inFileNames().size(); ++file) {
        auto decoder = openDecoder(file, params);
        if (!decoder) {
            decoders_.clear();
            return false;
        }
        decoders_.push_back(std::move(decoder));
    }
    return true;
}

int Interleave::chooseRate(int targetRate) const {
    int highest = 0;
    for (const auto& decoder : decoders_)
        for (int stream = 0; stream < decoder->nrStreams(qvAudioStream); ++stream)
            highest = std::max(highest, decoder->getAudioParam(stream, "samplerate").asInt32(0));
    return targetRate != 0 ? targetRate : highest;
}

int Interleave::selectStreams(int rate) {
    for (std::size_t i = 0; i < decoders_.size(); ++i) {
        QvDecodePipe* const decoder = decoders_[i].get();
        // The name in the set-up: the decoder may have resolved it to another one.
        const Any file = setup.inFileName(static_cast<int>(i));
        for (const Any& stream : setup.getFileActiveStreams(file)) {
            const int number = stream.asInt32();
            if (number < 0 || number >= decoder->nrStreams(qvAudioStream)) {
                const Any text =
                    Any::sprintf("Invalid stream number %d for file %s", number, shown(file).c_str());
                inputFailure_ = text.asString();
                qv_log()->error("%s", text.asString());
                return QvStatus::failed;
            }
            auto input = std::make_unique<ADecStream>(decoder, number, file);
            std::string reason;
            if (const int result = input->prepare(rate, setup.filters(file, number), reason)) {
                inputFailure_ =
                    "input '" + shown(file) + "': stream " + std::to_string(number) + ": " + reason;
                return result;
            }
            inputs_.push_back(std::move(input));
        }
    }
    for (const auto& input : inputs_) buffers_.append(&input->pcm());
    return QvStatus::ok;
}

// --- The mix.

int Interleave::indexOf(const Any& file, int stream) const {
    for (std::size_t i = 0; i < inputs_.size(); ++i)
        if (inputs_[i]->file() == file && inputs_[i]->number == stream) return static_cast<int>(i);
    return -1;
}

int Interleave::setUpMix() {
    const AnyVector& outputs = setup.outChannels();
    AnyVector channels;
    long long most = 0;
    for (const auto& input : inputs_) {
        channels.append(Any(input->channels()));
        most = std::max<long long>(most, input->channels());
    }
    if (outputs.empty() || outputs.size() > QvAudioMixDecSetup::maxChannels ||
        outputs.size() * static_cast<long long>(inputs_.size()) * most > QvAudioMix::maxElements) {
        inputFailure_ = "a mix of " + std::to_string(inputs_.size()) + " streams into " +
                        std::to_string(outputs.size()) + " channels can't be made";
        return QvStatus::failed;
    }
    mix_.init(outputs.size(), channels);
    for (int out = 0; out < outputs.size(); ++out) {
        if (!outputs.at(out).isDict()) continue;
        for (const Any& entry : outputs.at(out).asDict().getVector("source")) {
            if (!entry.isDict()) continue;
            if (const int result = setSource(out, entry.asDict()); result != QvStatus::ok) return result;
        }
    }
    return QvStatus::ok;
}

// Sets the weight that a channel of an input has in an output channel.
int Interleave::setSource(int out, const AnyDict& source) {
    const int input = indexOf(source.get("src"), source.getInt32("stream"));
    QV_ASSERT_MSG(input >= 0, "a source of the mix is no input");
    const int channel = source.getInt32("channel");
    const int count = inputs_[static_cast<std::size_t>(input)]->channels();
    if (channel < 0 || channel >= count) {
        inputFailure_ = "input '" + shown(source.get("src")) + "': there is no channel " +
                        std::to_string(channel) + ", the last one is " + std::to_string(count - 1);
        return QvStatus::failed;
    }
    const Any& weight = source.get("weight");
    mix_.setWeight(out, input, channel, weight.isInt() || weight.isFloat() ? weight.toDouble() : 0.0);
    return QvStatus::ok;
}

// The parameters of the stream, and its buffer.
int Interleave::publishParams(int rate) {
    long long bytes = 0;
    for (const auto& decoder : decoders_)
        if (const Any size = decoder->QvCodec::getParam("filesize"); size.isInt()) bytes += size.toInt64();
    Any codec;
    for (const auto& input : inputs_) {
        samples_ = std::max(samples_, input->targetSamples());
        const Any own = input->decoder->getAudioParam(input->number, "codec");
        if (codec.isValid() && codec != own) codec = mixedCodec;
        if (!codec.isValid()) codec = own;
    }
    const int channels = mix_.nrOutChannels();
    if (rate < 1 || pcm->init(rate, channels, mixBits / 8, rate) != QvStatus::ok) {
        inputFailure_ = "no buffer for " + std::to_string(channels) + " channels at " + std::to_string(rate) +
                        " samples a second";
        return rate < 1 ? QvStatus::failed : QvStatus::outOfMemory;
    }
    const MediaTime length(samples_, rate, MediaTime::defaultTimescale);
    params.set("samples", Any(samples_));
    params.set("bitsPerSample", mixBits);
    params.set("bytesPerSample", mixBits / 8);
    params.set("samplerate", rate);
    params.set("channels", channels);
    params.set("duration", length.seconds());
    params.set("codec", codec.isText() ? codec : Any(mixedCodec));
    params.set("filesize", Any(bytes));
    position_ = -1;
    return QvStatus::ok;
}

// --- Reading.

int Interleave::stop(int result) {
    if (pcm->inited()) pcm->setSamples(0);
    position_ = -1;
    return result;
}

int Interleave::read(int count) {
    count = static_cast<int>(
        std::clamp(samples_ - position_ + 1, 0LL, static_cast<long long>(std::max(count, 0))));
    if (inputs_.empty()) return stop(QvStatus::failed);
    bool good = false, ended = true;
    for (const auto& input : inputs_) {
        const int result = input->read(count);
        good |= result == QvStatus::ok || result == QvStatus::endOfStream;
        ended &= result == QvStatus::endOfStream;
    }
    if (!good) return stop(QvStatus::failed);
    if (ended) return stop(QvStatus::endOfStream);
    if (const int result = mix_.mixChannels(count, *pcm, buffers_); result != QvStatus::ok)
        return stop(result);
    position_ += pcm->samples();
    pcm->setPosition(position_ + 1);
    return pcm->samples();
}

int Interleave::seek(long long sample) {
    if (sample < 0 || sample >= samples_ || inputs_.empty()) return QvStatus::endOfStream;
    bool any = false;
    for (const auto& input : inputs_) any |= input->seek(sample) == QvStatus::ok;
    if (!any) return QvStatus::endOfStream;
    pcm->setSamples(0);
    pcm->setPosition(sample);
    position_ = sample - 1;
    return QvStatus::ok;
}
