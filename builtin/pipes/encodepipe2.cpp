#include "builtin/pipes/encodepipe2.h"

#include <cstring>

#include "builtin/creators.h"
#include "builtin/pipes/output/memberaddress.h"
#include "builtin/pipes/output/outputanswers.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

namespace {

enum class Action {
    applyPreset,
    setFilename,
    setMuxer,
    setSink,
    setAdjust,
    toVideo,
    toVideoAndMuxer,
    switchToBuiltin,
    switchToUser,
    obsolete,
};

struct OwnParam {
    const char* name;
    Action action;
    const char* obsolete = nullptr;  // the text of the assertion
};

constexpr OwnParam ownParams[] = {
    {"preset", Action::applyPreset},
    {"userProfile", Action::obsolete,
     "EncodePipe: 'userProfile' parameter OBSOLETE, use QvEncodePipe::applyPreset()"},
    {"filename", Action::setFilename},
    {"twoPass", Action::toVideo},
    {"video", Action::obsolete, "EncodePipe: 'video' parameter OBSOLETE, use QvEncodePipe::setCodec()"},
    {"audio", Action::obsolete, "EncodePipe: 'audio' parameter OBSOLETE, use QvEncodePipe::setCodec()"},
    {"adjustCodecToMuxer", Action::setAdjust},
    {"pal", Action::toVideoAndMuxer},
    {"muxerName", Action::setMuxer},
    {"sinkName", Action::setSink},
    {"_switchToBuiltin", Action::switchToBuiltin},
    {"_switchToUser", Action::switchToUser},
};

const OwnParam* findOwn(const char* name) {
    for (const auto& row : ownParams)
        if (std::strcmp(row.name, name) == 0) return &row;
    return nullptr;
}

constexpr QvParamRow<EncodePipe2> described[] = {
    {.name = "filename",
     .flags = qvParamByHand,
     .help = "the output; the multiplexer may make several names of it",
     .type = Any::String},
    {.name = "sinkName", .flags = qvParamByHand, .help = "module of the sink", .type = Any::String},
    {.name = "twoPass", .flags = qvParamByHand, .help = "for the video encoders", .type = Any::Int32},
    {.name = "pal",
     .flags = qvParamByHand,
     .help = "for the video encoders and the multiplexer",
     .type = Any::Int32},
    {.name = "adjustCodecToMuxer",
     .flags = qvParamByHand | qvParamWriteOnly,
     .help = "1: encoders follow what the multiplexer demands",
     .type = Any::Int32},
    {.name = "video0/...",
     .flags = qvParamByHand,
     .help = "a parameter of a member: video0, audio1, muxer or sink, a slash and its name"},
    {.name = "extension", .flags = qvParamByHand | qvParamReadOnly, .type = Any::String},
    {.name = "filesWritten", .flags = qvParamByHand | qvParamReadOnly, .type = Any::Vector},
};
static_assert(qvParamTableOk<EncodePipe2>(described));

}  // namespace

EncodePipe2::~EncodePipe2() {
    if (getState() == qvStateOpen) finish(true);
    setState(stateInitialised);
    builder_.removeAll(qvAllStreams);
}

int EncodePipe2::init() {
    if (getState() != stateCreated) {
        qv_dbg()->warning("EncodePipe.init: Already initialized");
        return QvStatus::ok;
    }
    const auto& presets = qvPresetMgr()->builtinPresets();
    if (presets.empty()) return setError(QvStatus::failed, "There are no presets");
    preset_.set(presets.preset(0));
    if (end_.setSink("filesink") != 0) return setError(QvStatus::failed, "Can not create file sink module.");
    adjustCodecToMuxer_ = true;
    if (const int result = applyFirst(preset_.preset().profile())) return result;
    setState(stateInitialised);
    return QvStatus::ok;
}

// A module of a plug-in that can't be made, for want of its hardware or its licence, must not keep all other
// outputs from being made: then the pipe begins with the raw preset of this library.
int EncodePipe2::applyFirst(int profile) {
    const bool canFallBack = profile != QvProfile::raw && qvPresetMgr()->profileAvailable(QvProfile::raw);
    if (!canFallBack) return applyPreset(profile, 0);
    try {
        if (applyPreset(profile, 0) == QvStatus::ok) return QvStatus::ok;
        qv_dbg()->warning("[Encode Pipe] The first preset can't be applied: %s", errorDesc());
    } catch (const QvMemoryFailure&) {
        throw;
    } catch (const QvException& failure) {
        qv_dbg()->warning("[Encode Pipe] The first preset can't be applied: %s", failure.what());
    }
    setError(QvStatus::ok, "%s", "");
    return applyPreset(QvProfile::raw, 0);
}

void* EncodePipe2::getInterface(int kind) const {
    auto* self = const_cast<EncodePipe2*>(this);
    if (kind == qvProgramSetupInterface) return static_cast<QvIProgramSetup*>(self);
    return kind == QvModuleType::encodePipe ? static_cast<QvEncodePipe*>(self) : nullptr;
}

int EncodePipe2::refuseWhileOpen() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    return setError(QvStatus::illegalState, "Not possible while the output is open");
}

// --- Opening, writing, closing

int EncodePipe2::open() {
    QV_ASSERT_MSG(getState() != stateCreated, "EncodePipe2.open: invalid state");
    if (getState() == qvStateOpen) return QvStatus::ok;
    const int result = run_.open(createOutFolder());
    if (result == QvStatus::ok) setState(qvStateOpen);
    return result;
}

int EncodePipe2::close() {
    QV_ASSERT_MSG(getState() != stateCreated, "EncodePipe.close: invalid state");
    return finish(false);
}

int EncodePipe2::abort() {
    QV_ASSERT_MSG(getState() != stateCreated, "EncodePipe.abort: invalid state");
    return finish(true);
}

int EncodePipe2::finish(bool aborting) {
    const int result = run_.finish(aborting);
    setState(stateInitialised);
    return result;
}

int EncodePipe2::writeFrame(QvFrame* frame, int stream) {
    auto* target = videoEncoder(stream);
    QV_ASSERT_MSG(target, "Invalid video stream");
    const int result = target->writeFrame(frame);
    return result == QvStatus::ok ? result : take(*target, result);
}

int EncodePipe2::writePcm(QvPcm* pcm, int stream) {
    auto* target = audioEncoder(stream);
    QV_ASSERT_MSG(target, "Invalid audio stream");
    const int result = target->writePcm(pcm);
    return result == QvStatus::ok ? result : take(*target, result);
}

// --- Parameters

int EncodePipe2::setParam(const char* name, const Any& value) {
    _traceParam(name, value);
    const auto* own = findOwn(name);
    if (!own) return setMember(name, value);
    switch (own->action) {
        case Action::applyPreset: return applyDeprecated(value);
        case Action::setFilename: return end_.setFilename(value);
        case Action::setMuxer:
            qv_dbg()->warning("EncodePipe: 'muxerName' parameter DEPRECATED, use QvEncodePipe::setMuxer()");
            if (value.isString()) return setMuxer(value.asString());
            return setError(QvStatus::invalidArgument, "Invalid value type for 'muxerName'");
        case Action::setSink:
            if (value.isString()) return setSink(value.asString());
            return setError(QvStatus::invalidArgument, "Invalid value type for 'sinkName'");
        case Action::setAdjust: adjustCodecToMuxer_ = value.isTrue(); return QvStatus::ok;
        case Action::toVideo: return spread(qvVideoStream, false, name, value);
        case Action::toVideoAndMuxer: return spread(qvVideoStream, true, name, value);
        case Action::switchToBuiltin: preset_.switchToBuiltin(value); break;
        case Action::switchToUser: preset_.switchToUser(value); break;
        case Action::obsolete: QV_FAIL(own->obsolete);
    }
    preset_.follow(end_.muxer());
    return QvStatus::ok;
}

int EncodePipe2::applyDeprecated(const Any& preset) {
    qv_dbg()->warning("EncodePipe: 'preset' parameter DEPRECATED, Use QvEncodePipe::applyPreset()");
    if (preset.isInt32()) return applyPreset(preset.asInt32(), 0);
    if (preset.isDict()) return applyPreset(QvPreset(preset.asDict()), 0);
    return setError(QvStatus::invalidArgument, "Invalid value type for 'preset'");
}

int EncodePipe2::spread(int mask, bool toMuxer, const char* name, const Any& value) {
    const int result = streams_.offer(mask, name, value);
    return toMuxer ? result | end_.offer(name, value) : result;
}

// A name that is not the pipe's own: for one member by its address, or for all.
int EncodePipe2::setMember(const char* name, const Any& value) {
    const auto address = MemberAddress::parse(name);
    if (!address) return spread(qvAllStreams, true, name, value);
    auto* target = address->find(streams_, end_);
    if (!target) return _raiseInvalidParam(name);
    int result = QvStatus::ok;
    if (address->rest)
        result = target->setParam(address->rest, value);
    else
        result = value.isDict() ? target->setParamDict(value.asDict()) : _raiseInvalidParam(name);
    if (result != QvStatus::ok && target->errorCode() == result) take(*target, result);
    return result;
}

void EncodePipe2::getParam(const char* name, Any& value) const {
    if (OutputAnswers(streams_, end_, preset_, displayName()).get(name, value)) return;
    if (const auto address = MemberAddress::parse(name); address && address->rest) {
        if (const auto* target = address->find(streams_, end_)) target->getParam(address->rest, value);
        return;
    }
    if (!qvGetParamRow<EncodePipe2>(described, *this, name, value)) QvEncodePipe::getParam(name, value);
}

// --- Presets and states

int EncodePipe2::applyPreset(int profile, int keep) {
    if (const int result = refuseWhileOpen()) return result;
    return applier_.applyBuiltin(profile, keep != 0);
}

int EncodePipe2::applyPreset(const QvPreset& preset, int keep) {
    if (const int result = refuseWhileOpen()) return result;
    return applier_.apply(preset, keep != 0, name());
}

void EncodePipe2::store(AnyDict& state) const { state_.store(state, name()); }

void EncodePipe2::storePreset(AnyDict& preset) const { state_.storePreset(preset); }

int EncodePipe2::restore(const AnyDict& state) {
    if (const int result = refuseWhileOpen()) return result;
    return state_.restore(state, name());
}

// --- Multiplexer and sink

int EncodePipe2::setMuxer(const char* name) {
    QV_ASSERT(name);
    if (const int result = refuseWhileOpen()) return result;
    const int result = exchange_.change(name);
    if (adjustCodecToMuxer_) builder_.adjustForTransport();
    return result;
}

int EncodePipe2::setSink(const char* name) {
    QV_ASSERT(name && *name);
    if (const int result = refuseWhileOpen()) return result;
    return end_.setSink(name);
}

// --- Streams

int EncodePipe2::nrStreams(int mask) const { return streams_.count(mask); }

QvOStream* EncodePipe2::stream(int type, int nr) const { return streams_.find(type, nr); }

QvOStream* EncodePipe2::streamAt(int index) const {
    QV_ASSERT_MSG(index >= 0 && index < static_cast<int>(streams_.size()), "Invalid stream index");
    return &streams_[static_cast<std::size_t>(index)];
}

TPtrList<QvOStream> EncodePipe2::streams(int type) const { return streams_.list(type); }

int EncodePipe2::indexOf(QvOStream* wanted) const { return streams_.placeOf(wanted); }

int EncodePipe2::streamNr(QvOStream* wanted) const { return wanted ? streams_.numberOf(*wanted) : -1; }

QvEncoder* EncodePipe2::encoder(int type, int nr) const { return streams_.encoder(type, nr); }

QvEncoder* EncodePipe2::encoder(int index) const {
    if (index < 0 || index >= static_cast<int>(streams_.size())) return nullptr;
    return streams_[static_cast<std::size_t>(index)].encoder;
}

QvVideoEncoder* EncodePipe2::videoEncoder(int nr) const { return streams_.videoEncoder(nr); }

QvAudioEncoder* EncodePipe2::audioEncoder(int nr) const { return streams_.audioEncoder(nr); }

int EncodePipe2::addStream(int type, const Any& params) {
    if (const int result = refuseWhileOpen()) return result;
    return builder_.add(type, params);
}

void EncodePipe2::removeStream(QvOStream* wanted) {
    QV_ASSERT(wanted);
    if (refuseWhileOpen() == QvStatus::ok) builder_.remove(wanted);
}

void EncodePipe2::removeStream(int type, int nr) {
    auto* found = streams_.find(type, nr);
    QV_ASSERT_MSG(found, "Invalid stream");
    removeStream(found);
}

void EncodePipe2::removeStreams(int mask) {
    if (refuseWhileOpen() == QvStatus::ok) builder_.removeAll(mask);
}

int EncodePipe2::setCodec(int type, int nr, const char* name, const AnyDict& params) {
    if (const int result = refuseWhileOpen()) return result;
    return builder_.setCodec(type, nr, name, params, adjustCodecToMuxer_);
}

// --- Programs

int EncodePipe2::nrPrograms() const { return end_.programs().count(); }

int EncodePipe2::addProgram(const QvProgram& program) { return end_.programs().add(program); }

int EncodePipe2::removeProgram(int index) { return end_.programs().remove(index); }

int EncodePipe2::getProgram(int index, QvProgram& program) const {
    return end_.programs().get(index, program);
}

int EncodePipe2::setProgram(int index, const QvProgram& program) {
    return end_.programs().set(index, program);
}

int EncodePipe2::getProgramStreams(int index, AnyVector& streams) const {
    streams.clear();
    AnyVector pairs;
    if (const int result = end_.programs().streams(index, pairs)) return result;
    for (const auto& element : pairs) {
        if (!element.isPair()) continue;
        const Pair& pair = element.asPair();
        qv_dbg()->debug("[encpipe] getprogramstreams, type=%d, no=%d", pair.first, pair.second);
        if (auto* found = stream(pair.first, pair.second))
            streams.append(Any(static_cast<const void*>(found)));
    }
    return QvStatus::ok;
}

QvCodec* newEncpipe() { return new EncodePipe2; }
