// Built for an engine with another interface.
#include <cstdlib>

#include "core/engine/modules/qvplugin.h"

namespace {

struct Early {
    Early() { setenv("QV_FOREIGN_RAN", "1", 1); }
} early;

}  // namespace

extern "C" {
QV_API unsigned qv_plugin_abi = qvPluginAbi + 1;
}

extern "C" QV_API QvPlugin* plugin_init() { return nullptr; }
