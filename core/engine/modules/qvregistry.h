// QvRegistry: the engine-wide list of plug-ins and modules, and the configuration of the process.
#pragma once

#include <deque>
#include <memory>
#include <vector>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvCodec;
class QvLogBase;
class QvModule;
class QvPlugin;
class QvPresetMgr;
struct QvPluginFailure;
class QvRegistry_p;

// Input and output operations that an application lends to decoders; what the words mean is between the two.
struct QvExternalIO {
    void* words[9] = {};
};

// The process has one: qv_registry(). Set-up and shut-down (configuration, loading, cleanup, module
// attributes) belong to the application's thread while nothing is processed. In between, lookups and newCodec
// may run on any thread; there is no lock.
class QV_API QvRegistry {
  public:
    // 1 while the object lives, 0 before and after; code that runs late in the process checks this or the
    // result of qv_registry().
    static int g_initialized;

    QvRegistry(const QvRegistry&) = delete;
    QvRegistry& operator=(const QvRegistry&) = delete;
    ~QvRegistry();

    // --- Configuration. Keys: "temp_dir", "userSettingsDir", "disable_exceptions", "allow_unsafe_plugins",
    // and those that init_wrapper reads ("logfile", "log_callback").
    void setConfig(AnyDict config);
    AnyDict config() const;
    Any tempDir() const;  // "temp_dir", or the system's
    // "userSettingsDir", relative to the home folder unless absolute; ".QVTarselSdk" if not set. The folder
    // is made unless `doNotCreate`.
    Any userSettingsDir(bool doNotCreate) const;
    bool throwParamException() const;  // false if "disable_exceptions" is true
    // Options: "log_setparam" (1 unless set: codecs trace their parameters), "log_progress". Invalid if
    // unset.
    Any getDbgOption(const char* name) const;
    void setDbgOption(const char* name, const Any& value);
    // Full names of fonts for text overlays: a sans face, or a bold monospace face if `monospace` is not 0.
    Any defaultFontFile(int monospace) const;
    Any defaultFontFileItalic(int monospace) const;
    Any defaultFontFileBold(int monospace) const;
    // Whether text can be drawn in a font family of this name, and the names of those installed (Strings,
    // sorted).
    bool hasFontFamily(const char* family) const;
    AnyVector fontFamilies() const;
    QvPresetMgr* presetMgr() const;
    void installLogger(QvLogBase* logger);  // borrowed; null stops the calls
    QvLogBase* logger() const;
    void setExternalDecoderIO(const QvExternalIO* io);  // copied; null zeroes the record
    const QvExternalIO* externalDecoderIO() const;      // null unless its fourth word is set

    // --- Plug-ins, in load order, the built-in one first.
    void setPluginFolder(const Any& folder);
    Any getPluginFolder() const;
    // Loads every plug-in file ("*_plugin.so") of `folder`, or of the stored plug-in folder if `folder` is
    // false, and updates the presets. A file that fails is logged and passed over. 0, or -1 if the folder has
    // no plug-in file.
    int scanFolder(const Any& folder);
    // Loads one file, once. 0, or QvStatus::pluginNotLoaded with the reason in the debug log and in
    // pluginFailures. A file that other users may change is refused unless the configuration has
    // "allow_unsafe_plugins" true: neither they nor a group with other members may write to the file, its
    // folder or the folders above, and all of these belong to root or this user. A folder above the file's
    // own may be open to all if it protects what is in it, as /tmp does.
    int loadPlugin(const Any& file);
    // The files that could not be loaded since the last cleanup, in the order of the attempts; a file that
    // was loaded later is not among them. Valid until the next loadPlugin, scanFolder or cleanup.
    const std::vector<QvPluginFailure>& pluginFailures() const;
    // The file that loadPlugin is loading at this moment, or null. A plug-in can end the process while it
    // starts, by a crash, an exit, a quick_exit or an exception from a static constructor (which ends in
    // std::terminate). The library installs no handlers; an application that does can name the culprit. Safe
    // in handlers of signals, std::terminate and exit. The text is valid during the handler.
    static const char* loadingPlugin();
    // Adds a plug-in that is in memory already; it must outlive its stay in the list. 0.
    int addPlugin(QvPlugin* plugin);
    int nrPlugins() const;
    QvPlugin* plugin(int index) const;         // null for an index out of range
    QvPlugin* plugin(const char* name) const;  // null if there is none
    // Unloads the plug-in files and empties the list, the built-in plug-in included. A file whose codecs are
    // still alive is reported and stays in memory, so that these can be destroyed later.
    void cleanup();

    // --- Modules, over all plug-ins in list order. On equal names the earlier plug-in's module is found.
    int nrModules(int type = 0) const;         // of that type, or all (0)
    QvModule* module(int index) const;         // null for an index out of range
    QvModule* module(const char* name) const;  // also knows the aliases "colorconv" and "scaler2" of "scaler"
    // A new, initialised codec, which the caller owns; null if there is no such module or it fails.
    QvCodec* newCodec(const char* name);
    // Dicts with "name", "desc" and "module" (borrowed pointer) of the modules of that type, of one of those
    // types, or of all (0, an empty vector).
    AnyVector modules(int type) const;
    AnyVector modules(const AnyVector& types) const;
    bool isModuleEnabled(const char* name) const;
    // The attributes that a module had when its plug-in was loaded, or null. Owned by the registry.
    const AnyDict* moduleDefaults(const char* name) const;
    bool isOverriden(const QvModule* module) const;  // its attributes differ from moduleDefaults
    // What has been changed since: module name to a Dict of its changed attributes.
    void getModuleOverrides(AnyDict& overrides) const;
    void setModuleOverrides(const AnyDict& overrides);  // unknown modules and ill-formed entries are logged

    // --- Input files.
    // The extensions that enabled decoders name, each once, as "*.ext", "*ext", ".ext" or "ext". The caller
    // owns the vector.
    AnyVector* inputExts(bool dot, bool star) const;
    // Names of the decoders that can try a file of this extension (without dot, exact case), best first.
    AnyVector decoders(const char* ext) const;

    int makeAccelFile(const char*) { return 0; }  // of the interface, without effect
    void removeAccelFile() {}

  private:
    friend QV_API QvRegistry* qv_registry();
    QvRegistry();

    void keepDefaults(const QvPlugin& plugin);
    void unload(QvPlugin* plugin);

    std::unique_ptr<QvRegistry_p> p_;
    std::deque<QvPlugin*> plugins_;
    AnyDict moduleDefaults_;
    AnyDict config_;
    Any pluginFolder_;
};

// The registry, made by the first call; null once it has been destroyed at the end of the process.
QV_API QvRegistry* qv_registry();
