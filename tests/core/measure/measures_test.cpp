// The small measures: clock times, dates, rectangles and rates of bits.
#include "core/measure/bitrate.h"
#include "core/measure/clocktime_p.h"
#include "core/measure/datetime.h"
#include "core/measure/measuretext_p.h"
#include "core/measure/qvframerate.h"
#include "core/measure/rect.h"
#include "tests/support/checks.h"

namespace {

TEST(Measures, ClockTimesAndFrames) {
    int h = 0, m = 0, s = 0, ms = 0;
    qvClockTimeMs(((25 * 60 + 59) * 60 + 58) * 1000LL + 999, h, m, s, ms);
    EXPECT_EQ(std::tie(h, m, s, ms), std::make_tuple(25, 59, 58, 999));
    qvClockTime(-1e300, h, m, s);
    EXPECT_EQ(h, -277'777'777);
    EXPECT_EQ(qvFrameAtPts(27'000'000LL * 3600, 30000.0 / 1001), 107892);
    EXPECT_EQ(qvFrameAtPts(27'000'000LL * 3600 - 1, 25), 89999);
}

TEST(Measures, DatesPackWithoutALoss) {
    const QvDateTime all(QvDate(31, 12, 2047), QvTime(23, 59, 58, 997, 996));
    QvDateTime back;
    back.fromI64(all.toI64());
    EXPECT_EQ(back, all);
    // Later in any part is a larger number.
    for (const auto& earlier :
         {QvDateTime(QvDate(30, 12, 2047), all.time), QvDateTime(QvDate(31, 11, 2047), all.time),
          QvDateTime(all.date, QvTime(22, 59, 58, 997, 996)),
          QvDateTime(all.date, QvTime(23, 58, 58, 997, 996)),
          QvDateTime(all.date, QvTime(23, 59, 57, 997, 996))})
        EXPECT_LT(earlier.toI64(), all.toI64());
}

TEST(Measures, ARectangleContainsWhatSticksOutNowhere) {
    const QvRect outer(1, 2, 11, 12);
    EXPECT_TRUE(outer.contains(outer) && outer.contains({5, 5, 6, 6}));
    for (const QvRect& out : {QvRect(0, 2, 11, 12), {1, 1, 11, 12}, {1, 2, 12, 12}, {1, 2, 11, 13}})
        EXPECT_FALSE(outer.contains(out)) << out.left() << " " << out.top();
}

TEST(Measures, BitratesCompareByWhatTheirKindUses) {
    const struct {
        QvBitrate rate;
        const char* text;
        QvBitrate same, other;
    } rows[] = {
        {QvBitrate(QvBitrate::cbr, 4000000), "CBR, 4000kbps", QvBitrate(QvBitrate::cbr, 4000000, 1, 2, 3),
         QvBitrate(QvBitrate::cbr, 4001000)},
        {QvBitrate(QvBitrate::vbr, 3500000, 0, 8000000), "VBR, 3500kbps (max 8000kbps)",
         QvBitrate(QvBitrate::vbr, 1, 0, 8000000), QvBitrate(QvBitrate::vbr, 3500000, 0, 9000000)},
        {QvBitrate(QvBitrate::cqt, 0, 0, 0, 5), "CQT", QvBitrate(QvBitrate::cqt, 9, 9, 9, 5),
         QvBitrate(QvBitrate::cqt, 0, 0, 0, 6)},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(qvBitrateText(row.rate), row.text);
        EXPECT_TRUE(row.rate == row.same && !(row.rate == row.other)) << row.text;
    }
}

}  // namespace
