#include "core/preset/qvpreset.h"

#include "core/arch/qvassert.h"
#include "core/encode/pipeinfo_p.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/preset/presettrial_p.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

namespace {

// A list of module names out of a list or a single name.
AnyVector nameList(const Any& names) {
    if (names.isVector()) return names.asVector();
    AnyVector list;
    if (names.isString()) list.append(names);
    return list;
}

// The names of modules in a preset that no pipe can show.
std::string storedInfo(const AnyDict& preset) {
    static constexpr const char* rows[][2] = {{"Format: %s", "muxer.name"},
                                              {"Video: %s", "streams.vids.0.codec.name"},
                                              {"Audio: %s", "streams.auds.0.codec.name"}};
    AnyVector parts;
    for (const auto& [form, path] : rows)
        if (const Any* name = preset.descendant("%s", path); name && name->isText())
            parts.append(Any::sprintf(form, name->toString().asString("")));
    return parts.empty() ? "Info not available" : parts.join("; ").asString("");
}

// A stored profile number that is `from` becomes none; false if it is another one.
bool moveToNone(AnyDict& settings, int from) {
    if (!settings.isSet("profile")) return true;
    if (!(settings.get("profile") == from)) return false;
    settings.set("profile", QvProfile::none);
    return true;
}

}  // namespace

QvPreset::QvPreset() : QvPreset(QvProfile::notSet, "<invalid>") {}

QvPreset::QvPreset(int profile, const char* name) {
    set("__class__", "Preset");
    set("__version__", "2.0");
    set("custom", 1);
    set("profile", profile);
    set("name", name);
}

QvPreset::QvPreset(const AnyDict& dict) : AnyDict(dict) {
    set("__class__", "Preset");
    set("__version__", "2.0");
    if (!isSet("custom")) set("custom", 1);
    if (!isSet("name")) set("name", "<invalid>");
    if (!isSet("profile")) set("profile", QvProfile::notSet);
}

QvPreset::QvPreset(int profile, const char* name, const Any& video, const Any& audio, const Any& muxers)
    : QvPreset(profile, name) {
    set("custom", 0);
    set("videoCodecs", nameList(video));
    set("audioCodecs", nameList(audio));
    set("muxers", nameList(muxers));
}

QvPreset::QvPreset(const QvEncodePipe* pipe, const char* name, bool) : QvPreset() {
    QV_ASSERT(pipe && name);
    pipe->storePreset(*this);
    remove("presetName");  // of the preset that the pipe followed; this one has a name of its own
    set("custom", 1);
    set("name", name);
    set("#valid", 1);
    createInfo(pipe);
}

const char* QvPreset::name() const { return getString("name", "<invalid>"); }
const char* QvPreset::shortName() const { return getString("shortName", name()); }
void QvPreset::setShortName(const char* name) { set("shortName", name); }
const char* QvPreset::symbol() const { return qvProfileToSym(profile()); }
void QvPreset::setDisabled(bool on) { set("disabled", on ? 1 : 0); }
AnyDict QvPreset::muxerParams() const { return getDict("muxer", AnyDict()); }
AnyVector QvPreset::programs() const { return getVector("programs", AnyVector()); }

std::optional<QvPresetMeta> QvPreset::presetMeta() const {
    const Any& meta = get("PresetMeta");
    return meta.isDict() ? std::optional<QvPresetMeta>(meta.asDict()) : std::nullopt;
}

void QvPreset::setInfo(const Any& text) {
    QV_ASSERT_MSG(text.isText(), "QvPreset.setInfo: invalid argument");
    set("info", text);
}

void QvPreset::setName(const char* name) {
    QV_ASSERT_MSG(isCustom(), "QvPreset.setName: allowed only for user presets");
    QV_ASSERT_MSG(qvPresetMgr()->builtinPresets().indexOfName(name) < 0, "QvPreset.setName: name conflict.");
    set("name", name);
}

void QvPreset::setPostprocessCmd(const Any& command) {
    QV_ASSERT(isCustom());
    AnyDict extension = getDict("extension", AnyDict());
    extension.set("postprocess", command);
    set("extension", extension);
}

Any QvPreset::postprocessCmd() const { return getDict("extension", AnyDict()).get("postprocess"); }

// The built-in preset that a user preset rests on, or null with a line in the log.
const AnyDict* QvPreset::base() const {
    QV_ASSERT_MSG(isCustom(), "getBasePreset called on builtin preset");
    const QvPresetList& builtin = qvPresetMgr()->builtinPresets();
    const int index = builtin.indexOfProfile(qvFixOldProfileNo(profile()));
    if (index >= 0) return &builtin.at(index).asDict();
    qv_dbg()->warning("[Preset] Base preset not found for %s", name());
    return nullptr;
}

bool QvPreset::isValid() { return isSet("#valid") ? get("#valid").isTrue() : checkValid(); }

bool QvPreset::checkValid() {
    QV_ASSERT_MSG(isSet("profile") && isSet("custom") && isSet("name"), "QvPreset: invalid object");
    const std::string reason = isBuiltin() ? "" : qvWhyInvalid(*this);
    if (reason.empty())
        remove("#err");
    else
        set("#err", reason.c_str());
    set("#valid", reason.empty() ? 1 : 0);
    return reason.empty();
}

void QvPreset::createInfo(const QvEncodePipe* pipe) {
    if (get("info").isText()) return;
    std::string text;
    if (isValid()) {
        if (pipe)
            text = qvPipeInfo(*pipe);
        else if (const PresetTrial trial(*this); trial.pipe)
            text = qvPipeInfo(*trial.pipe);
    }
    set("info", (text.empty() ? storedInfo(*this) : text).c_str());
}

QvPreset QvPreset::toNone(int) const {
    QV_ASSERT_MSG(isCustom(), "QvPreset.toNone: allowed only for user presets");
    QvPreset copy = *this;
    const int from = profile();
    moveToNone(copy, from);
    if (Any& muxer = copy.get("muxer"); muxer.isDict()) moveToNone(muxer.asDict(), from);
    if (Any& streams = copy.get("streams"); streams.isVector())
        for (Any& stream : streams.asVector())
            if (Any* codec = stream.isDict() ? &stream.asDict().get("codec") : nullptr;
                codec && codec->isDict())
                QV_ASSERT_MSG(moveToNone(codec->asDict(), from),
                              "QvPreset.toNone: a stream has another profile");
    // They belong to the former profile.
    copy.remove("#valid");
    copy.remove("#err");
    return copy;
}

AnyVector QvPreset::allowed(const char* key) const {
    const AnyDict* source = isBuiltin() ? this : base();
    return source ? source->getVector(key, AnyVector()) : AnyVector();
}

AnyVector QvPreset::codecs(int kind) const {
    QV_ASSERT(kind == QvModuleType::videoEncoder || kind == QvModuleType::audioEncoder);
    return kind == QvModuleType::videoEncoder ? videoCodecs() : audioCodecs();
}

Any QvPreset::defaultMuxer() const {
    if (get("muxer").isDict()) return get("muxer").asDict().get("name");
    return muxers().at(0);
}

bool QvPreset::muxerAllowed(const char* name) const { return muxers().contains(Any(name)); }

AnyDict QvPreset::streamParams(int type, int index, const char* codec) const {
    QV_ASSERT_MSG(isCustom(), "QvPreset.streamParams: builtin presets contain no stream params");
    QV_ASSERT(type == 1 || type == 2 || type == 4);
    const AnyVector streams = getVector("streams", AnyVector());
    AnyDict found;
    int seen = 0;
    for (int i = 0; i < streams.size() && seen <= index; ++i) {
        if (!streams.at(i).isDict()) continue;
        const AnyDict& stream = streams.at(i).asDict();
        if (stream.getInt32("type", -1) != type) continue;
        ++seen;
        if (!codec || stream.getDict("codec", AnyDict()).get("name") == codec) found = stream;
    }
    return found;
}

bool QvPreset::isCompatible(const char* codec, const char* muxer) const {
    return qvPresetMgr()->isCompatible(codec, muxer, profile());
}

AnyVector QvPreset::getCompatible(const char* name, int kind) const {
    return qvPresetMgr()->getCompatible(name, kind, profile());
}

QvPreset QvPresetList::preset(int index) const {
    return QvPreset(at(index).isDict() ? at(index).asDict() : AnyDict());
}

int QvPresetList::indexOfName(const char* name) const {
    for (int i = 0; i < size(); ++i)
        if (at(i).isDict() && at(i).asDict().get("name") == name) return i;
    return -1;
}

int QvPresetList::indexOfProfile(int profile) const {
    for (int i = 0; i < size(); ++i)
        if (at(i).isDict() && at(i).asDict().getInt32("profile", QvProfile::notSet) == profile) return i;
    return -1;
}
