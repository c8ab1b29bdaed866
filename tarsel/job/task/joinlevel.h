// The level of the sounds of a join, which is that of all segments together.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "tarsel/job/task/join.h"
#include "tarsel/sound/soundeffects.h"

class JoinLevel {
  public:
    // `name`: for messages. Throws Failure for a sound whose level can't be changed.
    JoinLevel(const Join& join, const SoundTarget& target, std::string name);

    // Reads each sound once and returns the gains that bring them to the target, in dB and by their numbers.
    // `goesOn` is called now and then with the share that is done, from 0 to 1; if it returns false there is
    // no result. The engine warns of a target that is not reached. Throws Failure for a sound that can't be
    // read.
    std::optional<std::vector<double>> gains(const std::function<bool(double)>& goesOn) const;

  private:
    Join join_;
    std::vector<PlannedStream> sounds_;
    SoundTarget target_;
    std::string name_;
};
