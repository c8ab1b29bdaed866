// An input of a picture of several views: a video stream of a decoder, whose frames have one view or more.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/compose/qvviewsetup.h"
#include "core/decode/qvdecoder.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvbuffer.h"

class ViewInput {
  public:
    // Opens it and selects the stream. `params` go to decoders as "openParameters"; may be null. Why it can't
    // be opened; empty if it is.
    std::string open(const QvViewSetup::View& view, const Any* params);

    // Why it doesn't go with another one in one picture, with both values; empty if it does.
    std::string mismatch(const ViewInput& other) const;

    // What the next frame is, or comes from: 0, -4 or another status with failure().
    int read();
    int seek(long long frame);
    const std::string& failure() const { return failure_; }

    // Views of the current frame, nrViews() of them, valid until the next read.
    const std::vector<QvFrame*>& frames() const { return frames_; }
    // The same with links that are free: the decoder's own frame where it has one view, else copies.
    // QvStatus::outOfMemory without memory.
    int linkable(std::vector<QvFrame*>& frames);

    int nrViews() const { return views_; }
    int nrFrames() const { return frameCount_; }
    long long announcedFrames() const { return announced_; }
    int width() const { return width_; }
    int height() const { return height_; }
    unsigned fourcc() const { return fourcc_; }
    const QvFramerate& rate() const { return rate_; }
    const AnyDict& params() const { return params_; }
    QvDecodePipe& decoder() const { return *decoder_; }
    const std::string& name() const { return name_; }

  private:
    std::unique_ptr<QvDecodePipe> decoder_;
    std::string name_;  // for messages
    int stream_ = 0;
    int views_ = 1;
    int frameCount_ = 0;
    long long announced_ = 0;
    int width_ = 0;
    int height_ = 0;
    unsigned fourcc_ = 0;
    QvFramerate rate_;
    AnyDict params_;
    std::vector<QvFrame*> frames_;
    std::vector<QvFrame> copies_;
    std::string failure_;

    std::string describe();
    int fail(int code, const std::string& text);
};
