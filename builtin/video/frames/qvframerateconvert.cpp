#include "builtin/video/frames/qvframerateconvert.h"

#include <cmath>

#include "builtin/creators.h"
#include "builtin/video/frames/fields.h"
#include "builtin/video/frames/pulldown.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/measure/qvnum.h"

namespace {

constexpr auto stateOpen = static_cast<QvCodec::State>(3);
constexpr double lowestRate = 0.1, highestRate = 120.0;
constexpr double pulldownRatio = 1.25;

using Settings = QvFramerateConvert::Settings;
using Access = QvParamAccess<Settings>;

// Any number is taken here: open says whether it is a rate.
template <QvFramerate Settings::*rate, double Settings::*fps>
int setRate(Settings& settings, const Any& value) {
    double number = 0;
    if (value.isFramerate()) {
        settings.*rate = value.asFramerate();
        settings.*fps = (settings.*rate).rate().ratio();
        return QvStatus::ok;
    }
    if (!qvparam::convert(value, number)) return QvStatus::invalidParam;
    settings.*rate = QvFramerate(number);
    settings.*fps = number;
    return QvStatus::ok;
}

template <double Settings::*fps>
void getFps(const Settings& settings, Any& value) {
    value = settings.*fps;
}

constexpr QvParamRow<Settings> rows[] = {
    {"inFramerate", Access{setRate<&Settings::inRate, &Settings::inFps>, getFps<&Settings::inFps>},
     qvParamStored, 0.1, 120, "", "frames/s", "of the frames that come in; also a frame rate with its scan"},
    {"outFramerate", Access{setRate<&Settings::outRate, &Settings::outFps>, getFps<&Settings::outFps>},
     qvParamStored, 0.1, 120, "", "frames/s", "of the frames that go out; also a frame rate with its scan"},
    {"interlace", &Settings::interlace, qvParamStored, 0, 2, "", "",
     "1 or 2: weaves two frames into one, top or bottom field first, at half the rate"},
    {.name = "pulldown",
     .member = &Settings::pulldown,
     .flags = qvParamStored,
     .help = "3:2 pulldown, at 5/4 of the rate"},
};
static_assert(qvParamTableOk<Settings>(rows));

bool same(double a, double b) { return QvNum::equ(a, b, QvRatio::tolerance); }

bool isRate(double fps) { return fps > lowestRate && fps <= highestRate; }

}  // namespace

QvCodec* newFrconvert() { return new QvFramerateConvert; }

QvFramerateConvert::QvFramerateConvert() = default;
QvFramerateConvert::~QvFramerateConvert() = default;

int QvFramerateConvert::init() {
    settings_ = {};
    interlacing_ = false;
    pulldown_.reset();
    return QvVideoFilter::init();
}

int QvFramerateConvert::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != stateCreated, "Not inited");
    if (const auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return QvVideoFilter::setParam(name, value);
}

void QvFramerateConvert::getParam(const char* name, Any& value) const {
    QV_ASSERT_MSG(getState() != stateCreated, "Not inited");
    if (qvGetParamRow<Settings>(rows, settings_, name, value)) return;
    if (Any(name) == "_safeToApplyAfter")
        value = settings_.inFps >= settings_.outFps || pulldown_ ? 1 : 0;
    else if (Any(name) == "_isFramerateConverter")
        value = 1;
    else
        QvVideoFilter::getParam(name, value);
}

void QvFramerateConvert::store(AnyDict& dict) const {
    QvVideoFilter::store(dict);
    AnyDict state;
    qvStoreParamRows<Settings>(rows, settings_, state);
    dict.set("state", state);
}

int QvFramerateConvert::restore(const AnyDict& dict) {
    if (const int result = QvVideoFilter::restore(dict)) return result;
    if (!dict.get("state").isDict()) return QvStatus::ok;
    return _restoreRows<Settings>(rows, settings_, dict.get("state").asDict());
}

int QvFramerateConvert::open() {
    QV_ASSERT(getState() == stateInitialised);
    const double in = settings_.inFps, out = settings_.outFps;
    QV_ASSERT(isRate(in) && isRate(out));
    numbers_ = {settings_.inRate, settings_.outRate};
    firstInput_ = currentSource_ = -1;
    nextOutput_ = 0;
    left_ = 0;
    halfDone_ = false;
    pulldown_.reset();
    carried_.clear();
    interlacing_ = settings_.interlace != 0 && same(in, 2.0 * out);
    if (interlacing_) {
        qv_dbg()->debug("[frconvert] Interlacing from %f fps to %f fps", in, out);
    } else if (settings_.pulldown && same(out / in, pulldownRatio)) {
        qv_dbg()->debug("[frconvert] pulldown from %f fps to %f fps", in, out);
        pulldown_ = std::make_unique<Pulldown>(settings_.outRate);
    } else {
        qv_dbg()->debug("[frconvert] converting from %f fps to %f fps", in, out);
    }
    setState(stateOpen);
    return QvStatus::ok;
}

int QvFramerateConvert::close() {
    output_.destroy();
    carried_.clear();
    pulldown_.reset();
    left_ = 0;
    firstInput_ = -1;
    setState(stateInitialised);
    return QvStatus::ok;
}

int QvFramerateConvert::write(QvFrame& frame) {
    if (getState() != stateOpen) return setError(QvStatus::illegalState, "Not opened");
    if (!frame.inited()) return setError(QvStatus::invalidArgument, "an empty frame");
    checkFrame(frame);
    if (firstInput_ == -1) start(frame.frameNr);
    int result = QvStatus::ok;
    if (pulldown_)
        result = pulldown_->write(frame);
    else
        result = interlacing_ ? writeInterlacing(frame) : writePlain(frame);
    return result == QvStatus::ok ? result : setError(result, "can not make the output frame");
}

void QvFramerateConvert::checkFrame(const QvFrame& frame) {
    QV_ASSERT(left_ == 0);
    if (same(frame.framerate.rate(), settings_.inFps)) return;
    qv_dbg()->write("invalid framerate in input frame %s, should be %s",
                    frame.framerate.desc(true, true).asString(),
                    settings_.inRate.desc(true, true).asString());
    QV_FAIL("the frame has another rate than the converter's input");
}

void QvFramerateConvert::start(long long firstNumber) {
    firstInput_ = firstNumber;
    nextOutput_ = numbers_.start(firstNumber);
    if (pulldown_) pulldown_->start(nextOutput_);
}

int QvFramerateConvert::writePlain(const QvFrame& frame) {
    const long long number = frame.frameNr;
    if (reduces()) carried_.addUserData(frame);
    carried_.addCaptions(frame);
    const long long source = numbers_.source(nextOutput_);
    if (source > number) return QvStatus::ok;
    if (source < number) {
        qv_dbg()->log(QvLogMask::error, "Framerate convert: need frame nr=%d, frame_nr=%d\n",
                      static_cast<int>(source), frame.frameNr);
        QV_FAIL("a frame of the input is missing");
    }
    if (const int status = output_.copy(frame)) return status;
    output_.framerate = settings_.outRate;
    output_.framerate.setInterlaced(frame.framerate.interlaced());
    if (reduces()) carried_.giveUserData(output_);
    carried_.giveCaptions(output_);
    output_.frameNr = static_cast<int>(nextOutput_);
    currentSource_ = number;
    do ++left_;
    while (numbers_.source(nextOutput_ + left_) == number);
    return QvStatus::ok;
}

int QvFramerateConvert::writeInterlacing(const QvFrame& frame) {
    const Field first = settings_.interlace == 1 ? Field::top : Field::bottom;
    carried_.addUserData(frame);
    carried_.addCaptions(frame);
    halfDone_ = !halfDone_;
    if (halfDone_) return beginWeave(output_, frame, first);
    if (const int status = endWeave(output_, frame, otherField(first))) return status;
    if (first == Field::bottom) output_.copyMeta(frame);  // the top field's, as wherever fields are woven
    carried_.giveUserData(output_);
    carried_.giveCaptions(output_);
    output_.framerate = settings_.outRate;
    output_.framerate.setInterlaced(settings_.interlace);
    output_.frameNr = static_cast<int>(nextOutput_);
    left_ = 1;
    return QvStatus::ok;
}

int QvFramerateConvert::ready() const { return pulldown_ ? pulldown_->ready() : left_; }

QvFrame* QvFramerateConvert::frame() { return pulldown_ ? pulldown_->frame() : &output_; }

int QvFramerateConvert::next() {
    if (pulldown_) {
        pulldown_->next();
        return QvStatus::ok;
    }
    if (left_ == 0) return QvStatus::ok;
    ++nextOutput_;
    if (--left_ == 0) return QvStatus::ok;
    // The same picture leaves again, without what leaves once.
    output_.clearUserData();
    output_.clearSubpic();
    output_.frameNr = static_cast<int>(nextOutput_);
    return QvStatus::ok;
}
