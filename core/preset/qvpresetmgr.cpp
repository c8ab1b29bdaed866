#include "core/preset/qvpresetmgr.h"

#include <string_view>

#include "core/arch/qvassert.h"
#include "core/engine/modules/presethook_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/preset/extendedpresets_p.h"
#include "core/preset/qvprofile.h"
#include "core/preset/qvuserpresets.h"
#include "core/preset/tables/codecpairs_p.h"

struct QvPresetMgr::Private {
    BuiltinCatalogue builtin;
    QvUserPresets source;  // of the extended presets
    ExtendedPresets extended;

    void extend() { extended = ExtendedPresets::make(builtin, source); }
    // The built-in preset of a profile of any scheme, or null.
    const AnyDict* presetOf(int profile) const {
        if (profile == QvProfile::notSet) return nullptr;
        const int index = builtin.presets.indexOfProfile(qvFixOldProfileNo(profile));
        return index < 0 ? nullptr : &builtin.presets.at(index).asDict();
    }
};

namespace {

// Where a preset lists the modules of a kind.
const char* columnOf(int kind) {
    QV_ASSERT(kind == QvModuleType::videoEncoder || kind == QvModuleType::audioEncoder ||
              kind == QvModuleType::muxer);
    return kind == QvModuleType::videoEncoder   ? "videoCodecs"
           : kind == QvModuleType::audioEncoder ? "audioCodecs"
                                                : "muxers";
}

}  // namespace

QvPresetMgr::QvPresetMgr() : p_(std::make_unique<Private>()) {}

QvPresetMgr::~QvPresetMgr() = default;

QvPresetMgr* qvPresetMgr() { return qv_registry()->presetMgr(); }

const QvPresetHook& qvPresetHook() {
    static constexpr QvPresetHook hook{
        .make =
            [] { return QvPresetHook::Catalogue(new QvPresetMgr, [](QvPresetMgr* gone) { delete gone; }); },
        .update = [](QvPresetMgr& catalogue) { catalogue.update(); },
    };
    return hook;
}

void QvPresetMgr::update() {
    p_->builtin = BuiltinCatalogue::make();
    p_->extend();
}

const QvPresetList& QvPresetMgr::builtinPresets() const { return p_->builtin.presets; }
QvPreset QvPresetMgr::builtinPreset(int index) const { return p_->builtin.presets.preset(index); }
const PresetGroupList& QvPresetMgr::builtinGroups() const { return p_->builtin.groups; }
const QvPresetList& QvPresetMgr::extendedPresets() const { return p_->extended.presets; }
QvPreset QvPresetMgr::extendedPreset(int index) const { return p_->extended.presets.preset(index); }
const PresetGroupList& QvPresetMgr::extendedGroups() const { return p_->extended.groups; }
AnyVector QvPresetMgr::missingPresets() const { return p_->builtin.missingPresets(); }
const CodecCompat& QvPresetMgr::compatList() const { return p_->builtin.pairs; }

int QvPresetMgr::loadExtendedPresets(const Any& source) {
    // Adds to what was loaded before, under a new name where one is in use.
    constexpr int mode = 6;
    QvUserPresets read = p_->source;
    if (const int result = read.load(source, mode)) return result;
    p_->source = std::move(read);
    p_->extend();
    return QvStatus::ok;
}

void QvPresetMgr::clearExtendedPresets() {
    p_->source = QvUserPresets();
    p_->extend();
}

int QvPresetMgr::findByProfile(int profile) const {
    QV_ASSERT(!p_->builtin.presets.empty());
    if (profile == QvProfile::notSet) return -1;
    return p_->builtin.presets.indexOfProfile(qvFixOldProfileNo(profile));
}

bool QvPresetMgr::isCompatible(const char* codec, const char* muxer) const {
    return p_->builtin.pairs.isCompatible(codec, muxer);
}

bool QvPresetMgr::isCompatible(const char* codec, const char* muxer, int profile) const {
    if (!isCompatible(codec, muxer)) return false;
    if (const auto answer = qvPairByProfile(codec, muxer, profile)) return *answer;
    const AnyDict* preset = p_->presetOf(profile);
    if (!preset) return true;
    const auto lists = [&](const char* key) { return preset->getVector(key).contains(Any(codec)); };
    return lists("videoCodecs") || lists("audioCodecs") || lists("muxers");
}

AnyVector QvPresetMgr::getCompatible(const char* name, int kind, int profile) const {
    const AnyDict* preset = p_->presetOf(profile);
    const auto fits = [&](const char* other) {
        const bool ofMuxers = kind == QvModuleType::muxer;
        const char *codec = ofMuxers ? name : other, *muxer = ofMuxers ? other : name;
        return preset ? isCompatible(codec, muxer, profile) : isCompatible(codec, muxer);
    };
    AnyVector list;
    if (preset) {
        for (const Any& other : preset->getVector(columnOf(kind)))
            if (fits(other.asString())) list.append(other);
    } else {
        for (const Any& module : qv_registry()->modules(kind))
            if (const Any& other = module.asDict().get("name"); fits(other.asString())) list.append(other);
    }
    return list;
}

const char* QvPresetMgr::getSubstitute(const char* codec) const {
    return codec && std::string_view(codec) == "h264venc" ? "bch264venc" : nullptr;
}
