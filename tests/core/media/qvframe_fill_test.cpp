#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

// The byte of black at a place of a row.
unsigned char black(unsigned fourcc, int plane, int byte) {
    const bool word = fourcc == W016 || fourcc == Y216;
    const bool chroma = plane > 0 || fourcc == Y216 ? plane > 0 || byte / 2 % 2 == 1
                        : fourcc == UYVY            ? byte % 2 == 0
                                                    : (fourcc == YUY2 || fourcc == YUYV) && byte % 2 == 1;
    if (!chroma) return 0;
    return word && byte % 2 == 0 ? 0 : 128;
}

TEST(QvFrameFill, Black) {
    unsigned seed = 1;
    for (unsigned fourcc : allFormats())
        for (const auto& size : oddSizes)
            for (int padding : {0, 3, 4}) {
                QvFrame frame;
                makeNoise(frame, fourcc, size.width, size.height, padding, ++seed);
                frame.setBlack();
                for (int p = 0; p < frame.planes(); ++p)
                    for (int i = 0; i < frame.plane_bytes(p); ++i)
                        ASSERT_EQ(frame.plane(p)[i], black(fourcc, p, i % frame.stride(p)))
                            << frame.str_four_cc() << " plane " << p << " byte " << i;
            }
}

TEST(QvFrameFill, Colour) {
    unsigned seed = 1;
    for (unsigned fourcc : allFormats())
        for (const auto& size : oddSizes) {
            QvFrame frame;
            makeNoise(frame, fourcc, size.width, size.height, 2, ++seed);
            auto wanted = modelOf(frame);
            const int step = fourcc == BGR4 || fourcc == BGRA ? 4 : 3;
            if (fourcc == BGR3 || fourcc == ARGB || step == 4) {
                for (int x = 0; x < size.width; ++x)
                    for (int i = 0; i < 3; ++i)
                        wanted.at(0, 0, step * x + i) = static_cast<unsigned char>(30 - 10 * i);
                for (int y = 1; y < size.height; ++y)
                    for (int i = 0; i < frame.stride(); ++i) wanted.at(0, y, i) = wanted.at(0, 0, i);
            }
            frame.setRGB(10, 20, 30);
            EXPECT_EQ(modelOf(frame), wanted) << frame.str_four_cc();
        }
}

}  // namespace
