// One stream of a film: what its head says in the libraries' terms, and its units in the form of the
// container.
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

// A track is described by its head, or by the parameters of an encoder of raw data. It is ready when all is
// known that the container's header needs; some of it may have to come from the first unit.
class MuxTrack {
  public:
    MuxTrack(const Container& container, bool video, std::string place);
    MuxTrack(MuxTrack&&) noexcept;
    ~MuxTrack();

    // All: false, with a text in problem(), for what the container does not take.
    bool describe(const QvWire::VideoHead& head);
    bool describe(const QvWire::AudioHead& head);  // a second one has the codec's own data as they became
    bool describeRaw(const QvCodec& encoder);      // by "type", "width", "samplerate", ...

    // Takes a unit whose times are in timeBase(); appends what the container gets to `out`.
    bool take(PacketPtr unit, std::vector<PacketPtr>& out);
    // The end: what was held, and its trailing silence cut.
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
    bool awaitsUnit_ = false;
    std::string place_, problem_;
    const MuxCodecRow* codec_ = nullptr;
    std::unique_ptr<AVCodecParameters, Free> parameters_;
    std::unique_ptr<AVBSFContext, Free> filter_;
    AVRational timeBase_{0, 1}, rate_{0, 1}, aspect_{0, 1};
    int sampleBytes_ = 0;
    std::int64_t pictureBytes_ = 0;
    std::int64_t last_ = INT64_MIN;      // decoding time of the last unit
    std::int64_t next_ = 0;              // time of a unit that has none
    int trailing_ = 0;                   // samples that are not heard at the end
    std::vector<PacketPtr> held_;        // the last units of sound
    std::vector<std::uint8_t> changed_;  // the codec's own data, where they were sent again

    bool fail(const std::string& why);
    bool choose(const MuxCodecRow* row, std::uint32_t fourcc);
    bool setOwnData(const void* data, std::uint64_t bytes);
    bool makeFilter();
    void choosePcm(int bits);
    void chooseTag(int profile);
    bool learn(AVPacket& unit);
    bool wrap(AVPacket& unit);
    bool takeBigPcm(AVPacket& unit, std::vector<PacketPtr>& out);
    bool pass(PacketPtr unit, std::vector<PacketPtr>& out);
    bool hold(PacketPtr unit, std::vector<PacketPtr>& out);
    bool addOwnData(std::vector<PacketPtr>& out);
};

}  // namespace av
