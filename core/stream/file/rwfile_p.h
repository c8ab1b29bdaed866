// The record of a file that is written and can be read again: one buffer, used for the current direction.
#pragma once

#include <memory>

#include "core/stream/bufstream.h"
#include "core/stream/iofailure.h"

// A service by name, "malloc" as void *(unsigned) and "free" as void (void *); null for the default.
using RcLookup = void* (*)(const char* name);

// Null if the file can't be opened for writing and reading, or there is no memory. Record and context come
// from the allocation functions of `lookup`, which may be null. The file is truncated.
//
// FILE_MODE_READ and FILE_MODE_WRITE change the direction at the position reached; FILE_SEEK moves it. After
// done() the record answers with nothing; free() ends it. done(abort) with `abort` does not write the buffer.
bufstream* rwFileNew(const QvWideString& name, unsigned size, std::shared_ptr<QvIoFailure> failure,
                     RcLookup lookup = nullptr);
