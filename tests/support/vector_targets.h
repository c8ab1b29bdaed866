// Runs kernels on one vector unit after the other.
#pragma once

#include <hwy/highway.h>

#include <vector>

// While it lives, kernels run on this unit alone. The machine is asked once what it has: that takes long.
class OnTarget {
  public:
    explicit OnTarget(int64_t target) { hwy::GetChosenTarget().Update(target); }
    ~OnTarget() {
        static const int64_t all = hwy::SupportedTargets();
        hwy::GetChosenTarget().Update(all);
    }
    OnTarget(const OnTarget&) = delete;
    OnTarget& operator=(const OnTarget&) = delete;
};

// The units that this machine has and the kernels are compiled for, plain loops among them.
inline std::vector<int64_t> machineTargets() {
    std::vector<int64_t> targets;
    for (const int64_t target : {HWY_STATIC_TARGET, HWY_SSE4, HWY_AVX2, HWY_AVX3})
        if (target == HWY_STATIC_TARGET || (hwy::SupportedTargets() & target)) targets.push_back(target);
    return targets;
}
