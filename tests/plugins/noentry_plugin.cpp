#include "core/engine/qvplugin.h"

extern "C" QV_API QvPlugin* plugin_start() { return nullptr; }
