#include "core/caption/subtitle/qvsubtitlerender.h"

#include <set>

#include "core/arch/platform.h"
#include "core/caption/subtitle/qvsubtitles.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/filter/qvcolorconvert.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvdraw.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"

namespace {

constexpr unsigned ground = 0x808080;
constexpr QvPoint standard(-1, -1);

QvSubtitle entry(const Any& text, QvPoint at = standard, const AnyVector& fieldMasks = {}, int rows = 1) {
    QvSubtitle subtitle;
    subtitle.text = text;
    subtitle.position = at;
    subtitle.fieldMasks = fieldMasks;
    subtitle.rows = rows;
    return subtitle;
}

struct Render : testing::Test {
    void SetUp() override {
        const std::string font = qv_platform().fontFile(QvFontFace::sans);
        if (font.empty()) GTEST_SKIP() << "no font on this system";
        options.fontRegular = font.c_str();
        options.charSize = 32;
        clear(640, 241);
    }
    void clear(int width, int height) {
        frame.init(QvFourcc::BGR4, width, height);
        frame.setBlack();
        frame.setRGB(0x80, 0x80, 0x80);
    }
    void draw(const QvSubtitle& subtitle) {
        QvSubtitleRender render;
        ASSERT_EQ(render.init(options), 0);
        ASSERT_EQ(render.render(frame, subtitle, nullptr), 0);
    }
    // The picture of a text on a fresh ground.
    std::size_t picture(const Any& text, QvPoint at = standard) {
        clear(frame.width(), frame.height());
        draw(entry(text, at));
        return fingerprint();
    }
    std::size_t fingerprint() const { return std::hash<std::string>()(pictureBytes(frame)); }
    unsigned pixel(int x, int y) const {
        const unsigned char* p = frame.pixelPtr(x, y);
        return static_cast<unsigned>(p[0] | p[1] << 8 | p[2] << 16);
    }
    // What is not ground within some rows.
    QvRect inked(int fromRow = 0, int toRow = INT_MAX) const {
        QvRect box(INT_MAX, INT_MAX, INT_MIN, INT_MIN);
        for (int y = fromRow; y < std::min(toRow, frame.height()); ++y)
            for (int x = 0; x < frame.width(); ++x)
                if (pixel(x, y) != ground)
                    box = QvRect(std::min(box.left(), x), std::min(box.top(), y),
                                 std::max(box.right(), x + 1), std::max(box.bottom(), y + 1));
        return box;
    }

    QvTextRenderingOptions options;
    QvFrame frame;
};

// Size 32: a line is 36 rows, two of them 73; half the size is 16. The letters of "H" stand on row 32.
TEST_F(Render, LinesStandAboveTheLowerEdgeOrAtAPosition) {
    draw(entry("H|HHH", standard, {}, 2));
    const int first = 241 - 16 - 73;
    EXPECT_EQ(inked(0, first + 36).bottom(), first + 32);
    EXPECT_EQ(inked(first + 36).bottom(), first + 36 + 32);
    const QvRect one = inked(0, first + 36), three = inked(first + 36);
    EXPECT_NEAR(one.left() + one.right(), 640, 6) << "centred";
    EXPECT_NEAR(three.left() + three.right(), 640, 6);
    EXPECT_GT(three.width(), 2 * one.width());

    picture("H", {100, 20});
    EXPECT_EQ(inked().bottom(), 20 + 32);
    EXPECT_NEAR(inked().left(), 104, 4);
}

// Within the margins on every side and in every corner, however many lines there are.
TEST_F(Render, AlignedTextStaysWithinItsMargins) {
    clear(320, 240);
    options.charSize = 20;
    options.wrap = true;
    options.marginX = 32;
    options.marginY = 24;
    const QvRect inner(32, 24, 320 - 32, 240 - 24);
    const auto drawn = [&](const char* text, int align) {
        options.align = align;
        picture(text);
        return inked();
    };
    for (int align = 1; align <= 9; ++align)
        for (const char* text : {"Hg", "gH|g", "a line of text that is far wider than this picture is"}) {
            const QvRect ink = drawn(text, align);
            EXPECT_TRUE(ink.left() >= inner.left() && ink.right() <= inner.right() + 1) << align << text;
            EXPECT_TRUE(ink.top() >= inner.top() && ink.bottom() <= inner.bottom()) << align << text;
            if (align % 3 == 1) {
                EXPECT_LE(ink.left(), inner.left() + 4) << align;
            }
            if (align % 3 == 0) {
                EXPECT_GE(ink.right(), inner.right() - 4) << align;
            }
            if (align <= 3) {
                EXPECT_GE(ink.bottom(), inner.bottom() - 4) << align << text;
            }
            if (align >= 7) {
                EXPECT_LE(ink.top(), inner.top() + 10) << align << text;
            }
        }
    EXPECT_EQ(drawn("{\\an8}Hg", 2).top(), drawn("Hg", 8).top());
}

TEST_F(Render, TagsChooseTheFaceAndAreNotDrawn) {
    const std::size_t plain = picture("H"), blank = picture("");
    options.fontBold = "/nowhere.ttf";
    EXPECT_EQ(picture("<b>HHH</b>H"), plain) << "a font that is not there draws nothing";
    for (const char* text : {"<b>HHH", "<b>H|H</b>"}) EXPECT_EQ(picture(text), blank) << text;
    for (const char* text : {"<H", "H>", "<font H", "{\\H", "{H}", "{1:H}", "<x>H"})
        EXPECT_NE(picture(text), plain) << text;
}

TEST_F(Render, FieldMasksLeaveOutLines) {
    draw(entry("HHHH", {10, 10}, AnyVector(1, 2, 3)));
    const int expected[] = {2, 1, 0, 3};  // bit 0: on even rows, bit 1: on odd ones; no mask for the fourth
    const int advance = inked().right() - 10;
    for (int letter = 0; letter < 4; ++letter) {
        int rows = 0;
        for (int y = 0; y < 60; ++y)
            for (int x = 10 + advance * letter / 4 + 2; x < 10 + advance * (letter + 1) / 4 - 2; ++x)
                if (pixel(x, y) != ground) rows |= 1 << y % 2;
        EXPECT_EQ(rows, expected[letter]) << letter;
    }
}

TEST_F(Render, TheSameTextIsDrawnAnewWhereItDiffers) {
    QvSubtitleRender render;
    render.init(options);
    const QvColor red(0xFF0000);
    const QvPoint cut(630, 230);  // partly out of the picture
    const struct {
        const char* text;
        const QvColor* color;
        QvPoint at;
        AnyVector masks;
    } rows[] = {{"Still", nullptr, standard, {}},
                {"Still", &red, standard, {}},
                {"Still", &red, standard, AnyVector(Any(3))},
                {"Still", nullptr, cut, {}},
                {"Stills", nullptr, standard, {}}};
    const auto drawn = [&](const char* text, const QvColor* color, QvPoint at, const AnyVector& masks) {
        clear(frame.width(), frame.height());
        render.render(frame, entry(text, at, masks), color);
        return fingerprint();
    };
    std::vector<std::size_t> first, again;
    for (const auto& row : rows) first.push_back(drawn(row.text, row.color, row.at, row.masks));
    for (int i = 0; i < 40; ++i) drawn(std::to_string(i).c_str(), nullptr, standard, {});
    for (const auto& row : rows) again.push_back(drawn(row.text, row.color, row.at, row.masks));
    EXPECT_EQ(again, first);
    EXPECT_EQ(std::set(first.begin(), first.end()).size(), std::size(rows)) << "no two are alike";
}

TEST_F(Render, AnySizeOfTextAndPictureIsSurvived) {
    draw(entry(std::string(3000, 'W').c_str()));
    EXPECT_LE(inked().left(), 2);
    EXPECT_GE(inked().right(), 638);
    for (const int rows : {5001, INT_MAX, INT_MIN})
        draw(entry(repeated("|x", 5000).c_str(), standard, {}, rows));
    for (const int size : {1, 2, 3, 33}) {
        clear(size, size);
        draw(entry("Text|more", standard, {}, 2));
    }
    for (const int size : {INT_MIN, -1, 0, 1, 1000, 4097, INT_MAX}) {
        options.charSize = size;
        draw(entry("H|\xC3\x89g"));
    }
}

// The letter stands in its place in every format, and its inside has exactly the colour that a whole picture
// of it would have.
TEST_F(Render, EveryFormatHasTheTextInItsPlaceAndColour) {
    const EngineScope engine;
    const QvColor orange(255, 128, 0, false);
    options.charSize = 200;
    const QvSubtitle subtitle = entry("H", {100, 20});
    QvSubtitleRender render;
    render.init(options);
    for (const auto fourcc : {QvFourcc::I420, QvFourcc::ARGB, QvFourcc::I420}) {
        clear(640, 480);
        render.render(frame, subtitle, &orange);
        const QvRect ink = inked();
        frame.setRGB(255, 128, 0);
        QvFrame whole, target;
        QvColorConverter(fourcc, false, false).convert(frame, whole);
        target.init(fourcc, 640, 480);
        target.setBlack();
        const QvFrame black(target);
        render.render(target, subtitle, &orange);
        for (int plane = 0; plane < target.planes(); ++plane) {
            int found = 0, top = INT_MAX, bottom = 0;
            for (int y = 0; y < target.height(plane); ++y)
                for (int i = 0; i < target.stride(plane); ++i) {
                    const auto at = y * target.stride(plane) + i;
                    const auto byte = target.plane(plane)[at];
                    found += byte == whole.plane(plane)[at] && byte != black.plane(plane)[at];
                    if (byte != black.plane(plane)[at]) top = std::min(top, y), bottom = y + 1;
                }
            const int step = frame.height() / target.height(plane);
            EXPECT_GT(found, 500) << target.str_four_cc() << plane;
            EXPECT_NEAR(top * step, ink.top(), 2) << target.str_four_cc() << plane;
            EXPECT_NEAR(bottom * step, ink.bottom(), 2) << target.str_four_cc() << plane;
        }
    }
}

TEST(RenderWithoutFonts, SaysSoAndDrawsNothing) {
    TempFolder folder;
    QvTextRenderingOptions options;
    options.fontRegular = "/nowhere.ttf";
    options.fontBold = folder.write("bold.ttf", "this is no font").c_str();
    QvFrame frame = makePicture(QvFourcc::BGR4, 64, 64);
    const std::string before = pictureBytes(frame);
    QvSubtitleRender render;
    EXPECT_EQ(render.init(options), 0);
    EXPECT_EQ(render.render(frame, entry("a<b>b</b><i>c</i>"), nullptr), 0);
    EXPECT_TRUE(pictureBytes(frame) == before);
}

}  // namespace
