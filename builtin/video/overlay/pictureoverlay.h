// A picture with transparency that is laid over frames of any format.
//
// The picture is composed over black and converted to the frame's format once. A frame's sample then becomes
// the converted one plus (1 - opacity) of its own distance from black. The conversion is linear, so this
// equals mixing in RGB before it, also at the edges of the picture and in shared chroma.
//
//      frame
//      +-------------------------------+
//      |        canvas                 |   the part of the picture that can be seen, with a margin for
//      |        +----------------+     |   shared chroma, on whole groups of pixels
//      |        |   +---------+  |     |
//      |        |   | picture |  |     |
//      |        +---+---------+--+     |
//      +-------------------------------+
#pragma once

#include <memory>
#include <vector>

#include "builtin/video/samplelayout.h"
#include "core/filter/qvfilter.h"
#include "core/measure/rect.h"

class PictureOverlay {
  public:
    enum class Alpha { straight, premultiplied };

    // Lays out `picture` (BGRA) for frames of the format and size of `frame`, with its top left corner at
    // `corner`, which may lie outside; what is outside is not seen. opacity 0 to 1. The picture is not needed
    // afterwards. 0, or a status with the reason in error().
    int prepare(const QvFrame& picture, Alpha alpha, const QvPoint& corner, double opacity,
                const QvFrame& frame);
    // Whether a frame has the format and size, and matrix, that was prepared for.
    bool suits(const QvFrame& frame) const;
    // Draws onto a frame that suits.
    void draw(QvFrame& frame);
    const char* error() const { return error_; }
    void clear();  // nothing is prepared, and the memory is given back

  private:
    struct Shape {
        unsigned fourcc = 0;
        int width = 0, height = 0, matrix = 0;
        bool operator==(const Shape&) const = default;
    };
    static Shape shapeOf(const QvFrame& frame);
    int fail(int status, const char* text);
    void placeCanvas();
    int compose(const QvFrame& picture, Alpha alpha, const QvPoint& corner, double opacity);
    int convert();
    int openScaler();
    void weigh(int plane);
    uint32_t opacityAt(int plane, int x, int y) const;

    Shape shape_;
    QvRect canvas_;                    // in the frame
    QvRect seen_;                      // of the picture, in the frame
    QvFrame composed_;                 // BGR4, over black
    std::vector<uint32_t> opacities_;  // of 65536, one a pixel of the canvas
    std::unique_ptr<QvCodec> scaler_;
    Shape scalerShape_;
    const QvFrame* converted_ = nullptr;  // in the frame's format, the scaler's or composed_
    SampleWeights weights_[3];            // row after row
    std::vector<uint16_t> apart_;
    const char* error_ = "";
};

// Where the top left corner of a picture lies. x and y are its distances from the left and top edges;
// negative: the distances of its right and lower edges from those of the frame, -1 for one pixel.
QvPoint qvOverlayCorner(int x, int y, int pictureWidth, int pictureHeight, const QvFrame& frame);
