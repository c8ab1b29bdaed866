#include "core/media/frameque.h"
#include "tests/support/checks.h"

namespace {

TEST(QvFrameQue, FramesGoRoundInOrder) {
    QvFrameQue que;
    EXPECT_TRUE(que.init(0) == 0 && que.init(-3) == 0 && !que.emptyBuffer() && !que.fullBuffer());
    EXPECT_THROW(que.moveToFull(), QvAssertFailure);
    EXPECT_THROW(que.moveToEmpty(), QvAssertFailure);
    que.init(1);
    que.init(1);
    QvFrame* const first = que.emptyBuffer();
    que.moveToFull();
    QvFrame* const second = que.emptyBuffer();
    EXPECT_TRUE(first != second && que.fullBuffer() == first);
    que.moveToFull();
    EXPECT_EQ(que.fullBuffer(), first);
    que.moveToEmpty();
    EXPECT_TRUE(que.emptyBuffer() == first && que.fullBuffer() == second);
    EXPECT_TRUE(que.nrEmpty() == 1 && que.nrFull() == 1);
    que.destroy();
    EXPECT_TRUE(que.nrEmpty() == 0 && que.nrFull() == 0);
}

}  // namespace
