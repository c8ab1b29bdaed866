#include "core/filter/videochain_p.h"

#include <cmath>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/arch/qvcancel.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/filter/chainfilters_p.h"
#include "core/filter/qvprocesspipe.h"
#include "core/job/jobdescription.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr int hdLines = 720;  // from here on a picture of unknown matrix counts as BT.709

// Rates closer than this are one rate.
constexpr double sameRate = 0.001;

enum class Matrix { keep, bt709To601, bt601To709 };

using VideoFilterPtr = std::unique_ptr<QvVideoFilter>;

class VideoChain {
  public:
    explicit VideoChain(const VideoJobDescription& job)
        : job_(job),
          width_(job.inWidth),
          height_(job.inHeight),
          interlaced_(job.inFramerate.interlaced() != 0) {}

    bool plan();
    void fill(QvVProcessPipe& pipe);

  private:
    const AnyDict* activeState(const char* name) const;
    VideoFilterPtr restoreFixed(const char* name) const;
    void planCropper();
    void planDeinterlace();
    void dropField();
    Matrix matrix() const;
    void planScaler();
    void planRate();
    void planCustom();
    void applyScalerState();
    void append(QvVProcessPipe& pipe, VideoFilterPtr filter) const;

    const VideoJobDescription& job_;
    int width_;  // of the picture at this place of the chain
    int height_;
    bool interlaced_;
    bool reducesRate_ = false;
    int backFactor_ = 1;  // of the rate, by custom filters at the end
    VideoFilterPtr flipper_, cropper_, deinterlace_, scaler_;
    qvchain::RateStages rate_;
    qvchain::VideoFilters front_, back_;
};

// Everything that a job needs; false when it needs nothing.
bool VideoChain::plan() {
    planCustom();
    flipper_ = restoreFixed("flipper");
    planCropper();
    planDeinterlace();
    dropField();
    planScaler();
    planRate();
    return scaler_ || rate_.main || flipper_ || deinterlace_ || cropper_ || !front_.empty() || !back_.empty();
}

const AnyDict* VideoChain::activeState(const char* name) const {
    const Any& state = job_.filters.get(name);
    return state.isDict() && state.asDict().get("_on").isTrue() ? &state.asDict() : nullptr;
}

VideoFilterPtr VideoChain::restoreFixed(const char* name) const {
    const auto* state = activeState(name);
    if (!state) return nullptr;
    auto filter = qvchain::newVideoFilter(name);
    if (filter) filter->restore(*state);
    return filter;
}

void VideoChain::planCropper() {
    const auto* state = activeState("cropper");
    if (!state) return;
    cropper_ = qvchain::newVideoFilter("cropper");
    // Without it the picture would come out uncut, which nobody asked for.
    QV_ASSERT_MSG(cropper_, "filter module 'cropper' is not available");
    cropper_->setParam("inputWidth", width_);
    cropper_->setParam("inputHeight", height_);
    cropper_->setParam("inputFrameAspect", job_.inFrameAspect);
    cropper_->restore(*state);
    width_ = cropper_->getParam("outputWidth").asInt32(width_);
    height_ = cropper_->getParam("outputHeight").asInt32(height_);
}

// Half the lines, even, so that 4:2:0 chroma has whole lines.
int halfHeight(int height) { return (height / 2) & ~1; }

bool halvesHeight(const Any& method) {
    if (method.isInt32()) return method.asInt32() == 1 || method.asInt32() == 2 || method.asInt32() == 4;
    return method == "top" || method == "bottom" || method == "bob";
}

void VideoChain::planDeinterlace() {
    deinterlace_ = restoreFixed("deinterlace");
    if (!deinterlace_) return;
    if (halvesHeight(deinterlace_->getParam("deinterlace"))) height_ = halfHeight(height_);
    interlaced_ = false;
}

// When scaling would throw half the lines away anyway, one field is enough.
void VideoChain::dropField() {
    if (job_.outFramerate.interlaced() != 0 || !interlaced_ || deinterlace_ || backFactor_ > 1) return;
    if (job_.outHeight > height_ / 2) return;
    deinterlace_ = qvchain::newVideoFilter("deinterlace");
    if (!deinterlace_) return;
    deinterlace_->setParam("deinterlace", "top");
    height_ = halfHeight(height_);
    interlaced_ = false;
}

Matrix VideoChain::matrix() const {
    const int in = job_.inITU;
    const int out = job_.outITU;
    const bool inHd = height_ >= hdLines;
    const bool outHd = job_.outHeight >= hdLines;
    if (in == 2 && out == 1) return Matrix::bt709To601;
    if (in == 1 && out == 2) return Matrix::bt601To709;
    // One known side bars the direction that contradicts it.
    if (in != 1 && out != 2 && inHd && !outHd) return Matrix::bt709To601;
    if (in != 2 && out != 1 && !inHd && outHd) return Matrix::bt601To709;
    return Matrix::keep;
}

void VideoChain::planScaler() {
    const Matrix direction = matrix();
    if (width_ == job_.outWidth && height_ == job_.outHeight && job_.topBlankingLines == 0 &&
        job_.inFOURCC == job_.outFOURCC && direction == Matrix::keep && !activeState("scaler"))
        return;
    scaler_ = qvchain::requireConverter("scaler", "scaler");
    scaler_->setParam("outWidth", job_.outWidth);
    scaler_->setParam("outHeight", job_.outHeight);
    scaler_->setParam("topBlankingLines", job_.topBlankingLines);
    scaler_->setParam("FOURCC", static_cast<int>(job_.outFOURCC));
    if (direction != Matrix::keep) {
        scaler_->setParam("inITU", direction == Matrix::bt709To601 ? 2 : 1);
        scaler_->setParam("outITU", direction == Matrix::bt709To601 ? 1 : 2);
    }
    applyScalerState();
}

// What a user asks of the conversion goes before what follows from the sizes.
void VideoChain::applyScalerState() {
    const auto* state = activeState("scaler");
    for (const char* name : {"inITU", "outITU", "quality"})
        if (state && state->get(name).isInt32()) scaler_->setParam(name, state->get(name));
}

// A filter that makes two frames of each interlaced one does its part of the conversion.
void VideoChain::planRate() {
    QvFramerate in = qvchain::scaledRate(job_.inFramerate, qvchain::rateFactor(front_), 1);
    QvFramerate out = job_.outFramerate;
    if (!interlaced_) in.setInterlaced(0);
    if (backFactor_ > 1) {
        out = qvchain::scaledRate(out, 1, backFactor_);
        out.setInterlaced(in.interlaced());
    }
    const double difference = in.rate().ratio() - out.rate().ratio();
    reducesRate_ = difference > 0;
    if (std::fabs(difference) > sameRate) rate_ = qvchain::chooseRateStages(in, out);
}

void VideoChain::planCustom() {
    const Any& custom = job_.filters.get("customFilters");
    if (!custom.isVector()) return;
    AnyVector front;
    AnyVector back;
    QvUtil::getSortedEffects(custom.asVector(), front, back, true);
    front_ = qvchain::restoreVideoFilters(front);
    back_ = qvchain::restoreVideoFilters(back);
    backFactor_ = qvchain::rateFactor(back_);
    if (qvchain::rateFactor(front_) > 1) interlaced_ = false;
}

void VideoChain::append(QvVProcessPipe& pipe, VideoFilterPtr filter) const {
    if (!filter) return;
    if (auto* writer = dynamic_cast<QvCancellable*>(filter.get())) writer->setCancel(job_.cancel);
    pipe.addFilter(filter.release(), -1);
}

void VideoChain::fill(QvVProcessPipe& pipe) {
    for (auto& filter : front_) append(pipe, std::move(filter));
    // A rate reduction runs first, so that no frame is scaled in vain.
    if (reducesRate_ && !rate_.afterScaler) append(pipe, std::move(rate_.main));
    append(pipe, std::move(flipper_));
    append(pipe, std::move(cropper_));
    append(pipe, std::move(deinterlace_));
    append(pipe, std::move(scaler_));
    append(pipe, std::move(rate_.pre));
    append(pipe, std::move(rate_.main));
    for (auto& filter : back_) append(pipe, std::move(filter));
}

}  // namespace

std::unique_ptr<QvVProcessPipe> qvchain::createVideoPipe(const VideoJobDescription& job,
                                                         const char* moduleName, bool deferOpen) {
    VideoChain chain(job);
    if (!chain.plan()) return nullptr;
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(moduleName));
    auto* pipe = dynamic_cast<QvVProcessPipe*>(codec.get());
    QV_ASSERT_MSG(pipe, "invalid name for vprocess module");
    chain.fill(*pipe);
    const int opened = deferOpen ? QvStatus::ok : pipe->open();
    QV_ASSERT_MEMORY(opened != QvStatus::outOfMemory, pipe->errorDesc());
    QV_ASSERT_MSG(opened == QvStatus::ok, pipe->errorDesc());
    codec.release();
    return std::unique_ptr<QvVProcessPipe>(pipe);
}
