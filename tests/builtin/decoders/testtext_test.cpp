#include "builtin/decoders/testtext.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "core/media/qvgeometry.h"
#include "tests/support/pictures.h"
#include "tests/support/platform_scope.h"

namespace {

class NoFonts : public QvPlatform {
  public:
    std::string fontFile(QvFontFace) override { return ""; }
};

// Columns and rows that a line of eleven characters takes at 0, 0.
QvPoint extent(int width, int height) {
    QvFrame frame;
    frame.init(QvFourcc::BGR4, width, height);
    frame.setBlack();
    makeTestText(height)->draw(frame, 0, 0, "00:00:00:00");
    QvPoint far(0, 0);
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x)
            if (*frame.pixelPtr(x, y)) far = QvPoint(std::max(far.x(), x + 1), std::max(far.y(), y + 1));
    return far;
}

TEST(TestText, FillsItsBoxesAtEverySize) {
    if (qv_platform().fontFile(QvFontFace::monospaceBold).empty()) GTEST_SKIP() << "no font on this system";
    for (const auto& [width, height] : {Pair(320, 240), Pair(720, 576), Pair(1920, 1080), Pair(3840, 2160)}) {
        const int h = height / 16;
        const QvPoint far = extent(width, height);
        EXPECT_GT(far.x(), 5 * h) << height;
        EXPECT_LE(far.x(), 7 * h - 4) << "the timecode box";
        EXPECT_GT(far.y(), h / 2);
        EXPECT_LE(far.y(), h + 1) << "a row of the box";
    }
}

TEST(TestText, NoFontMeansNoText) {
    NoFonts platform;
    PlatformScope scope(platform);
    QvFrame frame = makePicture(QvFourcc::BGR4, 320, 240);
    const std::string before = pictureBytes(frame);
    const auto text = makeTestText(240);
    ASSERT_NE(text, nullptr);
    text->draw(frame, 0, 0, "text");
    EXPECT_TRUE(pictureBytes(frame) == before);
}

}  // namespace
