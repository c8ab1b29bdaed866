#include "core/preset/qvpresetmgr.h"

#include <span>
#include <string_view>

#include "core/arch/qvassert.h"
#include "core/engine/modules/presethook_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/qvprofile.h"

namespace {

constexpr int kMuxerKind = 10;

// One built-in preset. Module names stand in the order of preference; those not installed drop out, and a
// preset without any video encoder is left out.
struct PresetRow {
    int profile;
    const char* name;
    const char* video[3];
    const char* audio[7];
    const char* muxers[5];
};

constexpr PresetRow kPresets[] = {
    {QvProfile::raw, "RAW/YUV", {"rawvenc"}, {"rawaenc"}, {"rawmux"}},
    {QvProfile::aviRaw, "Uncompressed AVI", {"rawvenc"}, {"rawaenc"}, {"rawavimux"}},
};

struct CompatRow {
    const char* codec;
    const char* muxers[8];
};

constexpr CompatRow kCompatible[] = {
    {"rawvenc", {"rawmux", "rawavimux"}},
    {"rawaenc", {"rawmux", "rawavimux", "mvrawmux"}},
};

bool installed(const char* name) { return qv_registry()->module(name) != nullptr; }

AnyVector installedOf(std::span<const char* const> names) {
    AnyVector list;
    for (const char* name : names)
        if (name && installed(name)) list.append(Any(name));
    return list;
}

}  // namespace

struct QvPresetMgr::Private {
    QvPresetList builtin;
    AnyDict compatible;  // encoder to the vector of its multiplexers
};

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
    p_->builtin.clear();
    for (const PresetRow& row : kPresets) {
        const AnyVector video = installedOf(row.video);
        if (video.empty()) continue;
        p_->builtin.append(
            QvPreset(row.profile, row.name, video, installedOf(row.audio), installedOf(row.muxers)));
    }
    p_->compatible.clear();
    for (const CompatRow& row : kCompatible)
        if (installed(row.codec)) p_->compatible.set(row.codec, installedOf(row.muxers));
}

const QvPresetList& QvPresetMgr::builtinPresets() const { return p_->builtin; }

QvPreset QvPresetMgr::builtinPreset(int index) const { return p_->builtin.preset(index); }

int QvPresetMgr::findByProfile(int profile) const {
    QV_ASSERT(!p_->builtin.empty());
    if (profile == QvProfile::notSet) return -1;
    return p_->builtin.indexOfProfile(qvFixOldProfileNo(profile));
}

bool QvPresetMgr::isCompatible(const char* codec, const char* muxer) const {
    const Any& muxers = p_->compatible.get(codec);
    return muxers.isVector() && muxers.asVector().contains(Any(muxer));
}

bool QvPresetMgr::isCompatible(const char* codec, const char* muxer, int profile) const {
    if (!isCompatible(codec, muxer)) return false;
    if (profile == QvProfile::notSet) return true;
    const int index = p_->builtin.indexOfProfile(qvFixOldProfileNo(profile));
    if (index < 0) return true;
    const QvPreset preset = p_->builtin.preset(index);
    return preset.videoCodecs().contains(Any(codec)) || preset.audioCodecs().contains(Any(codec)) ||
           preset.muxers().contains(Any(codec));
}

AnyVector QvPresetMgr::getCompatible(const char* name, int kind, int profile) const {
    AnyVector candidates;
    const int index =
        profile == QvProfile::notSet ? -1 : p_->builtin.indexOfProfile(qvFixOldProfileNo(profile));
    if (index >= 0) {
        const QvPreset preset = p_->builtin.preset(index);
        candidates = kind == kMuxerKind ? preset.muxers() : preset.codecs(kind);
    } else {
        const AnyVector modules = qv_registry()->modules(kind);
        for (int i = 0; i < modules.size(); ++i) candidates.append(modules.at(i).asDict().get("name"));
    }
    AnyVector list;
    for (int i = 0; i < candidates.size(); ++i) {
        const char* other = candidates.at(i).asString();
        const bool fits =
            kind == kMuxerKind ? isCompatible(name, other, profile) : isCompatible(other, name, profile);
        if (fits) list.append(candidates.at(i));
    }
    return list;
}

const char* QvPresetMgr::getSubstitute(const char* codec) const {
    return codec && std::string_view(codec) == "h264venc" ? "bch264venc" : nullptr;
}
