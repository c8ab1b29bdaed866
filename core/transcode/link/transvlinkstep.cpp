// The video link: one step, from a decoder's frame to the encoder.
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvprocesspipe.h"
#include "core/image/qvimage.h"
#include "core/transcode/link/steplog_p.h"
#include "core/transcode/link/translink.h"

namespace {

constexpr int iconWidth = 80;
constexpr int iconHeight = 60;

}  // namespace

struct TransVLink::Step {
    QvFrame* frame = nullptr;  // to write, owned by the pipe or the decoder
    int read = QvStatus::ok;
    int write = QvStatus::ok;
    bool smart = false;  // the encoder takes the coded data itself
};

int TransVLink::processFrame(int) {
    QV_STEP_LOG("VLink", "processFrame");
    Step step;
    step.smart = encoder_->getParam("video0/smartRenderingOn").isTrue();
    if (step.smart) {
        smartStep(step);
    } else {
        if (videoPipe_)
            pipeStep(step);
        else
            directStep(step);
        if (step.frame) writeStep(step);
    }
    endStep(step);
    ++framesWritten_;
    if (finished_ && (step.frame || step.smart) && outProcessed() % 2 != 0) repeatLast(step);
    // The frame was needed up to here.
    if (videoPipe_ && step.frame) videoPipe_->next();
    QV_STEP_LOG("VLink", "processFrame done, result=%d", step.write);
    return step.write;
}

int TransVLink::writeFrame(QvFrame* frame) { return encoder_->writeFrame(frame, encStreamNr_); }

void TransVLink::smartStep(Step& step) {
    QV_STEP_LOG("VLink", "writeFrame (sr)...");
    step.read = writeFrame(nullptr);
    QV_STEP_LOG("VLink", "writeFrame (sr) done, result=%d", step.read);
    if (framesWritten_ == 0) makeIcon(decoder_->getFramePtr(decStreamNr_));
}

void TransVLink::pipeStep(Step& step) {
    if (videoPipe_->ready() == 0) {
        QV_STEP_LOG("VLink", "vprocess...");
        try {
            step.read = _processOneFrame();
        } catch (const QvAssertFailure& failure) {
            pipeFailed(failure);
            throw;
        }
        QV_STEP_LOG("VLink", "vprocess done, result=%d", step.read);
        if (step.read == QvStatus::endOfStream) {
            qv_dbg()->debug("VLink @ %p: End of input stream", static_cast<void*>(this));
            step.read = QvStatus::ok;
        }
    }
    if (videoPipe_->ready() > 0) step.frame = videoPipe_->frame();
}

void TransVLink::directStep(Step& step) {
    QV_STEP_LOG("VLink", "readFrame...");
    step.read = decoder_->readFrame(decStreamNr_);
    QV_STEP_LOG("VLink", "readFrame done, result=%d", step.read);
    if (step.read == QvStatus::endOfStream) {
        qv_dbg()->debug("VLink @ %p: End of input stream", static_cast<void*>(this));
        step.read = QvStatus::ok;
        return;
    }
    if (step.read != QvStatus::ok) return;
    step.frame = decoder_->getFramePtr(decStreamNr_);
    feedMetaSources(step.frame);
}

void TransVLink::writeStep(Step& step) {
    QV_STEP_LOG("VLink", "writeFrame no=%d...", step.frame->frameNr);
    step.write = writeFrame(step.frame);
    QV_STEP_LOG("VLink", "writeFrame done, result=%d", step.write);
    if (step.write != QvStatus::ok) copyError(step.write, encoder_->videoEncoder(encStreamNr_)->errorDesc());
    if (framesWritten_ == 0) makeIcon(step.frame);
}

void TransVLink::endStep(Step& step) {
    const bool last = framesWritten_ >= nrFramesOut_ - 1;
    const bool nothing = !step.frame && !step.smart;
    if (!nothing && !last && step.read == QvStatus::ok) return;
    qv_dbg()->debug("VLink @ %p: Video processing done, frames out: %d (%d expected), frames in: %d.",
                    static_cast<void*>(this), framesWritten_ + 1, nrFramesOut_, nrFramesIn_);
    if (step.read != QvStatus::ok && !last) {
        qv_dbg()->log(QvLogMask::error, "VLink @ %p: Read error \n", static_cast<void*>(this));
        copyError(step.read, step.smart ? Any("Read error") : Any(decoder_->errorDesc()));
        step.write |= step.read;
    }
    finished_ = true;
}

void TransVLink::repeatLast(Step& step) {
    auto* encoder = encoder_->videoEncoder(encStreamNr_);
    if (!encoder || !encoder->getParam("_needEven").isTrue()) return;
    qv_log()->info("Repeating last frame to achieve even number (required by format)");
    qvSetOptionalParam(*encoder, "_repeatingLast", 1);
    step.write |= writeFrame(step.frame);
    ++framesWritten_;
}

int TransVLink::_processOneFrame() {
    int result = videoPipe_->process(nullptr, 0);
    while (result == QvStatus::needsInput) {
        const int read = decoder_->readFrame(decStreamNr_);
        QvFrame* frame = read == QvStatus::endOfStream ? completePair() : nullptr;
        if (read != QvStatus::ok && !frame) return read;
        if (read == QvStatus::ok) {
            frame = decoder_->getFramePtr(decStreamNr_);
            if (!frame) return QvStatus::failed;
            feedMetaSources(frame);
        }
        videoPipe_->write(*frame);
        result = videoPipe_->process(nullptr, 0);
    }
    return result;
}

// Where a halving takes one frame more than the stream has, the last one serves twice; otherwise null.
QvFrame* TransVLink::completePair() {
    if (!pairCompleted_ || static_cast<int>(videoPipe_->framesIn()) + 1 != nrFramesIn_) return nullptr;
    QvFrame* last = decoder_->getFramePtr(decStreamNr_);
    if (!last || !last->inited() || last->frameNr < 0) return nullptr;
    ++last->frameNr;
    last->clearUserData();
    last->clearSubpic();
    return last;
}

// A frame carries the captions of its own time, or none.
void TransVLink::feedMetaSources(QvFrame* frame) {
    if (!frame) return;
    for (const auto& source : metaSources_) {
        if (source->decoder != decoder_ || source->stream != decStreamNr_)
            source->decoder->readFrame(source->stream);
        AnyDict captions;
        if (source->decoder->readMeta(source->stream, 0, captions) == QvStatus::ok)
            frame->setSubpic(captions);
        else
            frame->clearSubpic();
    }
}

// Formats that show a small picture of the stream in a folder get it from the first frame.
void TransVLink::makeIcon(QvFrame* frame) const {
    auto* muxer = encoder_->getMuxer();
    if (!muxer || !frame || !encoder_->videoEncoder(0) || !muxer->getParam("needBMP").isTrue()) return;
    const Any name = QvFile::changeExt(muxer->getParam("filename"), "BMP");
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("scaler2"));
    auto* scaler =
        codec ? static_cast<QvVideoFilter*>(codec->getInterface(QvModuleType::videoFilter)) : nullptr;
    if (!scaler) return;
    scaler->setParam("outWidth", iconWidth);
    scaler->setParam("outHeight", iconHeight);
    scaler->setParam("FOURCC", static_cast<int>(QvFourcc::BGR3));
    if (scaler->open() != QvStatus::ok || scaler->write(*frame) != QvStatus::ok || scaler->ready() == 0)
        return;
    qv_log()->info("Creating video stream icon %s", name.toString().asString(""));
    QvImage::saveFrame(*scaler->frame(), name, QvImage::bmp);
    scaler->close();
}
