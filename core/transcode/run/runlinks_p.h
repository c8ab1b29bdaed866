// What is asked of all links of a run together.
#pragma once

class QvTask;

namespace qvrunlinks {

// Closes all of them, also when one throws; their results joined by bits.
int close(const QvTask& task);
// The frames that a run counts for its progress, 0 when nothing says. `rate` gets the frames a second of the
// output.
int totalFrames(const QvTask& task, double& rate);

}  // namespace qvrunlinks
