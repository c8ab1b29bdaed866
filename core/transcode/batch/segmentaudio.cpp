#include <algorithm>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/streamformat.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/batch/segmentaudio_p.h"

namespace {

// Of sound as well.
constexpr const char* openFailed = "Failed to open video process pipe";

bool sameConversion(const AudioJobDescription& a, const AudioJobDescription& b) {
    return a.inBitsPerSample == b.inBitsPerSample && a.inSamplerate == b.inSamplerate &&
           a.inChannels == b.inChannels && a.outBitsPerSample == b.outBitsPerSample &&
           a.outSamplerate == b.outSamplerate && a.outChannels == b.outChannels &&
           Any(a.connMatrix) == Any(b.connMatrix) && Any(a.filters) == Any(b.filters) &&
           a.conversion.rateQuality == b.conversion.rateQuality && a.conversion.dither == b.conversion.dither;
}

bool needsReport(const QvAProcessPipe& pipe) {
    for (int i = 0; i < pipe.nrFilters(); ++i)
        if (pipe.filter(i)->getParam("_needsReport").isTrue()) return true;
    return false;
}

int failedWith(int status, const QvCodec& codec, std::string& why) {
    why = codec.errorDesc();
    return status;
}

}  // namespace

SegmentAudio::SegmentAudio(const QvIStream& input) : input_(input), sound_(*input.decoder, input.number) {}

SegmentAudio::~SegmentAudio() = default;

SegmentSpan SegmentAudio::span(int outSamplerate) const {
    const Any rate = input_.decoder->getAudioParam(input_.number, "samplerate");
    return qvSegmentSpan(input_, QvRatio(rate.asInt32(0), 1), QvRatio(outSamplerate, 1));
}

int SegmentAudio::prepare(const AudioJobDescription& output, const SegmentAudio* like, std::string& why) {
    AnyDict params;
    input_.decoder->getStreamParams(qvAudioStream, input_.number, params);
    const AudioFormat in(params);
    if (in.samplerate < 1 || in.channels < 1) {
        why = in.samplerate < 1 ? "Could not get 'samplerate' from decoder"
                                : "Could not get 'channels' from decoder";
        return QvStatus::failed;
    }
    samplerate_ = in.samplerate;
    job_ = output;
    job_.inBitsPerSample = in.bits;
    job_.inSamplerate = in.samplerate;
    job_.inChannels = in.channels;
    if (const auto filters = input_.params.filters()) {
        const Any& custom = filters->get("customFilters");
        job_.filters = custom.isVector() ? custom.asVector() : AnyVector();
    }
    if (const AnyVector* map = input_.params.audioChannelMap()) job_.connMatrix = *map;
    if (const auto conversion = input_.params.audioConversion()) job_.conversion = *conversion;
    span_ = qvSegmentSpan(input_, QvRatio(in.samplerate, 1), QvRatio(output.outSamplerate, 1));
    delay_ = MediaTime();
    pipe_.reset();
    converts_ = measured_ = false;
    if (straight()) return QvStatus::ok;
    if (like && !like->measured_ && sameConversion(job_, like->job_)) {
        converts_ = like->converts_;
        delay_ = like->delay_;
        return QvStatus::ok;
    }
    if (const int result = build(why)) return result;
    converts_ = pipe_ != nullptr;
    measured_ = pipe_ && needsReport(*pipe_);
    if (measured_) {
        QvProcessUtil::applyStreamReport(pipe_.get(), input_.decoder, input_.number, span_.first,
                                         span_.first + span_.count);
    }
    const int result = openPipe(why);
    if (!measured_) pipe_.reset();
    return result;
}

// Whether the channels are passed on unconverted because nothing says how to connect them. The encoder then
// refuses them.
bool SegmentAudio::straight() const {
    if (job_.inChannels == job_.outChannels || job_.connMatrix.size() == job_.outChannels) return false;
    qv_dbg()->debug("channel number differ, conn matrix required");
    return true;
}

int SegmentAudio::build(std::string& why) {
    try {
        pipe_.reset(QvProcessUtil::createAudioPipe(job_, delay_));
    } catch (const QvAssertFailure& failure) {
        qv_dbg()->error("%s", failure.what());
        why = openFailed;
        return dynamic_cast<const QvMemoryFailure*>(&failure) ? QvStatus::outOfMemory : QvStatus::failed;
    }
    return QvStatus::ok;
}

int SegmentAudio::openPipe(std::string& why) {
    if (!pipe_ || pipe_->open() == QvStatus::ok) return QvStatus::ok;
    qv_dbg()->error("%s", pipe_->errorDesc());
    why = openFailed;
    const int code = pipe_->errorCode();
    pipe_.reset();
    return code == QvStatus::outOfMemory ? code : QvStatus::failed;
}

int SegmentAudio::start(bool bounded, std::string& why) {
    ended_ = counting_ = false;
    samplesRead_ = clipped_ = 0;
    if (!measured_) pipe_.reset();
    started_ = true;
    QvDecodePipe& decoder = *input_.decoder;
    if (!decoder.isSelected(qvAudioStream, input_.number)) {
        if (const int result = decoder.select(qvAudioStream, input_.number))
            return failedWith(result, decoder, why);
    }
    const MediaTime last = input_.duration();
    const MediaTime from = std::min(span_.in + delay_, last);
    const bool nothing = from >= last;
    const int result = nothing ? QvStatus::endOfStream : decoder.seek(from, qvAudioStream, input_.number);
    ended_ = result == QvStatus::endOfStream;
    if (result != QvStatus::ok && !ended_) return failedWith(result, decoder, why);
    first_ = from.position(samplerate_);
    end_ = std::max((span_.out + delay_).position(samplerate_), first_);
    sound_.setAvailable(decoder.nrSamples(input_.number) - first_);
    sound_.setLeft(bounded ? end_ - first_ : BoundedSound::unbounded);
    if (!converts_ || ended_) return QvStatus::ok;
    if (pipe_)
        pipe_->close();
    else if (const int built = build(why))
        return built;
    return openPipe(why);
}

int SegmentAudio::read(int n, QvPcm& to, std::string& why) {
    if (!counting_) countClipping();
    int result = pipe_ ? pipe_->process(&sound_, input_.number, n) : sound_.readSamples(n, input_.number);
    if (result < 0 && result != QvStatus::endOfStream)
        return pipe_ ? failedWith(result, *pipe_, why) : failedWith(result, sound_, why);
    const QvPcm* from = pipe_ ? pipe_->pcm() : sound_.getAudioPtr(input_.number);
    const int held = from && from->inited() ? std::min(from->samples(), n) : 0;
    ended_ = result == QvStatus::endOfStream || held < n;
    if (held < 1) return QvStatus::ok;
    result = append(*from, held, to, why);
    if (pipe_) pipe_->erase(held);
    return result;
}

// Other segments may have read the same part of the source, and its count begins with 0 here.
void SegmentAudio::countClipping() {
    counting_ = true;
    try {
        input_.decoder->setParam("clipRange", AnyVector(Any(first_), Any(end_)));
    } catch (const QvParamException&) {  // it clips nothing
    }
}

long long SegmentAudio::clipped() const {
    return counting_ ? input_.decoder->getAudioParam(input_.number, "clippedSamples").asInt64(0) : clipped_;
}

int SegmentAudio::append(const QvPcm& from, int n, QvPcm& to, std::string& why) const {
    const bool same = to.channels() == from.channels() && to.bytesPerSample() == from.bytesPerSample();
    if (!same && to.samples() > 0) {
        why = "The sound of two segments differs in its format";
        return QvStatus::failed;
    }
    if (!same && to.init(n, from.channels(), from.bytesPerSample(), from.samplerate()) != QvStatus::ok)
        return QvStatus::outOfMemory;
    return to.write(n, from.ptr(0));
}

int SegmentAudio::stop(std::string& why) {
    if (!started_) return QvStatus::ok;
    started_ = false;
    int result = QvStatus::ok;
    if (pipe_) {
        result = pipe_->close();
        if (result != QvStatus::ok) why = pipe_->errorDesc();
        if (!measured_) pipe_.reset();
    }
    clipped_ = clipped();
    counting_ = false;
    input_.decoder->deselect(qvAudioStream, input_.number);
    return result;
}
