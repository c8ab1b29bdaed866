// The record in front of a file that is written: collects patches, hands side information to observers.
#pragma once

#include <cstddef>
#include <memory>

#include "core/stream/bufstream.h"
#include "core/stream/iofailure.h"

using AuxInfoCallback = void (*)(void* context, unsigned offset, unsigned id, void* info, unsigned size);

// Units of a file name, with its end, beyond which it is not known to the record.
constexpr std::size_t longestPatchedName = 2048;

// Null if `inner` has no name or a longer one, or there is no memory. `inner` is borrowed: everything is
// handed on to it but BUF_SEEK_INFO and BUF_SEEK_REORDER, whose data are copied; the result of auxinfo is
// always 0. `callback` then hears of each item.
//
// done(abort) opens the file anew, so it runs after the file's own done(), and writes the patches in their
// order, none with `abort`, and then makes the block move, even then. Failures are noted in `failure`; what
// is not `patchable`, as a pipe, fails if there is anything to change.
bufstream* seekPatchNew(bufstream* inner, bool patchable, AuxInfoCallback callback, void* context,
                        std::shared_ptr<QvIoFailure> failure);
