#include "core/engine/qvplugin.h"

extern "C" QV_API QvPlugin* plugin_init() { return nullptr; }
