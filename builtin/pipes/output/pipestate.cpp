#include "builtin/pipes/output/pipestate.h"

#include "builtin/pipes/output/members/pipehost.h"
#include "core/arch/qvassert.h"
#include "core/engine/status.h"
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

void PipeState::store(AnyDict& state, const char* module) const {
    state.clear();
    state.set("__version__", "2.0");
    state.set("__class__", "EncodePipe");
    state.set("name", module);
    const Any filename = end_.filename();
    if (filename.isValid()) state.set("filename", filename);
    state.set("createOutFolder", createOutFolder ? 1 : 0);
    storeCommon(state);
}

void PipeState::storePreset(AnyDict& preset) const {
    preset.set("__version__", "2.0");
    preset.set("__class__", "Preset");
    storeCommon(preset);
}

void PipeState::storeCommon(AnyDict& state) const {
    state.set("profile", preset_.preset().profile());
    state.set("presetName", preset_.preset().name());
    if (const auto* muxer = end_.muxer()) {
        AnyDict stored;
        muxer->store(stored);
        stored.set("displayName", muxer->displayName());
        state.set("muxer", stored);
    }
    AnyVector all;
    for (const auto& stream : streams_) all.append(storeStream(*stream));
    state.set("streams", all);
    if (end_.hasPrograms()) state.set("programs", ProgramList::toState(end_.programs().all()));
}

AnyDict PipeState::storeStream(const OutputStream& stream) const {
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
    end_.muxer()->getStreamParams(stream.type, streams_.numberOf(stream), params);
    entry.set("stream", params);
    if (!stream.filters().empty()) entry.set("filters", static_cast<const AnyDict&>(stream.filters()));
    return entry;
}

int PipeState::restore(const AnyDict& state, const char* module) {
    if (state.isSet("name") && !(state.get("name") == module)) {
        host_.fail(QvStatus::invalidStructure, "Cannot restore - invalid state structure.");
        QV_FAIL(host_.lastFailure());
    }
    if (!state.isSet("__version__")) return restoreUnversioned(state);
    const Any& profile = state.get("profile");
    if (!profile.isInt32()) {
        host_.fail(QvStatus::invalidStructure, "Cannot restore - 'profile' entry not set.");
        QV_FAIL(host_.lastFailure());
    }
    if (const int result = restoreBase(profile.asInt32(), state.descendant("muxer.name"))) return result;
    end_.muxer()->restore(state.get("muxer").asDict());
    if (end_.hasPrograms() && state.get("programs").isVector()) {
        const auto programs = ProgramList::fromState(state.get("programs").asVector());
        if (const int result = end_.programs().addAll(programs, host_)) return result;
    }
    if (const int result = restoreStreams(state.get("streams"))) return result;
    if (state.get("filename").isText()) host_.setFilename(state.get("filename"));
    if (state.get("createOutFolder").isInt32()) createOutFolder = state.get("createOutFolder").asInt32() != 0;
    return QvStatus::ok;
}

// The built-in preset of a stored number, without streams, and a multiplexer by name.
int PipeState::restoreBase(int profile, const Any* muxer) {
    const int index = qvPresetMgr()->findByProfile(profile);
    if (index < 0)
        return host_.fail(QvStatus::invalidStructure, "Cannot restore - base profile %d (%s) not available.",
                          profile, qvProfileToSym(profile));
    if (!muxer || !muxer->isString())
        return host_.fail(QvStatus::failed, "Cannot restore - muxer entry not set");
    builder_.removeAll(qvAllStreams);
    preset_.set(qvPresetMgr()->builtinPreset(index));
    return exchange_.start(muxer->asString());
}

// A vector of streams; in an older form a dictionary of one vector for each type.
int PipeState::restoreStreams(const Any& entries) {
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

int PipeState::restoreStream(const AnyDict& entry, int type) {
    const Any& codec = entry.get("codec");
    const bool named = codec.isText() || (codec.isDict() && codec.asDict().get("name").isText());
    QV_ASSERT_MSG(named || type == qvSubpicStream,
                  "[EncodePipe] restore - invalid stream entry, no codec specified.");
    AnyDict request;
    if (named && type != qvSubpicStream) request.set("codec", codec);
    const int nr = builder_.add(type, Any(request));
    if (nr < 0) return nr;
    if (entry.get("stream").isDict()) end_.muxer()->setStreamParams(type, nr, entry.get("stream").asDict());
    if (entry.get("filters").isDict())
        streams_.find(type, nr)->filters() = FiltersState(entry.get("filters").asDict());
    return QvStatus::ok;
}

// The form without a version: "_preset" (a number), "muxer" with "name", and for each of "video0" and
// "audio0" the name of its encoder in "codec", with the encoder's parameters next to it or in "settings". A
// user's preset that was active is in "_userProfile".
int PipeState::restoreUnversioned(const AnyDict& state) {
    const Any& number = state.get(state.get("_preset").isInt32() ? "_preset" : "_presetNr");
    if (!number.isInt32()) {
        host_.fail(QvStatus::invalidStructure, "Cannot restore - 'profile' entry not set.");
        QV_FAIL(host_.lastFailure());
    }
    if (const int result = restoreBase(qvFixOldProfileNo(number.asInt32()), state.descendant("muxer.name")))
        return result;
    end_.muxer()->restore(state.get("muxer").asDict());
    for (const auto& [key, type] : {std::pair("video0", qvVideoStream), {"audio0", qvAudioStream}})
        if (const Any& entry = state.get(key); entry.isDict())
            if (const int result = restoreFirst(entry.asDict(), type)) return result;
    if (state.get("settings").isDict())
        for (const auto [key, value] : state.get("settings").asDict())
            streams_.offer(qvAllStreams, key, *value);
    if (state.get("_userProfile").isDict()) {
        const QvPreset user(state.get("_userProfile").asDict());
        if (user.isCustom() && qvFixOldProfileNo(user.profile()) == preset_.preset().profile()) {
            preset_.set(user);
            preset_.follow(end_.muxer());
        }
    }
    if (state.get("filename").isText()) host_.setFilename(state.get("filename"));
    return QvStatus::ok;
}

// "codec" is the name of the encoder here, and all other entries are its settings.
int PipeState::restoreFirst(const AnyDict& entry, int type) {
    if (!entry.get("codec").isText()) return QvStatus::ok;
    AnyDict settings = entry;
    settings.set("name", entry.get("codec"));
    settings.remove("codec");
    const int nr = builder_.add(type, Any(AnyDict("codec", settings)));
    return nr < 0 ? nr : QvStatus::ok;
}
