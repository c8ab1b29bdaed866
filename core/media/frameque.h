// A pool of frames between a thread that fills them and one that empties them.
#pragma once

#include <list>
#include <mutex>

#include "core/arch/api.h"
#include "core/media/qvframe.h"

// Two sides, each first in first out. No operation locks by itself: callers bracket them with lock and
// unlock, and may work on a head while the lock is open, as nobody else takes it off that side.
class QV_API QvFrameQue {
  public:
    QvFrameQue() = default;
    QvFrameQue(const QvFrameQue&) = delete;
    QvFrameQue& operator=(const QvFrameQue&) = delete;

    int init(int count);  // appends new empty frames to the empty side. 0
    void destroy();       // deletes the frames of both sides

    QvFrame* emptyBuffer();  // the head of the empty side, which stays there; null if there is none
    QvFrame* fullBuffer();   // the same of the full side
    void moveToFull();       // the head of the empty side to the end of the full side; none: an assertion
    void moveToEmpty();      // the reverse

    int nrEmpty() const { return static_cast<int>(empty_.size()); }
    int nrFull() const { return static_cast<int>(full_.size()); }

    void lock() { mutex_.lock(); }
    void unlock() { mutex_.unlock(); }

  private:
    std::list<QvFrame> empty_;
    std::list<QvFrame> full_;
    std::mutex mutex_;
};
