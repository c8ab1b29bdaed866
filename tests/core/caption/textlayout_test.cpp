#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "core/arch/platform.h"
#include "core/caption/textlayout_p.h"
#include "core/value/any.h"

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

class Layout : public testing::Test {
  protected:
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

using Order = std::vector<int>;

TEST_F(Layout, RightToLeftTextStandsInItsOrder) {
    EXPECT_EQ(order(U"abc"), (Order{0, 1, 2}));
    EXPECT_EQ(order(U"\u05D0\u05D1\u05D2"), (Order{2, 1, 0}));
    EXPECT_EQ(order(U"\u05D0\u05D1 12"), (Order{3, 4, 2, 1, 0})) << "numbers keep their order";
    EXPECT_EQ(order(U"ab \u05D0\u05D1"), (Order{0, 1, 2, 4, 3})) << "the first letter decides about the line";
    EXPECT_EQ(order(U"\u05D0 ab"), (Order{2, 3, 1, 0}));
    EXPECT_EQ(order(U"\u05D0<i>\u05D1</i>\u05D2"), (Order{9, 4, 0})) << "across faces";
}

TEST_F(Layout, BracketsAreMirrored) {
    const auto glyphs = lay(U"\u05D0(\u05D1)").glyphs;
    ASSERT_EQ(glyphs.size(), 4u);
    EXPECT_EQ(glyphs[0].glyph, faces[0].indexOf(U'('));
    EXPECT_EQ(glyphs[2].glyph, faces[0].indexOf(U')'));
}

TEST_F(Layout, ArabicLettersTakeTheirForms) {
    const auto joined = lay(U"\u0628\u0628\u0628").glyphs;
    const auto alone = lay(U"\u0628").glyphs;
    ASSERT_EQ(joined.size(), 3u);
    ASSERT_EQ(alone.size(), 1u);
    EXPECT_EQ(joined[0].character, 2) << "the last letter is the leftmost";
    EXPECT_NE(joined[0].glyph, joined[1].glyph);
    EXPECT_NE(joined[1].glyph, joined[2].glyph);
    for (const PlacedGlyph& form : joined) EXPECT_NE(form.glyph, alone[0].glyph);
    EXPECT_EQ(lay(U"\u0644\u0627").glyphs.size(), 1u) << "lam and alef are one";
}

TEST_F(Layout, KerningOnlyDrawsTogether) {
    const unsigned a = faces[0].indexOf(U'A'), v = faces[0].indexOf(U'V');
    ASSERT_LT(faces[0].kerning(a, v), 0);
    const auto pair = lay(U"AV").glyphs;
    EXPECT_EQ(pair[1].pen - pair[0].pen, faces[0].glyph(a).advance + faces[0].kerning(a, v));
    EXPECT_EQ(lay(U"AV").width, faces[0].glyph(a).advance / 64 + faces[0].glyph(v).advance / 64);
    const auto apart = lay(U"A<i>V").glyphs;
    EXPECT_EQ(apart[1].pen - apart[0].pen, faces[0].glyph(a).advance) << "not between two faces";
    EXPECT_EQ(faces[0].kerning(0, v), 0) << "nor with a glyph that is unknown";
}

TEST_F(Layout, MarksThatAreNotSeenTakeNoRoom) { EXPECT_EQ(order(U"\uFEFFa\u200Bb\r\u200E"), (Order{1, 3})); }

TEST_F(Layout, GlyphsAreDrawnOnce) {
    const FontGlyph& first = faces[0].glyph(faces[0].indexOf(U'g'));
    EXPECT_FALSE(first.coverage.empty());
    EXPECT_EQ(&faces[0].glyph(faces[0].indexOf(U'g')), &first);
    EXPECT_TRUE(faces[0].glyph(UINT_MAX).coverage.empty());
}

}  // namespace
