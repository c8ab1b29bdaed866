#include "core/engine/modules/qvplugin.h"

namespace {

struct OwnType {
    const char* text;
};

}  // namespace

extern "C" QV_API QvPlugin* plugin_init() { throw OwnType{"of a type that only this library knows"}; }
