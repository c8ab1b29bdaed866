// Moves the last block of a finished file in front of its body, so that a reader meets it first.
#pragma once

#include "core/stream/auxinfoid.h"
#include "core/stream/iofailure.h"

//     | head | body .................... | block |      the file as it was written
//     | head | block | body .................... |      afterwards
//
// The body moves in pieces of 1 MiB from its end on, so one piece and the block are in memory. A file of
// 5,120 bytes or less, and one whose block is in the first MiB, is unchanged; players find the block at the
// end too. Failures of the file are noted in `failure`.
void moveBlock(const QvWideString& name, const BufReorderInfo& order, QvIoFailure& failure);
