// Finds "av_codecs.so" in the folder of the plug-in's own file.
#include "plugins/av/door/codeclibrary.h"

#include <string>

#include "core/arch/platform.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/value/any.h"

namespace av {

CodecLibrary::~CodecLibrary() {
    if (leave_) leave_();
}

QvCodec* CodecLibrary::create(const QvModule& module) {
    if (!create_ && !load(module)) return nullptr;
    return create_(module.name());
}

bool CodecLibrary::load(const QvModule& module) {
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
    const auto entry = [&](const char* symbol) { return qv_platform().findSymbol(library.handle, symbol); };
    create_ = reinterpret_cast<av::CreateCodec>(entry(av::createSymbol));
    leave_ = reinterpret_cast<av::Leave>(entry(av::leaveSymbol));
    if (!create_) qv_dbg()->error("%s is not of this version", name.c_str());
    return create_ != nullptr;
}

}  // namespace av
