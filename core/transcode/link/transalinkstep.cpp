// The audio link: one step, which writes the samples that are due.
#include <algorithm>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/status.h"
#include "core/filter/qvprocesspipe.h"
#include "core/transcode/link/steplog_p.h"
#include "core/transcode/link/translink.h"

int TransALink::processFrame(int n) {
    QV_ASSERT(n != -1);
    QV_STEP_LOG("ALink", "processFrame");
    if (n < 1) {
        QV_STEP_LOG("ALink", "nothing to process");
        return QvStatus::ok;
    }
    if (smartRendering_) return smartStep(n);
    if (finished_) {
        QV_STEP_LOG("ALink", "silence samples=%d", n);
        return _insertSilence(n);
    }
    return audioPipe_ ? pipeStep(n) : directStep(n);
}

int TransALink::smartStep(int n) {
    QV_STEP_LOG("ALink", "writeFrame sample =%d...", n);
    const int result = audioEncoder()->writePcm(nullptr, n);
    processed_ += n;
    finished_ = processed_ >= totalOutSamples_ - 1;
    ++steps_;
    if (finished_) logDone("Audio smart rendering done");
    return result;
}

// From the decoder's buffer straight to the encoder.
int TransALink::directStep(int n) {
    auto* pcm = decoder_->getAudioPtr(decStreamNr_);
    QV_STEP_LOG("ALink", "read samples %d", n);
    const int read = decoder_->readSamples(n, decStreamNr_);
    QV_STEP_LOG("ALink", "read samples done, result=%d", read);
    if (read < n) {
        finished_ = true;
        if (!worked_) return readFailed();
    }
    int result = QvStatus::ok;
    const bool holds = pcm && pcm->inited() && pcm->samples() > 0;
    if (holds && (read >= 0 || read == QvStatus::endOfStream)) {
        QV_STEP_LOG("ALink", "writePcm samples=%d", pcm->samples());
        result = audioEncoder()->writePcm(pcm, -1);
        QV_STEP_LOG("ALink", "writePcm done result=%d", result);
        processed_ += pcm->samples();
    }
    return endStep(result);
}

// What the pipe has beyond the samples that are due stays in it.
int TransALink::pipeStep(int n) {
    QV_STEP_LOG("ALink", "aprocess samples=%d", n);
    const int processed = audioPipe_->process(decoder_, decStreamNr_, n);
    QV_STEP_LOG("ALink", "aprocess done, result=%d", processed);
    if (processed != QvStatus::ok) {
        finished_ = true;
        if (!worked_) return readFailed();
    }
    auto* pcm = audioPipe_->pcm();
    const int count = std::min(audioPipe_->samples(), n);
    int result = QvStatus::ok;
    if (pcm && count > 0) {
        QV_STEP_LOG("ALink", "writePcm samples=%d", count);
        result = audioEncoder()->writePcm(pcm, count);
        QV_STEP_LOG("ALink", "writePcm done, result=%d", result);
        processed_ += count;
        audioPipe_->erase(count);
    }
    return endStep(result);
}

int TransALink::endStep(int result) {
    if (result != QvStatus::ok) copyError(result, audioEncoder()->errorDesc());
    if (processed_ >= totalOutSamples_ - 1) finished_ = true;
    ++steps_;
    if (finished_) logDone("Audio processing done");
    worked_ = true;
    QV_STEP_LOG("ALink", "processFrame done, result=%d", result);
    return result == QvStatus::endOfStream ? QvStatus::ok : result;
}

int TransALink::readFailed() {
    return setError(QvStatus::failed,
                    Any::sprintf("ALink @ %p: Audio error, can not read samples", static_cast<void*>(this)));
}

void TransALink::logDone(const char* what) const {
    qv_dbg()->debug("ALink @ %p: %s, transcoded %lld samples (%lld was expected), last video frame is %d",
                    static_cast<const void*>(this), what, processed_ + 1, totalOutSamples_, steps_);
}

bool TransALink::prepareSilence(int n) {
    const bool fits = silence_.inited() && silence_.channels() == outChannels_ &&
                      silence_.bytesPerSample() == outBytesPerSample_ && silence_.size() >= n;
    if (!fits && silence_.init(n, outChannels_, outBytesPerSample_, outSamplerate_) != QvStatus::ok)
        return false;
    if (silence_.samples() == n) return true;
    silence_.setSamples(0);
    return silence_.addSilence(n) == QvStatus::ok;
}

int TransALink::_insertSilence(int n) {
    QV_ASSERT(n != -1);
    if (n < 1) return QvStatus::ok;
    if (!prepareSilence(n)) return setError(QvStatus::outOfMemory, "no memory for silence");
    audioEncoder()->writePcm(&silence_, -1);
    processed_ += n;
    if (!silenceLogged_)
        qv_log()->info("Audio stream shorter than the video stream, inserting silence at the end.");
    silenceLogged_ = true;
    return QvStatus::ok;
}
