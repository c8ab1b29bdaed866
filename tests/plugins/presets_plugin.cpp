// Brings a video encoder under a name that the engine's tables know, with the first preset of all, sound-only
// presets for the library's own modules, and one that is ill-formed.
#include "core/encode/qvencoder.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"

namespace {

// Writes nothing.
class Encoder : public QvVideoEncoder {
  public:
    int open() override { return 0; }
    int close() override { return 0; }
    int writeFrame(QvFrame*) override { return 0; }
    QvFrame* lastFrame() override { return nullptr; }
};

struct EncoderModule : QvModule {
    EncoderModule() : QvModule(QvModuleType::videoEncoder, "svcvenc", "of a test", "SVC") {}
    QvCodec* create() override { return _setAttrs(new Encoder); }
};

}  // namespace

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("presets", "Presets of sound alone");
    if (plugin.nrModules() == 0) plugin.addModule(new EncoderModule);
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
