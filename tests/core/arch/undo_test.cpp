#include "core/arch/undo_p.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace {

TEST(Undo, RunsUnlessItIsDismissed) {
    int undone = 0;
    {
        const Undo undo([&] { ++undone; });
    }
    {
        Undo undo([&] { undone += 10; });
        undo.dismiss();
    }
    EXPECT_EQ(undone, 1);
}

// The exception that was on its way is the one that is thrown.
TEST(Undo, GetsByWithoutMemory) {
    const auto without = [] { throw std::bad_alloc(); };
    EXPECT_THROW(
        {
            const Undo undo(without);
            throw std::runtime_error("first");
        },
        std::runtime_error);
    EXPECT_NO_THROW({ const Undo undo(without); });
}

}  // namespace
