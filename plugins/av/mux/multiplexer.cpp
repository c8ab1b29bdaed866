#include "plugins/av/mux/multiplexer.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <functional>
#include <string_view>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"
#include "core/preset/qvpresetmgr.h"
#include "plugins/av/mux/filefeed.h"
#include "plugins/av/mux/filmcheck.h"
#include "plugins/av/mux/filmwriter.h"
#include "plugins/av/mux/muxoptions.h"
#include "plugins/av/mux/muxtrack.h"
#include "plugins/av/mux/unitrecorder.h"
#include "plugins/av/mux/unitstream.h"

namespace av {

namespace {

using Settings = Multiplexer::Settings;
using Answer = QvParamAccess<Multiplexer>;

constexpr QvParamRow<Settings> settingRows[] = {
    {"seekable", &Settings::seekable, qvParamStored, -1, 1, "", "",
     "1: headers are corrected at the end; 0: as for a pipe; -1: 1 for a file"},
    {.name = "fastStart",
     .member = &Settings::fastStart,
     .flags = qvParamStored,
     .help = "MP4: the index in front"},
    {.name = "language",
     .member = &Settings::language,
     .flags = qvParamStored,
     .help = "of sound without one, three letters"},
    {.name = "filename", .member = &Settings::filename, .help = "of the output", .type = Any::String},
    {"samplerate", &Settings::samplerate, qvParamStored, 1, 768000, "", "Hz"},
    {"channels", &Settings::channels, qvParamStored, 1, 64},
    {"bitsPerSample", &Settings::bitsPerSample, qvParamStored, 8, 32},
    {"_totalFrames", &Settings::totalFrames, qvParamWriteOnly, 0, INT_MAX, "", "",
     "pictures to come, 0: not known"},
    {.name = "meta", .member = &Settings::meta, .help = "title, timecode, chapters and the like"},
    {.name = "tags",
     .member = &Settings::tags,
     .help = "in the place of meta: title, timecode, chapters and the like",
     .type = Any::Dict},
    {.name = "avOptions",
     .member = &Settings::avOptions,
     .flags = qvParamStored | qvParamByHand,
     .help = "options of the container, name=value:name=value"},
    {"framerate", {}, qvParamIgnored},
};
static_assert(qvParamTableOk<Settings>(settingRows));

AnyDict limits(const Multiplexer& muxer) {
    const Container& container = muxer.container();
    return AnyDict("vids", container.videos, "auds", container.sounds, "subs", 0, "total",
                   container.videos + container.sounds);
}

AnyVector codecs(const Multiplexer& muxer, int kind) {
    const auto* const presets = qv_registry()->presetMgr();
    return presets ? presets->getCompatible(muxer.name(), kind) : AnyVector();
}

constexpr QvParamRow<Multiplexer> answerRows[] = {
    {"estimateSecKb", Answer{nullptr, [](const Multiplexer& m, Any& v) { v = m.secondKilobytes(); }}},
    {"videoCodecs",
     Answer{nullptr, [](const Multiplexer& m, Any& v) { v = codecs(m, QvModuleType::videoEncoder); }}},
    {"audioCodecs",
     Answer{nullptr, [](const Multiplexer& m, Any& v) { v = codecs(m, QvModuleType::audioEncoder); }}},
    {"videoNecessary", Answer{nullptr, [](const Multiplexer& m,
                                          Any& v) { v = m.container().is(MuxTrait::needsVideo) ? 1 : 0; }}},
    {"maxStreams", Answer{nullptr, [](const Multiplexer& m, Any& v) { v = limits(m); }}},
};
static_assert(qvParamTableOk<Multiplexer>(answerRows));

// Encoders of the engine that write pixels and samples unchanged; others say so by an attribute.
bool isRaw(const QvCodec& encoder) {
    const QvModule* const module = encoder.module();
    if (!module) return false;
    const Any attribute = module->getAttr("uncompressed");
    if (attribute.isValid()) return attribute.isTrue();
    const std::string_view name = module->name();
    return name == "rawvenc" || name == "rawaenc" || name == "dummyaenc";
}

std::string lower(std::string text) {
    for (char& c : text)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return text;
}

std::string textOf(const Any& value) {
    const Any text = value.toString();
    return text.isString() ? text.asString() : "";
}

}  // namespace

Multiplexer::Multiplexer(const Container& container) : container_(container) {}

Multiplexer::~Multiplexer() { end(); }

double Multiplexer::secondKilobytes() const {
    if (std::exchange(asking_, true))
        return 0;  // by an encoder that passes the question on to its multiplexer
    double sum = 0;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr)
            if (const auto* const encoder = stream(type, nr)->atachee()) {
                const Any part = encoder->getParam("estimateSecKb");
                if (part.isInt() || part.isFloat()) sum += part.toDouble();
            }
    asking_ = false;
    return sum;
}

void Multiplexer::refuse(const std::string& problem) { setError(QvStatus::failed, "%s", problem.c_str()); }

// --- Parameters.

int Multiplexer::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != qvStateOpen, "A multiplexer in use takes no parameters");
    if (std::strcmp(name, "avOptions") == 0) return checkOptions(value);
    if (auto result = _setRow<Settings>(settingRows, settings_, name, value)) return *result;
    return BaseMuxer::setParam(name, value);
}

int Multiplexer::checkOptions(const Any& value) {
    _traceParam("avOptions", value);
    const std::string text = textOf(value);
    if (value.isValid() && !value.isText())
        return setError(QvStatus::invalidParam, "'avOptions' takes a text");
    OptionList unused;
    const std::string problem = parseMuxOptions(text, formFor(container_, extension()).format, unused);
    if (!problem.empty()) return setError(QvStatus::invalidParam, "avOptions: %s", problem.c_str());
    settings_.avOptions = text;
    return QvStatus::ok;
}

void Multiplexer::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "extension") == 0)
        value = Any(extension().c_str());
    else if (std::strcmp(name, "avOptions") == 0)
        value = Any(settings_.avOptions.c_str());
    else if (!qvGetParamRow<Settings>(settingRows, settings_, name, value) &&
             !qvGetParamRow<Multiplexer>(answerRows, *this, name, value))
        BaseMuxer::getParam(name, value);
}

void Multiplexer::store(AnyDict& state) const {
    state.clear();
    state.set("name", name());
    qvStoreParamRows<Settings>(settingRows, settings_, state);
    state.set("avOptions", Any(settings_.avOptions.c_str()));
    if (settings_.tags.isDict()) state.set("tags", settings_.tags);
}

int Multiplexer::restore(const AnyDict& state) {
    if (!(state.get("name") == name())) return setError(QvStatus::failed, "restore - invalid name");
    if (state.isSet("avOptions"))
        if (const int result = checkOptions(state.get("avOptions"))) return result;
    settings_.tags = state.get("tags").isDict() ? state.get("tags") : Any();
    return _restoreRows<Settings>(settingRows, settings_, state);
}

// That of the output if it is one of the container's, else the usual one.
std::string Multiplexer::extension() const {
    const std::string all = container_.module().extensions;
    const std::string own =
        settings_.filename.isText() ? lower(textOf(QvFile::getExt(settings_.filename, true))) : "";
    if (!own.empty() && (" " + all + " ").find(" " + own + " ") != std::string::npos) return own;
    return all.substr(0, all.find(' '));
}

// --- Streams.

QvBufStream* Multiplexer::addStream(int type, const AnyDict& params) {
    QV_ASSERT_MSG(type == qvVideoStream || type == qvAudioStream || type == qvSubpicStream,
                  "Invalid stream type");
    const int most = type == qvVideoStream   ? container_.videos
                     : type == qvAudioStream ? container_.sounds
                                             : 0;
    if (nrStreams(type) >= most) return nullptr;
    auto made = std::make_unique<UnitStream>(this);
    made->setParamDict(params);
    return keep(type, std::move(made));
}

QvBufStream* Multiplexer::streamAt(int type, int number) const {
    const bool known = type == qvVideoStream || type == qvAudioStream;
    return known && number >= 0 && number < nrStreams(type) ? stream(type, number) : nullptr;
}

int Multiplexer::setStreamParam(int type, int number, const char* name, const Any& value) {
    QvBufStream* const to = streamAt(type, number);
    const bool known = std::strcmp(name, "language") == 0 || std::strcmp(name, "title") == 0;
    if (!known || !to || !value.isText()) return BaseMuxer::setStreamParam(type, number, name, value);
    return to->setParam(name, value);
}

void Multiplexer::getStreamParams(int type, int number, AnyDict& params) const {
    params.clear();
    QvBufStream* const of = streamAt(type, number);
    for (const char* name : {"language", "title"})
        if (of && of->getParam(name).isText()) params.set(name, of->getParam(name));
}

// --- A run.

bool Multiplexer::regularFile() const {
    const Any name = outStream()->getParam("outfilename");
    return name.isText() && QvFile::flength(name) >= 0;
}

int Multiplexer::fail() { return setError(QvStatus::failed, "%s", film_->problem().c_str()); }

int Multiplexer::describe(int type, int nr, const Container& container, std::vector<MuxTrack>& tracks) {
    QvBufStream& from = *stream(type, nr);
    if (!from.enabled()) return QvStatus::ok;
    const bool video = type == qvVideoStream;
    const QvCodec* const encoder = from.atachee();
    if (!encoder)
        return setError(QvStatus::failed, "The %s stream #%d has no encoder", qvStreamTypeName(type), nr);
    MuxTrack& track = tracks.emplace_back(container, video,
                                          (video ? "Video stream #" : "Audio stream #") + std::to_string(nr));
    track.language = textOf(from.getParam("language"));
    track.title = textOf(from.getParam("title"));
    if (track.language.empty() && !video) track.language = settings_.language;
    if (isRaw(*encoder) && !track.describeRaw(*encoder))
        return setError(QvStatus::failed, "%s", track.problem().c_str());
    return QvStatus::ok;
}

int Multiplexer::open() {
    QV_ASSERT_MSG(getState() == stateInitialised, "Invalid state");
    QV_ASSERT_MSG(nrStreams(qvAllStreams) > 0, "Input not set");
    QV_ASSERT_MSG(anyEnabled(), "No enabled streams - use QvTranscoder::link()");
    QV_ASSERT_MSG(outStream(), "Output not set");
    const auto [container, format] = formFor(container_, extension());
    std::vector<MuxTrack> tracks;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr)
            if (const int result = describe(type, nr, *container, tracks)) return result;
    const bool pictures = std::any_of(tracks.begin(), tracks.end(), std::mem_fn(&MuxTrack::video));
    if (container->is(MuxTrait::needsVideo) && !pictures)
        return setError(QvStatus::failed, "%s requires video stream", container->module().displayName);
    FilmJob job;
    job.container = container;
    job.format = format;
    job.name = textOf(outStream()->getParam("outfilename"));
    job.extension = extension();
    job.seekable = settings_.seekable < 0 ? regularFile() : settings_.seekable != 0;
    job.fastStart = settings_.fastStart;
    job.frames = settings_.totalFrames;
    job.meta = settings_.tags.isDict() ? settings_.tags.asDict() : settings_.meta;
    job.options = settings_.avOptions;
    if (!job.seekable && container->pipe == PipeForm::none)
        return setError(QvStatus::failed,
                        "%s can't be written to a pipe: its headers are corrected at the end",
                        container->module().displayName);
    file_ = job.seekable && regularFile();
    film_ = std::make_unique<FilmWriter>(*outStream(), std::move(job), std::move(tracks));
    if (film_->failed()) return fail();
    std::size_t track = 0;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) {
            auto& from = static_cast<UnitStream&>(*stream(type, nr));
            if (!from.enabled()) continue;
            from.setParam("outfilename", outStream()->getParam("outfilename"));
            if (const int result = from.begin(*film_, track++)) {
                end();
                return setError(result, "Failed to init bufstream object");
            }
        }
    setState(qvStateOpen);
    return QvStatus::ok;
}

// An encoder that could not be opened has said why itself, and there is no film.
bool Multiplexer::encoderFailed() const {
    std::size_t track = 0;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) {
            const QvBufStream& from = *stream(type, nr);
            if (!from.enabled()) continue;
            const QvCodec* const encoder = from.atachee();
            if (!film_->track(track++).described() && encoder && encoder->errorCode() != 0) return true;
        }
    return false;
}

int Multiplexer::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    if (!film_->failed() && encoderFailed()) return abort();
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr)
            if (!static_cast<UnitStream*>(stream(type, nr))->finish())
                film_->fail(std::string(type == qvVideoStream ? "Video" : "Audio") + " stream #" +
                            std::to_string(nr) + ": its last unit is incomplete");
    const int result = film_->close() ? check() : fail();
    end();
    return result;
}

// Corrections are made now, so that what is read is what stays.
int Multiplexer::check() {
    if (!file_) return QvStatus::ok;
    outStream()->flush();
    if (outStream()->ioError() != 0)
        return setError(QvStatus::failed, "%s", outStream()->ioErrorText().c_str());
    std::vector<FilmExpectation> streams;
    for (std::size_t i = 0; i < film_->tracks(); ++i)
        streams.push_back({film_->track(i).video(), film_->written(i)});
    const Any name = outStream()->getParam("outfilename");
    const std::string problem = checkFilm(name, formFor(container_, extension()).container->format, streams,
                                          makesFragments(settings_.avOptions));
    if (problem.empty()) return QvStatus::ok;
    return setError(QvStatus::failed, "%s was written, but can't be read again: %s", textOf(name).c_str(),
                    problem.c_str());
}

int Multiplexer::abort() {
    end();
    return QvStatus::ok;
}

void Multiplexer::end() {
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < nrStreams(type); ++nr) stream(type, nr)->destroy(1);
    film_.reset();
    if (getState() == qvStateOpen) setState(stateInitialised);
}

int Multiplexer::muxElementaryStreams(QvFileMuxConfig& config, QvBufStream& output) {
    std::string error;
    const int result = muxFiles(*this, config, output, error);
    return result < 0 ? setError(result, "%s", error.c_str()) : result;
}

QvCodec* newMultiplexer(const char* module) {
    if (std::strcmp(module, recorderModule) == 0) return new UnitRecorder;
    const Container* const container = containerOf(module);
    return container ? new Multiplexer(*container) : nullptr;
}

}  // namespace av
