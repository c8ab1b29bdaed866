// A video stream of the test generator.
#pragma once

#include <memory>
#include <vector>

#include "builtin/decoders/generatorstream.h"
#include "builtin/decoders/testcard.h"
#include "core/media/qvframe.h"
#include "core/value/any.h"

class VideoGenerator : public GeneratorStream {
  public:
    int init(const AnyDict& dict) override;
    void close() override;
    void setDuration(const MediaTime& length) override;

    // The next frame is in head() then. It never ends.
    int readFrame();
    // The next readFrame gives this frame.
    void seekToFrame(int frame);
    int frames() const { return frames_; }
    QvFrame* head() { return views_.empty() ? nullptr : views_.front().get(); }

    // New claims about the picture, as overrides make them. For an aspect the frame that is there is drawn
    // again, for a rate the one of the next seek.
    void setFrameAspect(double aspect);
    void setFramerate(const QvFramerate& rate);

  private:
    using Frames = std::vector<std::unique_ptr<QvFrame>>;

    int frames_ = 0;
    double frameAspect_ = 0;
    double pixelAspect_ = 0;
    QvFramerate framerate_;
    Frames pictures_;  // templates, of which the first is shown
    std::unique_ptr<CardText> text_;
    bool pending_ = false;  // the frame in head() is new and not yet read
    Any mode_;
    Frames views_;  // a chain

    bool black_ = false;

    bool isGrayBar() const { return mode_ == "graybar"; }
    void takeFramerate(const Any& value);
    void addPicture(const Any& picture);
    int addPlain(const AnyDict& dict);
    void addPictures(const AnyDict& dict);
    void takeAspect(double aspect);
    void countFrames();
    void describe();
    void drawCard();
    void makeViews(int count);
    void showCard();
    void drawMoving();
    void renderNext();
};
