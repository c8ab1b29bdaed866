// What every pipe of filters does with a second init.
#pragma once

#include <gtest/gtest.h>

#include "core/engine/modules/qvcodec.h"
#include "core/engine/status.h"

// `pipe` is initialised, and can be opened.
inline void expectInitialisedOnce(QvCodec& pipe) {
    for (const bool open : {false, true}) {
        if (open) {
            EXPECT_EQ(pipe.open(), 0);
        }
        const auto state = pipe.getState();
        EXPECT_EQ(pipe.init(), QvStatus::failed);
        EXPECT_STREQ(pipe.errorDesc(), "Already initialized");
        EXPECT_EQ(pipe.getState(), state);
    }
}
