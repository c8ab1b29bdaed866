#include "core/preset/tables/presetcolumns_p.h"

#include <algorithm>
#include <cstring>

#include "core/engine/modules/qvmodule.h"
#include "core/preset/tables/codecpairs_p.h"

namespace {

using Names = std::vector<const char*>;

void addOnce(Names& names, const char* name) {
    const auto same = [name](const char* other) { return std::strcmp(name, other) == 0; };
    if (std::none_of(names.begin(), names.end(), same)) names.push_back(name);
}

void moveToEnd(Names& names, const char* name) {
    std::stable_partition(names.begin(), names.end(),
                          [name](const char* other) { return std::strcmp(name, other) != 0; });
}

const ModuleRow* muxersOf(const char* encoder) {
    for (const CodecPairs& row : qvCodecPairs())
        if (std::strcmp(row.encoder, encoder) == 0) return &row.muxers;
    return nullptr;
}

Names familyAudio(const PresetFamily& family, const AnyVector& muxers) {
    if (!family.audio.empty()) return {family.audio.begin(), family.audio.end()};
    Names audio;
    for (const CodecPairs& row : qvCodecPairs())
        if (row.kind == QvModuleType::audioEncoder &&
            std::any_of(row.muxers.begin(), row.muxers.end(),
                        [&](const char* muxer) { return muxers.contains(Any(muxer)); }))
            addOnce(audio, row.encoder);
    moveToEnd(audio, "rawaenc");
    return audio;
}

template <class Range>
AnyVector installedOf(const Range& names, const InstalledModules& installed) {
    AnyVector list;
    for (const char* name : names)
        if (installed.has(name)) list.append(Any(name));
    return list;
}

}  // namespace

std::vector<const char*> qvFamilyMuxers(const PresetFamily& family) {
    if (!family.muxers.empty()) return {family.muxers.begin(), family.muxers.end()};
    Names muxers;
    for (const char* encoder : family.video)
        if (const ModuleRow* row = muxersOf(encoder))
            for (const char* muxer : *row) addOnce(muxers, muxer);
    moveToEnd(muxers, "rawmux");
    return muxers;
}

PresetColumns qvPresetColumns(const PresetFamily& family, const InstalledModules& installed,
                              const CodecCompat& pairs) {
    PresetColumns columns;
    columns.video = installedOf(family.video, installed);
    for (const char* muxer : qvFamilyMuxers(family)) {
        const auto takes = [&](const Any& encoder) { return pairs.isCompatible(encoder.asString(), muxer); };
        if (std::any_of(columns.video.begin(), columns.video.end(), takes)) columns.muxers.append(Any(muxer));
    }
    columns.audio = installedOf(familyAudio(family, columns.muxers), installed);
    return columns;
}
