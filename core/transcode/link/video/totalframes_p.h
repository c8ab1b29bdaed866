// How many frames each filter of a chain will see: filters that fade or count need to know. Internal to
// core/transcode.
#pragma once

class QvVProcessPipe;

// Sets "_totalFrames" on the filters that take it, for a chain that makes `out` frames of `in`.
void qvSetTotalFrames(QvVProcessPipe& pipe, long long in, long long out);
