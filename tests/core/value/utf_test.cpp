#include "core/value/utf.h"

#include "tests/support/checks.h"

namespace {

std::vector<unsigned short> units(const char16_t* text) {
    const std::u16string_view view(text);
    return {view.begin(), view.end()};
}

TEST(Utf, illFormedUtf8BecomesReplacementCharacters) {
    const struct {
        const char* bytes;
        const char16_t* units;
        bool valid = false;
    } cases[] = {
        {"", u"", true},
        {"az\x7F", u"az\x7F", true},
        {"\xC2\x80\xDF\xBF", u"\u0080\u07FF", true},
        {"\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80\xEF\xBF\xBF", u"\u0800\uD7FF\uE000\uFFFF", true},
        {"\xF0\x90\x80\x80\xF4\x8F\xBF\xBF", u"\U00010000\U0010FFFF", true},
        {"a\xC3", u"a\uFFFD"},
        {"\xE2\x82(", u"\uFFFD("},  // a truncated sequence counts once
        {"\xF0\x9F\x8E", u"\uFFFD"},
        {"\xC0\xAF", u"\uFFFD\uFFFD"},            // overlong
        {"\xE0\x80\xAF", u"\uFFFD\uFFFD\uFFFD"},  // overlong
        {"\xED\xA0\x80", u"\uFFFD\uFFFD\uFFFD"},  // a surrogate
        {"\xF4\x90\x80\x80", u"\uFFFD\uFFFD\uFFFD\uFFFD"},
        {"\xFE\xFF", u"\uFFFD\uFFFD"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(QvUtf::toUtf16(c.bytes), units(c.units)) << testing::PrintToString(c.bytes);
        EXPECT_EQ(QvUtf::isValid(c.bytes), c.valid) << testing::PrintToString(c.bytes);
        EXPECT_TRUE(!c.valid || QvUtf::toUtf8(units(c.units)) == c.bytes) << c.bytes;
    }
}

TEST(Utf, unpairedSurrogatesBecomeReplacementCharacters) {
    const unsigned short high = 0xD83C, low = 0xDFAC;
    const std::string bad = "\xEF\xBF\xBD";
    EXPECT_EQ(QvUtf::toUtf8(std::vector{high, low}), "\xF0\x9F\x8E\xAC");
    EXPECT_EQ(QvUtf::toUtf8(std::vector{low, high}), bad + bad);
    EXPECT_EQ(QvUtf::toUtf8(std::vector{high, high, low}), bad + "\xF0\x9F\x8E\xAC");
    EXPECT_EQ(QvUtf::toUtf8(std::vector{high}), bad);
}

TEST(Utf, everyScalarValueSurvivesTheRoundTrip) {
    for (char32_t c = 0; c <= 0x10FFFF; c += c < 0x3000 ? 1 : 37) {
        if (c >= 0xD800 && c < 0xE000) continue;
        std::string bytes;
        QvUtf::append(bytes, c);
        ASSERT_TRUE(QvUtf::isValid(bytes)) << static_cast<unsigned>(c);
        ASSERT_EQ(QvUtf::toUtf8(QvUtf::toUtf16(bytes)), bytes) << static_cast<unsigned>(c);
    }
    std::string bytes;
    QvUtf::append(bytes, 0xD800);
    QvUtf::append(bytes, 0x110000);
    EXPECT_EQ(bytes, "\xEF\xBF\xBD\xEF\xBF\xBD");
}

}  // namespace
