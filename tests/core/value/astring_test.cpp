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

TEST(AString, heapCopyAndAlias) {
    char source[] = "source";
    AString<0> owned(source);
    AString<0> alias(source, false);
    const AString<0> ownedCopy(owned);
    source[0] = 'S';
    EXPECT_STREQ(owned.c_str(), "source");
    EXPECT_EQ(alias.c_str(), source);
    EXPECT_EQ(AString<0>(alias).c_str(), source);
    owned = owned.c_str() + 3;
    EXPECT_STREQ(owned.c_str(), "rce");
    EXPECT_STREQ(ownedCopy.c_str(), "source");
    alias = "other";
    EXPECT_STREQ(alias.c_str(), "other");
}

TEST(AString, buildingBlocksCheckTheirBuffer) {
    char buffer[5];
    char elsewhere[5] = "";
    char* pointer = nullptr;
    int flag = 0;
    EXPECT_EQ(failureOf([&] { AS_construct("x", 0, 4, nullptr, &pointer, &flag); }), "mbuf");
    AS_construct("abcde", 1, 4, buffer, &pointer, &flag);
    EXPECT_TRUE(pointer == buffer && flag == 0);
    pointer = elsewhere;
    EXPECT_EQ(failureOf([&] { AS_assign(buffer, &pointer, flag, 4, "x"); }), "*mptr == mbuf");
}

TEST(AString, comparesUnsignedBytes) {
    EXPECT_EQ(AS_compare("a", "a"), 0);
    EXPECT_EQ(AS_compare("a", "ab"), -1);
    EXPECT_EQ(AS_compare("\xC3", "z"), 1);
    EXPECT_TRUE(AString<8>("a") < AString<8>("b") && AString<8>("a") == "a");
}

}  // namespace
