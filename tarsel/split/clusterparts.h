// Runs parts as the elements of a job array of a cluster's scheduler. An element writes its progress and its
// exit status to files next to its task, so the folder of the tasks has to be shared with the nodes.
#pragma once

#include <atomic>
#include <set>
#include <string>
#include <vector>

#include "tarsel/cluster/scheduler.h"
#include "tarsel/host/childprocess.h"
#include "tarsel/split/partexecutor.h"
#include "tarsel/split/progressreader.h"

class ClusterParts : public PartExecutor {
  public:
    struct How {
        std::vector<std::string> toolOptions;       // further options of each 'tarsel run'
        std::vector<std::string> schedulerOptions;  // as the user gave them
        int threads = 0;                            // of a part; 0: as many as its element has processors
        std::string output;                         // of the whole job, for messages
    };
    // The scheduler has to outlive it.
    ClusterParts(const Scheduler& scheduler, How how);
    // Cancels what has not ended.
    ~ClusterParts() override;
    ClusterParts(const ClusterParts&) = delete;
    ClusterParts& operator=(const ClusterParts&) = delete;

    // The parts' files have to be in one folder. Throws Failure if the scheduler refuses the array.
    void begin(const std::vector<Part>& parts) override;
    bool wait() override;
    const std::vector<PartState>& states() const override { return states_; }
    void cancel() override;
    // Does nothing: a paused element would block its node.
    void pause(bool) override {}

  private:
    std::string script(const std::vector<Part>& parts) const;
    void readProgress(size_t part);
    void end(size_t part, int status);
    void queryScheduler();
    void showPending(const std::vector<ClusterElement>& active);
    void cancelJob();
    void sendCancel();
    bool finished() const;

    const Scheduler& scheduler_;
    const How how_;
    std::vector<Part> parts_;
    std::vector<PartState> states_;
    std::vector<ProgressReader> progress_;
    std::vector<long long> readBytes_;  // of each part: bytes of its progress file that were read
    std::set<size_t> absent_;           // parts that the scheduler's last answer did not list
    std::string name_, job_;            // of the array
    int untilQuery_ = 0;                // ticks
    int unanswered_ = 0;                // queries in a row without an answer
    int allPending_ = 0;                // answers in a row with pending elements only
    std::string shownReason_;           // for that, as it was shown last
    bool failed_ = false, cancelSent_ = false, givenUp_ = false;
    Bell bell_;
    std::atomic<bool> cancelled_{false};
};
