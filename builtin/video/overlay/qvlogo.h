// The logo (module "logo"): lays a PNG over each frame.
//
// Parameters:
//
//     "filename"  the PNG; its alpha channel, if it has one, is straight
//     "xpos"   0  pixels from the frame's left edge to the picture's; negative: from the right edges
//     "ypos"   0  the same from the top edges; negative: from the lower edges
//     "alpha"  1  opacity of all of it, 0 to 1
//
// Where the picture covers the frame by a (its alpha times "alpha"), a sample becomes (1 - a) of itself and a
// of the picture, converted to the frame's format and matrix; the alpha of frames stays. What lies outside of
// the frame is not seen. Works in place, on all formats. open fails without a PNG that can be read.
#pragma once

#include <string>

#include "builtin/video/inplaceeffect.h"
#include "builtin/video/overlay/pictureoverlay.h"

struct LogoSettings {
    std::string filename;
    int x = 0, y = 0;
    double alpha = 1;
};

class QvLogo : public InPlaceEffectOf<LogoSettings> {
  public:
    QvLogo();
    int open() override;
    int close() override;

  protected:
    int change(const QvFrame& from, QvFrame& to) override;

  private:
    QvFrame picture_;             // BGRA: the part of the PNG that is not transparent
    QvPoint inside_;              // where that part begins in it
    int width_ = 0, height_ = 0;  // of the PNG
    PictureOverlay overlay_;
    bool prepared_ = false;
};
