#include <cstdint>

#include "core/engine/qvutil.h"
#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/comma_locale.h"

namespace {

TEST(ParamTrace, EveryTypeHasItsForm) {
    const struct {
        Any value;
        const char* line;
    } cases[] = {
        {Any(), "v [Invalid]     = n/a"},
        {Any(1LL << 40), "v [Int64]       = 1099511627776"},
        {Any("text %s"), "v [String]      text %s"},
        {Any(u"wide \u00E9"), "v [WString]     wide \u00E9"},
        {Any(reinterpret_cast<const void*>(std::uintptr_t{0xAB12})), "v [Generic]     = 0x000000000000AB12"},
        {Any(MediaTime(1500LL, 1000)), "v [MediaTime]   = 1.500000s"},
    };
    LogCapture log;
    for (const auto& c : cases) {
        log.clear();
        QvUtil::debugOutAny("v", c.value, 0, 16);
        EXPECT_EQ(log.texts(), Texts{c.line});
        EXPECT_EQ(log.lines()[0].mask, QvLogMask::debug);
    }
}

TEST(ParamTrace, NumbersIgnoreTheLocale) {
    const CommaLocale locale;
    if (!locale.active()) GTEST_SKIP() << "no locale with a decimal comma can be made here";
    LogCapture log;
    QvUtil::debugOutAny("v", Any(1.5), 0, 0);
    qv_dbg()->info("%.2f", 0.25);
    EXPECT_EQ(log.texts(), (Texts{"v [Float] = 1.500000", "0.25"}));
}

}  // namespace
