#include "core/encode/qvencoder.h"

#include <cstring>
#include <span>

#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/qvbufstrm.h"
#include "core/value/anycontainer.h"

namespace {

constexpr QvParamRow<QvAudioEncoder> audioRows[] = {
    {.name = "timecodeOffset", .flags = qvParamIgnored},
    {.name = "smartRender", .flags = qvParamIgnored},
    {.name = "adjustSettings", .flags = qvParamIgnored},
    {.name = "tsAdjust", .flags = qvParamIgnored},
};

constexpr QvParamRow<QvVideoEncoder> videoRows[] = {
    {.name = "timecodeOffset", .flags = qvParamIgnored},
    {.name = "extension", .flags = qvParamIgnored},
    {.name = "adjustSettings", .flags = qvParamIgnored},
    {.name = "getQualityStats", .flags = qvParamIgnored},
};

int spreadBitrate(QvVideoEncoder& encoder, const QvBitrate& rate) {
    int result = encoder.setParam("vbr", rate.type);
    if (rate.type == QvBitrate::vbr) {
        result |= encoder.setParam("minVBitrate", static_cast<double>(rate.min));
        result |= encoder.setParam("maxVBitrate", static_cast<double>(rate.max));
    }
    if (rate.type == QvBitrate::cbr || rate.type == QvBitrate::vbr)
        result |= encoder.setParam("vBitrate", static_cast<double>(rate.target));
    return result;
}

int bitsOf(const QvVideoEncoder& encoder, const char* name) {
    Any value;
    encoder.getParam(name, value);
    return value.isFloat() || value.isInt() ? value.toInt32() : 0;
}

QvBitrate gatherBitrate(const QvVideoEncoder& encoder) {
    QvBitrate rate;
    rate.type = bitsOf(encoder, "vbr");
    if (rate.type == QvBitrate::cbr || rate.type == QvBitrate::vbr) rate.target = bitsOf(encoder, "vBitrate");
    if (rate.type == QvBitrate::vbr) {
        rate.min = bitsOf(encoder, "minVBitrate");
        rate.max = bitsOf(encoder, "maxVBitrate");
    }
    return rate;
}

}  // namespace

int QvEncoder::attachOutStream(QvBufStream* stream) {
    if (!stream) return setError(QvStatus::invalidArgument, "Output stream is null");
    if (outStream_) detachOutStream();
    outStream_ = stream;
    stream->setAtachee(this);
    return QvStatus::ok;
}

int QvEncoder::detachOutStream() {
    if (outStream_ && outStream_->atachee() == this) outStream_->setAtachee(nullptr);
    outStream_ = nullptr;
    return QvStatus::ok;
}

int QvEncoder::abort() { return close(); }

int QvVideoEncoder::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "bitrate") == 0) {
        _traceParam(name, value);
        if (!value.isBitrate()) return setError(QvStatus::invalidParam, "\"bitrate\" takes a bit rate");
        return spreadBitrate(*this, value.asBitrate());
    }
    if (auto result = _setRow<QvVideoEncoder>(videoRows, *this, name, value)) return *result;
    return QvCodec::setParam(name, value);
}

void QvVideoEncoder::getParam(const char* name, Any& value) const {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    if (is("bitrate")) {
        value = gatherBitrate(*this);
    } else if (is("inFOURCC")) {
        if (module()) value = getAttr("inFOURCC");
    } else if (is("frameAspectEx")) {
        getParam("frameAspect", value);
    } else if (is("palRange")) {
        value = AnyVector(0, 1);
    } else if (is("multiViewPossible")) {
        value = 0;
    } else if (is("nrViews")) {
        value = 1;
    } else {
        QvCodec::getParam(name, value);
    }
}

void* QvVideoEncoder::getInterface(int kind) const {
    return kind == 7 ? const_cast<QvVideoEncoder*>(this) : nullptr;
}

int QvAudioEncoder::setParam(const char* name, const Any& value) {
    if (auto result = _setRow<QvAudioEncoder>(audioRows, *this, name, value)) return *result;
    return QvCodec::setParam(name, value);
}

void* QvAudioEncoder::getInterface(int kind) const {
    return kind == 6 ? const_cast<QvAudioEncoder*>(this) : nullptr;
}
