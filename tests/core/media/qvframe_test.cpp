#include "core/media/qvframe.h"

#include <climits>
#include <cstring>
#include <functional>

#include "core/engine/status.h"
#include "core/value/ptrlist.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

TEST(QvFrame, LaysOutEveryFormat) {
    const struct {
        const char* code;
        int width, height;
        int stride0, stride1;
        int bytes0, bytes1;
        int planes, bits, depth;
    } cases[] = {{"GRAY", 7, 5, 8, 0, 40, 0, 1, 8, 8},       {"I420", 7, 5, 7, 3, 35, 7, 3, 12, 8},
                 {"YV12", 8, 6, 8, 4, 48, 12, 3, 12, 8},     {"I422", 7, 5, 7, 3, 35, 15, 3, 16, 8},
                 {"W016", 7, 5, 14, 7, 70, 17, 3, 24, 16},   {"YUY2", 7, 5, 14, 0, 70, 0, 1, 16, 8},
                 {"Y216", 7, 5, 28, 0, 140, 0, 1, 32, 16},   {"v210", 1, 2, 128, 0, 256, 0, 1, 32, 10},
                 {"v210", 49, 2, 256, 0, 512, 0, 1, 32, 10}, {"BGR3", 7, 5, 24, 0, 120, 0, 1, 24, 8},
                 {"ARGB", 7, 5, 28, 0, 140, 0, 1, 32, 8},    {"b64a", 7, 5, 56, 0, 280, 0, 1, 64, 16},
                 {"R555", 7, 5, 14, 0, 70, 0, 1, 0, 8}};
    for (const auto& c : cases) {
        unsigned fourcc = 0;
        std::memcpy(&fourcc, c.code, 4);
        SCOPED_TRACE(c.code);
        QvFrame frame;
        ASSERT_EQ(frame.init(fourcc, c.width, c.height), 0);
        EXPECT_STREQ(frame.str_four_cc(), c.code);
        EXPECT_EQ(frame.planes(), c.planes);
        EXPECT_EQ(frame.total_bytes(), c.bytes0 + 2 * c.bytes1);
        for (int p = 0; p < c.planes; ++p) {
            EXPECT_EQ(frame.stride(p), p ? c.stride1 : c.stride0);
            EXPECT_EQ(frame.plane_bytes(p), p ? c.bytes1 : c.bytes0);
            EXPECT_EQ(frame.plane(p) - frame.plane(0), p ? c.bytes0 + (p - 1) * c.bytes1 : 0);
        }
        EXPECT_TRUE(frame.plane_bytes(c.planes) == 0 && frame.plane_bytes(-1) == 0);
        EXPECT_THROW(frame.bytes(c.planes), QvAssertFailure);
        EXPECT_EQ(frame.plane(0, true), frame.plane(0) + c.bytes0 - c.stride0);
        EXPECT_EQ(frame.stride(0, true), -c.stride0);
        EXPECT_EQ(QvFrame::bitDepth(fourcc), c.depth);
        if (c.bits)
            EXPECT_EQ(QvFrame::bitsPerPixel(fourcc), c.bits);
        else
            EXPECT_THROW(QvFrame::bitsPerPixel(fourcc), QvAssertFailure);
    }
}

TEST(QvFrame, FormatGroups) {
    const auto names = [](auto test) {
        std::string found;
        for (unsigned fourcc : allFormats()) {
            QvFrame frame;
            frame.init(fourcc, 4, 4);
            if (test(frame)) found += std::string(frame.str_four_cc()) + " ";
        }
        return found;
    };
    EXPECT_EQ(names([](auto& f) { return f.isRGB(); }), "BGR3 BGR4 BGRA ARGB ");
    EXPECT_EQ(names([](auto& f) { return f.is420(); }), "I420 YV12 ");
    EXPECT_EQ(names([](auto& f) { return f.is422(); }), "I422 YUY2 YUYV UYVY ");
    EXPECT_EQ(names([](auto& f) { return f.isPlanar(); }), "I420 YV12 I422 W016 ");

    for (const auto& [fourcc, offsets] :
         {std::pair(I422, "9999"), {UYVY, "1302"}, {YUY2, "0213"}, {YUYV, "0213"}}) {
        int y0 = 9, y1 = 9, u = 9, v = 9;
        QvFrame frame;
        frame.init(fourcc, 4, 4);
        frame.get422offsets(&y0, &y1, &u, &v);
        EXPECT_EQ(Any::sprintf("%d%d%d%d", y0, y1, u, v), offsets);
    }
}

TEST(QvFrame, WishedStridesOnlyGrow) {
    const struct {
        unsigned fourcc;
        AnyVector wishes;
        int strides[3];
    } cases[] = {{I420, {0, 0, 0}, {8, 4, 4}},
                 {I420, {10, 2, 16}, {10, 4, 16}},
                 {W016, AnyVector(Any(40)), {40, 20, 20}},  // half of the luma's
                 {I420, {"x", 6}, {8, 6, 4}}};
    for (const auto& c : cases) {
        QvFrame frame;
        ASSERT_EQ(frame.init(c.fourcc, 8, 5, nullptr, &c.wishes), 0);
        for (int p = 0; p < 3; ++p) EXPECT_EQ(frame.stride(p), c.strides[p]) << p << " of " << c.strides[0];
        EXPECT_EQ(frame.plane_bytes(2), 5 * c.strides[2] / 2);
    }
}

TEST(QvFrame, RefusesWhatCanNotBeHeld) {
    const Size tooLarge[] = {{65536, 65536}, {INT_MAX, INT_MAX}, {INT_MAX, 1}, {1, INT_MAX}, {-1, 5},
                             {5, -1},        {INT_MIN, INT_MIN}};
    for (const auto& size : tooLarge)
        for (unsigned fourcc : {BGRA, b64a, v210}) {
            QvFrame frame;
            frame.init(I420, 4, 4);
            EXPECT_EQ(frame.init(fourcc, size.width, size.height), QvStatus::outOfMemory);
            EXPECT_TRUE(!frame.inited() && frame.planes() == 0);
        }
    QvFrame frame;
    const AnyVector huge(Any(1LL << 62));
    EXPECT_EQ(frame.init(GRAY, 4, 4, nullptr, &huge), QvStatus::outOfMemory);
    for (unsigned fourcc : allFormats()) {
        EXPECT_EQ(frame.init(fourcc, 0, 0), 0);
        frame.setBlack();
        frame.changeDominance(true);
        EXPECT_EQ(QvFrame(frame).total_bytes(), 0);
    }
    LogCapture log;
    EXPECT_THROW(frame.init(qvFourcc("XXXX"), 4, 4), QvAssertFailure);
    EXPECT_TRUE(log.contains("Unknown fourCC :XXXX", QvLogMask::error));
    EXPECT_FALSE(frame.inited());
}

TEST(QvFrame, AnEmptyFrameRefusesPlaneOperations) {
    QvFrame frame;
    const std::function<void()> operations[] = {
        [&] { frame.plane(0); },          [&] { frame.stride(0); },  [&] { frame.pixelPtr(0, 0); },
        [&] { frame.str_four_cc(); },     [&] { frame.setBlack(); }, [&] { frame.changeDominance(true); },
        [&] { frame.copyBob(QvFrame()); }};
    for (const auto& operation : operations) EXPECT_THROW(operation(), QvAssertFailure);
    frame.init(GRAY, 4, 4);
    frame = QvFrame();
    EXPECT_FALSE(frame.inited());
}

TEST(QvFrame, InitForgetsAndExternalMemoryStays) {
    QvFrame frame;
    unsigned char memory[4 * 6 + 1];
    std::memset(memory, 7, sizeof(memory));
    frame.framerate = QvFramerate(50.0, 2);
    ASSERT_EQ(frame.init(GRAY, 4, 6, memory), 0);
    EXPECT_TRUE(frame.external() && frame.plane(0) == memory);
    EXPECT_EQ(frame.framerate, QvFramerate(50.0));  // it was empty before
    frame.getFrame_tt()->planes[0][5] = 9;
    EXPECT_EQ(*frame.pixelPtr(1, 1), 9);
    frame.frameNr = 4;
    frame.setTimestamp(5);
    frame.setBlack();
    EXPECT_EQ(memory[24], 7);
    ASSERT_EQ(frame.init(GRAY, 4, 6), 0);
    EXPECT_TRUE(!frame.external() && frame.framerate == QvFramerate(25.0));
    EXPECT_TRUE(frame.frameNr == -1 && frame.getTimestamp() == -1);
}

TEST(QvFrame, PixelAddresses) {
    QvFrame frame;
    frame.init(v210, 48, 2);
    EXPECT_EQ(frame.pixelPtr(13, 1) - frame.plane(0), 128 + 32);
    frame.init(W016, 6, 4);
    EXPECT_EQ(frame.pixelPtr(2, 1, 1) - frame.plane(1), 4 + frame.stride(1));
    EXPECT_NO_THROW(frame.pixelPtr(5, 3));
    EXPECT_THROW(frame.pixelPtr(0, 0, 3), QvAssertFailure);
    for (const auto& [x, y] : {std::pair{0, 4}, {0, -1}, {INT_MAX, INT_MAX}})
        EXPECT_THROW(frame.pixelPtr(x, y), QvAssertFailure) << y;
}

TEST(QvFrame, Metadata) {
    QvFrame frame;
    EXPECT_TRUE(frame.YUVMatrix() == qvMatrixNotSet && !frame.userData() && !frame.subpic());
    frame.meta().set("timestamp", Any(5));  // of another type
    EXPECT_EQ(frame.getTimestamp(), -1);
    frame.setTimestamp(1LL << 40);
    frame.setYUVMatrix(qvMatrixBT709);
    auto* data = reinterpret_cast<QvUserData*>(&frame);
    frame.setUserData(data);
    frame.setSubpic(AnyDict("text", "x"));
    const QvFrame copy(frame);
    EXPECT_TRUE(copy.getTimestamp() == 1LL << 40 && copy.YUVMatrix() == qvMatrixBT709);
    ASSERT_TRUE(copy.userData() == data && copy.subpic() && copy.subpic() != frame.subpic());
    EXPECT_STREQ(copy.subpic()->getString("text"), "x");
    frame.clearSubpic();
    frame.clearUserData();
    EXPECT_TRUE(!frame.userData() && !frame.subpic());
}

TEST(QvFrame, ChangesOnlyTheLabel) {
    QvFrame frame;
    makeNoise(frame, YUY2, 6, 4, 2, 1);
    const auto before = modelOf(frame);
    EXPECT_EQ(frame.changeFOURCC(UYVY), 0);
    EXPECT_EQ(modelOf(frame).planes, before.planes);
    EXPECT_EQ(frame.changeFOURCC(BGRA), -1);
    EXPECT_EQ(frame.four_cc(), UYVY);
    EXPECT_EQ(QvFrame().changeFOURCC(0), -1);
}

TEST(QvFrame, ViewsAreAChain) {
    QvFrame frames[3];
    TPtrList<QvFrame> list;
    QvFrame_linkViews(list);
    for (auto& frame : frames) list.append(&frame);
    frames[2].init(GRAY, 2, 2);
    QvFrame_linkViews(list);
    EXPECT_TRUE(QvFrame_nrViews(&frames[0]) == 3 && QvFrame_viewIndex(&frames[2]) == 2);
    EXPECT_TRUE(frames[1].nextView() == &frames[2] && frames[1].prevView() == &frames[0]);
    EXPECT_THROW(QvFrame_nrViews(&frames[1]), QvAssertFailure);
}

}  // namespace
