// The command that runs after a task: its placeholders and the file names that replace them.
#pragma once

#include "core/decode/qvdpipelist.h"
#include "core/value/any.h"

class QvEncodePipe;

// %i1 %i2 ... and %i: the inputs; %op and %ob: folder and base name of the first output; %o1 %o2 ... and %o:
// the outputs. The names are quoted for the command line. A command that is no String is unchanged.
// `output` may be null.
Any qvPostprocessCommand(const Any& command, const QvDPipeList& inputs, QvEncodePipe* output);
