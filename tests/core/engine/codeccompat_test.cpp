#include "core/engine/codeccompat.h"
#include "tests/support/checks.h"

namespace {

TEST(CodecCompatList, NamesAreAddedOnceAndOnlyToKnownCodecs) {
    CodecCompat list;
    EXPECT_THROW(list.add("rawvenc", "rawmux"), QvAssertFailure);
    EXPECT_THROW(list.removeName("rawvenc", "rawmux"), QvAssertFailure);
    list.addCodec("rawvenc");
    list.add("rawvenc", "rawmux");
    list.add("rawvenc", "rawmux");
    list.add("rawvenc", "rawavimux");
    list.addCodec("rawvenc");
    EXPECT_EQ(list.names("rawvenc").size(), 2);
    for (const char* name : {"absent", "rawmux"}) list.removeName("rawvenc", name);
    EXPECT_TRUE(list.isCompatible("rawvenc", "rawavimux") && !list.isCompatible("rawvenc", "rawmux"));
    EXPECT_FALSE(list.isCompatible("other", "rawmux") || list.isCompatible(nullptr, "rawmux"));
}

}  // namespace
