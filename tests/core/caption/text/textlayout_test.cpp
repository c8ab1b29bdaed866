#include "core/arch/platform.h"
#include "core/caption/text/textlayout_p.h"
#include "core/caption/text/textmask_p.h"
#include "core/media/qvframe.h"
#include "tests/support/checks.h"

namespace {

// A font with the scripts that the tests need; not every system has one.
std::string wideFont() {
    for (const char* name : {"/usr/share/fonts/truetype/dejavu/DejaVuSans.ttf",
                             "/usr/share/fonts/dejavu-sans-fonts/DejaVuSans.ttf"}) {
        QvFileStatus status;
        if (qv_platform().status(name, status)) return name;
    }
    return "";
}

struct Layout : testing::Test {
    void SetUp() override {
        if (wideFont().empty()) GTEST_SKIP() << "no font with Arabic and Hebrew";
        for (FontFace& face : faces) face.load(library, wideFont().c_str(), 40);
    }
    TextLine lay(std::u32string_view text) {
        FontStyle style = FontStyle::regular;
        return layOutLine(text, faces, style);
    }
    // The characters of the glyphs from left to right.
    std::vector<int> order(std::u32string_view text) {
        std::vector<int> characters;
        long long pen = 0;
        for (const PlacedGlyph& placed : lay(text).glyphs) {
            EXPECT_GE(placed.pen, pen);
            pen = placed.pen;
            characters.push_back(placed.character);
        }
        return characters;
    }

    FontLibrary library;
    FontFaces faces;
};

TEST_F(Layout, CharactersStandInTheirOrder) {
    const struct {
        const char* what;
        std::u32string_view text;
        std::vector<int> order;
    } rows[] = {
        {"left to right", U"abc", {0, 1, 2}},
        {"right to left", U"\u05D0\u05D1\u05D2", {2, 1, 0}},
        {"the first letter decides about the line", U"ab \u05D0\u05D1", {0, 1, 2, 4, 3}},
        {"and here, too", U"\u05D0 ab", {2, 3, 1, 0}},
        {"the last Arabic letter is the leftmost", U"\u0628\u0628\u0628", {2, 1, 0}},
        {"lam and alef are one", U"\u0644\u0627", {0}},
        {"marks that are not seen take no room", U"\uFEFFa\u200Bb\r\u200E", {1, 3}},
    };
    for (const auto& row : rows) EXPECT_EQ(order(row.text), row.order) << row.what;
    const auto glyphs = lay(U"\u05D0(\u05D1)").glyphs;
    ASSERT_EQ(glyphs.size(), 4u);
    EXPECT_EQ(glyphs[0].glyph, faces[0].indexOf(U'(')) << "brackets are mirrored";
}

// Letters that the face lacks come from a font that has them; a letter and its marks from one font.
TEST_F(Layout, LettersOfOtherFonts) {
    faces.fallBack(library, 40, 1);
    const struct {
        const char* what;
        std::u32string_view text;
    } rows[] = {{"Thai", U"a\u0E17\u0E35\u0E48"},
                {"Devanagari", U"a\u0915\u094D\u0924\u093F"},
                {"Han", U"a\u65E5\u672C"},
                {"Hangul", U"a\uD55C\uAE00"}};
    for (const auto& row : rows) {
        if (qv_platform().fontsWith(row.text.substr(1), QvFontFace::sans).size() != 1) continue;
        const auto glyphs = lay(row.text).glyphs;
        ASSERT_GE(glyphs.size(), 2u) << row.what;
        EXPECT_EQ(glyphs[0].face, &faces[0]) << row.what;
        for (std::size_t i = 1; i < glyphs.size(); ++i) {
            EXPECT_EQ(glyphs[i].face, glyphs[1].face) << row.what;
            EXPECT_NE(glyphs[i].face, &faces[0]) << row.what;
            EXPECT_NE(glyphs[i].glyph, 0u) << row.what;
        }
        EXPECT_EQ(faces.absent(), U"") << row.what;
    }
    // A letter for private use is in none; the others of its line are drawn all the same.
    EXPECT_EQ(lay(U"a\U0010FFFDb\U0010FFFD").glyphs.size(), 4u);
    EXPECT_EQ(faces.absent(), U"\U0010FFFD");
    EXPECT_EQ(lay(U"e\u0302\u0301").glyphs[0].face, &faces[0]) << "composed, the face has it";
}

TEST_F(Layout, WideLinesAreBrokenEvenly) {
    const auto widths = [&](std::u32string_view text, long long widest) {
        FontStyle style = FontStyle::regular;
        std::vector<long long> found;
        for (const TextLine& line : layOutLines(text, faces, style, widest)) {
            EXPECT_TRUE(line.width <= widest || widest == 1);
            found.push_back(line.width);
        }
        return found;
    };
    const long long word = lay(U"nnnn").width, space = lay(U" ").width;
    EXPECT_EQ(widths(U"nnnn nnnn nnnn nnnn", 4 * word + 3 * space).size(), 1u);
    EXPECT_EQ(widths(U"nnnn nnnn nnnn nnnn", 4 * word), (std::vector{2 * word + space, 2 * word + space}));
    EXPECT_EQ(widths(U"nnnn nnnn nnnn", 2 * word + space).size(), 2u);
    EXPECT_EQ(widths(U"nnnnnnnn", word), (std::vector{word, word})) << "a word without a place to break";
    EXPECT_EQ(widths(U"nnnn\u00A0nnnn nnnn", 2 * word + space)[0], 2 * word + space) << "a space that holds";
    EXPECT_EQ(widths(U"nn", 1).size(), 2u);
    EXPECT_EQ(widths(U"", 1).size(), 1u);
    EXPECT_EQ(widths(U"    ", 1).size(), 1u);
    // Each part of a line of Arabic is read from the right, also one that begins with Latin letters.
    FontStyle style = FontStyle::regular;
    const std::u32string_view arabic = U"\u0628\u0628\u0628\u0628\u0628\u0628\u0628\u0628 abc \u0628";
    const auto lines = layOutLines(arabic, faces, style, lay(arabic).width * 3 / 5);
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_EQ(lines[1].glyphs.front().character, 13);
    EXPECT_EQ(lines[1].glyphs.back().character, 11);
    EXPECT_EQ(style, FontStyle::regular);
    layOutLines(U"nnnn <i>nnnn nnnn", faces, style, word);
    EXPECT_EQ(style, FontStyle::italic);
}

TEST(TextMask, OutlinesOfOneDotAndOfMore) {
    const auto outlined = [](int radius) {
        QvFrame letters, mask;
        letters.init(QvFourcc::GRAY, 12, 10);
        letters.setBlack();
        *letters.pixelPtr(4, 4) = 0x81;
        *letters.pixelPtr(8, 4) = 0x42;
        *letters.pixelPtr(0, 9) = 0xFF;
        outlineMask(letters, mask, radius);
        std::string dots;
        for (int y = 0; y < 10; ++y)
            for (int x = 0; x < 12; ++x)
                if (const int value = *mask.pixelPtr(x, y))
                    dots += Any::sprintf("%d,%d:%02x ", x, y, value).asString();
        return dots;
    };
    EXPECT_EQ(outlined(1),
              "3,3:81 4,3:81 5,3:81 7,3:42 8,3:42 9,3:42 3,4:81 4,4:81 5,4:81 7,4:42 8,4:42 9,4:42 "
              "3,5:81 4,5:81 5,5:81 7,5:42 8,5:42 9,5:42 0,8:ff 1,8:ff 0,9:ff 1,9:ff ");
    EXPECT_EQ(outlined(2), "2,2:81 6,2:c3 4,4:81 8,4:42 2,6:81 6,6:c3 2,7:ff 0,9:ff ");
}

}  // namespace
