// One stream of a film that is multiplexed: its description as the libraries want it (AVCodecParameters), and
// its units converted to the form that the container holds.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "plugins/av/mux/containers.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/wire.h"

struct AVBSFContext;
class QvCodec;

namespace av {

// A track is described by its head, or by the parameters of an encoder of raw data. It is ready when
// everything is known that the container's header needs; for some codecs that takes the first unit.
class MuxTrack {
  public:
    MuxTrack(const Container& container, bool video, std::string place);
    MuxTrack(MuxTrack&&) noexcept;
    ~MuxTrack();

    // Each returns false, with a text in problem(), for a stream that the container does not hold. A second
    // head updates the extradata, and for sound the trailing padding.
    bool describe(const QvWire::VideoHead& head);
    bool describe(const QvWire::AudioHead& head);
    bool describeRaw(const QvCodec& encoder);  // by "type", "width", "samplerate", ...

    // Takes a unit whose times are in timeBase(); appends the units that are ready for the container to
    // `out`. False with problem().
    bool take(PacketPtr unit, std::vector<PacketPtr>& out);
    // At the end: appends the units that were held back, without the trailing padding.
    bool finish(std::vector<PacketPtr>& out);

    bool video() const { return video_; }
    bool raw() const { return raw_; }
    bool described() const { return codec_ != nullptr; }
    bool ready() const { return described() && !awaitsUnit_; }
    int sampleBytes() const { return sampleBytes_; }             // of raw sound, all channels
    std::int64_t pictureBytes() const { return pictureBytes_; }  // of raw pictures
    int frameSize() const { return parameters_->frame_size; }
    AVRational timeBase() const { return timeBase_; }
    AVRational rate() const { return rate_; }
    AVRational aspect() const { return aspect_; }
    const MuxCodecRow& codec() const { return *codec_; }
    const AVCodecParameters& parameters() const { return *parameters_; }
    const std::string& place() const { return place_; }  // "Video stream #0", for messages
    const std::string& problem() const { return problem_; }

    std::string language, title;
    AVStream* stream = nullptr;  // in the container, once it has a header

  private:
    struct Free {
        void operator()(AVCodecParameters* parameters) const;
        void operator()(AVBSFContext* filter) const;
    };

    const Container* container_;
    bool video_;
    bool raw_ = false;
    bool awaitsUnit_ = false;  // the header needs something of the first unit
    std::string place_, problem_;
    const MuxCodecRow* codec_ = nullptr;
    std::unique_ptr<AVCodecParameters, Free> parameters_;
    std::unique_ptr<AVBSFContext, Free> filter_;
    AVRational timeBase_{0, 1}, rate_{0, 1}, aspect_{0, 1};
    int sampleBytes_ = 0;
    std::int64_t pictureBytes_ = 0;
    std::int64_t lastDts_ = AV_NOPTS_VALUE;   // of the last unit
    std::int64_t nextTime_ = 0;               // for a unit that has no time
    int trailingPadding_ = 0;                 // samples after the end of the sound
    std::vector<PacketPtr> held_;             // see holdBack
    std::vector<std::uint8_t> newExtradata_;  // from a second head

    bool fail(const std::string& why);
    bool chooseCodec(const MuxCodecRow* row, std::uint32_t fourcc);
    bool describeRawSound(const QvCodec& encoder);
    bool describeRawPictures(const QvCodec& encoder);
    bool setExtradata(const void* data, std::uint64_t bytes);
    bool makeUnitFilter();
    void choosePcm(int bits);
    void chooseTag(int profile);
    bool completeFrom(AVPacket& unit);
    bool hasValidTimes(const AVPacket& unit);
    bool wrap(AVPacket& unit);
    bool takeBigEndianPcm(AVPacket& unit, std::vector<PacketPtr>& out);
    bool deliver(PacketPtr unit, std::vector<PacketPtr>& out);
    bool holdBack(PacketPtr unit, std::vector<PacketPtr>& out);
    bool addExtradataUpdate(std::vector<PacketPtr>& out);
};

}  // namespace av
