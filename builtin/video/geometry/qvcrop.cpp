#include "builtin/video/geometry/qvcrop.h"

#include <cstring>

#include "builtin/creators.h"
#include "builtin/video/samplelayout.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"
#include "core/media/rows_p.h"

namespace {

using Settings = CropSettings;
using Access = QvParamAccess<Settings>;
using Geometry = CropGeometry;

int refuse(Settings& settings, const Any& text) {
    settings.fault = text.asString("");
    return QvStatus::failed;
}

template <int Geometry::*side>
int setInput(Settings& settings, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || wanted <= 0 || wanted > Geometry::mostInput)
        return refuse(settings, "Invalid state generic");
    Geometry& g = settings.geometry;
    const bool isWidth = side == &Geometry::inputWidth;
    g.setInput(isWidth ? wanted : g.inputWidth, isWidth ? g.inputHeight : wanted);
    return QvStatus::ok;
}

template <int Geometry::*member>
void get(const Settings& settings, Any& value) {
    value = settings.geometry.*member;
}

template <double Geometry::*member>
int setAspect(Settings& settings, const Any& value) {
    double wanted = 0;
    if (!qvparam::convert(value, wanted) || !(wanted >= 0.1 && wanted <= 10.0))
        return refuse(settings, "invalid aspect");
    Geometry& g = settings.geometry;
    g.*member = wanted;
    if (g.mode == CropMode::chosenAspect) g.fit();
    return QvStatus::ok;
}

void getInputAspect(const Settings& settings, Any& value) { value = settings.geometry.shownAspect(); }

void getCropAspect(const Settings& settings, Any& value) { value = settings.geometry.cropAspect; }

int setMode(Settings& settings, const Any& value) {
    int mode = 0;
    if (!qvparam::convert(value, mode) || mode < 1 || mode > 5) return refuse(settings, "Invalid crop mode");
    settings.geometry.setMode(static_cast<CropMode>(mode));
    return QvStatus::ok;
}

void getMode(const Settings& settings, Any& value) { value = static_cast<int>(settings.geometry.mode); }

template <int CropPads::*side>
int setPad(Settings& settings, const Any& value) {
    int pad = 0;
    if (!qvparam::convert(value, pad) || pad < 0 || pad > Geometry::mostPad)
        return refuse(settings, Any::sprintf("A pad is a number from 0 to %d", Geometry::mostPad));
    if (settings.geometry.mode == CropMode::freeBox) settings.geometry.pads.*side = pad;
    return QvStatus::ok;
}

template <int CropPads::*side>
void getPad(const Settings& settings, Any& value) {
    value = settings.geometry.pads.*side;
}

Any outside(const char* side, int wanted, const Geometry::Limits& limits) {
    return Any::sprintf("The crop %s %d does not lie between %d and %d", side, wanted, limits.min,
                        limits.max);
}

int setWidth(Settings& settings, const Any& value) {
    Geometry& g = settings.geometry;
    int wanted = 0;
    if (g.derived()) return refuse(settings, "Can not change width in this mode");
    if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
    return g.setWidth(wanted) ? QvStatus::ok : refuse(settings, outside("width", wanted, g.width()));
}

int setHeight(Settings& settings, const Any& value) {
    Geometry& g = settings.geometry;
    int wanted = 0;
    if (g.derived()) return refuse(settings, "Can not change height in this mode");
    if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
    return g.setHeight(wanted) ? QvStatus::ok : refuse(settings, outside("height", wanted, g.height()));
}

int moveBox(Settings& settings, const Any& value) {
    QvPoint corner;
    if (!qvparam::convert(value, corner)) return QvStatus::invalidParam;
    const Geometry& g = settings.geometry;
    if (settings.geometry.moveTo(corner)) return QvStatus::ok;
    return refuse(
        settings,
        Any::sprintf("The crop box of %dx%d at (%d, %d) does not lie in the picture of %dx%d", g.box.width(),
                     g.box.height(), corner.x(), corner.y(), g.inputWidth, g.inputHeight));
}

// The size of the input may be known later only.
int setBox(Settings& settings, const Any& value) {
    QvRect box;
    if (!qvparam::convert(value, box)) return QvStatus::invalidParam;
    if (box.left() < 0 || box.top() < 0 || box.right() <= box.left() || box.bottom() <= box.top() ||
        box.right() > Geometry::mostInput || box.bottom() > Geometry::mostInput)
        return refuse(settings, "The crop box is no rectangle in a picture");
    settings.geometry.place(box);
    return QvStatus::ok;
}

void getBox(const Settings& settings, Any& value) { value = settings.geometry.box; }

// A state says whether its box is one that somebody chose: otherwise it is no more than that of the input at
// that time. States of other makers don't say, and mean their box.
int setChosen(Settings& settings, const Any& value) {
    bool chosen = true;
    if (!qvparam::convert(value, chosen)) return QvStatus::invalidParam;
    if (chosen) return QvStatus::ok;
    settings.geometry.placed = false;
    settings.geometry.fit();
    return QvStatus::ok;
}

void getChosen(const Settings& settings, Any& value) { value = settings.geometry.placed ? 1 : 0; }

int reset(Settings& settings, const Any&) {
    settings.geometry.reset();
    return QvStatus::ok;
}

template <auto measure>
void measured(const Settings& settings, Any& value) {
    value = measure(settings.geometry);
}

template <auto measure>
constexpr Access reads{nullptr, measured<measure>};

// In the order in which a stored state is taken: the box last but for the pads, so that nothing moves it.
using paramset::least, paramset::most;

constexpr QvParamRow<Settings> rows[] = {
    {"inputWidth", Access{setInput<&Geometry::inputWidth>, get<&Geometry::inputWidth>}, qvParamPlain, 1,
     65536, "", "pixels", "of the frames; the chain of a job sets it"},
    {"inputHeight", Access{setInput<&Geometry::inputHeight>, get<&Geometry::inputHeight>}, qvParamPlain, 1,
     65536, "", "pixels", "of the frames; the chain of a job sets it"},
    {"inputFrameAspect", Access{setAspect<&Geometry::inputAspect>, getInputAspect}, qvParamPlain, 0.1, 10, "",
     "", "width to height of the frames as shown"},
    {"inFrameAspect", Access{setAspect<&Geometry::inputAspect>, getInputAspect}, qvParamStored, 0.1, 10, "",
     "", "as inputFrameAspect"},
    {"mode", Access{setMode, getMode}, qvParamStored, 1, 5, "", "",
     "1 free, with pads; 2 keeps the shape of the input; 3 keeps cropAspect; 4 16:9 cut to 4:3; 5 16:9 with "
     "bars to 4:3"},
    {"cropAspect", Access{setAspect<&Geometry::cropAspect>, getCropAspect}, qvParamStored, 0.1, 10, "", "",
     "of the box as shown, in mode 3"},
    {.name = "cropBox",
     .member = Access{setBox, getBox},
     .flags = qvParamStored,
     .unit = "pixels",
     .help = "the part that is kept"},
    {.name = "boxChosen",
     .member = Access{setChosen, getChosen},
     .flags = qvParamStored,
     .help = "0: the box is that of the input and follows another one"},
    {"padTop", Access{setPad<&CropPads::top>, getPad<&CropPads::top>}, qvParamStored, 0, 16384, "", "pixels",
     "black around the box, in mode 1"},
    {"padBottom", Access{setPad<&CropPads::bottom>, getPad<&CropPads::bottom>}, qvParamStored, 0, 16384, "",
     "pixels", "black around the box, in mode 1"},
    {"padLeft", Access{setPad<&CropPads::left>, getPad<&CropPads::left>}, qvParamStored, 0, 16384, "",
     "pixels", "black around the box, in mode 1"},
    {"padRight", Access{setPad<&CropPads::right>, getPad<&CropPads::right>}, qvParamStored, 0, 16384, "",
     "pixels", "black around the box, in mode 1"},
    {"cropWidth", Access{setWidth, measured<[](const Geometry& g) { return g.box.width(); }>}, qvParamPlain,
     least, most, "", "pixels", "rounded down to a multiple of 4; minWidth to maxWidth"},
    {"cropHeight", Access{setHeight, measured<[](const Geometry& g) { return g.box.height(); }>},
     qvParamPlain, least, most, "", "pixels", "rounded down to a multiple of 4; minHeight to maxHeight"},
    {.name = "moveCropBox",
     .member = Access{moveBox, nullptr},
     .flags = qvParamWriteOnly,
     .unit = "pixels",
     .help = "corner of the box",
     .type = Any::Point},
    {.name = "reset",
     .member = Access{reset, nullptr},
     .flags = qvParamWriteOnly,
     .help = "any value: the whole input, without pads"},
    {"outputWidth", reads<[](const Geometry& g) { return g.outputWidth(); }>},
    {"outputHeight", reads<[](const Geometry& g) { return g.outputHeight(); }>},
    {"minWidth", reads<[](const Geometry& g) { return g.width().min; }>},
    {"maxWidth", reads<[](const Geometry& g) { return g.width().max; }>},
    {"minHeight", reads<[](const Geometry& g) { return g.height().min; }>},
    {"maxHeight", reads<[](const Geometry& g) { return g.height().max; }>},
    {"minX", reads<[](const Geometry&) { return 0; }>},
    {"maxX", reads<[](const Geometry& g) { return g.inputWidth - g.box.width(); }>},
    {"minY", reads<[](const Geometry&) { return 0; }>},
    {"maxY", reads<[](const Geometry& g) { return g.inputHeight - g.box.height(); }>},
};
static_assert(qvParamTableOk<Settings>(rows));

// Clipping a frame leaves its chroma alone when it has half the columns and all the rows.
void clipChroma(QvFrame& to, const QvFrame& from, const CropGeometry& g) {
    for (int p = 1; p < from.planes(); ++p)
        qvrows::copy(
            to.plane(p) + static_cast<std::ptrdiff_t>(to.stride(p)) * g.pads.top + g.pads.left / 2,
            to.stride(p),
            from.plane(p) + static_cast<std::ptrdiff_t>(from.stride(p)) * g.box.top() + g.box.left() / 2,
            from.stride(p), g.box.width() / 2, g.box.height());
}

}  // namespace

QvCodec* newCropper() { return new QvCrop; }

QvCrop::QvCrop() : VideoEffectOf("cropper", rows) {}

int QvCrop::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "state") == 0) return setState(value);
    const int result = VideoEffectOf::setParam(name, value);
    return result == QvStatus::failed ? setError(result, "%s", settings_.fault.c_str()) : result;
}

int QvCrop::setState(const Any& value) {
    _traceParam("state", value);
    if (!value.isDict()) return setError(QvStatus::failed, "Invalid state generic");
    CropSettings wanted = settings_;
    if (qvRestoreParamRows<CropSettings>(rows, wanted, value.asDict()) != QvStatus::ok)
        return setError(QvStatus::failed, "Invalid state generic: %s", wanted.fault.c_str());
    settings_ = std::move(wanted);
    return QvStatus::ok;
}

AnyDict QvCrop::state() const {
    AnyDict state;
    qvStoreParamRows<CropSettings>(rows, settings_, state);
    // Nobody has said what the aspect is: another input has its own.
    if (settings_.geometry.inputAspect <= 0) state.remove("inFrameAspect");
    return state;
}

void QvCrop::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "state") != 0) return VideoEffectOf::getParam(name, value);
    value = state();
}

void QvCrop::store(AnyDict& dict) const {
    VideoEffectOf::store(dict);
    dict.set("state", state());
}

int QvCrop::open() {
    fourcc_ = 0;
    return VideoEffectOf::open();
}

int QvCrop::prepare(const QvFrame& frame) {
    if (frame.four_cc() == QvFourcc::v210)
        return setError(QvStatus::notSupported, "Clip not supported for v210 colorspace");
    used_ = settings_.geometry;
    const QvRect& box = used_.box;
    if (used_.placed && !used_.derived() && !used_.fits(frame.width(), frame.height()))
        return setError(QvStatus::failed, "The crop box (%d, %d)-(%d, %d) does not lie in the frame of %dx%d",
                        box.left(), box.top(), box.right(), box.bottom(), frame.width(), frame.height());
    if (frame.width() != used_.inputWidth || frame.height() != used_.inputHeight)
        used_.setInput(frame.width(), frame.height());
    if (const int result = output_.init(frame.four_cc(), used_.outputWidth(), used_.outputHeight())) {
        qv_dbg()->error("[crop] Can not init output frame to %s FOURCC, w= %d, h= %d", frame.str_four_cc(),
                        used_.outputWidth(), used_.outputHeight());
        return setError(result, "no memory for a frame of %dx%d", used_.outputWidth(), used_.outputHeight());
    }
    output_.setBlack();
    fourcc_ = frame.four_cc();
    return QvStatus::ok;
}

int QvCrop::fill(const QvFrame& frame) {
    if (!getParam("_on").isTrue()) {
        fourcc_ = 0;
        if (const int result = takeShape(output_, frame)) return result;
        copySamples(output_, frame);
        output_.copyMeta(frame);
        return QvStatus::ok;
    }
    const bool same = fourcc_ == frame.four_cc() && used_.inputWidth == frame.width() &&
                      used_.inputHeight == frame.height();
    if (!same) {
        fourcc_ = 0;
        if (const int result = prepare(frame)) return result;
    }
    output_.copyMeta(frame);
    const QvRect& box = used_.box;
    const int result = output_.clip(frame, box.left(), box.top(), used_.pads.left, used_.pads.top,
                                    box.width(), box.height());
    if (frame.four_cc() == QvFourcc::I422) clipChroma(output_, frame, used_);
    return result;
}
