// How much of each stream a job will write: the frames and samples that the engine counts.
#pragma once

struct JobPlan;

// Ends the pictures with the shortest sound (--shortest), or holds the last one up to the end of the longest
// (--longest), where that is earlier, or later, than their own end. The parts, the formats and the delays
// have to be known. Throws Failure where there is nothing to end with, or nothing is left.
void planEnds(JobPlan& plan, bool shortest, bool longest);
// Sets the expected frames. The parts and the formats have to be known. Throws Failure for points that no
// frame lies between.
void planFrames(JobPlan& plan);
// Sets the expected samples: next to a picture those that belong to its frames, otherwise those of the part.
// Notes where a sound and its picture end apart. The expected frames and the delays have to be known.
void planSamples(JobPlan& plan);
