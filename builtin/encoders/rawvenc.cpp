#include "builtin/encoders/rawvenc.h"

#include <climits>
#include <cmath>

#include "builtin/creators.h"
#include "builtin/encoders/rawsettings.h"
#include "builtin/encoders/rawvencformats.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"

struct RawVideoEnc::Params {
    using Enc = RawVideoEnc;
    using Access = QvParamAccess<Enc>;

    // --- What is set

    template <int (*change)(Enc&, int)>
    static int setInt(Enc& enc, const Any& value) {
        int number = 0;
        if (!qvparam::convert(value, number)) return QvStatus::invalidParam;
        return change(enc, number);
    }
    static int width(Enc& enc, int width) { return enc.remake(width, enc.height_, enc.type_); }
    static int height(Enc& enc, int height) { return enc.remake(enc.width_, height, enc.type_); }
    static int type(Enc& enc, int type) {
        return enc.remake(enc.width_, enc.height_, static_cast<unsigned>(type));
    }
    static int interlaced(Enc& enc, int interlaced) {
        enc.rate_.setInterlaced(interlaced);
        return QvStatus::ok;
    }
    static int framerate(Enc& enc, const Any& value) {
        if (value.isFramerate()) {
            enc.rate_ = value.asFramerate();
            return QvStatus::ok;
        }
        double rate = 0;
        if (!qvparam::convert(value, rate) || !(rate > 0)) return QvStatus::invalidParam;
        enc.rate_.setRate(rate);
        return QvStatus::ok;
    }
    static int acceleration(Enc& enc, const Any& value) {
        return qvparam::convert(value, enc.accelerated_) ? QvStatus::ok : QvStatus::invalidParam;
    }
    static int ignore(Enc&, const Any&) { return QvStatus::ok; }

    // --- What is answered

    static double bitrate(const Enc& enc) {
        return std::trunc(enc.rate_.rate().ratio() * enc.frameBytes_ * 8.0);
    }
    static int bitrateInt(const Enc& enc) { return rawsettings::bitrateInt(bitrate(enc)); }
    static Any single(double value) { return Any(static_cast<float>(value)); }

    template <int number>
    static void fixed(const Enc&, Any& value) {
        value = number;
    }
    static void vBitrate(const Enc& enc, Any& value) { value = bitrate(enc); }
    static void frameAspect(const Enc& enc, Any& value) {
        value = single(static_cast<double>(enc.width_) / enc.height_);
    }
    static void sizeRange(const Enc&, Any& value) {
        value = AnyDict("wmin", 32, "wmax", 4096, "hmin", 32, "hmax", 4096);
    }

    static std::span<const QvParamRow<Enc>> rows();
};

std::span<const QvParamRow<RawVideoEnc>> RawVideoEnc::Params::rows() {
    using E = const Enc&;
    static const QvParamRow<Enc> table[] = {
        {.name = "settings",
         .member = Access{rawsettings::apply<Enc>, nullptr},
         .flags = qvParamWriteOnly,
         .help = "several parameters at once",
         .type = Any::Dict},
        {"firstPass", {}, qvParamIgnored},
        {"twoPass", {}, qvParamIgnored},
        {"meta", {}, qvParamIgnored},
        {"vbr", {}, qvParamIgnored},
        {"pal", {}, qvParamIgnored},
        {"topFirst", {}, qvParamIgnored},
        {"accelerationType", {}, qvParamIgnored},
        {.name = "vBitrate", .member = Access{ignore, vBitrate}, .help = "accepted, without effect"},
        {.name = "maxVBitrate", .member = Access{ignore, vBitrate}, .help = "accepted, without effect"},
        {.name = "minVBitrate", .member = Access{ignore, vBitrate}, .help = "accepted, without effect"},
        {.name = "bitrate",
         .member = Access{ignore, [](E e, Any& v) { v = QvBitrate(QvBitrate::cbr, bitrateInt(e)); }},
         .help = "accepted, without effect"},
        {.name = "chapters", .member = Access{ignore, fixed<0>}, .help = "accepted, without effect"},
        {.name = "frameAspect", .member = Access{ignore, frameAspect}, .help = "accepted, without effect"},
        {"width", Access{setInt<width>, [](E e, Any& v) { v = e.width_; }}, qvParamStored, 1, 65535, "",
         "pixels"},
        {"height", Access{setInt<height>, [](E e, Any& v) { v = e.height_; }}, qvParamStored, 1, 65535, "",
         "pixels"},
        {.name = "type",
         .member = Access{setInt<type>, [](E e, Any& v) { v = static_cast<int>(e.type_); }},
         .flags = qvParamStored,
         .help = "FOURCC of the output"},
        {.name = "framerate",
         .member = Access{framerate, [](E e, Any& v) { v = e.rate_; }},
         .flags = qvParamStored,
         .help = "a frame rate, or frames/s"},
        {.name = "profile", .member = &Enc::profile_, .flags = qvParamWriteOnly, .help = "a QvProfile"},
        {.name = "getOut", .member = &Enc::getOut_, .help = "kept, without effect"},
        {.name = "accelerationOn",
         .member = Access{acceleration, fixed<0>},
         .help = "1: writes on a thread of its own"},
        {"interlaced", Access{setInt<interlaced>, nullptr}, qvParamWriteOnly, 0, 2, "", "",
         "0 progressive, 1 top field first, 2 bottom field first", Any::Int32},
        {"selectedFOURCC", Access{nullptr, [](E e, Any& v) { v = static_cast<int>(e.frameType()); }}},
        {"allowedTypes", Access{nullptr, [](E e, Any& v) { v = rawvenc::allowedTypes(e.profile_); }}},
        {"pixelAspect", Access{nullptr, [](E, Any& v) { v = 1.0; }}},
        {"frameAspectEx", Access{nullptr, [](E, Any& v) { v = 0.0; }}},
        {"_outFrameSize", Access{nullptr, [](E e, Any& v) { v = e.frameBytes_; }}},
        {"dstBuffSize", Access{nullptr, [](E e, Any& v) { v = e.frameBytes_ + 10; }}},
        {"bitrateRange", Access{nullptr, [](E e, Any& v) { v = rawsettings::bitrateRange(bitrateInt(e)); }}},
        {"vBitrateRange", Access{nullptr, [](E e, Any& v) { v = AnyVector(bitrateInt(e), bitrateInt(e)); }}},
        {"twoPassPossible", Access{nullptr, fixed<0>}},
        {"previewPossible", Access{nullptr, fixed<1>}},
        {"estimateSecKb", Access{nullptr, [](E e, Any& v) { v = single(bitrate(e) / 8000.0); }}},
        {"aspectRange", Access{nullptr, [](E, Any& v) { v = AnyVector(0.0); }}},
        {"palRange", Access{nullptr, [](E, Any& v) { v = AnyVector(0); }}},
        {"sizeRange", Access{nullptr, sizeRange}},
        {"framerateRange", Access{nullptr, [](E, Any& v) { v = rawvenc::framerates(); }}},
        {"extension", Access{nullptr, [](E, Any& v) { v = "raw"; }}},
        {"hasAcceleration", Access{nullptr, fixed<0>}},
        {"pulldown", Access{nullptr, fixed<0>}},
    };
    return table;
}

RawVideoEnc::RawVideoEnc() = default;

RawVideoEnc::~RawVideoEnc() {
    if (getState() == qvStateOpen) finish(true);
}

int RawVideoEnc::init() {
    if (const int result = QvVideoEncoder::init()) return result;
    return remake(720, 576, QvFourcc::BGR3);
}

unsigned RawVideoEnc::frameType() const { return type_ == QvFourcc::v210 ? QvFourcc::Y216 : type_; }

// Leaves everything as it was when such a frame can't be made.
int RawVideoEnc::remake(int width, int height, unsigned type) {
    if (!qvPixelFormat(type)) return setError(QvStatus::invalidParam, "Unknown type 0x%08x", type);
    const long long bytes = rawvenc::frameBytesBound(width, height);
    if (width < 1 || height < 1 || bytes > INT_MAX / 2)
        return setError(QvStatus::invalidParam, "Invalid frame size %dx%d", width, height);
    unsigned char place = 0;  // for the shape alone: nothing is allocated or touched
    QvFrame shape;
    if (shape.init(type == QvFourcc::v210 ? QvFourcc::Y216 : type, width, height, &place) != 0)
        return setError(QvStatus::invalidParam, "Invalid frame size %dx%d", width, height);
    width_ = width;
    height_ = height;
    type_ = type;
    frameBytes_ = type == QvFourcc::v210 ? rawvenc::v210Bytes(width, height) : shape.total_bytes();
    last_ = nullptr;
    return QvStatus::ok;
}

int RawVideoEnc::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != stateCreated, "Not inited");
    if (!qvFindParamRow(Params::rows(), name)) return QvVideoEncoder::setParam(name, value);
    _traceParam(name, value);
    if (auto result = qvSetParamRow(Params::rows(), *this, name, value)) return *result;
    return QvVideoEncoder::setParam(name, value);
}

void RawVideoEnc::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow(Params::rows(), *this, name, value)) QvVideoEncoder::getParam(name, value);
}

void RawVideoEnc::store(AnyDict& state) const { state = rawsettings::stored(name(), Params::rows(), *this); }

int RawVideoEnc::restore(const AnyDict& state) {
    if (state.get("name") != name()) return setError(QvStatus::failed, "restore - invalid name");
    return rawsettings::restore(
        *this, state, [this](const AnyDict& rows) { return _restoreRows(Params::rows(), *this, rows); });
}

int RawVideoEnc::attachOutStream(QvBufStream* stream) {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    return QvVideoEncoder::attachOutStream(stream);
}

int RawVideoEnc::open() {
    QV_ASSERT_MSG(getState() != stateCreated, "not initialized");
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Not initialized");
    if (!outStream()) return setError(QvStatus::failed, "Output stream not attached");
    if (accelerated_) {
        const auto started = worker_.start([this](const QvFrame& frame) { return writeOut(frame); });
        if (started.status != QvStatus::ok) return report(started);
    }
    setState(qvStateOpen);
    return QvStatus::ok;
}

bool RawVideoEnc::accepts(const QvFrame& frame) const {
    return frame.planes() > 0 && frame.width(0) == width_ && frame.height(0) == height_ &&
           qvEqualFourcc(frame.four_cc(), frameType());
}

int RawVideoEnc::writeFrame(QvFrame* frame) {
    if (getState() != qvStateOpen) return setError(QvStatus::illegalState, "Not opened");
    if (!frame) return setError(QvStatus::invalidArgument, "No frame given");
    if (!accepts(*frame))
        return setError(QvStatus::invalidArgument, "A frame of %dx%d %s does not fit the output of %dx%d",
                        frame->planes() > 0 ? frame->width(0) : 0, frame->planes() > 0 ? frame->height(0) : 0,
                        frame->planes() > 0 ? frame->str_four_cc() : "no format", width_, height_);
    if (worker_.running()) return report(worker_.put(*frame, last_));
    last_ = nullptr;
    if (const int result = rawvenc::copyPacked(picture_, *frame)) return setError(result, "Out of memory");
    last_ = &picture_;
    // A block that an output without a known fault does not give is a broken contract.
    const auto outcome = writeOut(picture_);
    const int result = report(outcome);
    QV_ASSERT_MSG(!outcome.noBlock, errorDesc());
    return result;
}

QvFrame* RawVideoEnc::lastFrame() { return last_; }

RawVideoOutcome RawVideoEnc::writeOut(const QvFrame& frame) {
    return writer_.write(frame, *outStream(), type_ == QvFourcc::v210 ? frameBytes_ : 0);
}

int RawVideoEnc::report(const RawVideoOutcome& outcome) {
    if (outcome.status == 0) return QvStatus::ok;
    if (!outcome.noBlock) return setError(outcome.status, "%s", outcome.text.c_str());
    const auto asked = static_cast<int>(outcome.asked);
    setError(outcome.status, "Error in raw encoder, can not allocate buffer, size=%d", asked);
    return outcome.status;
}

int RawVideoEnc::close() { return getState() == qvStateOpen ? finish(false) : QvStatus::ok; }

int RawVideoEnc::abort() { return getState() == qvStateOpen ? finish(true) : QvStatus::ok; }

int RawVideoEnc::finish(bool discard) {
    int result = QvStatus::ok;
    if (worker_.running()) {
        const auto outcome = worker_.stop(discard);
        last_ = nullptr;
        result = report(outcome);
    }
    writer_.reset();
    picture_.destroy();
    last_ = nullptr;
    setState(stateInitialised);
    return result;
}

QvCodec* newRawvenc() { return new RawVideoEnc; }
