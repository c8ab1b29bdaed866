// Words and marks of WAV inputs, which go into the WAV files that are written.
#pragma once

#include "tarsel/job/jobparts.h"
#include "tarsel/job/warnings.h"

// Gives them to the multiplexer of the job's pipe, and warns once an input of those that are lost.
void carryChunks(const JobParts& parts, Warnings& warnings);

// Lets the inputs count those clipped samples that the output takes.
void countClipping(const JobParts& parts);
