// Exchanges the multiplexer of a pipe. Streams are built again for the new one where it takes them.
#pragma once

#include <memory>
#include <vector>

#include "builtin/pipes/output/members/streamsnapshot.h"
#include "builtin/pipes/output/streambuilder.h"

class MuxerExchange {
  public:
    // All are borrowed for the life of the object.
    MuxerExchange(OutputStreams& streams, MuxerPlace& end, ActivePreset& preset, StreamBuilder& builder,
                  PipeHost& host)
        : streams_(streams), end_(end), preset_(preset), builder_(builder), host_(host) {}

    // The streams stay, and the new multiplexer gets what the old one hands on.
    int change(const char* module);
    // For a new preset: without streams (assertion), and with nothing of the old multiplexer.
    int start(const char* module);

  private:
    int put(const char* module, bool keepStreams);
    int putInternal(const char* module, const char* sink);
    int replace(std::unique_ptr<QvMuxer> fresh, bool keepStreams);
    void rebuild(const std::vector<StreamSnapshot>& former, const std::vector<QvProgram>& programs);

    OutputStreams& streams_;
    MuxerPlace& end_;
    ActivePreset& preset_;
    StreamBuilder& builder_;
    PipeHost& host_;
};
