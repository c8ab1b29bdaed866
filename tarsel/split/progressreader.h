// Reads what a task in another process reports: the objects of --progress json (see
// docs/progress.schema.json).
#pragma once

#include <string>
#include <utility>
#include <vector>

class ProgressReader {
  public:
    // Takes the next piece of the text, which may end anywhere. A line that is no object comes from a process
    // that could not start; it becomes the failure.
    void add(const std::string& text);

    double done() const { return done_; }  // 0 to 1
    long long frames() const { return frames_; }
    double outSeconds() const { return outSeconds_; }
    double speed() const { return speed_; }  // negative if unknown
    // Those since the last call.
    std::vector<std::string> takeWarnings() { return std::exchange(warnings_, {}); }
    // Why it failed; "" if it has not, or gave no reason.
    const std::string& failure() const { return failure_; }
    const std::vector<std::string>& outputs() const { return outputs_; }

  private:
    void take(const std::string& line);

    std::string rest_;  // the beginning of a line
    double done_ = 0, outSeconds_ = 0, speed_ = -1;
    long long frames_ = 0;
    std::vector<std::string> warnings_, outputs_;
    std::string failure_;
};
