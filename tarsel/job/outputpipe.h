// The engine's encode pipe as a plan wants it: multiplexer and encoders with their settings.
#pragma once

#include <memory>

#include "tarsel/job/plan/jobplan.h"

// `acceptPartial`: the output may become shorter than the plan says. Throws Failure for what a module does
// not take.
std::unique_ptr<QvEncodePipe> makeOutputPipe(const JobPlan& plan, bool acceptPartial);
