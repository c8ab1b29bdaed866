#include "builtin/decoders/mix/adecstream.h"

#include <algorithm>

#include "core/decode/qvdecoder.h"
#include "core/engine/status.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/filtersstate.h"
#include "core/job/jobdescription.h"
#include "core/measure/exactmath_p.h"

namespace {

constexpr int mixBytes = 4;

int failure(std::string& reason, const char* text, int code = QvStatus::failed) {
    reason = text;
    return code;
}

}  // namespace

ADecStream::ADecStream(QvDecodePipe* decoder, int number, const Any& file)
    : QvIStream(decoder, qvAudioStream, number), file_(file) {}

ADecStream::~ADecStream() = default;

int ADecStream::prepare(int targetRate, const FiltersState* filters, std::string& reason) {
    if (decoder->select(qvAudioStream, number) != QvStatus::ok)
        return failure(reason, "it can't be selected");
    channels_ = decoder->getAudioParam(number, "channels").asInt32(0);
    sourceRate_ = decoder->getAudioParam(number, "samplerate").asInt32(0);
    const int bytes = decoder->getAudioParam(number, "bytesPerSample").asInt32(0);
    targetRate_ = targetRate;
    if (channels_ < 1 || sourceRate_ < 1 || bytes < 1 || bytes > mixBytes)
        return failure(reason, "its format is not known");

    AudioJobDescription job;
    job.inBitsPerSample = bytes * 8;
    job.inSamplerate = sourceRate_;
    job.inChannels = job.outChannels = channels_;
    job.outBitsPerSample = mixBytes * 8;
    job.outSamplerate = targetRate_;
    if (filters && filters->get("customFilters").isVector())
        job.filters = filters->getVector("customFilters");
    MediaTime delay;
    pipe_.reset(QvProcessUtil::createAudioPipe(job, delay));
    if (const int result = pipe_ ? pipe_->open() : QvStatus::ok; result != QvStatus::ok)
        return failure(reason, pipe_->errorDesc(), result);

    if (pcm_.init(targetRate_, channels_, mixBytes, targetRate_) != QvStatus::ok)
        return failure(reason, "no memory for its samples", QvStatus::outOfMemory);
    pcm_.setPosition(-1);
    samples_ = decoder->nrSamples(number);
    return QvStatus::ok;
}

long long ADecStream::targetSamples() const { return qvmath::mulDiv(samples_, targetRate_, 1, sourceRate_); }

// Appends samples of the filters or of the decoder. Fails if a filter has changed their format.
int ADecStream::append(const QvPcm& from, int count) {
    if (count == 0) return QvStatus::ok;
    if (from.samples() < count || from.channels() != channels_ || from.bytesPerSample() != mixBytes ||
        pcm_.write(count, from.ptr(0)) != QvStatus::ok)
        return QvStatus::failed;
    pcm_.setPosition(pcm_.position() + count);
    return QvStatus::ok;
}

int ADecStream::readPipe(int count) {
    while (pcm_.samples() < count) {
        const int taken = std::min(pipe_->samples(), count - pcm_.samples());
        if (taken > 0) {
            if (append(*pipe_->pcm(), taken) != QvStatus::ok) return QvStatus::failed;
            pipe_->erase(taken);
        }
        const int missing = count - pcm_.samples();
        if (missing == 0) break;
        const int result = pipe_->process(decoder, number, missing);
        if (result == QvStatus::failed) return QvStatus::failed;
        if (pipe_->samples() == 0) return QvStatus::endOfStream;
    }
    return QvStatus::ok;
}

int ADecStream::readPlain(int count) {
    const int result = decoder->readSamples(count, number);
    if (result < 0) return result == QvStatus::endOfStream ? result : QvStatus::failed;
    const QvPcm* from = decoder->getAudioPtr(number);
    return from ? append(*from, std::min(result, count)) : QvStatus::failed;
}

int ADecStream::read(int count) {
    pcm_.setSamples(0);
    if (status_ == QvStatus::ok) status_ = pipe_ ? readPipe(count) : readPlain(count);
    const int missing = count - pcm_.samples();
    if (pcm_.addSilence(missing) != QvStatus::ok) return QvStatus::outOfMemory;
    pcm_.setPosition(pcm_.position() + missing);
    return status_;
}

int ADecStream::seek(long long sample) {
    const long long own = qvmath::mulDiv(sample, sourceRate_, 1, targetRate_);
    const int result = decoder->seekToSample(own, number);
    pcm_.setSamples(0);
    pcm_.setPosition(own - 1);
    status_ = result == QvStatus::ok || result == QvStatus::endOfStream ? result : QvStatus::failed;
    // The filters still hold samples from before the seek.
    if (pipe_ && (pipe_->close() != QvStatus::ok || pipe_->open() != QvStatus::ok))
        status_ = QvStatus::failed;
    return status_;
}
