#include "builtin/encoders/qvdummyaudio.h"

#include "builtin/creators.h"
#include "builtin/shared/muxerof.h"
#include "core/arch/qvassert.h"
#include "core/media/qvbuffer.h"
#include "core/stream/qvbufstrm.h"

int DummyAudioEnc::setParam(const char* name, const Any& value) {
    _traceParam(name, value);
    if (muxer_) return muxer_->setParam(name, value);
    waiting_.set(name, value);
    return QvStatus::ok;
}

void DummyAudioEnc::getParam(const char* name, Any& value) const {
    if (muxer_) muxer_->getParam(name, value);
    if (!value.isValid()) value = waiting_.get(name);
    if (!value.isValid()) QvAudioEncoder::getParam(name, value);
}

int DummyAudioEnc::attachOutStream(QvBufStream* stream) {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    auto* muxer = stream ? qvMuxerOf(*stream) : nullptr;
    if (!muxer) return setError(QvStatus::failed, "Can  not attach dummy audio, output not a muxer");
    if (const int result = QvAudioEncoder::attachOutStream(stream)) return result;
    muxer_ = muxer;
    muxer_->setParamDict(waiting_);
    waiting_.clear();
    return QvStatus::ok;
}

int DummyAudioEnc::detachOutStream() {
    muxer_ = nullptr;
    return QvAudioEncoder::detachOutStream();
}

int DummyAudioEnc::open() {
    QV_ASSERT_MSG(getState() == stateInitialised, "not inited");
    if (!outStream()) return setError(QvStatus::failed, "Output stream not attached");
    setState(qvStateOpen);
    return QvStatus::ok;
}

int DummyAudioEnc::close() {
    if (getState() == qvStateOpen) setState(stateInitialised);
    return QvStatus::ok;
}

int DummyAudioEnc::writePcm(QvPcm* pcm, int samples) {
    if (getState() != qvStateOpen) return setError(QvStatus::illegalState, "Not opened");
    if (!pcm) return setError(QvStatus::invalidArgument, "No samples given");
    if (samples < 0) samples = pcm->samples();
    if (samples > pcm->samples())
        return setError(QvStatus::invalidArgument, "%d samples asked for, %d given", samples, pcm->samples());
    if (samples == 0) return QvStatus::ok;
    auto* out = outStream()->input();
    const auto bytes = static_cast<unsigned>(pcm->samples2bytes(samples));
    const unsigned written = out ? out->copybytes(out, pcm->ptr(0), bytes) : 0;
    if (written == bytes) return QvStatus::ok;
    return setError(QvStatus::failed, "Audio write pcm failed, bytes to write %u, but %u written\n!", bytes,
                    written);
}

QvCodec* newDummyaenc() { return new DummyAudioEnc; }
