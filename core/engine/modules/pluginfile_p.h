// Plug-in files: from a name to a plug-in in memory and back.
#pragma once

#include <string>

#include "core/engine/modules/qvplugin.h"

class Any;

// The file that is being loaded while the object lives; QvRegistry::loadingPlugin gives its name. `file` must
// outlive the object.
class QvLoadingPlugin {
  public:
    explicit QvLoadingPlugin(const char* file);
    QvLoadingPlugin(const QvLoadingPlugin&) = delete;
    QvLoadingPlugin& operator=(const QvLoadingPlugin&) = delete;
    ~QvLoadingPlugin();
    static const char* file();  // of the innermost object; null if there is none

  private:
    const char* const outer_;  // a plug-in may load another one
};

struct QvPluginLoad {
    QvPlugin* plugin = nullptr;  // null: it failed, and the rest says why
    QvPluginFault fault = QvPluginFault::failed;
    std::string reason;
};

// Loads a library and asks it for its plug-in, which gets the attribute "_dllHandle". `file` must be text. A
// failure is written to the debug log, unless the plug-in declines, and nothing stays loaded. Files that
// other users may change are refused unless `allowUnsafe`.
QvPluginLoad qvLoadPluginFile(const Any& file, bool allowUnsafe);

// Releases the library of a plug-in, if it has one. While codecs of its modules are alive their code must
// stay: they are reported and the library remains in memory.
void qvUnloadPluginFile(QvPlugin& plugin);

// Gives back what a second load of a library that is in use already has taken.
void qvReleasePluginFile(const QvPlugin& plugin);
