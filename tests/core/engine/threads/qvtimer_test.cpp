#include "core/engine/threads/qvtimer.h"

#include <cmath>
#include <limits>

#include "tests/support/checks.h"

namespace {

std::string text(double seconds, unsigned format) {
    char buffer[QvTimer::strtimeSize + 1] = "unchanged";
    buffer[QvTimer::strtimeSize] = 'E';
    QvTimer::strtime(buffer, seconds, format);
    EXPECT_EQ(buffer[QvTimer::strtimeSize], 'E');
    return buffer;
}

TEST(Timer, FormatsSplitTheTimeIntoTheirFields) {
    const struct {
        double seconds;
        const char *sm, *msm, *hmsm;
    } cases[] = {
        {0, "0.000", "0:00.000", "0:00:00.000"},
        {3661.5, "3661.500", "61:01.500", "1:01:01.500"},
        {0.57, "0.570", "0:00.570", "0:00:00.570"},  // 0.57 * 1000 lies below 570
        {59.9996, "60.000", "1:00.000", "0:01:00.000"},
        {-1.5, "-1.500", "-0:01.500", "-0:00:01.500"},
        {1e300, "100000000000.000", "1666666666:40.000", "27777777:46:40.000"},
        {-std::numeric_limits<double>::infinity(), "-100000000000.000", "-1666666666:40.000",
         "-27777777:46:40.000"},
        {std::nan(""), "0.000", "0:00.000", "0:00:00.000"},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(text(c.seconds, 0x736D), c.sm);
        EXPECT_EQ(text(c.seconds, 0x6D736D), c.msm);
        EXPECT_EQ(text(c.seconds, 0x686D736D), c.hmsm);
    }
    EXPECT_EQ(text(1, 0x686D73), "unchanged");
}

}  // namespace
