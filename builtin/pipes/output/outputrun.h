// Opens the members of an output from its end to its start, and finishes them the other way:
//
//     open             sink, multiplexer, encoders in the order of the streams
//     close, abort     encoders, multiplexer, sink
#pragma once

#include <string>

#include "builtin/pipes/output/members/muxerplace.h"
#include "builtin/pipes/output/members/outputstreams.h"
#include "builtin/pipes/output/outputpreparation.h"

class PipeHost;

class OutputRun {
  public:
    // All are borrowed for the life of the object.
    OutputRun(const OutputStreams& streams, const MuxerPlace& end, PipeHost& host)
        : streams_(streams), end_(end), host_(host), preparation_(streams, end) {}

    // `makeFolder`: the folder of the file name is made when it is missing; if that fails it is only logged.
    // After a failure or an exception all members are closed. Disabled streams are not opened.
    int open(bool makeFolder);
    // Every member is finished, even when another one fails. A failure, a broken contract and want of memory
    // become the pipe's failure. Results ORed.
    int finish(bool aborting);

  private:
    int openAll();
    int failOpen(const QvCodec& member, int result);
    void makeOutFolder() const;
    int finishEncoders(bool aborting);
    int finishMuxer(bool aborting);
    int finishSink(bool aborting);
    void logForUser(const std::string& reason) const;

    const OutputStreams& streams_;
    const MuxerPlace& end_;
    PipeHost& host_;
    OutputPreparation preparation_;
};
