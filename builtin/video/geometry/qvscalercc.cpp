#include "builtin/video/geometry/qvscalercc.h"

#include <cstring>
#include <new>

#include "builtin/creators.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/filter/qvcolorconvert.h"
#include "core/filter/srscaler.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr int stateOpened = 3;
constexpr int leastSize = 4;
constexpr int hdLines = 720;

using Settings = QvScalerCC::Settings;

int setFourcc(Settings& settings, const Any& value) {
    std::string text;
    if (value.isString() || value.isWString()) {
        if (!qvparam::convert(value, text) || text.size() != 4) return QvStatus::invalidParam;
        settings.fourcc = 0;
        for (unsigned i = 0; i < 4; ++i)
            settings.fourcc |= static_cast<unsigned char>(text[i]) * (1u << 8 * i);
        return QvStatus::ok;
    }
    int number = 0;
    if (!qvparam::convert(value, number)) return QvStatus::invalidParam;
    settings.fourcc = static_cast<unsigned>(number);
    return QvStatus::ok;
}

void getFourcc(const Settings& settings, Any& value) { value = Any(qvFourccText(settings.fourcc).data()); }

void getFourccNumber(const Settings& settings, Any& value) { value = Any(static_cast<int>(settings.fourcc)); }

void getOffered(const Settings&, Any& value) {
    AnyVector offered;
    for (const char* name : {"I420", "BGR4", "YV12", "BGR3", "YUYV"}) offered.append(Any(name));
    value = offered;
}

using Access = QvParamAccess<Settings>;

constexpr QvParamRow<Settings> rows[] = {
    {.name = "outWidth",
     .member = &Settings::outWidth,
     .flags = qvParamStored,
     .unit = "pixels",
     .help = "of the output"},
    {.name = "outHeight",
     .member = &Settings::outHeight,
     .flags = qvParamStored,
     .unit = "pixels",
     .help = "of the output"},
    {.name = "quality",
     .member = &Settings::quality,
     .flags = qvParamStored,
     .help = "below 1 cubic, from 1 windowed sinc of eight taps"},
    {.name = "topBlankingLines",
     .member = &Settings::topBlankingLines,
     .flags = qvParamStored,
     .unit = "lines",
     .help = "of the output that stay black"},
    {.name = "inITU",
     .member = &Settings::inITU,
     .flags = qvParamStored,
     .help = "YUV matrix of the input: 0 by the height, 1 BT.601, 2 BT.709"},
    {.name = "outITU",
     .member = &Settings::outITU,
     .flags = qvParamStored,
     .help = "YUV matrix of the output: 0 by the height, 1 BT.601, 2 BT.709"},
    {.name = "FOURCC",
     .member = Access{setFourcc, getFourcc},
     .flags = qvParamStored,
     .help = "pixel format of the output",
     .type = Any::String},
    {"FOURCCint", Access{nullptr, getFourccNumber}},
    {"outFOURCC", Access{nullptr, getOffered}},
    {.name = "disableLog",
     .member = &Settings::disableLog,
     .flags = qvParamWriteOnly,
     .help = "no line in the log when it begins"},
};
static_assert(qvParamTableOk<Settings>(rows));

// FOURCCs as the conversion is called with them.
unsigned called(unsigned fourcc) {
    if (fourcc == QvFourcc::BGR4) return QvFourcc::BGRA;
    return fourcc == QvFourcc::YUY2 ? QvFourcc::YUYV : fourcc;
}

QvScalePicture pictureOf(const QvFrame& frame, unsigned fourcc) {
    const frame_tt& tt = *frame.getFrame_tt();
    return {qvFourcc("EXT1"), fourcc,        tt.width,      tt.height,
            tt.strides[0],    tt.strides[1], tt.strides[2], {tt.planes[0], tt.planes[1], tt.planes[2]}};
}

const char* matrixText(QvYUVMatrix matrix) { return matrix == qvMatrixBT601 ? "601" : "709"; }

// RGB in the sense of the matrix: these have none.
bool hasNoMatrix(const QvFrame& frame) {
    switch (frame.four_cc()) {
        case QvFourcc::R32C:
        case QvFourcc::b64a:
        case QvFourcc::R555:
        case QvFourcc::R565: return true;
        default: return frame.isRGB();
    }
}

}  // namespace

QvCodec* newScaler() { return new QvScalerCC; }

QvScalerCC::QvScalerCC(const QvModule* module) : QvVideoFilter(module) {}

int QvScalerCC::init() {
    settings_ = {};
    return QvVideoFilter::init();
}

int QvScalerCC::setParam(const char* name, const Any& value) {
    if (const auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return QvVideoFilter::setParam(name, value);
}

void QvScalerCC::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow<Settings>(rows, settings_, name, value)) QvVideoFilter::getParam(name, value);
}

void QvScalerCC::store(AnyDict& dict) const {
    QvVideoFilter::store(dict);
    AnyDict state;
    qvStoreParamRows<Settings>(rows, settings_, state);
    // No format, or one that is no text of four characters, can only be set again as its number.
    if (state.get("FOURCC").size() != 4) state.set("FOURCC", static_cast<int>(settings_.fourcc));
    dict.set("state", state);
}

int QvScalerCC::restore(const AnyDict& dict) {
    if (dict.get("name") != name()) {
        qv_dbg()->write("[scaler] restore - invalid dict");
        return QvStatus::failed;
    }
    if (const int result = QvVideoFilter::restore(dict)) return result;
    if (!dict.get("state").isDict()) return QvStatus::ok;
    return _restoreRows<Settings>(rows, settings_, dict.get("state").asDict());
}

int QvScalerCC::open() {
    ready_ = 0;
    started_ = cleared_ = false;
    int made = QvStatus::failed;
    if (qvPixelFormat(settings_.fourcc) && settings_.outWidth > 0 && settings_.outHeight > 0)
        made = output_.init(settings_.fourcc, settings_.outWidth, settings_.outHeight);
    if (made != QvStatus::ok) {
        setError(made, "QvScalerCC::Can not init output frame!");  // the code may be that of no memory
        return QvStatus::failed;
    }
    setState(static_cast<State>(stateOpened));
    return QvStatus::ok;
}

int QvScalerCC::close() {
    ready_ = 0;
    output_.destroy();
    work_.destroy();
    setState(stateInitialised);
    return QvStatus::ok;
}

int QvScalerCC::next() {
    ready_ = 0;
    return QvStatus::ok;
}

void QvScalerCC::logStart(const QvFrame& frame) {
    if (started_) return;
    started_ = true;
    if (settings_.disableLog) return;
    qv_dbg()->info("Starting scaler/cconv out: %s (%dx%d), topBlanking=%d, inITU=%d, outITU=%d",
                   output_.str_four_cc(), settings_.outWidth, settings_.outHeight, settings_.topBlankingLines,
                   settings_.inITU, settings_.outITU);
    qv_dbg()->info("in:  %s (%dx%d) %s", frame.str_four_cc(), frame.width(), frame.height(),
                   frame.framerate.interlaced() ? "interlaced" : "progressive");
    if (frame.YUVMatrix() != qvMatrixNotSet)
        qv_dbg()->info("Input frame has set yuv matrix to ITU%s", matrixText(frame.YUVMatrix()));
}

int QvScalerCC::write(QvFrame& frame) {
    if (!output_.inited()) return setError(QvStatus::illegalState, "Not opened");
    if (!frame.inited()) return setError(QvStatus::failed, "can not setup scaler call");
    logStart(frame);
    if (settings_.outWidth < leastSize || settings_.outHeight < leastSize) return writeBlack(frame);
    return convert(frame);
}

int QvScalerCC::writeBlack(const QvFrame& frame) {
    qv_dbg()->log(QvLogMask::error, "Scaler does not support size smaller that 4 pixels");
    output_.setBlack();
    output_.copyMeta(frame);
    ready_ = 1;
    return QvStatus::ok;
}

unsigned QvScalerCC::callFlags(const QvFrame& frame) const {
    unsigned flags = settings_.quality < 1 ? QvScale::standard : QvScale::high;
    if (frame.framerate.interlaced()) flags |= QvScale::interlaced;
    const auto is601 = [](int itu, int lines) { return itu == 1 || (itu != 2 && lines < hdLines); };
    const int own = frame.YUVMatrix();
    const bool in601 = own ? own == qvMatrixBT601 : is601(settings_.inITU, frame.height());
    flags |= in601 ? QvScale::source601 : QvScale::source709;
    flags |= is601(settings_.outITU, settings_.outHeight) ? QvScale::target601 : QvScale::target709;
    return flags;
}

int QvScalerCC::scaleInto(const QvFrame& from, unsigned fromFourcc, QvFrame& to, unsigned toFourcc,
                          unsigned flags) {
    const QvScalePicture source = pictureOf(from, fromFourcc), target = pictureOf(to, toFourcc);
    const int rectangles[8] = {0,
                               0,
                               (from.width() - 1) * 256,
                               (from.height() - 1) * 256,
                               0,
                               settings_.topBlankingLines,
                               to.width() - 1,
                               to.height() - 1};
    try {
        // Between formats that it does not know the output is unchanged.
        SRScaler(QvScale::placeTarget | QvScale::cropSource, source.tag, &source, 0, 0, 0, target.tag,
                 const_cast<QvScalePicture*>(&target), 0, 0, 0, 0, flags, rectangles);
    } catch (const std::bad_alloc&) {
        return setError(QvStatus::outOfMemory, "can not setup scaler call");
    }
    return QvStatus::ok;
}

int QvScalerCC::convert(QvFrame& frame) {
    if (settings_.topBlankingLines && !cleared_) {
        output_.setBlack();
        cleared_ = true;
    }
    const unsigned in = frame.four_cc(), out = settings_.fourcc;
    const unsigned flags = callFlags(frame);
    int result = QvStatus::ok;
    if (in == QvFourcc::ARGB && out != QvFourcc::ARGB) {
        qvColorARGBToBGR4(frame, work_);
        result = scaleInto(work_, called(QvFourcc::BGR4), output_, called(out), flags);
    } else if (in != QvFourcc::ARGB && out == QvFourcc::ARGB) {
        if (!work_.inited() || work_.width() != output_.width() || work_.height() != output_.height()) {
            if (work_.init(QvFourcc::BGR4, output_.width(), output_.height()) != QvStatus::ok)
                return setError(QvStatus::outOfMemory, "can not setup scaler call");
            work_.setBlack();
        }
        result = scaleInto(frame, called(in), work_, called(QvFourcc::BGR4), flags);
        if (result == QvStatus::ok) qvColorBGR4ToARGB(work_, output_);
    } else {
        const bool both = in == QvFourcc::ARGB;
        result = scaleInto(frame, both ? QvFourcc::BGRA : called(in), output_,
                           both ? QvFourcc::BGRA : called(out), flags);
    }
    if (result != QvStatus::ok) return result;
    repeatLastChroma(frame);
    finish(frame);
    return QvStatus::ok;
}

// The bottom field has one chroma line less than its luma asks for.
void QvScalerCC::repeatLastChroma(const QvFrame& frame) {
    const int lines = output_.height(1);
    if (!output_.is420() || !frame.framerate.interlaced() || output_.height() % 4 == 0 || lines < 2) return;
    for (int p = 1; p < 3; ++p) {
        unsigned char* last = output_.plane(p) + static_cast<std::ptrdiff_t>(output_.stride(p)) * (lines - 1);
        std::memcpy(last, last - output_.stride(p), static_cast<size_t>(output_.width(p)));
    }
}

void QvScalerCC::finish(const QvFrame& frame) {
    int matrix = settings_.outITU;
    if (hasNoMatrix(output_))
        matrix = qvMatrixNotSet;
    else if (matrix != qvMatrixBT601 && matrix != qvMatrixBT709)
        matrix = output_.height() < hdLines ? qvMatrixBT601 : qvMatrixBT709;
    output_.copyMeta(frame, static_cast<QvYUVMatrix>(matrix));
    ready_ = 1;
}
