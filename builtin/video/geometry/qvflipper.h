// The vertical flipper (module "flipper"): turns each frame upside down.
//
// Parameter "flip" (flag, default 1): 0 lets frames pass as they are.
//
// All planes are turned, of I422 all chroma rows too. The field order of an interlaced frame is reversed, as
// its first line has become its last. Works in place.
#pragma once

#include "builtin/video/inplaceeffect.h"

struct FlipperSettings {
    bool flip = true;
};

class QvFlipper : public InPlaceEffectOf<FlipperSettings> {
  public:
    QvFlipper();

  protected:
    int change(const QvFrame& from, QvFrame& to) override;
};
