// How many samples a packet of sound decodes to, without decoding it: from the codec's fixed frame length or
// from the first bytes of the packet.
#pragma once

#include <cstdint>
#include <memory>
#include <span>

struct AVCodecParameters;
struct AVPacket;
struct AVVorbisParseContext;

namespace av {

inline constexpr std::uint32_t unknownSamples = UINT32_MAX;

class PacketSamples {
  public:
    explicit PacketSamples(const AVCodecParameters& codec);  // borrowed
    ~PacketSamples();
    PacketSamples(PacketSamples&&) noexcept;

    // Of the next packet in decoding order, priming and padding included. 0 for what the decoder will refuse;
    // unknownSamples where only decoding tells, also when the form of the sound changes.
    std::uint32_t next(const AVPacket& packet);

  private:
    struct FreeVorbis {
        void operator()(AVVorbisParseContext* context) const;
    };
    const AVCodecParameters* codec_;
    std::unique_ptr<AVVorbisParseContext, FreeVorbis> vorbis_;
    bool vorbisStarted_ = false;
    int form_ = -1;  // of the first packet: what must not change, as the codec's header states it

    std::uint32_t keepsForm(int form, std::uint32_t samples);
    std::uint32_t ofMpeg(std::span<const std::uint8_t> data);
    std::uint32_t ofFlac(std::span<const std::uint8_t> data);
    std::uint32_t ofVorbis(std::span<const std::uint8_t> data);
};

}  // namespace av
