#include "core/arch/qvexception.h"

#include "tests/support/checks.h"

namespace {

TEST(Exception, TextIsCutBetweenCharacters) {
    EXPECT_EQ(std::string(QvParamException(std::string(2000, 'x').c_str()).what()), std::string(1023, 'x'));
    // An e with acute takes two bytes: the 512th would end at 1,024.
    const std::string accented = repeated("\xC3\xA9", 600);
    EXPECT_EQ(std::string(QvException(accented.c_str()).what()), accented.substr(0, 1022));
}

}  // namespace
