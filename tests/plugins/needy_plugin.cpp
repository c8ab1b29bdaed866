#include "core/engine/modules/qvplugin.h"

const char* qvTestDependencyName();

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("needy", qvTestDependencyName());
    return &plugin;
}
