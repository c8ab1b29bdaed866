// What happens to the sounds of a job: their formats and channels, the filters they pass, and how they are
// converted.
#pragma once

#include <vector>

#include "tarsel/job/plan/planoptions.h"
#include "tarsel/sound/channelmap.h"
#include "tarsel/sound/soundeffects.h"

struct JobPlan;
struct PlannedStream;
struct SoundFormat;

// The time at the start of the sound that the engine skips for these audio filters, such as a negative delay.
// Throws Failure for a chain that can't be built.
MediaTime skippedSound(const AnyVector& filters, const SoundFormat& in, const SoundFormat& out);

// Throws Failure where a stored filter would leave channels of the sound unwritten.
void checkChannels(const AnyDict& filter, const SoundFormat& in, const SoundFormat& out);

class SoundPlanner {
  public:
    // Applies --map, which joins the sounds of the job into one. Plan and options have to outlive it. Throws
    // Failure for options that do not fit.
    SoundPlanner(JobPlan& plan, const PlanOptions& options);
    // Sets how much earlier or later each sound comes, which the lengths depend on.
    void planDelays();
    // Sets the filters of all sounds; the lengths have to be known. Throws Failure for filters that can't be
    // used.
    void planFilters();

  private:
    void takeMap();
    void checkMap(const ChannelMap& map, const std::vector<const PlannedStream*>& sounds) const;
    void checkOptions() const;
    void planDelay(PlannedStream& stream) const;
    void planFilters(PlannedStream& stream) const;
    void addGiven(PlannedStream& stream) const;
    void addOptions(PlannedStream& stream) const;
    SoundFade fadeOf(const PlannedStream& stream) const;
    void planConversion(PlannedStream& stream) const;
    void checkMix(const PlannedStream& stream) const;

    JobPlan& plan_;
    const PlanOptions& options_;
    Volumes volumes_;
    bool mapCopies_ = true;
};
