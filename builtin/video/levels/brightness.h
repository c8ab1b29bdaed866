// Brightness, contrast and gamma (module "brightness").
//
// Parameters:
//
//     "brightness"  -1 to 1     0  added to the level
//     "contrast"     0 to 10    1  spreads the levels about mid-grey
//     "gamma"      0.1 to 10    1  above 1 lightens the middle and keeps black and white
//
// With v the level of a sample between black (0) and white (1), the new level is
//
//     ((v - 0.5) * contrast + 0.5 + brightness) ^ (1 / gamma)
//
// held between black and white before the power. Black and white are 16 and 235 for the luma of YUV and for
// GRAY, 0 and 255 for RGB, at the depth of the format; chroma and alpha stay. The result is rounded to the
// nearest. With the defaults frames pass untouched, levels beyond black and white included.
//
// Parameters may be changed between frames. Works in place, on GRAY, I420, YV12, YUYV, YUY2, UYVY, W016,
// Y216, BGR3, BGR4, BGRA, ARGB and b64a; any other format is an assertion.
#pragma once

#include <vector>

#include "builtin/video/inplaceeffect.h"

struct BrightnessSettings {
    double brightness = 0, contrast = 1, gamma = 1;
    bool operator==(const BrightnessSettings&) const = default;
};

class Brightness : public InPlaceEffectOf<BrightnessSettings> {
  public:
    Brightness();

  protected:
    int change(const QvFrame& from, QvFrame& to) override;

  private:
    void makeTable(const SampleLayout& layout, SampleRole role);

    const SampleLayout* madeFor_ = nullptr;  // the table's format; null: none is made
    BrightnessSettings madeWith_;
    std::vector<unsigned char> table8_;
    std::vector<uint16_t> table16_;
};
