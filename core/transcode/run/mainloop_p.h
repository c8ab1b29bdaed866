// The main loop of a run: one frame of every video link a turn, then exactly the samples that belong to the
// frames written so far.
#pragma once

#include <vector>

#include "core/measure/qvgeometry.h"
#include "core/transcode/run/runcontext_p.h"
#include "core/transcode/run/runcontrol_p.h"

class QvProgressReport;
class TransLink;

class MainLoop {
  public:
    // `logProgress`: a line in the log at each turn. `checkDiscSpace`: a full disc ends the run.
    MainLoop(const RunContext& run, bool logProgress, bool checkDiscSpace)
        : run_(run), logProgress_(logProgress), checkDiscSpace_(checkDiscSpace) {}

    // The status of the last step.
    int run();
    // The last video step found the end of its input.
    bool endOfVideo() const { return endOfVideo_; }

  private:
    void videoTurn();
    void audioTurn();
    int audioDue(const TransLink& audio) const;
    void link(TransLink& link, int n);
    void report(QvProgressReport& progress);
    int checkDisc();
    void logTurn();
    bool stopping() const { return run_.control.stopping(); }

    const RunContext& run_;
    const bool logProgress_;
    const bool checkDiscSpace_;
    std::vector<TransLink*> video_, audio_;
    QvFramerate rate_;          // at which audio is measured against the frames written
    long long framesDone_ = 0;  // by the video link that was worked on last
    int rounds_ = 0;
    int result_ = 0;  // of the last step
    bool endOfVideo_ = false;
    bool allDone_ = false;
    double lastTurn_ = 0;  // QvTimer::time
};
