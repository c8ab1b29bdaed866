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
