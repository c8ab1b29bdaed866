// The state of the pipe as a dictionary.
#include <cstring>

#include "builtin/pipes/encodepipe2.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"
#include "core/job/filtersstate.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

namespace {

// "codecInfo" of a stored stream: what a list of tasks shows without making the encoder.
AnyDict describe(const QvEncoder& encoder, int type) {
    struct Row {
        const char* key;
        const char* param;
    };
    static constexpr Row video[] = {
        {"framerate", "framerate"}, {"bitrate", "bitrate"}, {"width", "width"}, {"height", "height"}};
    static constexpr Row audio[] = {
        {"samplerate", "framerate"}, {"bitrate", "bitrate"}, {"channels", "channels"}};
    AnyDict info("displayName", encoder.displayName());
    const auto fill = [&](const auto& rows) {
        for (const auto& row : rows) {
            Any value;
            encoder.getParam(row.param, value);
            if (!value.isValid()) encoder.getParam(row.key, value);
            if (value.isValid()) info.set(row.key, value);
        }
    };
    if (type == qvVideoStream)
        fill(video);
    else
        fill(audio);
    return info;
}

}  // namespace

void EncodePipe2::store(AnyDict& state) const {
    state.clear();
    state.set("__version__", "2.0");
    state.set("__class__", "EncodePipe");
    state.set("name", name());
    Any filename;
    getParam("filename", filename);
    if (filename.isValid()) state.set("filename", filename);
    state.set("createOutFolder", createOutFolder_ ? 1 : 0);
    storeCommon(state);
}

void EncodePipe2::storePreset(AnyDict& preset) const {
    preset.set("__version__", "2.0");
    preset.set("__class__", "Preset");
    storeCommon(preset);
}

void EncodePipe2::storeCommon(AnyDict& state) const {
    state.set("profile", preset_.profile());
    state.set("presetName", preset_.name());
    if (muxer_) {
        AnyDict muxer;
        muxer_->store(muxer);
        muxer.set("displayName", muxer_->displayName());
        state.set("muxer", muxer);
    }
    AnyVector all;
    for (const auto& stream : streams_) all.append(storeStream(*stream));
    state.set("streams", all);
    if (programsSupported()) state.set("programs", storePrograms());
}

AnyDict EncodePipe2::storeStream(const Stream& stream) const {
    AnyDict entry("type", stream.type);
    if (stream.encoder) {
        AnyDict codec;
        stream.encoder->store(codec);
        entry.set("codec", codec);
        entry.set("codecInfo", describe(*stream.encoder, stream.type));
    } else {
        QV_ASSERT(stream.type == qvSubpicStream);
    }
    AnyDict params;
    muxer_->getStreamParams(stream.type, numberOf(stream), params);
    entry.set("stream", params);
    if (!stream.filters().empty()) entry.set("filters", static_cast<const AnyDict&>(stream.filters()));
    return entry;
}

AnyVector EncodePipe2::storePrograms() const {
    AnyVector all;
    for (int index = 0; index < nrPrograms(); ++index) {
        QvProgram program;
        if (getProgram(index, program) != QvStatus::ok) continue;
        all.append(AnyDict("program_PID", program.program_PID, "program_number", program.program_number,
                           "PCR_PID", program.PCR_PID));
    }
    return all;
}

int EncodePipe2::restore(const AnyDict& state) {
    if (const int result = refuseWhileOpen()) return result;
    if (state.isSet("name") && !(state.get("name") == name())) {
        setError(QvStatus::invalidStructure, "Cannot restore - invalid state structure.");
        QV_FAIL(errorDesc());
    }
    if (!state.isSet("__version__")) return restoreOld(state);
    if (!state.get("profile").isInt32()) {
        setError(QvStatus::invalidStructure, "Cannot restore - 'profile' entry not set.");
        QV_FAIL(errorDesc());
    }
    const Any* muxer = state.descendant("muxer.name");
    if (const int result = restoreBase(state.get("profile").asInt32(), muxer)) return result;
    muxer_->restore(state.get("muxer").asDict());
    if (programsSupported() && state.get("programs").isVector())
        if (const int result = addPrograms(state.get("programs").asVector())) return result;
    if (const int result = restoreStreams(state.get("streams"))) return result;
    if (state.get("filename").isText()) setFilename(state.get("filename"));
    if (state.get("createOutFolder").isInt32())
        createOutFolder_ = state.get("createOutFolder").asInt32() != 0;
    return QvStatus::ok;
}

// The preset of a stored number, without streams, and a multiplexer by name.
int EncodePipe2::restoreBase(int profile, const Any* muxer) {
    const int index = qvPresetMgr()->findByProfile(profile);
    if (index < 0)
        return setError(QvStatus::invalidStructure, "Cannot restore - base profile %d (%s) not available.",
                        profile, qvProfileToSym(profile));
    if (!muxer || !muxer->isString())
        return setError(QvStatus::failed, "Cannot restore - muxer entry not set");
    removeStreams(qvAllStreams);
    preset_ = qvPresetMgr()->builtinPreset(index);
    return _setMuxer(muxer->asString(), true);
}

// A vector of streams; in an older form a dictionary of one vector for each type.
int EncodePipe2::restoreStreams(const Any& entries) {
    struct Older {
        const char* key;
        int type;
    };
    static constexpr Older older[] = {
        {"vids", qvVideoStream}, {"auds", qvAudioStream}, {"subs", qvSubpicStream}};
    if (entries.isVector()) {
        for (const auto& entry : entries.asVector())
            if (entry.isDict())
                if (const int result = restoreStream(entry.asDict(), entry.asDict().getInt32("type", -1)))
                    return result;
    } else if (entries.isDict()) {
        for (const auto& row : older)
            for (const auto& entry : entries.asDict().getVector(row.key))
                if (entry.isDict())
                    if (const int result = restoreStream(entry.asDict(), row.type)) return result;
    }
    return QvStatus::ok;
}

int EncodePipe2::restoreStream(const AnyDict& entry, int type) {
    AnyDict request;
    const Any& codec = entry.get("codec");
    const bool named = codec.isText() || (codec.isDict() && codec.asDict().get("name").isText());
    QV_ASSERT_MSG(named || type == qvSubpicStream,
                  "[EncodePipe] restore - invalid stream entry, no codec specified.");
    if (named && type != qvSubpicStream) request.set("codec", codec);
    const int nr = addStream(type, request);
    if (nr < 0) return nr;
    if (entry.get("stream").isDict()) muxer_->setStreamParams(type, nr, entry.get("stream").asDict());
    if (entry.get("filters").isDict())
        find(type, nr)->filters() = FiltersState(entry.get("filters").asDict());
    return QvStatus::ok;
}

// The form without a version: "_preset" (a number), "muxer" with "name", and for each of "video0" and
// "audio0" the name of its encoder in "codec", with the encoder's parameters beside it or in "settings". A
// user's preset that was active is in "_userProfile".
int EncodePipe2::restoreOld(const AnyDict& state) {
    const Any& number = state.get(state.get("_preset").isInt32() ? "_preset" : "_presetNr");
    if (!number.isInt32()) {
        setError(QvStatus::invalidStructure, "Cannot restore - 'profile' entry not set.");
        QV_FAIL(errorDesc());
    }
    if (const int result = restoreBase(qvFixOldProfileNo(number.asInt32()), state.descendant("muxer.name")))
        return result;
    muxer_->restore(state.get("muxer").asDict());
    struct Row {
        const char* key;
        int type;
    };
    for (const auto& [key, type] : {Row{"video0", qvVideoStream}, Row{"audio0", qvAudioStream}}) {
        const Any& entry = state.get(key);
        if (!entry.isDict() || !entry.asDict().get("codec").isText()) continue;
        AnyDict settings = entry.asDict();
        settings.set("name", entry.asDict().get("codec"));
        settings.remove("codec");
        if (const int nr = addStream(type, AnyDict("codec", settings)); nr < 0) return nr;
    }
    if (state.get("settings").isDict())
        for (const auto [key, value] : state.get("settings").asDict())
            forwardToEncoders(qvAllStreams, key, *value);
    if (state.get("_userProfile").isDict()) {
        const QvPreset user(state.get("_userProfile").asDict());
        if (user.isCustom() && qvFixOldProfileNo(user.profile()) == preset_.profile()) {
            preset_ = user;
            rebuildAllowed();
        }
    }
    if (state.get("filename").isText()) setFilename(state.get("filename"));
    return QvStatus::ok;
}
