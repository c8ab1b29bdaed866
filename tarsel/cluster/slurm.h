// Slurm, used by its programs sbatch, squeue, scancel and sacct.
#pragma once

#include "tarsel/cluster/scheduler.h"

class SlurmScheduler : public Scheduler {
  public:
    static constexpr size_t kMostElements = 1000;  // of an array: Slurm's default limit

    std::string indexWord() const override;
    std::string coresWord() const override;
    void checkOptions(const std::vector<std::string>& options) const override;
    std::string submit(const ClusterArray& array) const override;
    std::vector<ClusterElement> elements(const std::vector<std::string>& arrays) const override;
    std::map<std::pair<std::string, size_t>, std::string> ends(
        const std::vector<std::string>& arrays) const override;
    void cancel(const std::vector<std::string>& jobs) const override;
};
