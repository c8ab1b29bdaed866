// How much of each stream a job will write: the frames and samples that the engine counts.
#pragma once

struct JobPlan;

// Sets the expected frames. The parts and the formats have to be known. Throws Failure for points that no
// frame lies between.
void planFrames(JobPlan& plan);
// Sets the expected samples: next to a picture those that belong to its frames, otherwise those of the part.
// The expected frames and the filters have to be known.
void planSamples(JobPlan& plan);
