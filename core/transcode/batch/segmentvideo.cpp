#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/streamformat.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/batch/segmentvideo_p.h"
#include "core/transcode/link/video/totalframes_p.h"

namespace {

constexpr const char* openFailed = "Failed to open video process pipe";

bool sameConversion(const VideoJobDescription& a, const VideoJobDescription& b) {
    return a.inFOURCC == b.inFOURCC && a.inWidth == b.inWidth && a.inHeight == b.inHeight &&
           a.inFramerate == b.inFramerate && a.inFrameAspect == b.inFrameAspect &&
           a.outFOURCC == b.outFOURCC && a.outWidth == b.outWidth && a.outHeight == b.outHeight &&
           a.outFramerate == b.outFramerate && a.topBlankingLines == b.topBlankingLines &&
           Any(a.filters) == Any(b.filters);
}

int failedWith(int status, const QvCodec& codec, std::string& why) {
    why = codec.errorDesc();
    return status;
}

}  // namespace

SegmentVideo::SegmentVideo(const QvIStream& input) : input_(input) {}

SegmentVideo::~SegmentVideo() = default;

SegmentSpan SegmentVideo::span(const QvFramerate& outRate) const {
    const Any rate = input_.decoder->getVideoParam(input_.number, "framerate");
    return rate.isFramerate() ? qvSegmentSpan(input_, rate.asFramerate().rate(), outRate.rate())
                              : SegmentSpan();
}

int SegmentVideo::prepare(const VideoJobDescription& output, const SegmentVideo* like, std::string& why) {
    AnyDict params;
    input_.decoder->getStreamParams(qvVideoStream, input_.number, params);
    const VideoFormat in(params);
    if (!in.hasRate()) {
        why = "Could not get 'framerate' from decoder";
        return QvStatus::failed;
    }
    job_ = output;
    job_.inFOURCC = in.fourcc;
    job_.inWidth = in.width;
    job_.inHeight = in.height;
    job_.inFramerate = in.framerate;
    job_.inFrameAspect = in.frameAspect;
    if (const auto filters = input_.params.filters()) job_.filters = *filters;
    span_ = qvSegmentSpan(input_, in.framerate.rate(), output.outFramerate.rate());
    job_.startFrame = static_cast<int>(span_.first);
    job_.stopFrame = static_cast<int>(span_.first + span_.count - 1);
    if (like && sameConversion(job_, like->job_)) {
        converts_ = like->converts_;
        takesUserData_ = like->takesUserData_;
        return QvStatus::ok;
    }
    const int result = build(why);
    converts_ = pipe_ != nullptr;
    takesUserData_ = filtersTakeUserData();
    pipe_.reset();
    return result;
}

int SegmentVideo::build(std::string& why) {
    try {
        pipe_.reset(QvProcessUtil::createVideoPipe(job_));
    } catch (const QvAssertFailure& failure) {
        qv_dbg()->error("%s", failure.what());
        why = openFailed;
        return dynamic_cast<const QvMemoryFailure*>(&failure) ? QvStatus::outOfMemory : QvStatus::failed;
    }
    if (pipe_) qvSetTotalFrames(*pipe_, span_.count, span_.owed);
    return QvStatus::ok;
}

bool SegmentVideo::filtersTakeUserData() const {
    for (int i = 0; pipe_ && i < pipe_->nrFilters(); ++i)
        if (pipe_->filter(i)->getParam("takesUserData").isTrue()) return true;
    return false;
}

int SegmentVideo::start(std::string& why) {
    pipe_.reset();
    ended_ = delivered_ = false;
    inputRead_ = 0;
    framesRead_ = 0;
    started_ = true;
    QvDecodePipe& decoder = *input_.decoder;
    if (!decoder.isSelected(qvVideoStream, input_.number)) {
        if (const int result = decoder.select(qvVideoStream, input_.number))
            return failedWith(result, decoder, why);
    }
    if (takesUserData_ && !decoder.readUserData(qvVideoStream, input_.number))
        decoder.setReadUserData(qvVideoStream, input_.number, true);
    const bool nothing = span_.owed < 1;
    const int result = nothing ? QvStatus::endOfStream : decoder.seek(span_.in, qvVideoStream, input_.number);
    ended_ = result == QvStatus::endOfStream;
    if (result != QvStatus::ok && !ended_) return failedWith(result, decoder, why);
    return converts_ && !ended_ ? build(why) : QvStatus::ok;
}

int SegmentVideo::read(QvFrame*& frame, std::string& why) {
    if (ended_ || framesRead_ >= span_.owed) return QvStatus::endOfStream;
    const int result = pipe_ ? readConverted(frame, why) : readDirect(frame, why);
    if (result == QvStatus::ok)
        ++framesRead_;
    else if (result == QvStatus::endOfStream)
        ended_ = true;
    return result;
}

// A frame of the decoder. Filters may ask for more than the segment has: it ends at the out point.
int SegmentVideo::readInput(std::string& why) {
    if (inputRead_ >= span_.count) return QvStatus::endOfStream;
    const int result = input_.decoder->readFrame(input_.number);
    if (result == QvStatus::ok)
        ++inputRead_;
    else if (result != QvStatus::endOfStream)
        why = input_.decoder->errorDesc();
    return result;
}

int SegmentVideo::readDirect(QvFrame*& frame, std::string& why) {
    if (const int result = readInput(why)) return result;
    frame = input_.decoder->getFramePtr(input_.number);
    if (frame) return QvStatus::ok;
    why = "the decoder gave no frame";
    return QvStatus::failed;
}

int SegmentVideo::readConverted(QvFrame*& frame, std::string& why) {
    if (delivered_) pipe_->next();
    delivered_ = false;
    while (pipe_->ready() <= 0) {
        int result = pipe_->process(nullptr, 0);
        if (result == QvStatus::needsInput) {
            QvFrame* input = nullptr;
            if (const int read = readDirect(input, why)) return read;
            result = pipe_->write(*input) == QvStatus::outOfMemory ? QvStatus::outOfMemory : QvStatus::ok;
        }
        // Frames pass a filter that fails unchanged, or not at all.
        if (result == QvStatus::ok) result = pipe_->errorCode();
        if (result != QvStatus::ok && result != QvStatus::warning) return failedWith(result, *pipe_, why);
    }
    frame = pipe_->frame();
    delivered_ = true;
    return QvStatus::ok;
}

int SegmentVideo::stop(std::string& why) {
    if (!started_) return QvStatus::ok;
    started_ = false;
    int result = QvStatus::ok;
    if (pipe_) {
        result = pipe_->close();
        if (result != QvStatus::ok) why = pipe_->errorDesc();
        pipe_.reset();
    }
    delivered_ = false;
    input_.decoder->deselect(qvVideoStream, input_.number);
    return result;
}
