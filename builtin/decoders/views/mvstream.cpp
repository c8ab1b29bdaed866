#include "builtin/decoders/views/mvstream.h"

#include <algorithm>
#include <climits>
#include <limits>

#include "builtin/decoders/views/viewjoin.h"
#include "core/engine/status.h"

bool MVStream::chained() const {
    return layout_ == QvViewLayout::interleaved || layout_ == QvViewLayout::swapped;
}

std::string MVStream::prepare(const QvViewSetup& setup, const Any* inputParams) {
    layout_ = setup.layout;
    inputs_.clear();
    inputs_.resize(setup.views.size());
    views_ = 0;
    for (std::size_t i = 0; i < inputs_.size(); ++i) {
        std::string fault = inputs_[i].open(setup.views[i], inputParams);
        if (fault.empty() && i > 0) fault = inputs_[i].mismatch(inputs_[0]);
        if (!fault.empty())
            return "view " + std::to_string(i + 1) + " ('" + inputs_[i].name() + "'): " + fault;
        views_ += inputs_[i].nrViews();
    }
    if (views_ > QvViewSetup::maxViews)
        return "it has " + std::to_string(views_) + " views, more than " +
               std::to_string(QvViewSetup::maxViews);
    first_ = layout_ == QvViewLayout::right ? inputs_.size() - 1 : 0;
    last_ = layout_ == QvViewLayout::left ? 0 : inputs_.size() - 1;
    if (const std::string fault = checkJoin(); !fault.empty()) return fault;
    return publish();
}

std::string MVStream::checkJoin() const {
    const bool single = layout_ == QvViewLayout::left || layout_ == QvViewLayout::right;
    if (chained() || single) return "";
    const ViewInput& input = inputs_.front();
    // Rows of the views in turn are no longer the fields that they were.
    const bool odd = layout_ == QvViewLayout::topBottom && input.height() % 2 != 0;
    if (input.rate().interlaced() != 0 && (odd || layout_ == QvViewLayout::lineByLine))
        return std::string("interlaced views can't be joined ") + (odd ? "at an odd height" : "line by line");
    return qvViewJoinFault(layout_, input.fourcc(), input.width(), input.height());
}

std::string MVStream::publish() {
    const ViewInput& shown = inputs_[first_];
    long long count = std::numeric_limits<long long>::max(), announced = 0;
    double bits = 0;
    for (std::size_t i = first_; i <= last_; ++i) {
        count = std::min<long long>(count, inputs_[i].nrFrames());
        announced = std::max(announced, inputs_[i].announcedFrames());
        const Any& rate = inputs_[i].params().get("vBitrate");
        if (rate.isFloat()) bits += rate.asDouble();
    }
    frames_ = count;
    for (const char* key : {"FOURCC", "framerate", "pixelAspect", "codec", "videoCodec", "pal"})
        if (shown.params().isSet(key)) params.set(key, shown.params().get(key));
    const bool across = layout_ == QvViewLayout::sideBySide;
    const bool down = layout_ == QvViewLayout::topBottom || layout_ == QvViewLayout::lineByLine;
    const long long width = across ? 1LL * shown.width() * views_ : shown.width();
    const long long height = down ? 1LL * shown.height() * views_ : shown.height();
    double aspect = shown.params().getDouble("frameAspect", 1.0 * shown.width() / shown.height());
    if (across) aspect *= views_;
    if (down) aspect /= views_;
    params.set("width", Any(static_cast<int>(std::min<long long>(width, INT_MAX))));
    params.set("height", Any(static_cast<int>(std::min<long long>(height, INT_MAX))));
    params.set("frameAspect", Any(aspect));
    params.set("frames", Any(static_cast<int>(count)));
    params.set("duration", Any(static_cast<double>(count) / shown.rate().rate().ratio()));
    params.set("nrViews", Any(chained() ? views_ : 1));
    if (bits > 0) params.set("vBitrate", Any(bits));
    if (announced > count) {
        params.set("truncated", Any(1));
        params.set("framesExpected", Any(announced));
    }
    if (across || down) {
        frame = std::make_unique<QvFrame>();
        if (width > INT_MAX || height > INT_MAX ||
            frame->init(shown.fourcc(), static_cast<int>(width), static_cast<int>(height)) != QvStatus::ok)
            return "no memory for a picture of " + std::to_string(width) + "x" + std::to_string(height);
    }
    shown_.reserve(static_cast<std::size_t>(views_));
    return "";
}

int MVStream::fail(int code, const std::string& text) {
    lost_ = true;
    failure_ = text;
    return code;
}

int MVStream::read() {
    if (lost_) return QvStatus::failed;
    if (next_ >= frames_) return QvStatus::endOfStream;
    for (std::size_t i = first_; i <= last_; ++i)
        if (const int result = inputs_[i].read(); result != QvStatus::ok)
            return fail(QvStatus::failed, inputs_[i].failure());
    if (const int result = show(); result != QvStatus::ok) return result;
    ++next_;
    return QvStatus::ok;
}

int MVStream::show() {
    if (layout_ == QvViewLayout::left) current_ = inputs_[first_].frames().front();
    if (layout_ == QvViewLayout::right) current_ = inputs_[last_].frames().back();
    if (layout_ == QvViewLayout::left || layout_ == QvViewLayout::right) return QvStatus::ok;
    return chained() ? link() : join();
}

int MVStream::link() {
    shown_.clear();
    for (ViewInput& input : inputs_)
        if (const int result = input.linkable(shown_); result != QvStatus::ok)
            return fail(result, input.failure());
    if (layout_ == QvViewLayout::swapped) std::reverse(shown_.begin(), shown_.end());
    links_.clear();
    for (QvFrame* view : shown_) links_.append(view);
    QvFrame_linkViews(links_);
    current_ = shown_.front();
    return QvStatus::ok;
}

int MVStream::join() {
    shown_.clear();
    for (const ViewInput& input : inputs_)
        shown_.insert(shown_.end(), input.frames().begin(), input.frames().end());
    qvJoinViews(layout_, shown_, *frame);
    frame->copyMeta(*shown_.front());
    current_ = frame.get();
    return QvStatus::ok;
}

int MVStream::seek(long long frame) {
    if (frame < 0 || frame >= frames_) return QvStatus::endOfStream;
    for (std::size_t i = first_; i <= last_; ++i)
        if (inputs_[i].seek(frame) != QvStatus::ok) return fail(QvStatus::failed, inputs_[i].failure());
    lost_ = false;
    next_ = frame;
    return QvStatus::ok;
}
