#include "core/media/frameque.h"

#include <gtest/gtest.h>

#include <thread>

#include "core/engine/qvexception.h"

namespace {

TEST(QvFrameQue, FramesGoRoundInOrder) {
    QvFrameQue que;
    EXPECT_EQ(que.init(0), 0);
    EXPECT_EQ(que.init(-3), 0);
    EXPECT_EQ(que.emptyBuffer(), nullptr);
    EXPECT_EQ(que.fullBuffer(), nullptr);
    EXPECT_THROW(que.moveToFull(), QvAssertFailure);
    EXPECT_THROW(que.moveToEmpty(), QvAssertFailure);
    que.init(1);
    que.init(1);
    QvFrame* first = que.emptyBuffer();
    que.moveToFull();
    QvFrame* second = que.emptyBuffer();
    EXPECT_NE(first, second);
    EXPECT_EQ(que.fullBuffer(), first);
    que.moveToFull();
    EXPECT_EQ(que.fullBuffer(), first);
    que.moveToEmpty();
    EXPECT_EQ(que.emptyBuffer(), first);
    EXPECT_EQ(que.fullBuffer(), second);
    EXPECT_TRUE(que.nrEmpty() == 1 && que.nrFull() == 1);
    que.destroy();
    EXPECT_TRUE(que.nrEmpty() == 0 && que.nrFull() == 0);
}

TEST(QvFrameQue, HandsFramesBetweenThreads) {
    constexpr int count = 200;
    QvFrameQue que;
    que.init(3);
    const auto step = [&](auto side, auto work, auto move) {
        que.lock();
        QvFrame* frame = (que.*side)();
        que.unlock();
        if (!frame) {
            std::this_thread::yield();
            return false;
        }
        work(*frame);
        que.lock();
        (que.*move)();
        que.unlock();
        return true;
    };
    std::thread producer([&] {
        for (int i = 0; i < count;)
            i += step(
                &QvFrameQue::emptyBuffer, [i](QvFrame& frame) { frame.frameNr = i; },
                &QvFrameQue::moveToFull);
    });
    for (int i = 0; i < count;)
        i += step(
            &QvFrameQue::fullBuffer, [i](QvFrame& frame) { EXPECT_EQ(frame.frameNr, i); },
            &QvFrameQue::moveToEmpty);
    producer.join();
}

}  // namespace
