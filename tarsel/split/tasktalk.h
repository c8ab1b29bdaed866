// What a task that runs elsewhere says: the objects of --progress json (see docs/progress.schema.json).
#pragma once

#include <string>
#include <utility>
#include <vector>

class TaskTalk {
  public:
    // More of the text, cut anywhere. A line that is no object comes from a process that could not begin, and
    // is why it failed.
    void hear(const std::string& text);

    double part() const { return part_; }  // 0 to 1
    long long frames() const { return frames_; }
    double outSeconds() const { return outSeconds_; }
    double speed() const { return speed_; }  // negative if unknown
    // What came since the last call.
    std::vector<std::string> takeWarnings() { return std::exchange(warnings_, {}); }
    const std::string& failure() const { return failure_; }  // of its end; "" if it did not say
    const std::vector<std::string>& outputs() const { return outputs_; }

  private:
    void take(const std::string& line);

    std::string heard_;  // of a line that has not ended
    double part_ = 0, outSeconds_ = 0, speed_ = -1;
    long long frames_ = 0;
    std::vector<std::string> warnings_, outputs_;
    std::string failure_;
};
