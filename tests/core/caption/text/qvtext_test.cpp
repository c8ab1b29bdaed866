#include "core/caption/text/qvtext.h"

#include "tests/support/checks.h"

namespace {

using namespace std::string_literals;

TEST(Text, EveryEncodingBecomesCodePoints) {
    const struct {
        const char* what;
        std::string bytes;
        int encoding;
        std::u32string expected;
    } cases[] = {
        {"bytes stand for themselves", "a\xE9\xFF", 0, U"a\u00E9\u00FF"},
        {"UTF-8", "a\xC3\xA9\xF0\x9F\x98\x80", 1, U"a\u00E9\U0001F600"},
        {"UTF-16 with a pair", "a\0\x3D\xD8\0\xDE"s, 2, U"a\U0001F600"},
        {"UTF-16, half a pair at the end", "a\0\x3D\xD8"s, 2, U"a\uFFFD"},
        {"UTF-16 ends at a zero unit", "a\0\0\0b\0"s, 2, U"a"},
        {"UTF-32", "a\0\0\0\0\xF6\x01\0"s, 3, U"a\U0001F600"},
        {"code page", "\xC7\xE1", 1256, U"\u0627\u0644"},
        {"lead bytes of a code page", "\x83\x7C|", 932, U"\u30DD|"},
        {"unknown code page", "a\xC7", 99999, U"a\uFFFD"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(QvText::toUtf32(c.bytes, c.encoding), c.expected) << c.what;
        std::vector<unsigned> out(c.bytes.size() + 1, 77);
        const std::string terminated = c.bytes + "\0\0\0\0"s;
        // The forms without a length cannot know of a cut unit.
        if (c.bytes.size() % (c.encoding == 2 ? 2 : c.encoding == 3 ? 4 : 1) != 0) continue;
        const int count = QvText::encodingToUtf32(terminated.c_str(), c.encoding, out.data());
        EXPECT_EQ(std::u32string(out.begin(), out.begin() + count), c.expected) << c.what;
        EXPECT_EQ(out[static_cast<std::size_t>(count)], 0u) << c.what;
    }
}

TEST(Text, BuffersAndWideStringsGoThereAndBack) {
    const std::string text = "a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80";
    unsigned wide[16];
    char narrow[64];
    EXPECT_EQ(QvText::utf8ToUtf32(text.c_str(), wide), 4);
    EXPECT_EQ(QvText::utf32ToUtf8(wide, narrow), 10);
    EXPECT_EQ(narrow, text);
    const unsigned bad[] = {0x110000, 0xD800, 0};
    QvText::utf32ToUtf8(bad, narrow);
    EXPECT_STREQ(narrow, "\xEF\xBF\xBD\xEF\xBF\xBD");
    Any wideText, narrowText;
    EXPECT_EQ(QvText::utf8ToWchar(text.c_str(), wideText), 0);
    EXPECT_EQ(QvText::wcharToUtf8(wideText, narrowText), 0);
    EXPECT_EQ(narrowText, text.c_str());
}

}  // namespace
