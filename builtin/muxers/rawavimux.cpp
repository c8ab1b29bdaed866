#include "builtin/muxers/rawavimux.h"

#include "builtin/creators.h"
#include "builtin/muxers/filestreams.h"
#include "builtin/muxers/rawavimuxbytes.h"
#include "builtin/muxers/streamcodec.h"
#include "core/arch/qvassert.h"
#include "core/arch/undo_p.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/iofailure.h"

namespace {

constexpr int mostStreams = 99;  // their numbers have two digits
constexpr int mostChannels = 32;

// Speakers of the usual layouts; 0 leaves them open.
constexpr unsigned speakers[] = {0, 0x4, 0x3, 0, 0, 0, 0x3F, 0, 0x63F};

using Settings = RawAviMux::Settings;
using Answer = QvParamAccess<RawAviMux>;

constexpr QvParamRow<Settings> settingRows[] = {
    {"riffBytes", &Settings::riffBytes, qvParamStored, 1024, 1 << 30, "", "bytes",
     "of each RIFF part of the file"},
    {"segments", &Settings::segments, qvParamStored, 1, 65536, "", "", "RIFF parts at most"},
    {"framerate", {}, qvParamIgnored},
};
static_assert(qvParamTableOk<Settings>(settingRows));

AnyDict limits() {
    return AnyDict("vids", mostStreams, "auds", mostStreams, "subs", 0, "total", mostStreams);
}

constexpr QvParamRow<RawAviMux> answerRows[] = {
    {"estimateSecKb", Answer{nullptr, [](const RawAviMux& m, Any& v) { v = qvEstimateSecKb(m); }}},
    {"videoCodecs",
     Answer{nullptr, [](const RawAviMux& m, Any& v) { v = qvMuxerCodecs(m, QvModuleType::videoEncoder); }}},
    {"audioCodecs",
     Answer{nullptr, [](const RawAviMux& m, Any& v) { v = qvMuxerCodecs(m, QvModuleType::audioEncoder); }}},
    {"extension", Answer{nullptr, [](const RawAviMux&, Any& v) { v = "avi"; }}},
    {"maxStreams", Answer{nullptr, [](const RawAviMux&, Any& v) { v = limits(); }}},
};
static_assert(qvParamTableOk<RawAviMux>(answerRows));

std::vector<unsigned char> pictureFormat(const AviPicture& picture) {
    AviBytes format;
    format.u32(40).u32(picture.width()).u32(picture.height()).u16(1).u16(picture.bitsPerPixel());
    format.u32(picture.compression()).u32(static_cast<int64_t>(picture.fileBytes())).zeros(16);
    return format.take();
}

std::vector<unsigned char> soundFormat(int samplerate, int channels, int bits) {
    const int valueBytes = (bits + 7) / 8;
    const bool plain = channels <= 2 && (bits == 8 || bits == 16);
    AviBytes format;
    format.u16(plain ? 1 : 0xFFFE).u16(channels).u32(samplerate);
    format.u32(int64_t{samplerate} * channels * valueBytes).u16(channels * valueBytes).u16(valueBytes * 8);
    if (plain) return format.u16(0).take();
    const auto known = static_cast<size_t>(channels) < std::size(speakers);
    format.u16(22).u16(bits).u32(known ? speakers[channels] : 0);
    return format.u32(1).u32(0x00100000).u32(0xAA000080).u32(0x719B3800).take();
}

}  // namespace

RawAviMux::~RawAviMux() { end(); }

int RawAviMux::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != qvStateOpen, "[rawavimux] Invalid state");
    _traceParam(name, value);
    if (auto result = qvSetParamRow<Settings>(settingRows, settings_, name, value)) return *result;
    return BaseMuxer::setParam(name, value);
}

void RawAviMux::getParam(const char* name, Any& value) const {
    if (qvGetParamRow<Settings>(settingRows, settings_, name, value)) return;
    if (!qvGetParamRow<RawAviMux>(answerRows, *this, name, value)) BaseMuxer::getParam(name, value);
}

void RawAviMux::store(AnyDict& state) const {
    state.clear();
    state.set("name", name());
    qvStoreParamRows<Settings>(settingRows, settings_, state);
}

int RawAviMux::restore(const AnyDict& state) {
    if (!(state.get("name") == name())) return setError(QvStatus::failed, "restore - invalid name");
    return _restoreRows<Settings>(settingRows, settings_, state);
}

QvBufStream* RawAviMux::addStream(int type, const AnyDict& params) {
    QV_ASSERT_MSG(type == qvVideoStream || type == qvAudioStream, "Invalid stream type");
    if (nrStreams(0) >= mostStreams) return nullptr;
    auto made = std::make_unique<AviStream>(this);
    made->setParamDict(params);
    return keep(type, std::move(made));
}

int RawAviMux::open() {
    QV_ASSERT_MSG(getState() == stateInitialised, "[rawavimux] Invalid state");
    QV_ASSERT_MSG(nrStreams(qvAllStreams) > 0, "Input not set");
    QV_ASSERT_MSG(anyEnabled(), "No enabled streams - use QvTranscoder::link()");
    QV_ASSERT_MSG(outStream(), "Output not set");
    std::vector<AviInterleaver::Source> sources;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr)
            if (const int result = describe(type, nr, sources)) return result;
    Undo ending([this] { end(); });
    if (!interleaver_.open(*outStream(), std::move(sources), {settings_.riffBytes, settings_.segments}))
        return fail();
    size_t track = 0;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) {
            auto& output = static_cast<AviStream&>(*stream(type, nr));
            if (!output.enabled()) continue;
            if (const int result = output.begin(interleaver_, track++, type == qvVideoStream))
                return setError(result, "Failed to init bufstream object");
        }
    ending.dismiss();
    setState(qvStateOpen);
    return QvStatus::ok;
}

int RawAviMux::describe(int type, int nr, std::vector<AviInterleaver::Source>& sources) {
    auto& output = *stream(type, nr);
    if (!output.enabled()) return QvStatus::ok;
    const auto* encoder = output.atachee();
    if (!encoder)
        return setError(QvStatus::failed, "The %s stream #%d has no encoder", qvStreamTypeName(type), nr);
    auto& source = sources.emplace_back();
    return type == qvVideoStream ? describeVideo(*encoder, source) : describeAudio(*encoder, source);
}

int RawAviMux::describeVideo(const QvCodec& encoder, AviInterleaver::Source& source) {
    const int width = qvIntParam(encoder, "width", 0);
    const int height = qvIntParam(encoder, "height", 0);
    const auto type = static_cast<unsigned>(qvIntParam(encoder, "type", 0));
    auto picture = AviPicture::of(type, width, height);
    if (!picture)
        return setError(QvStatus::failed,
                        "AVI takes no %s of %dx%d, but BGR3, BGR4, I420, YV12, YUYV, UYVY and v210",
                        qvFourccText(type).data(), width, height);
    const Any rate = encoder.getParam("framerate");
    const QvRatio ratio = rate.isFramerate() ? rate.asFramerate().rate() : QvRatio(0, 1);
    if (ratio.num < 1 || ratio.den < 1)
        return setError(QvStatus::failed, "The video encoder has no frame rate");
    auto& track = source.track;
    track.video = true;
    track.handler = picture->compression() ? picture->compression() : qvFourcc("DIB ");
    track.rate = static_cast<unsigned>(ratio.num);
    track.scale = static_cast<unsigned>(ratio.den);
    track.width = width;
    track.height = height;
    track.interlaced = rate.asFramerate().interlaced();
    track.format = pictureFormat(*picture);
    source.picture = std::move(*picture);
    return QvStatus::ok;
}

int RawAviMux::describeAudio(const QvCodec& encoder, AviInterleaver::Source& source) {
    const int samplerate = qvIntParam(encoder, "samplerate", 0);
    const int channels = qvIntParam(encoder, "channels", 0);
    const int bits = qvIntParam(encoder, "bitsPerSample", 0);
    if (samplerate < 1 || channels < 1 || channels > mostChannels || bits < 1 || bits > 32)
        return setError(QvStatus::failed, "AVI holds no sound of %d Hz, %d channels and %d bits", samplerate,
                        channels, bits);
    auto& track = source.track;
    track.rate = static_cast<unsigned>(samplerate);
    track.unitBytes = static_cast<unsigned>(channels * ((bits + 7) / 8));
    track.format = soundFormat(samplerate, channels, bits);
    return QvStatus::ok;
}

int RawAviMux::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    int result = QvStatus::ok;
    for (int nr = 0; nr < nrStreams(qvVideoStream); ++nr)
        if (static_cast<AviStream*>(stream(qvVideoStream, nr))->holdsPart())
            result = setError(QvStatus::failed, "The last picture of video stream #%d is incomplete", nr);
    bool written = false;
    {
        const Undo ending([this] { end(); });  // also if the index gets no memory
        written = interleaver_.close();
    }
    return written ? result : fail();
}

int RawAviMux::abort() {
    end();
    return QvStatus::ok;
}

void RawAviMux::end() {
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) stream(type, nr)->destroy(1);
    if (getState() == qvStateOpen) setState(stateInitialised);
}

int RawAviMux::fail() {
    QvIoFailure failure;
    interleaver_.tell(failure);
    return setError(QvStatus::failed, "%s", failure.text().c_str());
}

int RawAviMux::muxElementaryStreams(QvFileMuxConfig& config, QvBufStream& output) {
    std::string error;
    const int result = qvMuxFiles(*this, config, output, error);
    return result < 0 ? setError(result, "%s", error.c_str()) : result;
}

QvCodec* newRawavimux() { return new RawAviMux; }
