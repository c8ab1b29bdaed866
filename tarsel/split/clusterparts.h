// Parts as elements of an array of a scheduler. What an element says and how it ended are files next to its
// task, so the folder of the tasks has to be one that the nodes share.
#pragma once

#include <atomic>
#include <set>
#include <string>
#include <vector>

#include "tarsel/cluster/scheduler.h"
#include "tarsel/host/childprocess.h"
#include "tarsel/split/partexecutor.h"
#include "tarsel/split/tasktalk.h"

class ClusterParts : public PartExecutor {
  public:
    struct How {
        std::vector<std::string> toolOptions;       // more words for each 'tarsel run'
        std::vector<std::string> schedulerOptions;  // as the user gave them
        int threads = 0;                            // of a part; 0 for the processors that its element got
        std::string output;                         // of the whole job, for messages
    };
    // The scheduler has to outlive it.
    ClusterParts(const Scheduler& scheduler, How how);
    // Takes back what has not ended.
    ~ClusterParts() override;
    ClusterParts(const ClusterParts&) = delete;
    ClusterParts& operator=(const ClusterParts&) = delete;

    // All parts are next to each other. Throws Failure if the scheduler refuses them.
    void begin(const std::vector<Part>& parts) override;
    bool wait() override;
    const std::vector<PartState>& states() const override { return states_; }
    void cancel() override;
    // Nothing: the element keeps its node.
    void pause(bool) override {}

  private:
    std::string script(const std::vector<Part>& parts) const;
    void listen(size_t part);
    void end(size_t part, int status);
    void look();
    void tellWhatHolds(const std::vector<ClusterElement>& living);
    void takeBack();
    bool finished() const;

    const Scheduler& scheduler_;
    const How how_;
    std::vector<Part> parts_;
    std::vector<PartState> states_;
    std::vector<TaskTalk> talks_;
    std::vector<long long> heard_;  // bytes of what each has said
    std::set<size_t> missed_;       // that the scheduler did not have when it was asked last, or before
    std::string name_, job_;        // of the array
    int untilLook_ = 0;             // ticks
    int silent_ = 0;                // times in a row that the scheduler did not answer
    int held_ = 0;                  // times in a row that all elements waited
    std::string reason_;            // for which they do, as it was told last
    bool failed_ = false, takenBack_ = false, gone_ = false;
    Bell bell_;
    std::atomic<bool> cancelled_{false};
};
