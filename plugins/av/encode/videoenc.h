// The video encoders over the libraries: "h264venc" and the other rows of VideoCodec.
//
// Frames of the size and the form of "selectedFOURCC" come in; units in decoding order, in elementary form,
// go out with the records of "plugins/wire.h". Groups of pictures are closed. Bit rate, quality and groups of
// pictures are parameters of the codecs that have these, see VideoSettings.
//
// With "firstPass" the stream is dropped and the statistics go to the record "meta"; an encoder with "meta"
// and without "firstPass" reads them there, and open fails if there are none.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "core/encode/qvencoder.h"
#include "plugins/av/encode/frameinput.h"
#include "plugins/av/encode/passrecord.h"
#include "plugins/av/encode/unitwriter.h"
#include "plugins/av/encode/videosettings.h"
#include "plugins/av/picture/picturecaptions.h"

namespace av {

class VideoEnc : public QvVideoEncoder {
  public:
    explicit VideoEnc(const VideoCodec& codec) : settings_(codec) {}
    ~VideoEnc() override;

    using QvCodec::getParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;
    int open() override;
    int close() override;
    int abort() override;
    // QvStatus::invalidArgument for a null frame, and one of another size or form.
    int writeFrame(QvFrame* frame) override;
    QvFrame* lastFrame() override { return nullptr; }

  private:
    VideoSettings settings_;
    CodecPtr context_;
    PacketPtr packet_;
    FrameInput input_;
    CaptionInput captions_;
    UnitWriter output_;
    PassFiles files_;
    std::string statistics_;          // of a first pass, or for a second one
    std::vector<std::uint8_t> sets_;  // parameter sets, written before each key frame
    long long frames_ = 0, units_ = 0;

    int fail(const std::string& why);
    bool carryCaptions(const QvFrame& frame, AVFrame& picture);
    std::string checkSettings() const;
    std::string prepare();
    std::string refusal(int code) const;
    std::string configure(AVPixelFormat layout);
    void configureGroups();
    std::string configureRate();
    void limitRate(double target);
    std::string configurePass();
    std::string describeCodec();
    AVPixelFormat layout() const;
    bool sendHead();
    int drain();
    int putPacket();
    int finishPass();
    void release();
};

}  // namespace av
