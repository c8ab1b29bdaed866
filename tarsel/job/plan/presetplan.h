// Applies a preset to the streams of a plan: their encoders, and the formats that the options leave open.
#pragma once

#include <memory>
#include <vector>

#include "tarsel/job/plan/jobplan.h"

class PresetPlanner {
  public:
    // Without a preset it does nothing. `effects`: those of the pictures. `known`: formats of earlier
    // segments, which stay; may be null. All have to outlive it. Throws Failure.
    PresetPlanner(JobPlan& plan, const PlanOptions& options, const EffectOptions& effects,
                  const KnownFormats* known);
    // The formats that the pictures are to have, by their numbers: those that are known, and those that the
    // preset asks for; none where it leaves them to the options.
    const std::vector<PictureFormat>& pictures() const { return pictures_; }
    // Sets the formats of the sounds; --map has to be applied. Throws Failure.
    void takeSounds();
    // Sets the encoders of all streams, whose formats have to be those of the output. Throws Failure for a
    // format that the preset or an encoder does not support.
    void settle();

  private:
    void takeEncoder(PlannedStream& stream);
    PictureFormat wanted(const PlannedStream& stream, const QvCodec& encoder, bool& asks) const;
    void setColours(const PlannedStream& stream, QvCodec& encoder) const;
    void takeSound(PlannedStream& stream, const QvCodec& encoder) const;

    JobPlan& plan_;
    const PlanOptions& options_;
    const EffectOptions& effects_;
    const KnownFormats* known_;
    std::vector<PictureFormat> pictures_;
    std::unique_ptr<QvEncodePipe> pipe_;  // of the preset, to ask its encoders; null without one
};

// Sets an encoder to the format of its stream. Throws Failure for what it does not take.
void setFormat(QvEncoder& encoder, const PlannedStream& stream);
