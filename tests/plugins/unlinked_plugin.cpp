// Calls a function that no library has.
#include "core/engine/modules/qvplugin.h"

namespace qvtest {
int formerly(int width, const char* name);
}

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("unlinked", qvtest::formerly(1, "") > 0 ? "one" : "two");
    return &plugin;
}
