#include "core/engine/modules/qvplugin.h"

extern "C" QV_API QvPlugin* plugin_init() { return nullptr; }
