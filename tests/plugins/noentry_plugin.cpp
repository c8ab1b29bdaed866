#include "core/engine/modules/qvplugin.h"

extern "C" QV_API QvPlugin* plugin_start() { return nullptr; }
