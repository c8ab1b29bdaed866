// The decoders of the segments of a stored task.
#pragma once

#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "core/transcode/batch/lazydecoder_p.h"
#include "core/transcode/batch/qvbatchtask.h"

class QvTaskState;

class SegmentInputs {
  public:
    // The state outlives the object; the callback (may be null) hears of each file that is opened.
    SegmentInputs(const QvTaskState& state, QvFileOpenCb* callback);

    // Fills in the decoders and streams of a segment. 0, or QvStatus::failed with the reason in `error`: the
    // decoders that were opened by then are in the segment. An index out of range is an assertion. One
    // decoder reads all streams of a file, unless the same stream is asked for twice.
    int open(int index, QvInputSegment& segment, std::string& error);

  private:
    // A file as some decoder reads it.
    struct Known {
        AnyDict file;                              // an entry of "files"
        std::shared_ptr<const SourceFacts> facts;  // null: it can't be opened
    };

    QvDecodePipe* free(const QvInputSegment& segment, const AnyDict& source) const;
    QvDecodePipe* make(const AnyDict& source);
    std::shared_ptr<const SourceFacts> factsOf(const AnyDict& file);

    const QvTaskState& state_;
    QvFileOpenCb* callback_;
    std::unordered_map<std::string, int> places_;  // of names in "files"
    std::unordered_multimap<std::string, Known> known_;
    std::shared_ptr<OpenDecoders> open_;  // null: there is one segment, whose decoders stay open
};
