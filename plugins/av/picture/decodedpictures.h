// The decoder of one stream of pictures: what comes out of it, and from which packet it is.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "plugins/av/index/packetindex.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/concealedpackets.h"
#include "plugins/av/source/mediainput.h"

namespace av {

class DecodedPictures {
  public:
    static std::unique_ptr<DecodedPictures> open(const MediaBytes& bytes, const std::string& format,
                                                 int stream, std::shared_ptr<const PacketIndex> index,
                                                 int threads, std::string& reason);

    const std::vector<IndexedPacket>& packets() const { return index_->packets(stream_); }
    AVStream& stream() { return *input_->context().streams[stream_]; }
    AVFormatContext& container() { return input_->context(); }
    AVCodecContext& codec() { return *codec_; }

    // The next picture that next() gives is of this packet, or of one after it.
    bool seek(std::size_t packet);
    // The packet that is read next.
    std::size_t position() const { return position_; }

    enum class Next { picture, end, failed };
    // Pictures in the order of presentation. packetOf() the picture is the one that it began in.
    Next next(AVFrame& picture);
    static std::size_t packetOf(const AVFrame& picture) {
        return static_cast<std::size_t>(picture.reordered_opaque);
    }
    // Whether the picture has errors that the codec concealed, as far as they are in that packet: a field may
    // have one of its own.
    bool isConcealed(const AVFrame& picture, std::size_t packet) const;
    const std::string& failure() const { return failure_; }

  private:
    void takeFields(AVFrame& picture);

    std::unique_ptr<MediaInput> input_;
    std::shared_ptr<const PacketIndex> index_;
    int stream_ = 0;
    ConcealedPackets concealed_;
    CodecPtr codec_;
    PacketPtr packet_;
    bool waiting_ = false;  // packet_ was not taken yet
    bool draining_ = false;
    bool started_ = false;  // something was read
    std::size_t position_ = 0;
    int threads_ = 0;
    std::string failure_;

    bool openCodec(std::string& reason);
    // A packet into the codec, or the end. False for a failure of the file.
    bool feed();
};

}  // namespace av
