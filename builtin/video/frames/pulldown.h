// 3:2 pulldown: four progressive frames become five interlaced ones, top field first.
//
//     input    A    B    C         D
//     output   A   A/B  B/C      C    D      X/Y: top field of X, bottom field of Y
//
// A stream begins in phase 2, so its first frame leaves whole. Each write makes one or two frames, which are
// fetched before the next write.
#pragma once

#include <memory>

#include "core/media/qvframe.h"

class Pulldown {
  public:
    explicit Pulldown(const QvFramerate& outRate);

    void start(long long outputNumber) { nextNumber_ = outputNumber; }
    // A status; frames that nobody fetched are gone.
    int write(const QvFrame& frame);
    int ready() const { return (firstFull() ? 1 : 0) + (secondFull() ? 1 : 0); }
    QvFrame* frame();  // null if none is ready
    void next();

  private:
    bool firstFull() const { return first_->frameNr != -1; }
    bool secondFull() const { return second_.frameNr != -1; }
    int writePhase(const QvFrame& frame);
    int mix(const QvFrame& frame);
    void number(QvFrame& slot, long long number) const;

    QvFramerate outRate_;
    std::unique_ptr<QvFrame> first_, field_;  // they change places: a mixed frame begins as a field
    QvFrame second_;
    long long nextNumber_ = 0;
    int phase_ = 1;
};
