// How much of each stream a job will write: the frames and samples that the engine counts.
#pragma once

struct JobPlan;

// `shortest`: ends the pictures where the shortest sound ends, if that is earlier. `longest`: repeats the
// last picture up to the end of the longest sound, if that is later. Parts, formats and delays have to be
// known. Throws Failure without a sound or a picture, and if no picture is left.
void planEnds(JobPlan& plan, bool shortest, bool longest);
// Sets the expected frames. The parts and the formats have to be known. Throws Failure for points with no
// frame between them.
void planFrames(JobPlan& plan);
// Sets the expected samples: next to a picture those that belong to its frames, otherwise those of the part.
// Notes where a sound and its picture end apart. The expected frames and the delays have to be known.
void planSamples(JobPlan& plan);
