#include "builtin/video/frames/qvdeinterlace.h"

#include "tests/builtin/video/effect_frames.h"

namespace {

// I422 has a row of chroma for each of luma: each plane has five, filled with 10 * row + 1, top field first.
QvFrame ramp() {
    QvFrame frame;
    frame.init(QvFourcc::I422, 8, 5);
    for (int p = 0; p < 3; ++p)
        for (int y = 0; y < 5; ++y) std::memset(frame.plane(p) + frame.stride(p) * y, 10 * y + 1, 4);
    frame.framerate = QvFramerate::f50i();
    frame.frameNr = 7;
    frame.setTimestamp(99);
    return frame;
}

std::vector<int> rowsOf(const QvFrame& frame, int plane) {
    std::vector<int> rows;
    for (int y = 0; y < frame.height(); ++y) rows.push_back(*rowOf(frame, plane, y));
    return rows;
}

}  // namespace

TEST(QvDeinterlace, EachMethodTakesItsRows) {
    const struct {
        std::vector<Any> method;
        const char* name;
        std::vector<int> rows;
        int scan;
    } cases[] = {
        {{0, 5, -1, "weave"}, "", {1, 11, 21, 31, 41}, 1},
        {{1, "top"}, "top", {1, 21}, 0},
        {{2, "bottom"}, "bottom", {11, 31}, 0},
        {{3, "reverse"}, "reverse", {11, 1, 31, 21, 41}, 2},
        {{4, "bob"}, "bob", {6, 26}, 0},
    };
    QvDeinterlace filter;
    filter.init();
    QvFrame in = ramp(), empty;
    for (const auto& row : cases)
        for (const Any& method : row.method) {
            EXPECT_EQ(filter.setParam("deinterlace", method), 0);
            EXPECT_EQ(filter.getParam("deinterlace"), Any(row.name));
            EXPECT_EQ(filter.write(in), QvStatus::illegalState) << "before open";
            ASSERT_EQ(filter.open(), 0);
            ASSERT_EQ(filter.write(in), 0);
            ASSERT_EQ(filter.ready(), 1);
            const QvFrame& out = *filter.frame();
            for (int p = 0; p < 3; ++p) EXPECT_EQ(rowsOf(out, p), row.rows) << row.name << p;
            EXPECT_EQ(out.framerate.interlaced(), row.scan) << row.name;
            EXPECT_EQ(out.frameNr, 7);
            EXPECT_EQ(out.getTimestamp(), 99);
            filter.next();
            EXPECT_EQ(filter.ready(), 0);
            EXPECT_EQ(filter.write(empty), QvStatus::invalidArgument);
            filter.close();
        }
}
