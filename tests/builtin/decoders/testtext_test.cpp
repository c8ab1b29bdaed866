#include "builtin/decoders/testtext.h"

#include <gtest/gtest.h>

#include "tests/support/pictures.h"
#include "tests/support/platform_scope.h"

namespace {

class NoFonts : public QvPlatform {
  public:
    std::string fontFile(QvFontFace) override { return ""; }
};

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
