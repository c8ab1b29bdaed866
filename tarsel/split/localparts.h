// Runs parts as processes of this machine, a limited number at a time.
#pragma once

#include <atomic>
#include <memory>
#include <mutex>

#include "tarsel/split/childtask.h"
#include "tarsel/split/partexecutor.h"

class LocalParts : public PartExecutor {
  public:
    // `options`: more words for each 'tarsel run'. `output`: of the whole job, for messages.
    LocalParts(int atOnce, std::vector<std::string> options, std::string output);

    void begin(const std::vector<Part>& parts) override;
    bool wait() override;
    const std::vector<PartState>& states() const override { return states_; }
    void cancel() override;
    void pause(bool paused) override;

  private:
    void startParts();
    void readProgress(size_t part);
    void end(size_t part);
    void stopAll();

    const int atOnce_;
    const std::vector<std::string> options_;
    const std::string output_;
    std::vector<Part> parts_;
    std::vector<PartState> states_;
    std::vector<std::unique_ptr<ChildTask>> children_;
    size_t next_ = 0;  // part that starts next
    bool failed_ = false;
    Bell bell_;
    std::mutex lock_;  // protects children_: cancel and pause come from other threads
    std::atomic<bool> cancelled_{false}, paused_{false};
};
