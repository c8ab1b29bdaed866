// The cropper (module "cropper"): cuts a rectangle out of each frame and puts black around it.
//
// Parameters:
//
//     "inputWidth", "inputHeight"    100    pixels, above 0
//     "inputFrameAspect"             1.0    width to height as the picture is shown, 0.1 to 10; pixels are
//                                           square until it is set
//     "mode"                         2      1 free, with pads; 2 the box keeps the shape of the input;
//                                           3 the box keeps "cropAspect"; 4 the middle of 16:9 as 4:3;
//                                           5 16:9 with bars above and below as 4:3
//     "cropAspect"                   1.0    of the box in mode 3, as shown, 0.1 to 10
//     "cropWidth", "cropHeight"             sides of the box, rounded down to multiples of 4; the other
//                                           side follows in modes 2 and 3; refused in modes 4 and 5
//     "moveCropBox" (Point, set only)       its top left corner
//     "cropBox" (Rect)               whole  the box, not rounded
//     "padTop", "padBottom", "padLeft", "padRight"  0  pixels to 16384; without effect unless in mode 1
//     "reset" (set only)                    the whole input, as far as the mode allows, without pads
//     "state" (Dict)                        box, mode, aspects and pads at once; all or nothing. Its
//                                           "boxChosen" is 0 while no box was chosen: the box then follows
//                                           the input's size. It has an input aspect only if one was set
//
// and to read "outputWidth", "outputHeight" and the limits "minWidth", "maxWidth", "minHeight", "maxHeight"
// (of "cropWidth" and "cropHeight", with the corner where it is) and "minX", "maxX", "minY", "maxY" (of the
// corner). A value outside its limits is refused with -1 and a text, and changes nothing.
//
// Until a box is chosen it is the whole input, in mode 3 the largest part of it that has the shape; modes 4
// and 5 derive it from each size of frame. A frame that the chosen box does not lie in is an error. For the
// formats that share chroma between pixels box and pads are rounded to even. An odd top row, or an odd pad
// above it, reverses the field order. v210 can't be cropped. With "_on" 0 frames pass unchanged.
#pragma once

#include <string>

#include "builtin/video/geometry/cropgeometry.h"
#include "builtin/video/videoeffect.h"

struct CropSettings {
    CropGeometry geometry;
    std::string fault;  // why the last value was refused
};

class QvCrop : public VideoEffectOf<CropSettings> {
  public:
    QvCrop();
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    void store(AnyDict& dict) const override;
    int open() override;

    using VideoEffectOf::getParam;

  protected:
    int fill(const QvFrame& frame) override;

  private:
    AnyDict state() const;
    int setState(const Any& value);
    int prepare(const QvFrame& frame);

    CropGeometry used_;  // for the frames as they are
    unsigned fourcc_ = 0;
};
