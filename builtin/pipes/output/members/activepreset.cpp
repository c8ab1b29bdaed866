#include "builtin/pipes/output/members/activepreset.h"

#include "builtin/pipes/output/members/muxertraits.h"
#include "core/arch/qvassert.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/qvutil.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

void ActivePreset::switchToBuiltin(const Any& value) {
    const int profile = value.isInt() ? value.toInt32() : QvProfile::notSet;
    QV_ASSERT_MSG(profile != QvProfile::none, "switchToBuiltin: switch to none not supported yet");
    const int index = qvPresetMgr()->findByProfile(profile);
    QV_ASSERT_MSG(index >= 0, "switchToBuiltin: profile not found");
    switchTo(qvPresetMgr()->builtinPreset(index), "switchToBuiltin: mustn't change profile");
}

void ActivePreset::switchToUser(const Any& value) {
    QV_ASSERT_MSG(value.isDict(), "switchToUser: profile not found");
    const QvPreset preset(value.asDict());
    QV_ASSERT_MSG(preset.profile() != QvProfile::none, "switchToUser: switch to none not supported yet");
    switchTo(preset, "switchToUser: mustn't change profile");
}

void ActivePreset::switchTo(const QvPreset& preset, const char* otherProfile) {
    QV_ASSERT_MSG(preset.profile() == preset_.profile(), otherProfile);
    preset_ = preset;
}

void ActivePreset::follow(const QvMuxer* muxer) {
    const char* name = muxer ? muxer->name() : "";
    const bool all = MuxerTraits::of(muxer).anyCodec;
    const auto allowed = [&](int kind) {
        return all ? preset_.codecs(kind) : preset_.getCompatible(name, kind);
    };
    muxers_ = preset_.muxers();
    videoCodecs_ = allowed(QvModuleType::videoEncoder);
    audioCodecs_ = allowed(QvModuleType::audioEncoder);
}

const AnyVector& ActivePreset::codecs(int type) const {
    return type == qvVideoStream ? videoCodecs_ : audioCodecs_;
}

bool ActivePreset::takes(const char* codec, const QvMuxer& muxer) const {
    return MuxerTraits::of(&muxer).anyCodec || preset_.isCompatible(codec, muxer.name());
}

AnyDict ActivePreset::lists() const {
    return AnyDict("muxers", muxers_, "vcodecs", videoCodecs_, "acodecs", audioCodecs_);
}

StreamDefaults ActivePreset::defaults(int type, int nr, const char* codec, const QvMuxer& muxer) const {
    QV_ASSERT_MSG(type == qvVideoStream || type == qvAudioStream,
                  "EncodePipe._getStreamDefaults: invalid 'type'");
    const char* kind = qvStreamTypeName(type);
    if (preset_.isCustom()) {
        const AnyDict stored = preset_.streamParams(type, nr, codec);
        if (!stored.empty()) {
            const Any* name = stored.descendant("codec.name");
            QV_ASSERT_MSG(!codec || (name && *name == codec), "EncodePipe._getStreamDefaults: 1");
            const Any& settings = stored.get("codec");
            StreamDefaults found;
            if (settings.isDict()) {
                found.codec = settings.asDict().get("name").toString().asString("");
                found.settings = settings.asDict();
            } else if (settings.isText()) {
                found.codec = settings.toString().asString("");
            }
            if (stored.get("stream").isDict()) found.params = stored.get("stream").asDict();
            return found;
        }
        qv_dbg()->warning(
            "EncodePipe._getStreamDefaults: cannot determine %s settings for custom preset '%s', "
            "codec '%s', stream %d",
            kind, preset_.name(), codec ? codec : "<not specified>", nr);
    }
    const auto& allowed = codecs(type);
    if (codec && !allowed.contains(Any(codec))) {
        qv_dbg()->error(
            "EncodePipe._getStreamDefaults: codec '%s' specified but it's not allowed by muxer '%s'", codec,
            muxer.name());
        QvUtil::debugOutDict(preset_);
        qv_dbg()->error("---");
        QV_FAIL("EncodePipe._getStreamDefaults: 2");
    }
    if (!codec && allowed.empty()) {
        qv_dbg()->error("EncodePipe._getStreamDefaults: no allowed %s codecs for '%s'", kind, muxer.name());
        QV_FAIL("EncodePipe._getStreamDefaults: 3");
    }
    return {codec ? codec : allowed.front().toString().asString(""), AnyDict(), AnyDict()};
}
