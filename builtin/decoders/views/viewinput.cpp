#include "builtin/decoders/views/viewinput.h"

#include <algorithm>

#include "builtin/shared/inputnesting.h"
#include "core/arch/qvexception.h"
#include "core/decode/decodefactory.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/status.h"

namespace {

std::string sizeText(const ViewInput& input) {
    return std::to_string(input.width()) + "x" + std::to_string(input.height());
}

std::string rateText(const QvFramerate& rate) {
    const char* scan = rate.interlaced() == 0 ? "" : rate.isTopFirst() ? ", top first" : ", bottom first";
    return std::to_string(rate.rate().num) + "/" + std::to_string(rate.rate().den) + " frames/s" + scan;
}

std::string formatText(unsigned fourcc) { return qvFourccText(fourcc).data(); }

}  // namespace

std::string ViewInput::open(const QvViewSetup::View& view, const Any* params) {
    const bool hasFile = view.file.size() > 0;
    name_ = hasFile ? view.file.toString().asString("") : view.state.getString("name", "");
    if (hasFile && !QvFile::isFile(view.file)) return "there is no such file";
    std::string reason;
    try {
        decoder_ = InputNesting::open(
            view.file,
            [&](QvFileOpenCb* callback) {
                return view.state.empty() ? QvDecFactory::decodePipe(view.file, Any(), callback, params)
                                          : QvDecFactory::restoreDecoder(view.file, view.state, callback);
            },
            reason);
    } catch (const QvAssertFailure& failure) {
        return failure.what();  // a state that no decoder stored
    }
    if (!decoder_) return reason.empty() ? "it can't be opened" : reason;
    const int streams = decoder_->nrStreams(qvVideoStream);
    if (streams == 0) return "it has no picture";
    stream_ = view.stream;
    if (stream_ >= streams)
        return "there is no video stream " + std::to_string(stream_) + ", the last one is " +
               std::to_string(streams - 1);
    if (decoder_->select(qvVideoStream, stream_) != QvStatus::ok) return "its picture can't be selected";
    return describe();
}

std::string ViewInput::describe() {
    decoder_->getStreamParams(qvVideoStream, stream_, params_);
    width_ = params_.getInt32("width");
    height_ = params_.getInt32("height");
    fourcc_ = static_cast<unsigned>(params_.getInt32("FOURCC"));
    views_ = std::max(params_.getInt32("nrViews", 1), 1);
    if (!params_.get("framerate").isFramerate() || width_ < 1 || height_ < 1 || !qvPixelFormat(fourcc_))
        return "the format of its picture is not known";
    if (views_ > QvViewSetup::maxViews)
        return "it has " + std::to_string(views_) + " views, more than " +
               std::to_string(QvViewSetup::maxViews);
    rate_ = params_.get("framerate").asFramerate();
    frameCount_ = std::max(decoder_->nrFrames(stream_), 0);
    const Any& expected = params_.get("framesExpected");
    announced_ = std::max<long long>(expected.isInt() ? expected.toInt64() : 0, frameCount_);
    frames_.reserve(static_cast<std::size_t>(views_));
    if (views_ > 1) copies_.resize(static_cast<std::size_t>(views_));
    return "";
}

std::string ViewInput::mismatch(const ViewInput& other) const {
    const auto both = [](const std::string& own, const std::string& its) { return own + ", not " + its; };
    if (width_ != other.width_ || height_ != other.height_)
        return "its size is " + both(sizeText(*this), sizeText(other));
    if (rate_.rate() != other.rate_.rate() || rate_.interlaced() != other.rate_.interlaced())
        return "its rate is " + both(rateText(rate_), rateText(other.rate_));
    if (fourcc_ != other.fourcc_)
        return "its pixel format is " + both(formatText(fourcc_), formatText(other.fourcc_));
    return "";
}

int ViewInput::fail(int code, const std::string& text) {
    failure_ = "'" + name_ + "': " + text;
    return code;
}

int ViewInput::read() {
    if (const int result = decoder_->readFrame(stream_); result != QvStatus::ok) {
        if (result == QvStatus::endOfStream) return fail(result, "it ends before its last frame");
        return fail(result, *decoder_->errorDesc() ? decoder_->errorDesc() : "it can't be read");
    }
    frames_.clear();
    QvFrame* frame = decoder_->getFramePtr(stream_);
    for (; frame && static_cast<int>(frames_.size()) < views_; frame = frame->nextView()) {
        if (frame->four_cc() != fourcc_ || frame->width() != width_ || frame->height() != height_)
            return fail(QvStatus::failed, "the format of its picture changed");
        frames_.push_back(frame);
    }
    if (static_cast<int>(frames_.size()) == views_) return QvStatus::ok;
    return fail(QvStatus::failed,
                "a frame has " + std::to_string(frames_.size()) + " of " + std::to_string(views_) + " views");
}

int ViewInput::seek(long long frame) {
    const int result = decoder_->seekToFrame(frame, stream_);
    if (result == QvStatus::ok) return result;
    return fail(result, *decoder_->errorDesc() ? decoder_->errorDesc() : "it can't be sought");
}

int ViewInput::linkable(std::vector<QvFrame*>& frames) {
    // A decoder that links its own views counts on these links.
    for (std::size_t i = 0; i < frames_.size(); ++i) {
        if (views_ == 1) {
            frames.push_back(frames_[i]);
            continue;
        }
        if (copies_[i].copy(*frames_[i]) != QvStatus::ok)
            return fail(QvStatus::outOfMemory, "no memory for a view");
        frames.push_back(&copies_[i]);
    }
    return QvStatus::ok;
}
