#include "builtin/video/qvdeinterlace.h"

#include "tests/builtin/video/effect_frames.h"

namespace {

// GRAY, five rows filled with 10 * row + 1, top field first.
QvFrame ramp() {
    QvFrame frame;
    frame.init(QvFourcc::GRAY, 8, 5);
    for (int y = 0; y < 5; ++y) std::fill_n(frame.pixelPtr(0, y), 8, static_cast<unsigned char>(10 * y + 1));
    frame.framerate = QvFramerate::f50i();
    frame.frameNr = 7;
    frame.setTimestamp(99);
    return frame;
}

std::vector<int> rowsOf(const QvFrame& frame) {
    std::vector<int> rows;
    for (int y = 0; y < frame.height(); ++y) rows.push_back(*frame.pixelPtr(0, y));
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
            EXPECT_EQ(filter.write(in), -18) << "before open";
            ASSERT_EQ(filter.open(), 0);
            ASSERT_EQ(filter.write(in), 0);
            ASSERT_EQ(filter.ready(), 1);
            const QvFrame& out = *filter.frame();
            EXPECT_EQ(rowsOf(out), row.rows) << row.name;
            EXPECT_EQ(out.framerate.interlaced(), row.scan) << row.name;
            EXPECT_EQ(out.frameNr, 7);
            EXPECT_EQ(out.getTimestamp(), 99);
            filter.next();
            EXPECT_EQ(filter.ready(), 0);
            EXPECT_EQ(filter.write(empty), -12);
            filter.close();
            EXPECT_FALSE(filter.frame()->inited());
        }
}

// I422 has a row of chroma for each of luma: all of them are moved like rows of luma.
TEST(QvDeinterlace, ChromaWithAllRows) {
    for (const char* method : {"", "top", "bottom", "reverse", "bob"})
        for (const int height : {8, 7}) {
            QvFrame in = makePicture(QvFourcc::I422, 16, height);
            OpenedEffect<QvDeinterlace> filter({{"deinterlace", method}});
            const QvFrame& out = filter.through(in);
            for (int p = 1; p < 3; ++p) {
                QvFrame plane, expected;
                plane.init(QvFourcc::GRAY, 8, height);
                for (int y = 0; y < height; ++y)
                    std::memcpy(plane.plane() + plane.stride() * y, rowOf(in, p, y), 8);
                const std::string name = method;
                const int done = name == "top"       ? expected.copyDeinterlaced(plane, true)
                                 : name == "bottom"  ? expected.copyDeinterlaced(plane, false)
                                 : name == "reverse" ? expected.copySwitched(plane)
                                 : name == "bob"     ? expected.copyBob(plane)
                                                     : expected.copy(plane);
                ASSERT_EQ(done, 0);
                for (int y = 0; y < out.height(); ++y)
                    EXPECT_EQ(std::memcmp(rowOf(out, p, y), rowOf(expected, 0, y), 8), 0) << name << p << y;
            }
        }
}
