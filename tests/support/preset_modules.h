// Encoders and multiplexers under the names that the catalogue of presets knows. They do what the raw ones of
// the engine do.
//
//     PresetModules modules({"mpegvenc", "mptsmux"});   // and all built-in ones; the catalogue is up to date
#pragma once

#include <string_view>
#include <vector>

#include "builtin/encoders/rawaenc.h"
#include "builtin/encoders/rawvenc.h"
#include "builtin/muxers/rawmux.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/qvpresetmgr.h"

class PresetModules {
  public:
    // Every name of the catalogue that is not built in.
    static std::vector<const char*> all() {
        return {"mpegvenc",  "mpegaenc",  "mpegpcmenc",     "vc1venc",      "wmaaenc",   "mj2kvenc",
                "aacaenc",   "h264venc",  "h264mfxvenc",    "bch264venc",   "svcvenc",   "h264cudavenc",
                "dvvenc",    "dv100venc", "h264openclvenc", "divxh264venc", "ddaenc",    "ddproaenc",
                "mpeg4venc", "amraenc",   "ddplusproaenc",  "avsvenc",      "divxvenc",  "mp3aenc",
                "mvcvenc",   "vc3venc",   "mvrawmux",       "mpegpsmux",    "mpegtsmux", "mptsmux",
                "mp4mux",    "mxfmux",    "mj2mux",         "asfmux",       "mkvmux",    "dvmux",
                "dvavimux",  "dv100mux",  "dmfmux"};
    }

    explicit PresetModules(const std::vector<const char*>& names = {}) {
        init_wrapper(nullptr);
        qv_registry()->addPlugin(&plugin_);
        for (const char* name : names) add(name);
        qvPresetMgr()->update();
    }
    PresetModules(const PresetModules&) = delete;
    PresetModules& operator=(const PresetModules&) = delete;
    ~PresetModules() { cleanup_wrapper(); }

    // "...venc" is a video encoder, "...mux" a multiplexer, and any other name an audio encoder. The
    // catalogue follows at its next update.
    QvModule& add(const char* name) {
        const std::string_view text = name;
        QvModule* module = nullptr;
        if (text.ends_with("venc"))
            module = new Module<RawVideoEnc>(QvModuleType::videoEncoder, name);
        else if (text.ends_with("mux"))
            module = new Module<RawMux>(QvModuleType::muxer, name);
        else
            module = new Module<RawAudioEnc>(QvModuleType::audioEncoder, name);
        plugin_.addModule(module);
        return *module;
    }
    QvPlugin& plugin() { return plugin_; }

  private:
    template <class Codec>
    struct Module : QvModule {
        Module(int type, const char* name) : QvModule(type, name, "of a test", name) {}
        QvCodec* create() override { return _setAttrs(new Codec); }
    };

    QvPlugin plugin_{"presets", "Modules of presets"};
};

// The texts of a vector, with blanks between them.
inline std::string wordsOf(const AnyVector& texts) { return texts.join(" ").toString().asString(""); }
