// The progress lines of a link's step. They cost a test of the flag `logProgress_` alone.
#pragma once

#include "core/engine/log/qvlog.h"

#define QV_STEP_LOG(link, text, ...)                                            \
    do {                                                                        \
        if (logProgress_)                                                       \
            qv_dbg()->log(QvLogMask::progress, link " @ %p: " text,             \
                          static_cast<void*>(this) __VA_OPT__(, ) __VA_ARGS__); \
    } while (false)
