// --size and --fit: how large a picture becomes, and what is cut off or added so that it keeps its shape.
#pragma once

#include <optional>
#include <string>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/picture/picture.h"
#include "tarsel/words/timespec.h"

// What a picture keeps together: pixels that share their chroma, and in interlaced pictures the fields. Sides
// and places of its parts are multiples of these.
struct Grid {
    int columns, rows;
};
Grid gridOf(const PictureFormat& picture);

// The largest part of `picture` whose shape, as it is shown, is `aspect` (width to height), in its middle.
QvRect partOfShape(double aspect, const PictureFormat& picture);

// The size of --size; "1280x-1" keeps the shape in which `picture` is shown, on square pixels.
Size scaledSize(const std::string& text, const PictureFormat& picture);

// --fit.
struct Fit {
    enum class How { within, bars, crop };
    Size box;
    How how;

    double aspect() const { return static_cast<double>(box.width) / box.height; }
};
Fit parseFit(const std::string& text);
// The largest size in the box that has the shape in which `picture` is shown.
Size sizeWithin(const Size& box, const PictureFormat& picture);
// Columns on the left and as many on the right, or rows above and below, which make `part`, shown as
// `picture` is, a picture of another shape. One of them is 0.
struct Bars {
    int columns = 0, rows = 0;
};
Bars barsAround(const QvRect& part, const PictureFormat& picture, const Fit& fit, const std::string& text);
