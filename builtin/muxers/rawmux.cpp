#include "builtin/muxers/rawmux.h"

#include <algorithm>
#include <cmath>
#include <string>

#include "builtin/creators.h"
#include "builtin/muxers/filestreams.h"
#include "builtin/muxers/rawmuxoutput.h"
#include "builtin/muxers/streamcodec.h"
#include "builtin/shared/rawoutput.h"
#include "core/arch/qvassert.h"
#include "core/arch/undo_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvgeometry.h"
#include "core/split/qvbufstreamsplit.h"
#include "core/stream/file/qvfilebufstream.h"

namespace {

constexpr char exactNameKey[] = "exactName", firstKey[] = "firstPicture", allKey[] = "allPictures";
constexpr char nameMissing[] = "[rawmux] Output filename not set";
constexpr int mostPictures = 1'000'000'000;
constexpr int mostStreams = 99;  // their numbers have two digits

using Settings = RawMux::Settings;
using Answer = QvParamAccess<RawMux>;

constexpr QvParamRow<Settings> settingRows[] = {
    {.name = "rawAsPng",
     .member = &Settings::rawAsPng,
     .flags = qvParamStored,
     .help = "with splitVideo: frames become PNG files"},
    {.name = "splitVideo",
     .member = &Settings::splitVideo,
     .flags = qvParamStored,
     .help = "a file for each frame"},
    {.name = "splitAudio",
     .member = &Settings::splitAudio,
     .flags = qvParamStored,
     .help = "a file for each channel"},
    {.name = "filename",
     .member = &Settings::filename,
     .help = "of the outputs, without their extensions",
     .type = Any::String},
    {.name = exactNameKey,
     .member = &Settings::exactName,
     .help = "the one stream goes to filename as it is"},
    {.name = firstKey,
     .member = &Settings::firstPicture,
     .min = 0,
     .max = mostPictures,
     .help = "with splitVideo: the number of the first file"},
    {.name = allKey,
     .member = &Settings::allPictures,
     .min = 0,
     .max = mostPictures,
     .help =
         "with splitVideo: files of the whole sequence, for the width of the numbers; 0: those of the job"},
    {"type", {}, qvParamIgnored},
    {"_totalFrames", &Settings::totalFrames},
};
static_assert(qvParamTableOk<Settings>(settingRows));

AnyDict limits() {
    return AnyDict("vids", mostStreams, "auds", mostStreams, "subs", 0, "total", mostStreams);
}

constexpr QvParamRow<RawMux> answerRows[] = {
    {"rawMux", Answer{nullptr, [](const RawMux&, Any& v) { v = 1; }}},
    {"estimateSecKb", Answer{nullptr, [](const RawMux& m, Any& v) { v = qvEstimateSecKb(m); }}},
    {"videoCodecs",
     Answer{nullptr, [](const RawMux& m, Any& v) { v = qvMuxerCodecs(m, QvModuleType::videoEncoder); }}},
    {"audioCodecs",
     Answer{nullptr, [](const RawMux& m, Any& v) { v = qvMuxerCodecs(m, QvModuleType::audioEncoder); }}},
    {"extension", Answer{nullptr, [](const RawMux& m, Any& v) { v = m.extension(); }}},
    {"filenames", Answer{nullptr, [](const RawMux& m, Any& v) { v = m.filenames(); }}},
    {"filesWritten", Answer{nullptr, [](const RawMux& m, Any& v) { v = m.filesWritten(); }}},
    {"maxStreams", Answer{nullptr, [](const RawMux&, Any& v) { v = limits(); }}},
};
static_assert(qvParamTableOk<RawMux>(answerRows));

}  // namespace

RawMux::RawMux() = default;

RawMux::~RawMux() { finish(1); }

int RawMux::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != qvStateOpen, "[RawMux] Invalid state");
    if (auto result = _setRow<Settings>(settingRows, settings_, name, value)) return *result;
    return OwnFilesMuxer::setParam(name, value);
}

void RawMux::getParam(const char* name, Any& value) const {
    if (qvGetParamRow<Settings>(settingRows, settings_, name, value)) return;
    if (!qvGetParamRow<RawMux>(answerRows, *this, name, value)) OwnFilesMuxer::getParam(name, value);
}

void RawMux::store(AnyDict& state) const {
    state.clear();
    state.set("name", name());
    qvStoreParamRows<Settings>(settingRows, settings_, state);
    if (settings_.exactName) state.set(exactNameKey, 1);
    if (settings_.firstPicture > 0) state.set(firstKey, settings_.firstPicture);
    if (settings_.allPictures > 0) state.set(allKey, settings_.allPictures);
}

int RawMux::restore(const AnyDict& state) {
    if (!(state.get("name") == name())) return setError(QvStatus::failed, "restore - invalid name");
    if (state.isSet(exactNameKey)) settings_.exactName = state.get(exactNameKey).isTrue();
    for (const char* key : {firstKey, allKey})
        if (state.isSet(key))
            if (const auto result = _setRow<Settings>(settingRows, settings_, key, state.get(key));
                result && *result != QvStatus::ok)
                return *result;
    return _restoreRows<Settings>(settingRows, settings_, state);
}

Any RawMux::extension() const {
    if (nrStreams(qvVideoStream) > 0) return qvStreamExtension(*stream(qvVideoStream, 0), "vid");
    return nrStreams(qvAudioStream) > 0 ? "aud" : "vid";
}

AnyVector RawMux::filenames() const {
    AnyVector names;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) names.append(outputName(type, nr));
    return names;
}

QvBufStream* RawMux::addStream(int type, const AnyDict& params) {
    std::unique_ptr<QvBufStream> made;
    switch (type) {
        case qvVideoStream: made = std::make_unique<QvBsSplitVideo>(this); break;
        case qvAudioStream: made = std::make_unique<QvBsSplitAudio>(this); break;
        case qvSubpicStream: made = std::make_unique<QvFileBufStream>(this); break;
        default: QV_FAIL("Invalid stream type");
    }
    made->setParamDict(params);
    return keep(type, std::move(made));
}

bool RawMux::hasSeveral() const { return nrStreams(qvVideoStream) > 1 || nrStreams(qvAudioStream) > 1; }

Any RawMux::outputName(int type, int nr) const {
    QV_ASSERT_MSG(settings_.filename.isText(), nameMissing);
    if (settings_.exactName) return settings_.filename;
    auto& output = *stream(type, nr);
    Any name = QvFile::stripExt(settings_.filename);
    if (hasSeveral()) name = Any::strcat(name, Any::sprintf("#%02d", nr));
    return Any::strcat(Any::strcat(name, "."), qvStreamExtension(output, ""));
}

bool RawMux::makesSeveral() const {
    int enabled = 0;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) enabled += stream(type, nr)->enabled() ? 1 : 0;
    return enabled > 1 || settings_.splitVideo || settings_.splitAudio;
}

// Streams whose names agree would write over each other.
int RawMux::checkNames() const {
    AnyVector names;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) {
            if (!stream(type, nr)->enabled()) continue;
            const auto name = outputName(type, nr);
            if (names.contains(name)) return -1;
            names.append(name);
        }
    return 0;
}

int RawMux::open() {
    QV_ASSERT_MSG(getState() == stateInitialised, "[rawmux] Invalid state");
    QV_ASSERT_MSG(settings_.filename.isText(), nameMissing);
    QV_ASSERT_MSG(anyEnabled(), "No enabled streams - use QvTranscoder::link()");
    QV_ASSERT_MSG(outStream(), "Output not set");
    outputs_.clear();
    if (settings_.exactName && makesSeveral())
        return setError(QvStatus::failed, "One output of an exact name takes one stream in one piece");
    if (checkNames() != 0)
        return setError(QvStatus::failed,
                        "Two streams would be written to one file, their extensions are equal");
    // Finishing says nothing of its own, so the reason stays.
    Undo finishing([this] { finish(1); });
    if (const int result = openAll()) return result;
    finishing.dismiss();
    setState(qvStateOpen);
    return QvStatus::ok;
}

int RawMux::openAll() {
    for (int nr = 0; nr < nrStreams(qvAudioStream); ++nr)
        if (stream(qvAudioStream, nr)->enabled())
            if (const int result = openAudio(nr)) return result;
    for (int nr = 0; nr < nrStreams(qvVideoStream); ++nr)
        if (stream(qvVideoStream, nr)->enabled())
            if (const int result = openVideo(nr)) return result;
    return QvStatus::ok;
}

int RawMux::openAudio(int nr) {
    auto& output = *stream(qvAudioStream, nr);
    const auto* encoder = output.atachee();
    const bool pcm = encoder && qvModuleTraits(*encoder).uncompressed;
    output.setParam("isPcm", pcm ? 1 : 0);
    output.setParam("split", pcm && settings_.splitAudio ? 1 : 0);
    if (pcm)
        for (const char* name : {"samplerate", "channels", "bitsPerSample"})
            output.setParam(name, encoder->getParam(name));
    output.setParam(rawWriteThrough, pcm ? 0 : 1);
    const int channels = encoder ? qvIntParam(*encoder, "channels", 1) : 1;
    outputs_.push_back(std::make_unique<RawMuxOutput>(
        output, outputName(qvAudioStream, nr),
        pcm && settings_.splitAudio ? RawMuxOutput::channelFiles : RawMuxOutput::oneFile, channels));
    return openStream(qvAudioStream, nr, "Unable to open output audio file %s");
}

int RawMux::openVideo(int nr) {
    auto& output = *stream(qvVideoStream, nr);
    const auto* encoder = output.atachee();
    const ModuleTraits traits = encoder ? qvModuleTraits(*encoder) : ModuleTraits();
    const bool raw = traits.uncompressed;
    const bool split = settings_.splitVideo && (raw || traits.wholePictures);
    const bool png = split && settings_.rawAsPng && raw;
    const int all = settings_.allPictures > 0 ? settings_.allPictures : settings_.totalFrames;
    const int digits = all >= 1 ? static_cast<int>(std::ceil(std::log10(static_cast<double>(all))) + 0.1) : 0;
    output.setParam("split", split ? 1 : 0);
    output.setParam("nrDigits", digits);
    output.setParam("firstNumber", settings_.firstPicture);
    const auto size = output.getParam("size");
    if (split && size.isInt32() && size.asInt32() > 0) output.setParam("chunk", size);
    output.setParam("png", png ? 1 : 0);
    output.setParam("parallel", png ? 1 : 0);
    if (png) {
        output.setParam("width", encoder->getParam("width"));
        output.setParam("height", encoder->getParam("height"));
        // What comes out of the encoder: of v210 the selected format is what goes in.
        output.setParam("FOURCC", encoder->getParam("type"));
    }
    output.setParam(rawWriteThrough, split ? 0 : 1);
    outputs_.push_back(std::make_unique<RawMuxOutput>(
        output, outputName(qvVideoStream, nr), split ? RawMuxOutput::pictureFiles : RawMuxOutput::oneFile,
        digits, png));
    outputs_.back()->first = settings_.firstPicture;
    return openStream(qvVideoStream, nr, "Unable to open output video file %s");
}

int RawMux::openStream(int type, int nr, const char* failure) {
    auto& output = *stream(type, nr);
    const auto name = outputName(type, nr);
    output.setParam("outfilename", name);
    const int opened = output.init();
    if (opened == QvStatus::ok) return opened;
    outputs_.back()->failed = true;
    const std::string message = failure;
    return setError(opened == QvStatus::outOfMemory ? opened : QvStatus::failed, "%s%s",
                    message.substr(0, message.size() - 2).c_str(), qv_os_name(name).c_str());
}

int RawMux::close() { return getState() == qvStateOpen ? finish(0) : QvStatus::ok; }

int RawMux::abort() { return getState() == qvStateOpen ? finish(1) : QvStatus::ok; }

// Every file is finished, whatever happens to one of them; the first failure is reported.
int RawMux::finish(int abort) {
    const QvBufStream* failed = nullptr;
    for (const int type : {qvAudioStream, qvVideoStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) {
            auto& output = *stream(type, nr);
            if (!output.inited()) continue;
            output.destroy(abort);
            if (!failed && output.ioError() != 0) failed = &output;
        }
    for (auto& output : outputs_) output->release();
    if (getState() == qvStateOpen) setState(stateInitialised);
    if (!failed || abort) return QvStatus::ok;
    return setError(QvStatus::failed, "%s", failed->ioErrorText().c_str());
}

AnyVector RawMux::filesWritten() const {
    AnyVector files;
    for (const auto& output : outputs_) output->appendFiles(files);
    return files;
}

int RawMux::muxElementaryStreams(QvFileMuxConfig& config, QvBufStream& output) {
    std::string error;
    const int result = qvMuxFiles(*this, config, output, error);
    return result < 0 ? setError(result, "%s", error.c_str()) : result;
}

QvCodec* newRawmux() { return new RawMux; }
