#include "core/engine/modules/init.h"

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/builtinplugin_p.h"
#include "core/engine/modules/presethook_p.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreadpool.h"
#include "core/engine/threads/qvtimer.h"

namespace {

void startLog(const AnyDict* config) {
    const Any logfile = config && config->get("logfile").isText() ? config->get("logfile") : Any();
    void* callback = config ? config->get("log_callback").asGeneric(nullptr) : nullptr;
    qv_dbg()->init(&logfile, static_cast<QvLogBase*>(callback));
}

void logFolders(const QvRegistry& registry) {
    const Any library = QvUtil::libraryPath().toString();
    const Any temp = registry.tempDir().toString();
    const Any settings = registry.userSettingsDir(false).toString();
    qv_dbg()->debug("Using core library '%s'.", library.asString(""));
    qv_dbg()->debug("Temp dir is '%s'.", temp.asString(""));
    qv_dbg()->debug("User settings dir is '%s'.", settings.asString(""));
}

void addBuiltinModules(QvRegistry& registry) {
    QvPlugin* builtin = qvBuiltinPlugin();
    if (!registry.plugin("builtin")) registry.addPlugin(builtin);
    // Presets of the built-in modules are there without any plug-in file, too.
    qvPresetHook().update(*registry.presetMgr());
}

}  // namespace

int init_wrapper(const AnyDict* config) {
    [[maybe_unused]] static const double started = QvTimer::time();  // fixes the origin of log times
    startLog(config);
    QvRegistry* registry = qv_registry();
    if (!registry) return QvStatus::ok;
    if (config) registry->setConfig(*config);
    if (config && config->get("threads").isInt32() && !qvSetThreads(config->get("threads").asInt32()))
        qv_dbg()->debug("The number of threads can't be set any more, or is out of range.");
    logFolders(*registry);
    addBuiltinModules(*registry);
    return QvStatus::ok;
}

void cleanup_wrapper() {
    if (QvRegistry* registry = qv_registry()) registry->cleanup();
}
