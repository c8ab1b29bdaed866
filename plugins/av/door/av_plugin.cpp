// The door of the codec plug-in: its table of modules. It has no codec library under it; the first codec that
// is made loads "av_codecs.so" from the folder of this file.
#include <memory>
#include <string>

#include "core/arch/platform.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "plugins/av/door/entry.h"
#include "plugins/av/door/extensions.h"

namespace {

class Codecs {
  public:
    Codecs() = default;
    Codecs(const Codecs&) = delete;
    Codecs& operator=(const Codecs&) = delete;
    // The library stays in memory: some of those under it keep blocks and threads of their own to the end of
    // the program, and must not go earlier.
    ~Codecs() {
        if (leave_) leave_();
    }

    // Null, with the reason in the log, if the library can't be used. It is tried again each time: what was
    // missing may have been installed.
    QvCodec* create(const QvModule& module) {
        if (!create_ && !load(module)) return nullptr;
        return create_(module.name());
    }

  private:
    av::CreateCodec create_ = nullptr;
    av::Leave leave_ = nullptr;

    bool load(const QvModule& module) {
        const Any plugin = module.plugin()->getAttr("filename").toString();
        std::string name = plugin.asString("");
        name = name.substr(0, name.rfind('/') + 1) + av::codecsFile;
        const bool anyone = static_cast<bool>(qv_registry()->config().get("allow_unsafe_plugins"));
        const QvLibrary library =
            qv_platform().loadLibrary(name.c_str(), anyone ? QvLibraryTrust::anyone : QvLibraryTrust::owner);
        if (!library.handle) {
            qv_dbg()->error("Failed to load %s", name.c_str());
            qv_dbg()->error("%s %s", name.c_str(), library.reason.c_str());
            return false;
        }
        const auto entry = [&](const char* symbol) {
            return qv_platform().findSymbol(library.handle, symbol);
        };
        create_ = reinterpret_cast<av::CreateCodec>(entry(av::createSymbol));
        leave_ = reinterpret_cast<av::Leave>(entry(av::leaveSymbol));
        if (!create_) qv_dbg()->error("%s is not of this version", name.c_str());
        return create_ != nullptr;
    }
};

class Module : public QvModule {
  public:
    Module(std::shared_ptr<Codecs> codecs, int type, const char* name, const char* desc,
           const char* displayName)
        : QvModule(type, name, desc, displayName), codecs_(std::move(codecs)) {}
    QvCodec* create() override {
        QvCodec* const codec = codecs_->create(*this);
        return codec ? _setAttrs(codec) : nullptr;
    }

  private:
    std::shared_ptr<Codecs> codecs_;
};

void addModules(QvPlugin& plugin) {
    const auto codecs = std::make_shared<Codecs>();
    AnyVector extensions;
    for (const char* extension : av::extensions) extensions.append(Any(extension));
    auto* decoder = new Module(codecs, QvModuleType::decoder, "avdec", "Film reader", "Film import");
    decoder->setAttr("exts", extensions);
    decoder->setAttr("priority", 50);
    plugin.addModule(decoder);
}

}  // namespace

extern "C" {
QV_API unsigned qv_plugin_abi = qvPluginAbi;
}

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("av", "Films: codecs and containers");
    if (plugin.nrModules() == 0) addModules(plugin);
    plugin.setAttr("version", "1.0");
    plugin.setAttr("versionDate", "2026-11-22");
    return &plugin;
}
