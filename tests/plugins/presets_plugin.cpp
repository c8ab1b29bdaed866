// Brings sound-only presets for the library's own modules, and one that is ill-formed.
#include "core/engine/modules/qvplugin.h"

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("presets", "Presets of sound alone");
    AnyVector presets;
    for (const int profile : {0x2800000, 0x2800001, 7}) {
        AnyDict preset("profile", profile, "group", "Sound");
        preset.set("name", Any::sprintf("WAV %d", presets.size()));
        preset.set("audio", "rawaenc");
        preset.set("muxers", AnyVector("absentmux", "rawmux"));
        presets.append(preset);
    }
    plugin.setAttr("presets", presets);
    return &plugin;
}
