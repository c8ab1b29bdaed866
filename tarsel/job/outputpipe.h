// The engine's encode pipe as a plan wants it: multiplexer and encoders with their settings.
#pragma once

#include <memory>

#include "tarsel/job/plan/jobplan.h"

// `acceptPartial`: the output may become shorter than the plan says. Throws Failure for what a module does
// not take.
std::unique_ptr<QvEncodePipe> makeOutputPipe(const JobPlan& plan, bool acceptPartial);

// How the multiplexer names its file, and what the header of a stream, which goes ahead of the sound, says of
// its length: what may end early promises none.
void fitToPlace(QvEncodePipe& pipe, const JobPlan& plan, bool acceptPartial);
