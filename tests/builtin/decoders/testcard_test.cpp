#include "builtin/decoders/testcard.h"

#include <map>

#include "core/media/qvbuffer.h"
#include "tests/support/checks.h"

namespace {

class Lines : public CardText {
  public:
    void draw(QvFrame&, int x, int y, const char* text) override { at[{x, y}] = text; }
    std::map<std::pair<int, int>, std::string> at;
};

// 640 x 480: units of 40 columns and 30 rows, half a row unit is 15.
class Card : public testing::Test {
  protected:
    Card() {
        frame.init(QvFourcc::BGR4, 640, 480);
        frame.framerate = QvFramerate(25.0);
    }
    unsigned pixel(int x, int y) const {
        const unsigned char* p = frame.pixelPtr(x, y);
        return static_cast<unsigned>(p[0] | p[1] << 8 | p[2] << 16);
    }

    QvFrame frame;
    Lines lines;
};

TEST_F(Card, EveryPartIsInItsPlace) {
    drawTestCard(frame, 4 / 3.0, &lines);
    const struct {
        const char* what;
        int x, y;
        unsigned colour;
    } pixels[] = {
        {"frame, top left", 0, 0, 0xFFFFFF},
        {"last grid column", 20, 445, 0xAAAAAA},
        {"the last box", 15 + 24 * 24, 450, 0x303030},
        {"field patch, first field", 640 - 135, 15, 0xFFFF00},
        {"field patch, second field", 640 - 135 + 60, 16, 0x00FFFF},
        {"blue bar", 15 + 6 * 40, 209, 0x0000FF},
        {"darkest gray", 20, 270, 0x000000},
        {"circle, right", 480 + 90, 240, 0xFFFFFF},
    };
    for (const auto& p : pixels) EXPECT_EQ(pixel(p.x, p.y), p.colour) << p.what;
    EXPECT_EQ((lines.at[{19, 12}]), "640x480 25p ");
    EXPECT_EQ((lines.at[{19, 42}]), "4:3 px.1:1 ");
    EXPECT_EQ(lines.at.size(), 2u);
}

TEST_F(Card, MovingPartsFollowTheFrameNumber) {
    drawTestCard(frame, 4 / 3.0, nullptr);
    const int begin = 3 * 24 + 16;  // a cell is 610 / 25 = 24.4 columns
    frame.frameNr = -1;
    drawMovingParts(frame, 2, nullptr);
    for (int x = 15; x < 300; ++x) ASSERT_NE(pixel(x, 460), 0xFFFFFFu) << "no cursor before the first frame";
    frame.frameNr = 25 * 60 + 3;
    drawMovingParts(frame, 2, &lines);
    EXPECT_EQ(pixel(begin + 1, 460), 0xFFFFFFu);
    EXPECT_EQ(pixel(begin + 1, 448), 0x303030u) << "a row is left at the top";
    EXPECT_EQ(pixel(begin + 30, 460), 0x303030u);
    EXPECT_EQ(pixel(15, 386), 0x303030u) << "timecode box";
    EXPECT_EQ((lines.at[{19, 383}]), "00:01:00:03");
    EXPECT_EQ((lines.at[{19, 413}]), "#      1503");
    EXPECT_EQ((lines.at[{490, 386}]), "view #2");
}

}  // namespace
