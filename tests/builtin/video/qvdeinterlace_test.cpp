#include "builtin/video/qvdeinterlace.h"

#include <gtest/gtest.h>

#include "core/engine/qvexception.h"
#include "tests/support/log_capture.h"

namespace {

// GRAY, row r filled with 10 * r + 1, top field first.
QvFrame ramp(int height) {
    QvFrame frame;
    frame.init(QvFourcc::GRAY, 8, height);
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < 8; ++x)
            frame.plane()[y * frame.stride() + x] = static_cast<unsigned char>(10 * y + 1);
    frame.framerate = QvFramerate::f50i();
    frame.frameNr = 7;
    frame.setTimestamp(99);
    return frame;
}

std::vector<int> rowsOf(const QvFrame& frame) {
    std::vector<int> rows;
    for (int y = 0; y < frame.height(); ++y) rows.push_back(frame.plane()[y * frame.stride()]);
    return rows;
}

}  // namespace

TEST(QvDeinterlace, EachMethodTakesItsRows) {
    const struct {
        Any method;
        const char* name;
        std::vector<int> rows;
        int scan;
    } cases[] = {
        {0, "", {1, 11, 21, 31, 41}, 1},
        {1, "top", {1, 21}, 0},
        {2, "bottom", {11, 31}, 0},
        {3, "reverse", {11, 1, 31, 21, 41}, 2},
        {4, "bob", {6, 26}, 0},
        {5, "", {1, 11, 21, 31, 41}, 1},
        {"top", "top", {1, 21}, 0},
        {"bob", "bob", {6, 26}, 0},
        {"weave", "", {1, 11, 21, 31, 41}, 1},
        {-1, "", {1, 11, 21, 31, 41}, 1},
        {"reverse", "reverse", {11, 1, 31, 21, 41}, 2},
    };
    for (const auto& row : cases) {
        QvDeinterlace filter;
        filter.init();
        EXPECT_EQ(filter.setParam("deinterlace", row.method), 0);
        EXPECT_EQ(filter.getParam("deinterlace"), Any(row.name));
        QvFrame in = ramp(5);
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
        QvFrame empty;
        EXPECT_EQ(filter.write(empty), -12);
        filter.close();
        EXPECT_FALSE(filter.frame()->inited());
    }
}

TEST(QvDeinterlace, StatesThatAreNoneChangeNothing) {
    QvDeinterlace filter, other;
    filter.init();
    other.init();
    filter.setParam("deinterlace", 4);
    filter.setParam("_position", 3);
    EXPECT_EQ(filter.setParam("deinterlace", AnyVector()), -5);
    AnyDict stored;
    filter.store(stored);
    EXPECT_EQ(other.restore(stored), 0);
    EXPECT_EQ(other.getParam("deinterlace"), Any("bob"));
    EXPECT_EQ(other.getParam("_position"), Any(3));
    AnyDict stranger = stored, shapeless = stored, wrong = stored;
    stranger.set("name", "flipper");
    shapeless.set("state", 5);
    wrong.set("state", AnyDict("deinterlace", AnyVector()));
    for (const AnyDict* state : {&stranger, &shapeless}) {
        LogCapture log;
        EXPECT_EQ(other.restore(*state), -1);
        EXPECT_TRUE(log.contains("[deinterlace] restore - invalid dict"));
    }
    EXPECT_EQ(other.restore(wrong), -5);
    EXPECT_EQ(other.getParam("deinterlace"), Any("bob"));
    EXPECT_THROW(filter.setParam("deinterlacer", 1), QvParamException);
}
