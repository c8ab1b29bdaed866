#include "builtin/encoders/rawaenc.h"

#include <algorithm>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/encoders/rawsettings.h"
#include "builtin/shared/muxerof.h"
#include "builtin/shared/rawoutput.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvbuffer.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/qvbufstrm.h"

namespace {

constexpr unsigned announcedInfoBytes = 16;

struct Row {
    const char* muxer;
    RawAudioTarget target;
};

constexpr Row targets[] = {
    {"rawmux", {.announcedUnits = true, .markedEnd = true}},
    {"memmux", {.announcedUnits = true}},
    {"mxfmux", {.lpcmHeader = true}},
};

RawAudioTarget targetOf(const char* muxer) {
    for (const auto& row : targets)
        if (std::strcmp(row.muxer, muxer) == 0) return row.target;
    return {};
}

}  // namespace

RawAudioEnc::~RawAudioEnc() {
    try {
        close();
    } catch (const QvException& failure) {
        qv_dbg()->error("[%s] %s", name(), failure.what());
    }
}

int RawAudioEnc::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != stateCreated, "Not inited");
    const bool all = name && std::strcmp(name, "settings") == 0;
    if (!all && !qvFindParamRow(RawAudioSettings::rows(), name)) return QvAudioEncoder::setParam(name, value);
    _traceParam(name, value);
    if (all) return rawsettings::apply(*this, value);
    if (auto result = qvSetParamRow(RawAudioSettings::rows(), settings_, name, value)) return *result;
    return QvAudioEncoder::setParam(name, value);
}

void RawAudioEnc::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow(RawAudioSettings::rows(), settings_, name, value))
        QvAudioEncoder::getParam(name, value);
}

void RawAudioEnc::store(AnyDict& state) const {
    state = rawsettings::stored(name(), RawAudioSettings::rows(), settings_);
}

int RawAudioEnc::restore(const AnyDict& state) {
    if (state.get("name") != name()) return setError(QvStatus::failed, "restore - invalid name");
    return rawsettings::restore(*this, state, [this](const AnyDict& rows) {
        return _restoreRows(RawAudioSettings::rows(), settings_, rows);
    });
}

int RawAudioEnc::attachOutStream(QvBufStream* stream) {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    return QvAudioEncoder::attachOutStream(stream);
}

int RawAudioEnc::open() {
    QV_ASSERT_MSG(getState() == stateInitialised, "not inited");
    if (!outStream()) return setError(QvStatus::failed, "Output stream not attached");
    const auto* muxer = qvMuxerOf(*outStream());
    target_ = targetOf(muxer ? muxer->name() : "");
    outStream()->setParam("rawaenc.audioSettings",
                          AnyDict("samplerate", settings_.samplerate, "channels", settings_.channels,
                                  "bits_per_sample", settings_.bitsPerSample));
    headerDue_ = true;
    setState(qvStateOpen);
    return QvStatus::ok;
}

int RawAudioEnc::writePcm(QvPcm* pcm, int samples) {
    if (getState() != qvStateOpen) return setError(QvStatus::illegalState, "Not opened");
    if (!pcm) return setError(QvStatus::invalidArgument, "No samples given");
    if (samples < 0) samples = pcm->samples();
    if (samples > pcm->samples())
        return setError(QvStatus::invalidArgument, "%d samples asked for, %d given", samples, pcm->samples());
    if (pcm->channels() * pcm->bytesPerSample() != settings_.bytesPerSample() ||
        pcm->channels() != settings_.channels)
        return setError(
            QvStatus::invalidArgument,
            "Samples of %d channels and %d bytes do not fit the output of %d channels and %d bits",
            pcm->channels(), pcm->bytesPerSample(), settings_.channels, settings_.bitsPerSample);
    RawOutput output(*outStream());
    if (headerDue_) {
        headerDue_ = false;
        if (target_.lpcmHeader)
            if (const int result = putHeader(output)) return result;
    }
    if (samples == 0) return QvStatus::ok;
    const auto bytes = static_cast<uint64_t>(samples) * static_cast<uint64_t>(settings_.bytesPerSample());
    return putUnits(output, pcm->ptr(0), bytes);
}

// "LPCM", then the layout: bits 2 to 4 channels less one, bit 0 96 kHz, bits 5 and 6 the width.
int RawAudioEnc::putHeader(RawOutput& output) {
    int layout = (settings_.channels - 1) * 4;
    if (settings_.samplerate == 96000) layout += 1;
    if (settings_.bitsPerSample == 24) layout += 96;
    if (settings_.bitsPerSample == 20) layout += 64;
    const unsigned char header[6] = {'L', 'P', 'C', 'M', static_cast<unsigned char>(layout), 0};
    return putUnit(output, header, sizeof header);
}

int RawAudioEnc::putUnits(RawOutput& output, const unsigned char* data, uint64_t bytes) {
    const auto sample = static_cast<uint64_t>(settings_.bytesPerSample());
    uint64_t unit = bytes;
    if (target_.announcedUnits && output.largestBlock() >= sample)
        unit = std::min<uint64_t>(bytes, output.largestBlock() / sample * sample);
    for (; bytes > 0; data += unit, bytes -= unit) {
        unit = std::min(unit, bytes);
        if (const int result = putUnit(output, data, unit)) return result;
        if (target_.announcedUnits) {
            if (const int answer = output.announce(QvAuxId::AUDIO_AU_CODE, unit, announcedInfoBytes))
                return setError(answer, "The output did not take the samples");
            if (!output.sound()) return setError(QvStatus::failed, "%s", output.fault().c_str());
        }
    }
    return QvStatus::ok;
}

int RawAudioEnc::putUnit(RawOutput& output, const unsigned char* data, uint64_t bytes) {
    switch (output.put(data, bytes)) {
        case RawPutResult::ok: return QvStatus::ok;
        case RawPutResult::failed: return setError(QvStatus::failed, "%s", output.fault().c_str());
        case RawPutResult::noBlock: break;
    }
    return setError(QvStatus::failed, "Error in raw audio encoder, can not allocte buffer, size=%d",
                    static_cast<int>(output.asked()));
}

int RawAudioEnc::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    setState(stateInitialised);
    if (!target_.markedEnd) return QvStatus::ok;
    auto* out = outStream()->input();
    out->auxinfo(out, 0, QvAuxId::STREAM_END_CODE, nullptr, 0);
    if (outStream()->ioError() != 0)
        return setError(QvStatus::failed, "%s", outStream()->ioErrorText().c_str());
    return QvStatus::ok;
}

int RawAudioEnc::abort() {
    if (getState() == qvStateOpen) setState(stateInitialised);
    return QvStatus::ok;
}

QvCodec* newRawaenc() { return new RawAudioEnc; }
