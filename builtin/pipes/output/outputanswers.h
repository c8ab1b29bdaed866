// What a pipe answers to getParam by names of its own, from its preset, its multiplexer, sink and encoders.
#pragma once

#include "builtin/pipes/output/members/activepreset.h"
#include "builtin/pipes/output/members/muxerplace.h"
#include "builtin/pipes/output/members/outputstreams.h"

class OutputAnswers {
  public:
    // All are borrowed for the life of the object. `displayName` is the pipe's.
    OutputAnswers(const OutputStreams& streams, const MuxerPlace& end, const ActivePreset& preset,
                  const char* displayName)
        : streams_(streams), end_(end), preset_(preset), displayName_(displayName) {}

    // Whether the name is one of these. `value` comes in invalid and stays so when no member has an answer.
    // Names that are obsolete are assertions.
    bool get(const char* name, Any& value) const;

  private:
    void preset(Any& value) const;
    void presets(Any& value) const;
    void origProfile(Any& value) const;
    void pal(Any& value) const;
    void estimate(Any& value) const;
    void filesWritten(Any& value) const;
    void extension(Any& value) const;
    void srPossible(Any& value) const;
    void videoNecessary(Any& value) const;
    void bitrateRange(Any& value) const;
    void ofVideo(const char* name, Any& value) const;
    void ofMuxer(const char* name, Any& value) const;
    Any nameOfFirst(int type, const char* param) const;

    const OutputStreams& streams_;
    const MuxerPlace& end_;
    const ActivePreset& preset_;
    const char* displayName_;
};
