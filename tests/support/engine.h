// The engine with its built-in modules, from set-up to tear-down; a fixture has one as its first member.
#pragma once

#include "core/engine/modules/init.h"

struct EngineScope {
    EngineScope() { init_wrapper(nullptr); }
    EngineScope(const EngineScope&) = delete;
    EngineScope& operator=(const EngineScope&) = delete;
    ~EngineScope() { cleanup_wrapper(); }
};
