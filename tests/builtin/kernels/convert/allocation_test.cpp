// A conversion that was met before takes no memory.
#include <gtest/gtest.h>

#include <tuple>
#include <vector>

#include "builtin/pipes/qvvideopipe.h"
#include "core/engine/modules/qvregistry.h"
#include "core/media/qvframe.h"
#include "tests/builtin/kernels/layouts.h"
#include "tests/support/counted_memory.h"
#include "tests/support/engine.h"

TEST(Memory, IsTakenForTheFirstPictureOnly) {
    std::vector<unsigned char> from(64 * 48 * 8, 3), to(96 * 80 * 8);
    const struct {
        const char *source, *target;
        unsigned flags;
    } cases[] = {{"I420", "BGR4", QvScale::standard},
                 {"BGR3", "v210", QvScale::high | QvScale::interlaced},
                 {"YUYV", "I420", QvScale::standard | QvScale::source601 | QvScale::target709}};
    for (const auto& c : cases) {
        const auto run = [&](int count) {
            for (int i = 0; i < count; ++i)
                ASSERT_EQ(SRScaler(QvScale::oneThread, codeOf(c.source), from.data(), 0, 64, 48,
                                   codeOf(c.target), to.data(), 0, 96, 80, 0, c.flags, nullptr),
                          1);
        };
        run(2);
        const int before = allocations;
        run(5);
        EXPECT_EQ(allocations, before) << c.source << " to " << c.target;
    }
}

TEST(Memory, OfAChainOfFiltersIsTakenForTheFirstPicturesOnly) {
    const EngineScope engine;
    QvVf pipe;
    for (const char* name : {"scaler", "brightness", "flipper", "videofade", "scaler"}) {
        auto* filter = static_cast<QvVideoFilter*>(qv_registry()->newCodec(name)->getInterface(12));
        ASSERT_EQ(pipe.addFilter(filter, -1), 0);
    }
    pipe.init();
    const auto size = [&](int at, const char* fourcc, int width, int height) {
        pipe.filter(at)->setParamDict(AnyDict("outWidth", width, "outHeight", height, "FOURCC", fourcc));
    };
    size(0, "I420", 128, 96);
    pipe.filter(1)->setParam("contrast", 1.2);
    pipe.filter(3)->setParam("fade_in", 50);
    size(4, "BGR3", 64, 64);
    ASSERT_EQ(pipe.open(), 0);
    QvFrame in;
    in.init(QvFourcc::YUYV, 160, 120);
    std::memset(in.plane(), 120, static_cast<size_t>(in.total_bytes()));
    int taken = 0;
    for (int i = 0; i < 12; ++i) {
        in.frameNr = i;
        const int before = allocations;
        ASSERT_EQ(pipe.write(in), 0);
        ASSERT_EQ(pipe.process(nullptr, 0), 0);
        ASSERT_EQ(pipe.frame()->width(), 64);
        pipe.next();
        if (i >= 2) taken += allocations - before;
    }
    EXPECT_EQ(taken, 0);
}
