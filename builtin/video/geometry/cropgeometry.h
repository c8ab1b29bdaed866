// What a cropper cuts out of a picture and what it puts around it.
//
//      input                               output
//      +---------------------------+       +- - - - - - - - -+
//      |      box.top              |       .  pads.top       .
//      |     +---------+           |       .    +---------+  .
//      |     |   box   |           |  -->  .    |   box   |  .   pads.left, pads.right
//      |     +---------+           |       .    +---------+  .
//      +---------------------------+       +- - - - - - - - -+
#pragma once

#include "core/measure/rect.h"

enum class CropMode {
    freeBox = 1,       // any box, and pads
    inputAspect = 2,   // the box has the shape of the input
    chosenAspect = 3,  // the box has a picture aspect of its own
    cropTo43 = 4,      // the middle of a 16:9 input, as 4:3
    padTo43 = 5        // a 16:9 input with bars above and below, as 4:3
};

struct CropPads {
    int top = 0, bottom = 0, left = 0, right = 0;
    bool operator==(const CropPads&) const = default;
};

struct CropGeometry {
    static constexpr int step = 4;        // sides of a box that is set are multiples of it
    static constexpr int leastSide = 32;  // of a box that is set, for the longer side
    static constexpr int mostInput = 1 << 20;
    static constexpr int mostPad = 16384;

    int inputWidth = 100, inputHeight = 100;
    double inputAspect = 0;  // width to height of the shown picture; 0: pixels are square
    CropMode mode = CropMode::inputAspect;
    double cropAspect = 1.0;  // likewise, of the box in mode 3
    QvRect box{0, 0, 100, 100};
    bool placed = false;  // the box was chosen; otherwise it is the largest that the mode allows
    CropPads pads;

    // What a side of the box can be set to from its present corner, both inclusive.
    struct Limits {
        int min, max;
    };
    Limits width() const;
    Limits height() const;

    int outputWidth() const { return box.width() + pads.left + pads.right; }
    int outputHeight() const { return box.height() + pads.top + pads.bottom; }
    double shownAspect() const;              // of the input, 0.1 to 10
    bool fits(int width, int height) const;  // the box lies in a picture of that size
    bool derived() const { return mode == CropMode::cropTo43 || mode == CropMode::padTo43; }

    // Each returns false, and changes nothing, when its result does not lie in the limits.
    bool setWidth(int wanted);
    bool setHeight(int wanted);
    bool moveTo(const QvPoint& corner);

    // A box that was placed is cut to what lies in the input, and is no longer placed if that is nothing.
    void setInput(int width, int height);
    void setMode(CropMode to);
    // Any box. In modes 4 and 5 a box of another size than the derived one is ignored, and only the corner
    // used.
    void place(const QvRect& wanted);
    // Gives the box the shape that the mode requires: at its corner with its width if it was placed,
    // otherwise as large as can be.
    void fit();
    void reset();  // not placed, without pads

  private:
    double ratio() const;  // of the sides of the box in pixels
    void derive();
};
