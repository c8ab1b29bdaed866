#include "core/media/bitrate.h"
#include "tests/support/checks.h"

namespace {

TEST(QvBitrate, ComparesWhatItsTypeUses) {
    using B = QvBitrate;
    const struct {
        QvBitrate a, b;
        bool equal;
    } cases[] = {
        {B(B::cbr, 5, 1, 1, 1), B(B::cbr, 5, 2, 2, 2), true},
        {B(B::cbr, 5), B(B::cbr, 6), false},
        {B(B::vbr, 5, 1, 2, 3), B(B::vbr, 6, 1, 2, 3), true},  // targets are not compared
        {B(B::vbr, 5, 1, 2, 3), B(B::vbr, 5, 1, 2, 4), false},
        {B(B::vbr, 5, 1, 2, 3), B(B::vbr, 5, 1, 9, 3), false},
        {B(B::vbr, 5, 1, 2, 3), B(B::vbr, 5, 9, 2, 3), false},
        {B(B::cqt, 5, 1, 2, 3), B(B::cqt, 6, 7, 8, 3), true},
        {B(B::cqtStrict, 0, 0, 0, 3), B(B::cqtStrict, 0, 0, 0, 4), false},
        {B(77, 5, 1, 2, 3), B(77, 6, 1, 2, 4), false},
        {B(B::cqt, 0, 0, 0, 3), B(B::cqtStrict, 0, 0, 0, 3), false},
    };
    for (const auto& c : cases) EXPECT_EQ(c.a == c.b, c.equal);
}

TEST(QvBitrate, DescribesItself) {
    const struct {
        QvBitrate rate;
        const char* text;
    } cases[] = {
        {QvBitrate(0, 4999), "CBR, 4kbps"},
        {QvBitrate(1, 4000000, 0, 8000000, 255), "VBR, 4000kbps (max N/A)"},
        {QvBitrate(1, 4000000, 0, 8000000), "VBR, 4000kbps (max 8000kbps)"},
        {QvBitrate(2), "CQT"},
        {QvBitrate(3), "CQT Strict"},
        {QvBitrate(4), "Constant Quality"},
        {QvBitrate(5), "Beats me"},
    };
    for (const auto& c : cases) EXPECT_STREQ(c.rate.desc().asString(), c.text);
}

}  // namespace
