// What a person or a program sees while a job runs: one line on a terminal, JSON lines, or nothing.
#pragma once

#include <atomic>
#include <mutex>
#include <string>

struct ProgressState {
    double part = -1;       // 0 to 1; negative when unknown
    long long frame = 0;    // frames of the output written so far
    double outSeconds = 0;  // their time in the output
    int pass = 1, passes = 1;
    const char* state = "running";
};

enum class ProgressMode { automatic, json, off };

class Progress {
  public:
    // Automatic: a line when the standard error is a terminal, otherwise nothing. `label` stands in front.
    Progress(ProgressMode mode, std::string label);
    ~Progress();

    void start();
    // Cheap: shows something only when the last time is long enough ago.
    void update(const ProgressState& state);
    bool due() const;
    // Shows it at once.
    void show(const ProgressState& state) {
        if (json_ || line_) show("progress", state);
    }
    // Prints it once, whatever the mode: an object in JSON, otherwise a line that stays. From any thread.
    void report(const ProgressState& state);
    // Sends the last event; the line goes.
    void finish(const ProgressState& state);
    bool onTerminal() const { return line_; }
    bool isJson() const { return json_; }

  private:
    void show(const char* event, const ProgressState& state);
    void showLine(const ProgressState& state, double elapsed, double eta);
    std::string line(const ProgressState& state, double elapsed, double eta, bool color) const;
    void showJson(const char* event, const ProgressState& state, double elapsed, double eta);

    std::string label_;
    bool line_ = false, json_ = false, color_ = false;
    std::mutex lock_;  // of what is shown
    bool shown_ = false;
    double begin_ = 0, end_ = 0;   // seconds of the system's counter; 0 before
    std::atomic<double> last_{0};  // likewise
};
