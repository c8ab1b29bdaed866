// What a person or a program sees while a job runs: one line on a terminal, a line now and then in a log,
// objects, or nothing.
#pragma once

#include <atomic>
#include <mutex>
#include <string>
#include <utility>

#include "tarsel/host/events.h"

struct ProgressState {
    double part = -1;       // 0 to 1; negative when unknown
    long long frame = 0;    // frames of the output written so far; negative where there are none
    double outSeconds = 0;  // their time in the output
    int pass = 1, passes = 1;
    const char* state = "running";
};

// --progress.
struct ProgressMode {
    enum class How { automatic, json, log, off };
    How how = How::automatic;
    std::string target;      // of json: see Events::open
    double logSeconds = 10;  // between two lines of a log
};
// "auto", "none", "json", "json:3", "json:FILE", "log", "log:SECONDS". Throws Failure (usage).
ProgressMode parseProgress(const std::string& text);

// The time for which a job has been running: not while it was paused or the process was stopped. From any
// thread.
class RunningTime {
  public:
    // `before`: seconds for which it has been running already.
    void start(double before = 0);
    // To be called while the job works; returns the seconds of the system's counter.
    double tick();
    void pause();
    void resume();
    // The process is about to be stopped; it was continued. Without a call of the first, it counts as stopped
    // since the last tick.
    void stopping();
    void continued();

    double seconds() const;

  private:
    mutable std::mutex lock_;
    std::atomic<double> tick_{0};
    double begin_ = 0, away_ = 0;
    double paused_ = -1, stopped_ = -1;  // since then; negative for not
    double longStep_ = 0,
           longStepEnd_ = -1;  // between two ticks, and when the second was; negative for never
};

// What '?' shows.
inline constexpr const char* kKeyHelp = "tarsel: keys: p pauses and resumes, q stops the job, ? shows this";

class Progress {
  public:
    // Automatic: a line if the standard error is a terminal, otherwise a log; with `quiet` only objects are
    // shown. `label` is in front of lines; `keys`: whether the keys of a terminal work.
    Progress(const ProgressMode& mode, bool quiet, std::string label, bool keys = true);
    ~Progress();

    void start() { start({0, 0, 0, 1, 1, "running"}); }
    // The same after a pass that has taken `before` seconds.
    void start(const ProgressState& first, double before = 0);
    // Cheap: shows something only if enough time has passed since the last time.
    void update(const ProgressState& state);
    bool due();
    // Shows it at once, except in a log.
    void show(const ProgressState& state);
    // Prints it once, whatever the mode: an object, otherwise a line that stays. From any thread.
    void report(const ProgressState& state);
    // A line that stays, above the one that changes. From any thread.
    void say(const std::string& line);
    // Removes the line that changes.
    void finish(const ProgressState& state);
    bool onTerminal() const { return line_; }
    // A new label. On the thread that updates.
    void setLabel(std::string label) { label_ = std::move(label); }
    RunningTime& time() { return time_; }

  private:
    void showLine(const ProgressState& state);
    std::string line(const ProgressState& state, bool color) const;
    JobFigures figures(const ProgressState& state) const;

    std::string label_;
    bool keys_ = true, line_ = false, json_ = false, log_ = false, color_ = false;
    double interval_ = 0;  // seconds
    std::mutex lock_;      // of what is shown
    bool shown_ = false;
    RunningTime time_;
    std::atomic<double> last_{0};  // seconds of the system's counter
};
