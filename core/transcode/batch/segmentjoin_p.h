// The decoder that plays the segments of a task one after the other.
#pragma once

#include <cstddef>
#include <memory>
#include <vector>

#include "core/transcode/batch/qvbatchdecoder.h"
#include "core/transcode/batch/qvbatchtask.h"

class QvEncodePipe;

// The number, within its type, of the output stream at this place; asserts that it is of the input's type.
int qvOutputNumber(QvEncodePipe& output, const QvIStream& stream, std::size_t place);

// Of the open segments, at least two (assertion), with the formats of the output's streams that are fed; what
// an encoder leaves open is as in the first segment. Not open yet. Null: there is no output, which is logged.
// An assertion when a segment does not suit the output.
std::unique_ptr<QvBatchDecoder> qvJoinSegments(const std::vector<std::unique_ptr<QvInputSegment>>& segments,
                                               QvEncodePipe* output);
