#include "core/engine/qvexception.h"

#include "core/value/qvassert.h"
#include "tests/support/checks.h"

namespace {

TEST(Exception, NullTextGivesTheDefaultOfEachClass) {
    EXPECT_STREQ(QvException(nullptr).what(), "Tarsel exception");
    EXPECT_STREQ(QvParamException(nullptr).what(), "unknown parameter");
    EXPECT_STREQ(QvAssertFailure(nullptr).what(), "assertion failure");
    EXPECT_STREQ(QvFileException(nullptr).what(), "file access error");
}

TEST(Exception, TextIsCutBetweenCharacters) {
    EXPECT_EQ(std::string(QvParamException(std::string(2000, 'x').c_str()).what()), std::string(1023, 'x'));
    // An e with acute takes two bytes: the 512th would end at 1,024.
    const std::string accented = repeated("\xC3\xA9", 600);
    EXPECT_EQ(std::string(QvException(accented.c_str()).what()), accented.substr(0, 1022));
}

TEST(Exception, CopiesOwnTheirText) {
    QvException copy(nullptr);
    copy = QvAssertFailure("gone");
    const QvException second(copy);
    copy = copy;
    EXPECT_STREQ(copy.what(), "gone");
    copy = QvException(nullptr);
    EXPECT_STREQ(copy.what(), "Tarsel exception");
    EXPECT_STREQ(static_cast<const char*>(second), "gone");
}

template <class Act>
std::string assertionText(Act act) {
    try {
        act();
    } catch (const QvException& failure) {
        return failure.what();
    }
    return "";
}

TEST(Assertion, ThrowsAndLogsPlaceAndMessage) {
    LogCapture log;
    EXPECT_EQ(assertionText([] { qvAssertFail("x(1)", nullptr); }), "*** Assertion failed at x(1)");
    EXPECT_EQ(assertionText([] { qvAssertFail("x(1)", "m"); }), "*** Assertion failed at x(1): \nm");
    EXPECT_EQ(log.count("*** Assertion failed at x(1)", QvLogMask::error), 2);
}

TEST(Assertion, PlaceIsFloorUnitAndLine) {
    const struct {
        const char* file;
        const char* place;
    } cases[] = {
        {"core/value/any.cpp", "core/any(7)"},
        {"/home/core/project/core/value/any.cpp", "core/any(7)"},
        {"/src/builtin/decoders/wavdec.cpp", "builtin/wavdec(7)"},
        {"../core/arch/posix/files.cpp", "core/files(7)"},
        {"wave.cpp", "wave(7)"},
    };
    for (const auto& c : cases)
        EXPECT_EQ(assertionText([&] { qvAssertFailAt(c.file, 7, nullptr); }),
                  std::string("*** Assertion failed at ") + c.place);
}

TEST(Assertion, MacrosThrowOnlyWhenBroken) {
    EXPECT_NO_THROW(QV_ASSERT(1 + 1 == 2));
    EXPECT_THROW(QV_ASSERT(1 + 1 == 3), QvAssertFailure);
    EXPECT_NE(assertionText([] { QV_ASSERT_MSG(false, "why"); }).find("qvexception_test("),
              std::string::npos);
}

}  // namespace
