#include "core/transcode/link/video/transvlink.h"

#include <algorithm>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/qvutil.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/streamformat.h"
#include "core/measure/mediarange.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/link/linkopen_p.h"
#include "core/transcode/link/steplog_p.h"
#include "core/transcode/link/video/encodertraits_p.h"
#include "core/transcode/link/video/qualitylog_p.h"
#include "core/transcode/link/video/smartrender_p.h"
#include "core/transcode/link/video/streamicon_p.h"
#include "core/transcode/link/video/totalframes_p.h"

namespace {

int views(const Any& value) { return std::max(value.asInt32(1), 1); }

}  // namespace

struct TransVLink::Step {
    QvFrame* frame = nullptr;  // to write, owned by the pipe or the decoder
    int read = QvStatus::ok;
    int write = QvStatus::ok;
    bool smart = false;  // the encoder takes the coded data itself
};

TransVLink::TransVLink()
    : range_(std::make_unique<QvFrameRange>()), smartRender_(std::make_unique<SmartRender>()) {}

TransVLink::TransVLink(const TransVLink& other) : TransVLink() { *this = other; }

TransVLink& TransVLink::operator=(const TransVLink& other) {
    if (this == &other) return *this;
    if (opened_) TransVLink::close();
    TransLink::operator=(other);
    outFramerate_ = other.outFramerate_;
    *range_ = *other.range_;
    framesWritten_ = -1;
    decViews_ = other.decViews_;
    encViews_ = other.encViews_;
    metaSources_.clear();
    for (const auto& source : other.metaSources_)
        metaSources_.push_back(std::make_unique<MetaVHelper>(*source));
    return *this;
}

TransVLink::~TransVLink() {
    if (opened_) TransVLink::close();
}

int TransVLink::init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) {
    TransLink::init(decoder, decStream, encoder, encStream);
    if (!decoder->isSelected(qvVideoStream, decStream)) {
        qv_dbg()->log(QvLogMask::error, "Can not init translink video, decoder stream not selected");
        QV_FAIL_PLAIN();
    }
    if (encStream < 0) {
        qv_dbg()->log(QvLogMask::error, "Cannot link, encoder stream not available");
        QV_FAIL_PLAIN();
    }
    if (encStream >= encoder->nrVideoStreams()) {
        qv_dbg()->log(QvLogMask::error, "Invalid encoder video stream nr %d", encStream);
        return QvStatus::failed;
    }
    nameStreams();
    decViews_ = views(decoder->getVideoParam(decStream, "nrViews"));
    encViews_ = views(encoder->getParam(_encPar("nrViews").asString()));
    if (encViews_ > 1 && decViews_ < encViews_)
        qv_log()->warning("Multi-view: only %d views in input, encoder requires %d views", decViews_,
                          encViews_);
    if (decViews_ > encViews_)
        qv_log()->warning(
            "Multi-view: too many views in input for the encoder, excess views will be ignored.");
    return QvStatus::ok;
}

int TransVLink::openWith(const LinkOpen& given) {
    if (opened_) return QvStatus::failed;
    videoPipe_.reset();
    readLogProgress();
    if (given.frameNumbers) QV_FAIL("startFrame and stopFrame are deprecated. Use inOutPoints.");
    AnyDict stream;
    decoder_->getStreamParams(qvVideoStream, decStreamNr_, stream);
    const VideoFormat in(stream);
    job_ = VideoJobDescription();
    if (const int result = readRates(in)) return result;
    if (const int result = takeRange(given, in)) return result;
    const bool chapters = applyChapters(given);
    describeJob(given, in);
    QV_ASSERT(decViews_ >= encViews_);
    if (const int result = buildPipe()) return result;
    QvProcessUtil::adjustVideoEncoder(job_, videoPipe_.get(), encoder_, encStreamNr_);
    smartRender_->negotiate(*decoder_, decStreamNr_, *encoder_, encStreamNr_, job_, videoPipe_.get(), *range_,
                            given.passPicture && !chapters);
    prepareMetaSources();
    requestUserData();
    finished_ = false;
    framesWritten_ = 0;
    qualityLog_ = QualityLog::start(given.qualityStats, *encoder_, encStreamNr_);
    opened_ = true;
    return QvStatus::ok;
}

int TransVLink::readRates(const VideoFormat& in) {
    if (!in.hasRate()) return setError(QvStatus::failed, "Could not get 'framerate' from decoder");
    const Any out = encoder_->getParam(_encPar("framerate").asString());
    if (!out.isFramerate() || out.asFramerate().rate().ratio() <= 0)
        return setError(QvStatus::failed, "Could not get 'framerate' from encoder");
    job_.inFramerate = in.framerate;
    job_.outFramerate = outFramerate_ = out.asFramerate();
    return QvStatus::ok;
}

int TransVLink::takeRange(const LinkOpen& given, const VideoFormat& in) {
    const bool points = takePoints(given, qvInstantOf(in.frames, in.framerate.rate()));
    qv_dbg()->debug("%s", points ? "VLink.open: In/out points are set"
                                 : "VLink.open: In/out points constructed from total duration");
    QvFrameRange range(inPoint(), outPoint(), in.framerate);
    qv_dbg()->debug("VLink.open: in=%f, out=%f (sec)", inPoint().seconds(), outPoint().seconds());
    qv_dbg()->debug("VLink.open: Start frame=%d, end frame=%d", range.start, range.stop);
    if (points && range.empty()) return setError(QvStatus::failed, "The out point is not after the in point");
    range.convert(in.framerate, outFramerate_);
    *range_ = range;
    lastFrame_ = given.holdLast ? in.frames - 1 : -1;
    held_ = 0;
    return QvStatus::ok;
}

// True when the encoder got at least one chapter point.
bool TransVLink::applyChapters(const LinkOpen& given) {
    if (given.chapters.empty()) return false;
    AnyVector points;
    QvProcessUtil::rescaleTimePoints(given.chapters, job_.inFramerate, outFramerate_, &points);
    qv_dbg()->debug("Vlink.open: applying %d chapter points", points.size());
    qvSetOptionalParam(*encoder_->videoEncoder(encStreamNr_), "chapters", points);
    return true;
}

void TransVLink::describeJob(const LinkOpen& given, const VideoFormat& in) {
    const EncoderTraits out(*encoder_, encStreamNr_);
    job_.inFOURCC = in.fourcc;
    job_.inFrameAspect = in.frameAspect;
    job_.inWidth = in.width;
    job_.inHeight = in.height;
    job_.cancel = cancel_;
    job_.startFrame = range_->start;
    job_.stopFrame = range_->stop;
    job_.topBlankingLines = out.topBlankingLines;
    job_.outFOURCC = out.formatFor(in.fourcc);
    job_.outWidth = out.width;
    job_.outHeight = out.height;
    job_.filters = given.effects;
}

int TransVLink::buildPipe() {
    try {
        videoPipe_.reset(QvProcessUtil::createVideoPipeMV(job_, encViews_));
    } catch (const QvAssertFailure& failure) {
        return pipeFailed(failure);
    }
    _setTotalVDuration();
    return QvStatus::ok;
}

void TransVLink::_setTotalVDuration() {
    if (videoPipe_) qvSetTotalFrames(*videoPipe_, range_->in, range_->out);
}

void TransVLink::prepareMetaSources() {
    for (const auto& source : metaSources_) {
        qvSetOptionalParam(*encoder_->videoEncoder(encStreamNr_), "ccMode",
                           static_cast<const AnyDict&>(source->params));
        // It is read once a frame, whatever rate its own times are written at.
        if (source->decoder != decoder_) qvSetOptionalParam(*source->decoder, "readRate", job_.inFramerate);
    }
}

// Reading them may cost a source time, so it does only what is wanted.
void TransVLink::requestUserData() {
    bool wanted = encoder_->getParam(_encPar("takesUserData").asString()).isTrue();
    for (int i = 0; videoPipe_ && i < videoPipe_->nrFilters() && !wanted; ++i)
        wanted = videoPipe_->filter(i)->getParam("takesUserData").isTrue();
    if (wanted && !decoder_->readUserData(qvVideoStream, decStreamNr_))
        decoder_->setReadUserData(qvVideoStream, decStreamNr_, true);
}

int TransVLink::close() {
    if (!opened_) return QvStatus::ok;
    if (qualityLog_) qualityLog_->finish(*encoder_, encStreamNr_);
    qualityLog_.reset();
    const int result = videoPipe_ ? closePipe(*videoPipe_) : QvStatus::ok;
    videoPipe_.reset();
    qv_dbg()->debug("VLink @ %p: closed, %d frames written", static_cast<void*>(this), framesWritten_);
    framesWritten_ = -1;
    opened_ = false;
    return result;
}

int TransVLink::totalOutFrames() const { return range_->out; }
int TransVLink::nrFramesIn() const { return range_->in; }
int TransVLink::startFrame() const { return range_->start; }
int TransVLink::stopFrame() const { return range_->stop; }

double TransVLink::completed() const { return range_->out > 0 ? framesWritten_ * 100.0 / range_->out : 0.0; }

QvCodec* TransVLink::filter(const char* name, int index) const {
    return videoPipe_ ? videoPipe_->filter(name, index) : nullptr;
}

int TransVLink::addMetaSource(QvDecodePipe* decoder, int, int stream, const MetaProcessParams& params) {
    metaSources_.push_back(std::make_unique<MetaVHelper>(MetaVHelper{decoder, stream, params}));
    return QvStatus::ok;
}

int TransVLink::nrMetaSources() const { return static_cast<int>(metaSources_.size()); }

QvDecodePipe* TransVLink::metaSource(int index) const {
    if (index < 0 || index >= nrMetaSources()) return nullptr;
    return metaSources_[static_cast<std::size_t>(index)]->decoder;
}

int TransVLink::metaSourceStreamNr(int index) const {
    if (index < 0 || index >= nrMetaSources()) return -1;
    return metaSources_[static_cast<std::size_t>(index)]->stream;
}

void TransVLink::log() {
    if (!decoder_ || !encoder_) {
        qv_dbg()->debug("missing components");
        return;
    }
    qv_dbg()->debug("--- VLink @ %p ---", static_cast<void*>(this));
    qv_dbg()->debug("Input: '%s' @ %p video #%d:", decoder_->name(), static_cast<void*>(decoder_),
                    decStreamNr_);
    AnyDict stream;
    decoder_->getStreamParams(qvVideoStream, decStreamNr_, stream);
    QvUtil::debugOutDict(stream);
    qv_dbg()->debug("---");
    const auto* encoder = encoder_->videoEncoder(encStreamNr_);
    if (!encoder) {
        qv_dbg()->debug("No video encoder?");
        return;
    }
    qv_dbg()->debug("Output: '%s' @ %p video #%d", encoder->name(), static_cast<const void*>(encoder),
                    encStreamNr_);
    logEncoder(*encoder, {"profile", "type", "pal", "width", "height", "frameAspect", "bitrate",
                          "quantization", "framerate", "N", "M", "chroma"});
    if (!videoPipe_ || videoPipe_->nrFilters() == 0) return;
    qv_dbg()->debug("---");
    qv_dbg()->debug("Processing:");
    for (int i = 0; i < videoPipe_->nrFilters(); ++i) logFilter(i + 1, *videoPipe_->filter(i));
}

// --- One step.

int TransVLink::processFrame(int) {
    QV_STEP_LOG("VLink", "processFrame");
    Step step;
    step.smart = smartRender_->isOn(*encoder_);
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
    if (framesWritten_ == 0) qvMakeStreamIcon(*encoder_, decoder_->getFramePtr(decStreamNr_));
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
    step.read = readFrame();
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
    if (framesWritten_ == 0) qvMakeStreamIcon(*encoder_, step.frame);
}

void TransVLink::endStep(Step& step) {
    const bool last = framesWritten_ >= range_->out - 1;
    const bool nothing = !step.frame && !step.smart;
    if (!nothing && !last && step.read == QvStatus::ok) return;
    qv_dbg()->debug("VLink @ %p: Video processing done, frames out: %d (%d expected), frames in: %d.",
                    static_cast<void*>(this), framesWritten_ + 1, range_->out, range_->in);
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

// Where the last frame is held it is read again, as filters may have changed what the decoder gave.
int TransVLink::readFrame() {
    const int result = held_ == 0 ? decoder_->readFrame(decStreamNr_) : QvStatus::endOfStream;
    if (result != QvStatus::endOfStream || lastFrame_ < 0) return result;
    if (decoder_->seekToFrame(lastFrame_, decStreamNr_) != QvStatus::ok) return QvStatus::failed;
    const int again = decoder_->readFrame(decStreamNr_);
    QvFrame* frame = decoder_->getFramePtr(decStreamNr_);
    if (again != QvStatus::ok || !frame) return QvStatus::failed;
    frame->frameNr = lastFrame_ + ++held_;
    frame->clearUserData();
    frame->clearSubpic();
    return again;
}

int TransVLink::_processOneFrame() {
    int result = videoPipe_->process(nullptr, 0);
    while (result == QvStatus::needsInput) {
        const int read = readFrame();
        QvFrame* frame = read == QvStatus::endOfStream ? completePair() : nullptr;
        if (read != QvStatus::ok && !frame) return read;
        if (read == QvStatus::ok) {
            frame = decoder_->getFramePtr(decStreamNr_);
            if (!frame) return QvStatus::failed;
            feedMetaSources(frame);
        }
        videoPipe_->write(*frame);
        result = videoPipe_->process(nullptr, 0);
        if (result == QvStatus::needsInput && losesAll()) return videoPipe_->errorCode();
    }
    return result;
}

// A filter that fails may lose every frame, and there are decoders without an end.
bool TransVLink::losesAll() const {
    const int error = videoPipe_->errorCode();
    if (error == QvStatus::ok) return false;
    return error == QvStatus::outOfMemory || static_cast<int>(videoPipe_->framesIn()) >= range_->in;
}

// Where a halving takes one frame more than the stream has, the last one is taken twice; otherwise null.
QvFrame* TransVLink::completePair() {
    if (!range_->pairCompleted || static_cast<int>(videoPipe_->framesIn()) + 1 != range_->in) return nullptr;
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
