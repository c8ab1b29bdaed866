// Why a run failed, as one line for the user.
#pragma once

#include <string>

#include "tarsel/job/jobtranscoder.h"

// Throws the reason of a run's result as a Failure. It is kept by the object that failed: a decoder, a member
// of the output, a filter or a link. For a file of the output it is what the system said.
[[noreturn]] void throwRunFailure(const JobParts& parts, const JobTranscoder& run, int result);

// While an exception is being handled: throws it as a Failure. If memory ran out, that is the reason of all
// that failed afterwards; what the engine says about a broken contract is for its log. `output`: its name.
[[noreturn]] void throwBetter(bool ranOut, const std::string& output);
