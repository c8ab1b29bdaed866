// How many frames each filter of a chain will see: filters that fade or count need to know. Internal to
// core/transcode and to pipes of several chains.
#pragma once

class QvVProcessPipe;

// Sets "_totalFrames" on the filters that take it, for a chain that makes `out` frames of `in`.
void qvSetTotalFrames(QvVProcessPipe& pipe, long long in, long long out);

// A pipe that has a chain for each view shows the first one only. It gets both numbers for the others under
// this name, as a Vector of two Int64.
inline constexpr const char* qvTotalFramesOfViews = "_totalFramesOfViews";
