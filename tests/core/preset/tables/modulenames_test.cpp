#include "core/preset/tables/modulenames_p.h"

#include <gtest/gtest.h>

#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "tests/support/engine.h"

namespace {

TEST(InstalledModules, AreAllOfTheRegistry) {
    const EngineScope engine;
    const QvRegistry& registry = *qv_registry();
    const InstalledModules installed;
    ASSERT_GT(registry.nrModules(), 40);
    for (int i = 0; i < registry.nrModules(); ++i)
        EXPECT_TRUE(installed.has(registry.module(i)->name())) << registry.module(i)->name();
    EXPECT_FALSE(installed.has("mp4mux"));
}

}  // namespace
