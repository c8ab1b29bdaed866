// A conversion that was met before takes no memory.
#include <gtest/gtest.h>

#include <cstring>
#include <tuple>
#include <vector>

#include "core/filter/srscaler.h"
#include "core/media/fourcc.h"
#include "tests/support/counted_memory.h"

TEST(Memory, IsTakenForTheFirstPictureOnly) {
    std::vector<unsigned char> from(64 * 48 * 8, 3), to(96 * 80 * 8);
    for (const auto& [source, target, flags] :
         {std::tuple{"I420", "BGR4", QvScale::standard},
          {"BGR3", "v210", QvScale::high | QvScale::interlaced},
          {"YUYV", "I420", QvScale::standard | QvScale::source601 | QvScale::target709}}) {
        const auto run = [&](int count) {
            unsigned a, b;
            std::memcpy(&a, source, 4);
            std::memcpy(&b, target, 4);
            for (int i = 0; i < count; ++i)
                ASSERT_EQ(SRScaler(QvScale::oneThread, a, from.data(), 0, 64, 48, b, to.data(), 0, 96, 80, 0,
                                   flags, nullptr),
                          1);
        };
        run(2);
        const int before = allocations;
        run(5);
        EXPECT_EQ(allocations, before) << source << " to " << target;
    }
}
