// One run of a transcoder: opening, the main loop, and closing.
#pragma once

#include <vector>

#include "core/measure/qvgeometry.h"
#include "core/transcode/run/qvtranscoder_p.h"

class TransLink;

// How often cbProgress comes and what it tells.
class QvProgressReport {
  public:
    // `settings`: the transcoder's "progress" dictionary. `total`: frames of the run, 0 when unknown.
    // `rate`: frames a second, for settings in seconds.
    QvProgressReport(const AnyDict& settings, int total, double rate);

    // Called once a round. True when a report is due; `part` (0 to 1) is then what to report.
    bool due(double now, double& part);
    // The share of this pass in the whole: part * scale + offset.
    void setPass(double offset, double scale) { offset_ = offset, scale_ = scale; }
    int round() const { return counter_; }

    static constexpr int byTime = -1;

  private:
    double partDone() const;

    int step_ = 0;  // rounds between reports, or byTime
    int total_ = 0;
    int counter_ = 0;  // rounds so far
    int lastReported_ = -1;
    double interval_ = 0;  // seconds, when by time
    double lastTime_ = 0;
    double offset_ = 0, scale_ = 1;
};

class QvTranscodeRun {
  public:
    QvTranscodeRun(QvTranscoder& transcoder, QvTranscoder::Private& state)
        : t_(transcoder), p_(state), number_(state.runNumber) {}

    // Checks the task, opens the links, seeks the inputs and opens the output. 0, -16, or a failure after
    // which nothing is left open.
    int open();
    // The run itself, from the first step to cbDone. The error, or 0.
    int start();
    // Leaves everything closed after an open without a start.
    void giveUp();
    // The first pass of a two-pass run: fills the statistics of each encoder that wants them.
    int analyze();

    static int totalFrames(const QvTask& task, double& rate);
    // Closes all of them, also when one throws; their results joined by bits.
    static int closeLinks(const QvTask& task);

  private:
    int breakOff();
    // open
    void collectParams();
    int checkTask(int& warning);
    int openLinks();
    int seekInputs();
    void setMuxerLength();
    void copyMeta();
    int openEncoder();
    void copyPipeError(int code);
    void logSettings() const;
    void beginLogFile();
    // start
    int work();
    int runPasses();
    int mainLoop();
    int closeOutput(int result);
    int finish(int result);
    int postprocess(const Any& command);
    template <class Work>
    int guarded(Work work);
    // analyze
    struct FirstPass;
    int makeFirstPass(const TPtrList<TransLink>& wanted, FirstPass& pass);
    int runFirstPass(FirstPass& pass);
    int endFirstPass(const FirstPass& pass);
    // main loop
    void videoTurn();
    void audioTurn();
    int audioDue(const TransLink& audio) const;
    void link(TransLink& link, int n);
    void waitWhilePaused();
    void report(QvProgressReport& progress);
    void callProgress(double part);
    void callProcess();
    int checkDisc();
    void logTurn();
    void forgetStatistics();
    void stopLoop() { p_.stopRequested = true; }
    bool stopping() const { return p_.stopRequested.load(std::memory_order_relaxed); }

    QvTranscoder& t_;
    QvTranscoder::Private& p_;
    int number_;  // of the run: a callback can have started the next one before this one has ended

    std::vector<TransLink*> video_, audio_;
    QvFramerate rate_;          // at which audio is measured against the frames written
    long long framesDone_ = 0;  // by the video link that was worked on last
    int rounds_ = 0;
    int result_ = 0;  // of the last step
    bool endOfVideo_ = false;
    bool allDone_ = false;
    double lastTurn_ = 0;
};
