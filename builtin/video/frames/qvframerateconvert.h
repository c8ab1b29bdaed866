// The frame rate converter (module "frconvert"). Whole frames are dropped or repeated, two progressive frames
// are woven into an interlaced one, or 3:2 pulldown makes five of four; nothing is ever blended.
//
// Frame numbers are the only time base: an output frame k shows the input frame that is on screen when k
// begins, and a stream that starts at input frame 100 starts at the output frame of the same time.
//
// Parameters:
//   "inFramerate"            Framerate, or frames a second; getParam answers with frames a second. 25
//   "outFramerate"           the same
//   "interlace"              0 none, 1 top field first, 2 bottom field first: weaves if the input rate is
//                            twice the output rate
//   "pulldown"               int as bool: 3:2 pulldown if the output rate is 5/4 of the input rate
//   "_safeToApplyAfter"      read only: 1 if each output frame leaves once, so that a filter may work on
//                            it in place
//   "_isFramerateConverter"  read only: 1
//
// With rates that don't suit them "interlace" and "pulldown" have no effect. Parameters before init, rates
// outside 0.1 to 120 at open, a frame of another rate and numbers that do not rise are assertions.
//
// A rate that goes down carries user data and captions of dropped frames to the next frame that leaves; a
// repeated frame takes them once.
#pragma once

#include <memory>

#include "builtin/video/frames/carrieddata.h"
#include "builtin/video/frames/framenumbers.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvframe.h"

class Pulldown;

class QvFramerateConvert : public QvVideoFilter {
  public:
    QvFramerateConvert();
    ~QvFramerateConvert() override;

    int init() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;
    void store(AnyDict& dict) const override;
    int restore(const AnyDict& dict) override;

    int write(QvFrame& frame) override;
    // How many output frames of the last input frame are still to be fetched.
    int ready() const override;
    QvFrame* frame() override;
    int next() override;

    using QvVideoFilter::getParam;

    struct Settings {
        QvFramerate inRate{QvRatio(25, 1)}, outRate{QvRatio(25, 1)};
        double inFps = 25.0, outFps = 25.0;  // as set
        int interlace = 0;
        bool pulldown = false;
    };

  private:
    void checkFrame(const QvFrame& frame);
    void start(long long firstNumber);
    int writePlain(const QvFrame& frame);
    int writeInterlacing(const QvFrame& frame);
    bool reduces() const { return settings_.inFps > settings_.outFps; }

    Settings settings_;
    FrameNumbers numbers_;
    QvFrame output_;
    CarriedData carried_;
    std::unique_ptr<Pulldown> pulldown_;  // null unless in pulldown mode
    long long firstInput_ = -1;           // -1: no frame seen
    long long currentSource_ = -1;
    long long nextOutput_ = 0;
    int left_ = 0;  // output frames that show the held frame; 0: none is held
    bool interlacing_ = false;
    bool halfDone_ = false;  // the first frame of a pair is woven
};
