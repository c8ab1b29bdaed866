// A film's bytes, and a demultiplexer over them.
//
// Every reader of a stream has a demultiplexer of its own, so that streams are read and sought independently.
// Bytes come through the engine's byte sources only: the library's own protocols are disabled, and a file
// that refers to other files makes it open none of them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "core/stream/qvbytesource.h"
#include "core/value/any.h"

struct AVFormatContext;
struct AVPacket;

namespace av {

// Where the bytes are: a file, or a source of the application. Has to outlive the inputs that are opened on
// it.
class MediaBytes {
  public:
    explicit MediaBytes(const Any& filename);
    // The source is borrowed. Its readers share it: each has a position of its own and seeks before it reads.
    MediaBytes(QvByteSource& source, const Any& name);

    // A reader from the first byte. Null with `reason`, a part of a sentence, if it can't be opened.
    std::unique_ptr<QvByteSource> open(std::string& reason) const;
    const Any& name() const { return name_; }  // for messages, and for its extension
    bool seekable() const;                     // false for a pipe: one reader only, from its start to its end

  private:
    Any name_;
    QvByteSource* source_ = nullptr;
};

// Identifies a packet among those of its stream; see PacketIndex.
struct PacketKey {
    std::int64_t pts, dts;      // in the stream's time base; AV_NOPTS_VALUE where the container has none
    std::int64_t position;      // byte in the file; -1 where the container doesn't say
    std::uint32_t ordinal = 0;  // among the packets of its stream that have this position
};

class MediaInput {
  public:
    // Opens and probes. `format`: the library's name of the container; "": it is detected. Null with
    // `reason`, a part of a sentence, for a file whose container is not allowed, that is beyond the limits
    // (source/limits.h) or encrypted, or that has no stream.
    static std::unique_ptr<MediaInput> open(const MediaBytes& bytes, const std::string& format,
                                            std::string& reason);
    ~MediaInput();
    MediaInput(const MediaInput&) = delete;
    MediaInput& operator=(const MediaInput&) = delete;

    AVFormatContext& context();
    const AVFormatContext& context() const;
    long long size() const;  // bytes; QvByteSource::unknown of a pipe

    // From here on only packets of this stream are delivered; others are skipped where the container can, and
    // are never decoded. -1: of all streams.
    void selectOnly(int stream);

    // For containers that have one table of all packets: until the next rewind read() delivers the same
    // packets, but does not read their bytes from the file, so their content is undefined. Whether a packet
    // is a key packet then comes from the table, not from the codec. False where there is no such table, or
    // where the library can't describe the packets without their bytes.
    bool leaveBytes();

    enum class Read { packet, end, failed };
    // The next packet, to be unreferenced by the caller. After `failed`, failure() is the reason.
    Read read(AVPacket& packet);
    const std::string& failure() const { return failure_; }

    // Moves so that the next packet of this stream that read() delivers is `packet`, the one with this
    // `number` in its stream. Where the container's own seek misses it, the file is read from an earlier
    // place. False with failure() if the packet is not found. The packets after it come in the order of the
    // index, but their times may differ from those of the index: in some containers they depend on where
    // reading started.
    bool seekTo(int stream, const PacketKey& packet, std::size_t number);
    // Back to the first packet. After a failed read, and where the container has nothing to seek by, the file
    // is opened again, and references into context() become invalid.
    bool rewind();

  private:
    struct State;
    std::unique_ptr<State> state_;
    const MediaBytes* bytes_ = nullptr;
    std::string format_;
    int only_ = -1;
    bool lost_ = false;  // a read failed: from there the demultiplexer may be unable to seek
    std::string failure_;

    MediaInput();
    bool openState(std::string& reason);
    bool reopen();
    bool find(int stream, const PacketKey& packet);
    bool count(int stream, std::size_t number);
};

}  // namespace av
