// Adds streams to a pipe, removes them, and exchanges their encoders.
//
//     request --> settings complete --> encoder --> bitstream of the multiplexer --> list of streams
//
// The pipe is not open while any of this happens.
#pragma once

#include <memory>
#include <string>

#include "builtin/pipes/output/members/activepreset.h"
#include "builtin/pipes/output/members/muxerplace.h"
#include "builtin/pipes/output/members/outputstreams.h"
#include "builtin/pipes/output/members/savedsettings.h"
#include "builtin/pipes/output/members/streamrequest.h"

class PipeHost;

class StreamBuilder {
  public:
    // All are borrowed for the life of the builder.
    StreamBuilder(OutputStreams& streams, MuxerPlace& end, const ActivePreset& preset, PipeHost& host)
        : streams_(streams), end_(end), preset_(preset), host_(host) {}

    // How many more streams of a type fit, as QvEncodePipe::canAddStreams.
    int room(int type) const;
    // `argument` as for QvEncodePipe::addStream. The number of the stream within its type, or a status below
    // 0; another type than 1, 2 and 4 is an assertion, and so is a missing multiplexer.
    int add(int type, const Any& argument);
    int add(int type, StreamRequest request);
    int addDefault(int type) { return add(type, StreamRequest()); }

    // Deletes the stream, which must be in the list.
    void remove(const QvOStream* stream);
    // From the last to the first; the streams are deleted when the multiplexer has forgotten them all.
    void removeAll(int mask);

    // A new encoder of module `name` for the stream, which must have one already. It gets `params`, else the
    // settings that the module had when it was last replaced here, else the defaults; these with "tsAdjust"
    // for a transport stream when `adjustToMuxer`.
    int setCodec(int type, int nr, const char* name, const AnyDict& params, bool adjustToMuxer);

    // "tsAdjust" to the video encoders when the multiplexer writes a transport stream.
    void adjustForTransport();

  private:
    int checkRoom(int type);
    int build(int type, StreamRequest request);
    int buildSubpic(const StreamRequest& request);
    int complete(int type, StreamRequest& request);
    int setUp(QvEncoder& encoder, const AnyDict& settings) const;
    int join(OutputStream& stream, const char* name);
    int append(std::unique_ptr<OutputStream> stream, const AnyDict& params, const char* name);
    int configure(QvEncoder& encoder, int type, int nr, const AnyDict& params, bool adjustToMuxer);

    OutputStreams& streams_;
    MuxerPlace& end_;
    const ActivePreset& preset_;
    PipeHost& host_;
    SavedSettings saved_;
};
