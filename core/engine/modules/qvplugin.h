// QvPlugin: a group of modules, as a plug-in file hands it over.
#pragma once

#include <deque>
#include <memory>
#include <string>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvModule;

// Owns its modules.
class QV_API QvModuleList {
  public:
    QvModuleList();
    QvModuleList(const QvModuleList&) = delete;
    QvModuleList& operator=(const QvModuleList&) = delete;
    virtual ~QvModuleList();
    void append(QvModule* module);  // takes ownership
    QvModule* at(int index) const;  // null for an index out of range
    int nr() const { return static_cast<int>(modules_.size()); }

  private:
    std::deque<std::unique_ptr<QvModule>> modules_;
};

// The registry holds plug-ins without owning them. That of a file belongs to the file's own code, best as a
// function-local static, which is destroyed when the library is unloaded:
//
//     extern "C" QV_API QvPlugin* plugin_init() {
//         static QvPlugin plugin("wave", "Wave formats");
//         if (plugin.nrModules() == 0) plugin.addModule(new WaveDecModule);
//         plugin.setAttr("version", "1.0");
//         plugin.setAttr("versionDate", "2024-05-01");
//         return &plugin;
//     }
//
// Attributes: "filename" (full path of the file, or "builtin"), "version" and "versionDate" (Strings, set by
// the plug-in), "_dllHandle" (borrowed handle of the library; absent for the built-in plug-in).
class QV_API QvPlugin {
  public:
    QvPlugin(const char* name, const char* desc);
    QvPlugin(const QvPlugin&) = delete;
    QvPlugin& operator=(const QvPlugin&) = delete;
    virtual ~QvPlugin();

    void addModule(QvModule* module);  // takes ownership; not null
    int nrModules() const { return modules_.nr(); }
    QvModule* module(int index) const { return modules_.at(index); }  // null for an index out of range
    Any getAttr(const char* key) const;
    void setAttr(const char* key, const Any& value);
    const Any& name() const { return name_; }
    const Any& desc() const { return description_; }

  private:
    AnyDict attributes_;
    QvModuleList modules_;
    Any description_;
    Any name_;
};

// What a plug-in file exports under the name "plugin_init". Null: the plug-in declines to load.
using QvPluginInit = QvPlugin* (*)();

// The number of the interface between the engine and its plug-ins. It is raised when a plug-in that was
// compiled before no longer fits: when virtual functions or fields of public classes change. A plug-in file
// may export the number that it was compiled with; the engine then refuses the file unless it is its own:
//
//     extern "C" { QV_API unsigned qv_plugin_abi = qvPluginAbi; }
constexpr unsigned qvPluginAbi = 1;

enum class QvPluginFault {
    unreadable,    // the file is not there, or may not be read
    unsafe,        // other users may change the file or a link that leads to it
    invalid,       // it is not a whole shared library of this machine
    unresolved,    // a library that it needs is not there
    noEntry,       // it has no "plugin_init"
    otherAbi,      // its "qv_plugin_abi" is not the engine's
    failed,        // its "plugin_init" threw
    declined,      // its "plugin_init" returned null
    unsafeFolder,  // other users may change a folder that leads to it; the reason names the folder
    foreign,       // it was built against other versions: a symbol that it needs is in no library
};

// A plug-in file that was not loaded.
struct QvPluginFailure {
    Any file;  // the name that was given
    QvPluginFault fault;
    std::string reason;  // the end of a sentence that begins with the file: "is empty"
};
