#include "core/media/qvframe.h"

#include <malloc.h>

#include "core/engine/status.h"
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
                 {"R555", 7, 5, 14, 0, 70, 0, 1, 0, 8},      {"R565", 7, 5, 14, 0, 70, 0, 1, 0, 8}};
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
        EXPECT_EQ(frame.plane(0, true), frame.plane(0) + c.bytes0 - c.stride0);
        EXPECT_EQ(frame.stride(0, true), -c.stride0);
        EXPECT_EQ(QvFrame::bitDepth(fourcc), c.depth);
        if (c.bits)
            EXPECT_EQ(QvFrame::bitsPerPixel(fourcc), c.bits);
        else
            EXPECT_THROW(QvFrame::bitsPerPixel(fourcc), QvAssertFailure);
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
    const std::pair<int, int> tooLarge[] = {
        {65536, 65536}, {INT_MAX, INT_MAX}, {INT_MAX, 1}, {1, INT_MAX}, {-1, 5}, {5, -1}, {INT_MIN, INT_MIN}};
    for (const auto& size : tooLarge)
        for (unsigned fourcc : {BGRA, b64a, v210}) {
            QvFrame frame;
            frame.init(I420, 4, 4);
            EXPECT_EQ(frame.init(fourcc, size.first, size.second), QvStatus::outOfMemory);
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

// Memory that held something else before.
struct UsedMemory {
    UsedMemory() { mallopt(M_PERTURB, 85); }
    ~UsedMemory() { mallopt(M_PERTURB, 0); }
};

TEST(QvFrame, BytesOfNoPixelAreZero) {
    const UsedMemory used;
    for (unsigned fourcc : allFormats())
        for (int width : {1, 2, 5, 33, 50})
            for (int height : {1, 4, 7})
                for (int padding : {0, 5}) {
                    QvFrame plain, frame;
                    plain.init(fourcc, width, height);
                    AnyVector strides;
                    for (int p = 0; p < plain.planes(); ++p) strides.append(Any(plain.stride(p) + padding));
                    ASSERT_EQ(frame.init(fourcc, width, height, nullptr, &strides), 0);
                    for (int p = 0; p < frame.planes(); ++p) {
                        const int perPixel = fourcc == v210 ? 0 : frame.pixelBytes(p);
                        const int row = fourcc == v210 ? (width + 5) / 6 * 16 : frame.width(p) * perPixel;
                        for (int i = 0; i < frame.plane_bytes(p); ++i) {
                            if (i % frame.stride(p) < row && i / frame.stride(p) < frame.height(p)) continue;
                            ASSERT_EQ(frame.plane(p)[i], 0) << frame.str_four_cc() << ' ' << width << 'x'
                                                            << height << " plane " << p << " byte " << i;
                        }
                    }
                }
}

// The byte of black at a place of a row.
unsigned char black(unsigned fourcc, int plane, int byte) {
    const bool word = fourcc == W016 || fourcc == Y216;
    const bool chroma = plane > 0 || fourcc == Y216 ? plane > 0 || byte / 2 % 2 == 1
                        : fourcc == UYVY            ? byte % 2 == 0
                                                    : (fourcc == YUY2 || fourcc == YUYV) && byte % 2 == 1;
    if (!chroma) return 0;
    return word && byte % 2 == 0 ? 0 : 128;
}

TEST(QvFrame, BlackInEveryFormat) {
    unsigned seed = 1;
    for (unsigned fourcc : allFormats())
        for (int width : {1, 2, 7, 33, 70})
            for (int padding : {0, 3, 4}) {
                QvFrame frame = noiseFrame(fourcc, width, 5, padding, ++seed);
                frame.setBlack();
                for (int p = 0; p < frame.planes(); ++p)
                    for (int i = 0; i < frame.plane_bytes(p); ++i)
                        ASSERT_EQ(frame.plane(p)[i], black(fourcc, p, i % frame.stride(p)))
                            << frame.str_four_cc() << " plane " << p << " byte " << i;
            }
}

}  // namespace
