#include "core/caption/qvsubtitlerender.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <functional>
#include <memory>
#include <string>

#include "core/arch/platform.h"
#include "core/caption/qvsubtitles.h"
#include "core/caption/qvtextrenderingoptions.h"
#include "core/engine/init.h"
#include "core/filter/qvcolorconvert.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvdraw.h"
#include "tests/support/log_capture.h"
#include "tests/support/pictures.h"
#include "tests/support/temp_folder.h"

namespace {

constexpr unsigned ground = 0x808080;

class Render : public testing::Test {
  protected:
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
    void draw(const char* text, int rows = 1, QvPoint at = {-1, -1}, const QvColor* color = nullptr) {
        QvSubtitle subtitle;
        subtitle.text = text;
        subtitle.rows = rows;
        subtitle.position = at;
        QvSubtitleRender render;
        ASSERT_EQ(render.init(options), 0);
        ASSERT_EQ(render.render(frame, subtitle, color), 0);
    }
    // The picture of a text on a fresh ground.
    std::size_t picture(const char* text, int rows = 1, QvPoint at = {-1, -1}) {
        clear(frame.width(), frame.height());
        draw(text, rows, at);
        return fingerprint();
    }
    std::size_t fingerprint() const { return std::hash<std::string>()(pictureBytes(frame)); }
    std::size_t blank() {
        clear(frame.width(), frame.height());
        return fingerprint();
    }
    unsigned pixel(int x, int y) const {
        const unsigned char* p = frame.pixelPtr(x, y);
        return static_cast<unsigned>(p[0] | p[1] << 8 | p[2] << 16);
    }
    // What is not ground within some rows.
    QvRect inked(int fromRow, int toRow) const {
        QvRect box(INT_MAX, INT_MAX, INT_MIN, INT_MIN);
        for (int y = fromRow; y < toRow; ++y)
            for (int x = 0; x < frame.width(); ++x)
                if (pixel(x, y) != ground) {
                    box = QvRect(std::min(box.left(), x), std::min(box.top(), y),
                                 std::max(box.right(), x + 1), std::max(box.bottom(), y + 1));
                }
        return box;
    }
    template <class Test>
    int countIf(Test test) const {
        int found = 0;
        for (int y = 0; y < frame.height(); ++y)
            for (int x = 0; x < frame.width(); ++x) found += test(pixel(x, y));
        return found;
    }
    int count(unsigned colour) const {
        return countIf([colour](unsigned found) { return found == colour; });
    }

    QvTextRenderingOptions options;
    QvFrame frame;
};

// Size 32: a line is 36 rows, two of them 73; half the size is 16. The letters of "H" stand on row 32.
TEST_F(Render, LinesStandAboveTheLowerEdge) {
    draw("H|HHH", 2);
    const int first = 241 - 16 - 73;
    EXPECT_EQ(inked(0, first + 36).bottom(), first + 32);
    EXPECT_EQ(inked(first + 36, 241).bottom(), first + 36 + 32);
    const QvRect one = inked(0, first + 36), three = inked(first + 36, 241);
    EXPECT_NEAR(one.left() + one.right(), 640, 6) << "centred";
    EXPECT_NEAR(three.left() + three.right(), 640, 6);
    EXPECT_GT(three.width(), 2 * one.width());
}

TEST_F(Render, APositionInThePictureCounts) {
    const std::size_t standard = picture("H");
    draw("H", 1, {100, 20});
    EXPECT_EQ(inked(0, 100).bottom(), 20 + 32);
    EXPECT_NEAR(inked(0, 100).left(), 104, 4);
    EXPECT_NE(picture("H", 1, {0, -1}), standard);
    for (const QvPoint& outside : {QvPoint(-1, 5), QvPoint(5, -2), QvPoint(641, 5), QvPoint(5, 242)})
        EXPECT_EQ(picture("H", 1, outside), standard) << outside.x() << ", " << outside.y();
    clear(640, 241);
    draw("H|H", 2, {100, 20});
    EXPECT_EQ(inked(0, 241).bottom(), 20 + 36 + 32) << "further lines go down from there";
}

TEST_F(Render, TagsChooseTheFaceAndAreNotDrawn) {
    const std::size_t plain = picture("H");
    EXPECT_EQ(picture("<b></b><i></i>H"), plain);
    EXPECT_EQ(picture("<b>H</b>"), plain) << "without a font of its own";
    options.fontBold = "/nowhere.ttf";
    EXPECT_EQ(picture("<b>HHH</b>H"), plain) << "a font that is not there draws nothing";
    EXPECT_EQ(picture("<b>HHH"), blank());
    EXPECT_EQ(picture("<b>H|H</b>"), blank()) << "a tag goes on to the next line";
    EXPECT_EQ(picture("<font color=\"#00ff00\"><u>H</u></font>{\\an8}{c:$0000ff}"), plain);
    for (const char* text : {"<H", "H>", "<font H", "{\\H", "{H}", "{1:H}", "<x>H"})
        EXPECT_NE(picture(text), plain) << text;
    options.fontItalic = qv_platform().fontFile(QvFontFace::sansItalic).c_str();
    EXPECT_NE(picture("<i>H</i>"), plain);
    QvSubtitle open, next;
    open.text = "<b>H";
    next.text = "H";
    QvSubtitleRender render;
    render.init(options);
    clear(640, 241);
    render.render(frame, open, nullptr);
    render.render(frame, next, nullptr);
    EXPECT_EQ(fingerprint(), plain) << "and ends with the subtitle";
}

TEST_F(Render, ColoursAreTheCallers) {
    const QvColor orange(255, 128, 0, false), yuv(255, 128, 0, true);
    draw("HHH", 1, {10, 10}, &orange);
    EXPECT_GT(count(0xFF8000), 100);
    EXPECT_EQ(count(0xFFFFFF), 0);
    clear(640, 241);
    draw("HHH", 1, {10, 10}, &yuv);
    EXPECT_GT(count(0xFFFFFF), 100);
}

TEST_F(Render, FieldMasksLeaveOutLines) {
    QvSubtitle subtitle;
    subtitle.text = "HHH";
    subtitle.position = QvPoint(10, 10);
    subtitle.fieldMasks = AnyVector(1, 2);
    QvSubtitleRender render;
    render.init(options);
    render.render(frame, subtitle, nullptr);
    bool even[3] = {}, odd[3] = {};
    const QvRect all = inked(0, 241);
    for (int y = all.top(); y < all.bottom(); ++y)
        for (int x = all.left(); x < all.right(); ++x) {
            const int letter = (x - all.left()) * 3 / all.width();
            if (pixel(x, y) != ground) (y % 2 == 0 ? even : odd)[letter] = true;
        }
    EXPECT_TRUE(!even[0] && odd[0]);
    EXPECT_TRUE(even[1] && !odd[1]);
    EXPECT_TRUE(even[2] && odd[2]) << "no mask for the third";
}

TEST_F(Render, EffectsGrowAroundTheLetters) {
    int covered[QvTextRenderingOptions::nrEffects];
    for (int effect = 0; effect < QvTextRenderingOptions::nrEffects; ++effect) {
        options.fontEffect = effect;
        clear(640, 241);
        draw("HiH", 1, {100, 20});
        covered[effect] = 640 * 241 - count(ground);
        EXPECT_GT(count(0xFFFFFF), 100) << "letters stay white";
        EXPECT_EQ(countIf([](unsigned c) { return c < ground; }) > 100, effect != 0) << effect;
        const QvRect box = inked(0, 241);
        static QvRect letters;
        if (effect == 0) letters = box;
        const int grown = effect == 0 ? 0 : 1, shadow = effect <= 1 ? 0 : effect == 3 ? 1 : 2;
        EXPECT_EQ(box, QvRect(letters.left() - grown, letters.top() - grown, letters.right() + grown + shadow,
                              letters.bottom() + grown + shadow))
            << effect;
    }
    EXPECT_LT(covered[0], covered[1]);
    EXPECT_LT(covered[1], covered[3]);
    EXPECT_LT(covered[3], covered[2]) << "a soft shadow ends further off";
}

TEST_F(Render, TheSameTextIsDrawnAnewWhereItDiffers) {
    QvSubtitleRender render;
    render.init(options);
    QvSubtitle subtitle;
    subtitle.text = "Still";
    const auto again = [&](const QvColor* color) {
        clear(frame.width(), frame.height());
        render.render(frame, subtitle, color);
        return fingerprint();
    };
    const QvColor red(0xFF0000);
    const std::size_t white = again(nullptr), first = again(&red);
    EXPECT_NE(white, first);
    EXPECT_EQ(again(nullptr), white);
    EXPECT_EQ(again(&red), first);
    subtitle.fieldMasks = AnyVector(Any(3));
    EXPECT_NE(again(&red), first);
    subtitle.fieldMasks.clear();
    for (int i = 0; i < 40; ++i) {
        subtitle.text = std::to_string(i).c_str();
        again(nullptr);
    }
    subtitle.text = "Still";
    EXPECT_EQ(again(nullptr), white);
    subtitle.position = QvPoint(630, 230);  // partly out of the picture
    const std::size_t cut = again(nullptr);
    subtitle.position = QvPoint(-1, -1);
    EXPECT_EQ(again(nullptr), white);
    subtitle.position = QvPoint(630, 230);
    EXPECT_EQ(again(nullptr), cut);
}

TEST_F(Render, TextBeyondThePictureIsCut) {
    const std::string wide(3000, 'W');
    const QvRect ink = (draw(wide.c_str()), inked(0, 241));
    EXPECT_LE(ink.left(), 2);
    EXPECT_GE(ink.right(), 638);
    std::string lines;
    for (int i = 0; i < 5000; ++i) lines += "|x";
    draw(lines.c_str(), 5001);
    draw(lines.c_str(), INT_MAX);
    draw(lines.c_str(), INT_MIN);
    for (const int size : {1, 2, 3, 33}) {
        clear(size, size);
        draw("Text|more", 2);
    }
    clear(200, 600);
    draw("H", 1, {20, 500});
    EXPECT_EQ(inked(0, 600).bottom(), 532) << "tall pictures have text on all their rows";
}

TEST_F(Render, AnySizeOfLettersIsSurvived) {
    LogCapture log;
    for (const int size : {INT_MIN, -1, 0, 1, 1000, 4097, INT_MAX}) {
        options.charSize = size;
        draw("H|\xC3\x89g");
    }
    EXPECT_EQ(log.count("Error setting char size to: 4097pt 72dpi (default)", QvLogMask::info), 3);
}

TEST_F(Render, EncodingsAreRead) {
    options.subEncoding = QvTextRenderingOptions::utf8;
    const std::size_t expected = picture("\xC3\x84|H", 2);
    options.subEncoding = QvTextRenderingOptions::ascii;
    EXPECT_EQ(picture("\xC3\x84|H", 2), expected);
    options.subEncoding = QvTextRenderingOptions::byCodePage;
    options.codePage = 1252;
    EXPECT_EQ(picture("\xC4|H", 2), expected);
    options.codePage = 0;
    EXPECT_EQ(picture("\xC4|H", 2), expected) << "each byte a code point";
    options.subEncoding = 5;
    EXPECT_EQ(picture("H"), blank());
    options.subEncoding = QvTextRenderingOptions::utf16;
    QvSubtitle subtitle;
    const Any bytes(static_cast<const void*>("\xC4\0|\0H\0"), 6);
    subtitle.text = bytes;
    subtitle.rows = 2;
    QvSubtitleRender render;
    render.init(options);
    clear(640, 241);
    render.render(frame, subtitle, nullptr);
    EXPECT_EQ(fingerprint(), expected);
    subtitle.text = u"\u00C4|H";
    clear(640, 241);
    render.render(frame, subtitle, nullptr);
    EXPECT_EQ(fingerprint(), expected) << "wide text needs no encoding";
}

// Rows of the first plane that differ between two pictures.
QvPoint changedRows(const QvFrame& a, const QvFrame& b) {
    QvPoint rows(INT_MAX, INT_MIN);
    for (int y = 0; y < a.height(); ++y)
        if (std::memcmp(a.plane() + y * a.stride(), b.plane() + y * b.stride(),
                        static_cast<std::size_t>(a.stride())) != 0)
            rows = QvPoint(std::min(rows.x(), y), y);
    return rows;
}

TEST_F(Render, EveryFormatHasTheTextInItsPlace) {
    init_wrapper(nullptr);
    draw("H", 1, {100, 20});
    const QvRect ink = inked(0, 241);
    QvSubtitle subtitle;
    subtitle.text = "H";
    subtitle.position = QvPoint(100, 20);
    QvSubtitleRender render;
    render.init(options);
    for (const unsigned fourcc :
         {QvFourcc::I420, QvFourcc::YUY2, QvFourcc::BGR3, QvFourcc::ARGB, QvFourcc::I420}) {
        QvFrame target;
        target.init(fourcc, 640, 242);
        target.setBlack();
        const QvFrame before(target);
        render.render(target, subtitle, nullptr);
        const QvPoint rows = changedRows(before, target);
        EXPECT_NEAR(rows.x(), ink.top(), 1) << target.str_four_cc();
        EXPECT_NEAR(rows.y(), ink.bottom() - 1, 1) << target.str_four_cc();
    }
    cleanup_wrapper();
}

// The letter's inside has exactly the colour that a whole picture of it would have.
TEST_F(Render, ColoursSuitThePicturesMatrix) {
    init_wrapper(nullptr);
    const QvColor orange(255, 128, 0, false);
    options.charSize = 200;
    QvSubtitle subtitle;
    subtitle.text = "H";
    subtitle.position = QvPoint(100, 20);
    QvSubtitleRender render;
    render.init(options);
    for (const int height : {480, 1080}) {
        clear(640, height);
        frame.setRGB(255, 128, 0);
        QvFrame whole, target;
        QvColorConverter(QvFourcc::I420, false, false).convert(frame, whole);
        target.init(QvFourcc::I420, 640, height);
        target.setBlack();
        render.render(target, subtitle, &orange);
        for (int plane = 0; plane < 3; ++plane) {
            int found = 0;
            for (int y = 0; y < target.height(plane); ++y)
                for (int x = 0; x < target.width(plane); ++x)
                    found += *target.pixelPtr(x, y, plane) == *whole.pixelPtr(0, 0, plane);
            EXPECT_GT(found, 500) << "plane " << plane << " of " << height;
        }
    }
    cleanup_wrapper();
}

TEST(RenderWithoutFonts, SaysSoAndDrawsNothing) {
    TempFolder folder;
    LogCapture log;
    QvTextRenderingOptions options;
    options.fontRegular = "/nowhere.ttf";
    options.fontBold = folder.write("bold.ttf", "this is no font").c_str();
    QvFrame frame = makePicture(QvFourcc::BGR4, 64, 64);
    const std::string before = pictureBytes(frame);
    QvSubtitle subtitle;
    subtitle.text = "a<b>b</b><i>c</i>";
    QvSubtitleRender render;
    EXPECT_EQ(render.render(frame, subtitle, nullptr), 0) << "before init";
    EXPECT_EQ(render.init(options), 0);
    EXPECT_EQ(render.render(frame, subtitle, nullptr), 0);
    EXPECT_TRUE(pictureBytes(frame) == before);
    EXPECT_EQ(log.count("Freetype library version ", QvLogMask::info), 1);
    EXPECT_EQ(log.count("Failed to load font file '/nowhere.ttf'", QvLogMask::info), 2);
    EXPECT_EQ(log.count("Unsupported font type", QvLogMask::info), 1);
    EXPECT_EQ(render.init(QvTextRenderingOptions()), 0) << "no font is named at all";
    EXPECT_EQ(render.render(frame, subtitle, nullptr), 0);
}

}  // namespace
