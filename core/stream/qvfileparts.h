// Parts of files as one run of bytes, as where several programs have each written a piece of it.
#pragma once

#include <memory>
#include <vector>

#include "core/arch/api.h"
#include "core/stream/qvbytesource.h"
#include "core/value/any.h"

struct QvFilePart {
    Any file;                                 // the name of a regular file
    long long first = 0;                      // bytes in front of the part
    long long bytes = QvByteSource::unknown;  // of the part; unknown: all that follow
};

// How many bytes they have together; QvByteSource::unknown if a file can't be opened, is no regular file or
// ends within its part.
QV_API long long qvFilePartsBytes(const std::vector<QvFilePart>& parts);

// A source that reads them one after the other; it has one file open at a time. The caller owns it. Null
// where qvFilePartsBytes has no answer. A file that changes meanwhile makes a read fail.
QV_API std::unique_ptr<QvByteSource> qvFilePartsSource(std::vector<QvFilePart> parts,
                                                       std::size_t bufferBytes = 64 * 1024);
