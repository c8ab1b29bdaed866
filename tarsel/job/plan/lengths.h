// How much of each stream a job will write.
#pragma once

struct JobPlan;

// Sets the expected frames and samples, as the engine counts them. Sound next to a picture gets the samples
// that belong to the picture's frames. Throws Failure for points that no frame lies between.
void planLengths(JobPlan& plan);
