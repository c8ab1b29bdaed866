#include "core/value/astring.h"

#include "tests/support/checks.h"

namespace {

TEST(AString, inlineTextIsCutPaddedAndIndependent) {
    AString<4> text("abcdefgh");
    EXPECT_STREQ(text.c_str(), "abcd");
    AString<4> copy(text);
    text = "x";
    EXPECT_STREQ(text.c_str() + 2, "");
    EXPECT_EQ(text.c_str()[3], 0);
    copy = copy.c_str() + 1;
    EXPECT_STREQ(copy.c_str(), "bcd");
    EXPECT_STREQ(AString<4>(nullptr).c_str(), "");
}

TEST(AString, textWithoutRoomOfItsOwnIsACopyOrAnAlias) {
    const char source[] = "abc";
    for (const int owned : {0, 1}) {
        char* text = nullptr;
        int flag = -1;
        AS_construct(source, owned, 0, nullptr, &text, &flag);
        EXPECT_EQ(flag, owned);
        EXPECT_EQ(text == source, !owned);
        AS_assign(nullptr, &text, flag, 0, text + 1);
        EXPECT_STREQ(text, "bc");
        AS_destroy(text, flag, 0);
    }
}

TEST(AString, comparesUnsignedBytes) {
    EXPECT_EQ(AS_compare("a", "a"), 0);
    EXPECT_EQ(AS_compare("a", "ab"), -1);
    EXPECT_EQ(AS_compare("\xC3", "z"), 1);
    EXPECT_TRUE(AString<8>("a") < AString<8>("b") && AString<8>("a") == "a");
}

}  // namespace
