#include <atomic>
#include <exception>
#include <new>
#include <string>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/pluginfile_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"

namespace {

constexpr char handleKey[] = "_dllHandle";
constexpr char entryPoint[] = "plugin_init";
constexpr char abiSymbol[] = "qv_plugin_abi";

std::atomic<const char*> loading{nullptr};
static_assert(std::atomic<const char*>::is_always_lock_free);  // handlers of signals read it

void* handleOf(const QvPlugin& plugin) { return plugin.getAttr(handleKey).asGeneric(nullptr); }

constexpr QvPluginFault faultOf(QvLibraryFault fault) {
    switch (fault) {
        case QvLibraryFault::unreadable: return QvPluginFault::unreadable;
        case QvLibraryFault::unsafe: return QvPluginFault::unsafe;
        case QvLibraryFault::invalid: return QvPluginFault::invalid;
        case QvLibraryFault::unsafeFolder: return QvPluginFault::unsafeFolder;
        case QvLibraryFault::foreign: return QvPluginFault::foreign;
        default: return QvPluginFault::unresolved;
    }
}

QvPluginLoad failure(QvPluginFault fault, const std::string& reason) { return {nullptr, fault, reason}; }

// What the library's entry point gives. Exceptions end here: their types may go away with the library.
QvPluginLoad initialise(void* library) {
    auto* init = reinterpret_cast<QvPluginInit>(qv_platform().findSymbol(library, entryPoint));
    if (!init) return failure(QvPluginFault::noEntry, std::string("has no function ") + entryPoint);
    std::string text;
    try {
        QvPlugin* const plugin = init();
        if (plugin) return {plugin, QvPluginFault::failed, ""};
        return failure(QvPluginFault::declined, "declined to load");
    } catch (const QvException& thrown) {
        text = std::string(": ") + thrown.what();
    } catch (const std::bad_alloc&) {
        text = ": out of memory";
    } catch (const std::exception& thrown) {
        text = std::string(": ") + thrown.what();
    } catch (...) {
    }
    return failure(QvPluginFault::failed, "failed in its start" + text);
}

QvPluginLoad refuseAbi(const char* file, unsigned abi) {
    const QvPluginLoad refused =
        failure(QvPluginFault::otherAbi, "was built for version " + std::to_string(abi) +
                                             " of the plug-in interface; this engine has version " +
                                             std::to_string(qvPluginAbi));
    qv_dbg()->error("%s %s", file, refused.reason.c_str());
    return refused;
}

QvPluginLoad start(void* library, const char* file) {
    const auto* const abi = static_cast<const unsigned*>(qv_platform().findSymbol(library, abiSymbol));
    if (abi && *abi != qvPluginAbi) return refuseAbi(file, *abi);
    const QvPluginLoad result = initialise(library);
    if (!result.plugin && result.fault != QvPluginFault::declined)
        qv_dbg()->error("Loaded %s, failed to initialize", file);
    return result;
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

QvLoadingPlugin::QvLoadingPlugin(const char* file) : outer_(loading.exchange(file)) {}
QvLoadingPlugin::~QvLoadingPlugin() { loading.store(outer_); }
const char* QvLoadingPlugin::file() { return loading.load(); }

QvPluginLoad qvLoadPluginFile(const Any& file, bool allowUnsafe) {
    QV_ASSERT(file.isText());
    const Any narrow = file.toString();
    const char* const name = narrow.asString("");
    // First from the file: what was built for another engine may lack symbols of this one, which would be the
    // loader's complaint, or crash in its static constructors.
    std::uint32_t abi = qvPluginAbi;
    if (qv_platform().libraryNumber(name, abiSymbol, abi) && abi != qvPluginAbi) return refuseAbi(name, abi);
    const QvLibrary library =
        qv_platform().loadLibrary(name, allowUnsafe ? QvLibraryTrust::anyone : QvLibraryTrust::owner);
    if (!library.handle) {
        qv_dbg()->error("Failed to load %s", name);
        qv_dbg()->error("%s %s", name, library.reason.c_str());
        return failure(faultOf(library.fault), library.reason);
    }
    QvPluginLoad result = start(library.handle, name);
    if (result.plugin)
        result.plugin->setAttr(handleKey, Any(static_cast<const void*>(library.handle)));
    else
        qv_platform().unloadLibrary(library.handle);
    return result;
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
