// The state of a pipe as a dictionary: written as a state or as a preset, and read in its present and its
// older forms.
#pragma once

#include "builtin/pipes/output/muxerexchange.h"

class PipeState {
  public:
    // All are borrowed for the life of the object.
    PipeState(OutputStreams& streams, MuxerPlace& end, ActivePreset& preset, StreamBuilder& builder,
              MuxerExchange& exchange, PipeHost& host)
        : streams_(streams),
          end_(end),
          preset_(preset),
          builder_(builder),
          exchange_(exchange),
          host_(host) {}

    bool createOutFolder = false;  // whether opening makes the folder of the file name

    // `module` is the name of the pipe's module, which a state carries.
    void store(AnyDict& state, const char* module) const;  // replaces what `state` holds
    void storePreset(AnyDict& preset) const;               // adds to what `preset` holds
    // A state of another module, and one without profile, is an assertion after the pipe's failure.
    int restore(const AnyDict& state, const char* module);

  private:
    void storeCommon(AnyDict& state) const;
    AnyDict storeStream(const OutputStream& stream) const;
    int restoreBase(int profile, const Any* muxer);
    int restoreStreams(const Any& entries);
    int restoreStream(const AnyDict& entry, int type);
    int restoreUnversioned(const AnyDict& state);
    int restoreFirst(const AnyDict& entry, int type);

    OutputStreams& streams_;
    MuxerPlace& end_;
    ActivePreset& preset_;
    StreamBuilder& builder_;
    MuxerExchange& exchange_;
    PipeHost& host_;
};
