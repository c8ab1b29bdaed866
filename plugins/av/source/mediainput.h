// A film's bytes, and a demultiplexer over them.
//
// Every reader of a stream has a demultiplexer of its own, so that streams are read and sought independently.
// Bytes come through the engine's byte sources only: no protocol of the library is open, and a document that
// names other files opens none of them.
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

// Where the bytes are: a file, or a source that the application has. Outlives the inputs that are made of it.
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

// What tells packets of one stream apart; see PacketIndex.
struct PacketKey {
    std::int64_t pts, dts;      // in the stream's time base; AV_NOPTS_VALUE where the container has none
    std::int64_t position;      // byte in the file; -1 where the container doesn't say
    std::uint32_t ordinal = 0;  // among the packets of its stream that have this position
};

class MediaInput {
  public:
    // Opens and probes. `format` is the name of a container that the library must use; "" finds it out.
    // Null with `reason`, a part of a sentence, for what is none of the containers that are allowed, is
    // beyond the limits (source/limits.h), encrypted, or has no stream.
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

    // Where the container has one table of all packets: from here to the next rewind packets come as they do
    // else, but their bytes are not read from the file, and are anything; which of them are keys is the
    // table's word then, and not the codec's. False where there is no such table, or where the library needs
    // the bytes to say what the packets are.
    bool leaveBytes();

    enum class Read { packet, end, failed };
    // The next packet, to be unreferenced by the caller. After `failed`, failure() is the reason.
    Read read(AVPacket& packet);
    const std::string& failure() const { return failure_; }

    // The next packet that read() delivers of this stream is this one. Where the container's own seek misses
    // it, the file is read from an earlier place until it comes. False with failure(): it did not come.
    // What follows comes in the order of the index; times of packets may differ from those of the index, as
    // some containers derive them from where reading began.
    // `number` is that of the packet among those of its stream.
    bool seekTo(int stream, const PacketKey& packet, std::size_t number);
    // After a failed read the file is opened again: references into context() end.
    bool rewind();

  private:
    struct State;
    std::unique_ptr<State> state_;
    const MediaBytes* bytes_ = nullptr;
    std::string format_;
    int only_ = -1;
    bool lost_ = false;  // a read failed: the demultiplexer may not find back from there
    std::string failure_;

    MediaInput();
    bool openState(std::string& reason);
    bool find(int stream, const PacketKey& packet);
    bool count(int stream, std::size_t number);
};

}  // namespace av
