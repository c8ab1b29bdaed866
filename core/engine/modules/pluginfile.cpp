#include <string>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/pluginfile_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"

namespace {

constexpr char handleKey[] = "_dllHandle";
constexpr char entryPoint[] = "plugin_init";

void* handleOf(const QvPlugin& plugin) { return plugin.getAttr(handleKey).asGeneric(nullptr); }

// What the library's entry point gives; null if it declines, or with a line in the log if it fails.
QvPlugin* initialise(void* library, const char* file) {
    auto* init = reinterpret_cast<QvPluginInit>(qv_platform().findSymbol(library, entryPoint));
    try {
        if (init) return init();
    } catch (...) {
        // Ends here: its type may go away with the library.
    }
    qv_dbg()->error("Loaded %s, failed to initialize", file);
    return nullptr;
}

// True if codecs of the plug-in exist, after a line for each module that has some.
bool reportInstances(const QvPlugin& plugin) {
    bool found = false;
    for (int i = 0; i < plugin.nrModules(); ++i) {
        const QvModule& module = *plugin.module(i);
        const int count = module.codecList().size();
        if (!count) continue;
        qv_dbg()->warning("%s: *** %d instances still alive", module.displayName(), count);
        found = true;
    }
    return found;
}

}  // namespace

QvPlugin* qvLoadPluginFile(const Any& file) {
    QV_ASSERT(file.isText());
    const Any narrow = file.toString();
    const char* name = narrow.asString("");
    std::string reason;
    void* library = qv_platform().loadLibrary(name, reason);
    if (!library) {
        qv_dbg()->error("Failed to load %s", name);
        if (!reason.empty()) qv_dbg()->error("%s", reason.c_str());
        return nullptr;
    }
    QvPlugin* plugin = initialise(library, name);
    if (plugin)
        plugin->setAttr(handleKey, Any(static_cast<const void*>(library)));
    else
        qv_platform().unloadLibrary(library);
    return plugin;
}

void qvUnloadPluginFile(QvPlugin& plugin) {
    void* library = handleOf(plugin);
    if (!library || reportInstances(plugin)) return;
    const Any name = plugin.name();  // a copy: the original goes with the library
    debug_trace1("unloading", name.asString(""));
    qv_platform().unloadLibrary(library);
    debug_trace1(name.asString(""), "unloaded.");
}

void qvReleasePluginFile(const QvPlugin& plugin) {
    if (void* library = handleOf(plugin)) qv_platform().unloadLibrary(library);
}
