// Parameters of the raw video encoder.
#include <cmath>

#include "builtin/encoders/rawsettings.h"
#include "builtin/encoders/rawvenc.h"
#include "builtin/encoders/rawvencformats.h"
#include "core/arch/qvassert.h"

struct RawVideoParams {
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

std::span<const QvParamRow<RawVideoEnc>> RawVideoParams::rows() {
    using E = const Enc&;
    static const QvParamRow<Enc> table[] = {
        {"settings", Access{rawsettings::apply<Enc>, nullptr}},
        {"firstPass", {}, qvParamIgnored},
        {"twoPass", {}, qvParamIgnored},
        {"meta", {}, qvParamIgnored},
        {"vbr", {}, qvParamIgnored},
        {"pal", {}, qvParamIgnored},
        {"topFirst", {}, qvParamIgnored},
        {"accelerationType", {}, qvParamIgnored},
        {"vBitrate", Access{ignore, vBitrate}},
        {"maxVBitrate", Access{ignore, vBitrate}},
        {"minVBitrate", Access{ignore, vBitrate}},
        {"bitrate", Access{ignore, [](E e, Any& v) { v = QvBitrate(QvBitrate::cbr, bitrateInt(e)); }}},
        {"chapters", Access{ignore, fixed<0>}},
        {"frameAspect", Access{ignore, frameAspect}},
        {"width", Access{setInt<width>, [](E e, Any& v) { v = e.width_; }}, qvParamStored},
        {"height", Access{setInt<height>, [](E e, Any& v) { v = e.height_; }}, qvParamStored},
        {"type", Access{setInt<type>, [](E e, Any& v) { v = static_cast<int>(e.type_); }}, qvParamStored},
        {"framerate", Access{framerate, [](E e, Any& v) { v = e.rate_; }}, qvParamStored},
        {"profile", &Enc::profile_, qvParamWriteOnly},
        {"getOut", &Enc::getOut_},
        {"accelerationOn", Access{acceleration, fixed<0>}},
        {"interlaced", Access{setInt<interlaced>, nullptr}},
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

int RawVideoEnc::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != stateCreated, "Not inited");
    if (!qvFindParamRow(RawVideoParams::rows(), name)) return QvVideoEncoder::setParam(name, value);
    _traceParam(name, value);
    if (auto result = qvSetParamRow(RawVideoParams::rows(), *this, name, value)) return *result;
    return QvVideoEncoder::setParam(name, value);
}

void RawVideoEnc::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow(RawVideoParams::rows(), *this, name, value)) QvVideoEncoder::getParam(name, value);
}

void RawVideoEnc::store(AnyDict& state) const {
    state = rawsettings::stored(name(), RawVideoParams::rows(), *this);
}

int RawVideoEnc::restore(const AnyDict& state) {
    if (state.get("name") != name()) return setError(QvStatus::failed, "restore - invalid name");
    return rawsettings::restore(*this, state, [this](const AnyDict& rows) {
        return _restoreRows(RawVideoParams::rows(), *this, rows);
    });
}
