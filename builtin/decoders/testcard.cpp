#include "builtin/decoders/testcard.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <numbers>
#include <string>

#include "core/arch/qvassert.h"
#include "core/measure/qvgeometry.h"
#include "core/measure/qvnum.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvdraw.h"
#include "core/value/any.h"

namespace {

constexpr unsigned white = 0xFFFFFF;
constexpr unsigned gridColour = 0xAAAAAA;
constexpr unsigned boxColour = 0x303030;

struct Units {
    int width;
    int height;
    int u;
    int h;
    int k;

    explicit Units(const QvFrame& frame)
        : width(frame.width()), height(frame.height()), u(width / 16), h(height / 16), k(h / 2) {}

    // Negative coordinates count from the right and the bottom edge.
    int x(int at) const { return at < 0 ? at + width : at; }
    int y(int at) const { return at < 0 ? at + height : at; }
};

// --- Boxes.

// The part of a box that lies in the frame; with a step, its first row stays one of the filled ones.
QvRect visible(const Units& units, int x, int y, int width, int height, int step) {
    x = units.x(x);
    y = units.y(y);
    const int right = std::min(x + width, units.width);
    const int bottom = std::min(y + height, units.height);
    if (y < 0) y += (-y + step - 1) / step * step;
    return QvRect(std::max(x, 0), y, right, bottom);
}

void box(QvFrame& frame, int x, int y, int width, int height, unsigned colour, int step = 1) {
    const QvRect rect = visible(Units(frame), x, y, width, height, step);
    if (rect.width() > 0 && rect.height() > 0) QvDraw::fillRect(&frame, rect, colour, step);
}

void write(QvFrame& frame, int x, int y, const char* line, CardText* text) {
    if (!text || x < 0 || y < 0 || x >= frame.width() || y >= frame.height()) return;
    text->draw(frame, x, y, line);
}

// --- Seconds bar: a box for each frame of a second, the last one narrower for a fractional rate.
//
//     left                    right
//     [ 0  ] [ 1  ] ... [ n-1  ]      each box is a cell less a gap of 2 columns
//     |<-cell->|

class SecondsBar {
  public:
    explicit SecondsBar(const QvFrame& frame)
        : left_(Units(frame).k),
          top_(frame.height() - 2 - Units(frame).h),
          height_(Units(frame).h),
          rate_(frame.framerate.rate()),
          cell_((frame.width() - 2 * left_) / std::ceil(rate_)) {}

    void drawBoxes(QvFrame& frame) const {
        if (!(cell_ >= 2)) return;  // nothing would be left of a box
        int end = left_;
        for (int i = 0; i < static_cast<int>(rate_); ++i) {
            const int begin = left_ + static_cast<int>(i * cell_);
            end = left_ + static_cast<int>((i + 1) * cell_) - 2;
            box(frame, begin, top_, end - begin, height_, boxColour);
        }
        const double part = 1 - std::ceil(rate_) + rate_;
        if (part < 1) box(frame, end, top_, static_cast<int>(part * cell_), height_, boxColour);
    }

    void drawCursor(QvFrame& frame) const {
        if (frame.frameNr < 0 || !(rate_ > 0)) return;
        const int nr = QvTimecode(frame.frameNr, frame.framerate, false).frames();
        const int begin = static_cast<int>(nr * cell_ + left_ + 1.0);
        const int end = static_cast<int>((nr + 1) * cell_ + left_ - 3.0);
        box(frame, begin, top_ + 1, end - begin, height_ - 2, white);
    }

  private:
    int left_;
    int top_;
    int height_;
    double rate_;
    double cell_;
};

// --- Grid: lines s rows and h columns apart from the middle, squares as shown, framed in white.

class Grid {
  public:
    Grid(QvFrame& frame, double frameAspect)
        : frame_(frame),
          units_(frame),
          white_(QvDraw::color32(white, frame.four_cc())),
          line_(QvDraw::color32(gridColour, frame.four_cc())) {
        const double spacing = units_.height * frameAspect / units_.width * units_.h;
        rowSpacing_ = spacing < units_.height ? static_cast<int>(spacing) : units_.height;
    }

    void draw() const {
        const int rows = linesEachSide(units_.height, rowSpacing_);
        for (int y = 0; y < units_.height; ++y) {
            const int fromMiddle = std::abs(y - units_.height / 2);
            const bool onLine = rows > 0 && fromMiddle > 0 && fromMiddle % rowSpacing_ == 0 &&
                                fromMiddle / rowSpacing_ <= rows;
            if (onLine)
                fillRow(y, line_);
            else if (y == 0 || fromMiddle == 0 || y == units_.height - 1)
                fillRow(y, white_);
            else
                crossColumns(y);
        }
    }

  private:
    QvFrame& frame_;
    Units units_;
    unsigned white_;
    unsigned line_;
    int rowSpacing_ = 0;

    static int linesEachSide(int length, int spacing) {
        if (spacing < 1) return 0;
        const int count = length / spacing / 2;
        return count * spacing * 2 == length ? count - 1 : count;
    }

    void set(int x, int y, unsigned value) const { std::memcpy(frame_.pixelPtr(x, y), &value, sizeof value); }

    void fillRow(int y, unsigned value) const {
        for (int x = 0; x < units_.width; ++x) set(x, y, value);
    }

    void crossColumns(int y) const {
        for (const int x : {0, units_.width / 2, units_.width - 1}) set(x, y, white_);
        const int columns = linesEachSide(units_.width, units_.h);
        for (int j = 1; j <= columns; ++j) {
            set(units_.width / 2 - j * units_.h, y, line_);
            set(units_.width / 2 + j * units_.h, y, line_);
        }
    }
};

// --- Still parts.

void drawFieldPatch(QvFrame& frame) {
    const Units units(frame);
    const int h = units.h;
    const int x = units.x(-(4 * h + units.k));
    box(frame, x, units.k, 4 * h, 2 * h, 0x808080);
    box(frame, x, units.k, 2 * h, 2 * h, 0xFFFF00, 2);
    box(frame, x + 2 * h, units.k + 1, 2 * h, 2 * h - 1, 0x00FFFF, 2);
}

std::string ratioText(double value) {
    int num = 0;
    int den = 0;
    QvNum::ratio(value, num, den, 10000, 0.001);
    return std::to_string(num) + ":" + std::to_string(den);
}

void drawFormatBox(QvFrame& frame, double frameAspect, CardText* text) {
    const Units units(frame);
    const int at = units.k;
    const Any rate = frame.framerate.desc(true, false);
    const std::string format =
        std::to_string(units.width) + "x" + std::to_string(units.height) + " " + rate.asString("") + " ";
    box(frame, at, at, static_cast<int>(format.size()) * units.h * 3 / 5, 2 * units.h, 0x800000);
    write(frame, at + 4, at - units.h / 8, format.c_str(), text);
    const double pixelAspect = units.height * frameAspect / units.width;
    const std::string aspects = ratioText(frameAspect) + " px." + ratioText(pixelAspect) + " ";
    write(frame, at + 4, at + units.h - units.h / 8, aspects.c_str(), text);
}

void drawColourBars(QvFrame& frame) {
    const Units units(frame);
    int x = units.k;
    for (const unsigned colour :
         {0xFFFFFFu, 0xFFFF00u, 0x00FFFFu, 0x00FF00u, 0xFF00FFu, 0xFF0000u, 0x0000FFu}) {
        box(frame, x, 3 * units.h, units.u, 4 * units.h, colour);
        x += units.u;
    }
}

void drawGrayBars(QvFrame& frame, const QvRect& rect) {
    constexpr int bars = 11;
    const int width = rect.width() / bars;
    for (int i = 0; i < bars; ++i) {
        const auto level = static_cast<unsigned>(i * 25.5 + 0.5);
        box(frame, rect.left() + i * width, rect.top(), width, rect.height(), level * 0x010101);
    }
}

// As QvDraw::drawEllipse, without the chords that leave the frame.
void drawCutEllipse(QvFrame& frame, const QvPoint& centre, int rx, int ry) {
    const QvRect whole(0, 0, frame.width(), frame.height());
    const auto inside = [&whole](const QvPoint& p) {
        return p.x() >= 0 && p.y() >= 0 && p.x() < whole.right() && p.y() < whole.bottom();
    };
    QvPoint pen(centre.x() + rx, centre.y());
    for (int degree = 1; degree <= 360; ++degree) {
        const double angle = degree * std::numbers::pi / 180;
        const QvPoint next(static_cast<int>(centre.x() + std::cos(angle) * rx + 0.5),
                           static_cast<int>(centre.y() + std::sin(angle) * ry + 0.5));
        if (!(next == pen) && inside(pen) && inside(next)) QvDraw::drawLine(&frame, pen, next, white);
        pen = next;
    }
}

void drawEllipse(QvFrame& frame, double pixelAspect) {
    const Units units(frame);
    const QvPoint centre(12 * units.u, 8 * units.h);
    const int rx = 3 * std::min(units.u, units.h);
    const int ry = static_cast<int>(std::min(rx * pixelAspect, 1e6));
    const bool fits = centre.x() + rx < units.width && centre.y() >= ry && centre.y() + ry < units.height;
    if (fits)
        QvDraw::drawEllipse(&frame, centre, rx, ry, white);
    else
        drawCutEllipse(frame, centre, rx, ry);
}

void drawTimecode(QvFrame& frame, CardText* text) {
    const Units units(frame);
    const int x = units.k;
    const int y = units.y(-4 - 3 * units.h);
    const QvRect rect = visible(units, x, y, 7 * units.h, 2 * units.h, 1);
    if (rect.width() > 0 && rect.height() > 0) QvDraw::fillTransparent(&frame, rect, boxColour, 1.0);
    if (!text) return;
    char line[QvTimecode::textSize];
    QvTimecode(frame.frameNr, frame.framerate, false).pprint(line, frame.framerate.df());
    write(frame, x + 4, y - units.h / 8, line, text);
    std::snprintf(line, sizeof line, "#   %7d", frame.frameNr);
    write(frame, x + 4, y - units.h / 8 + units.h, line, text);
}

void drawViewNr(QvFrame& frame, int viewNr, CardText* text) {
    if (!text) return;
    const Units units(frame);
    char line[32];
    std::snprintf(line, sizeof line, "view #%d", viewNr);
    write(frame, units.x(units.width - 5 * units.h), units.y(-4 - 3 * units.h), line, text);
}

void clear(QvFrame& frame) {
    QV_ASSERT_MSG(frame.isRGB(), "testgen: only RGB supported");
    frame.setBlack();  // the fourth bytes, too
    frame.setRGB(128, 128, 128);
}

}  // namespace

void drawTestCard(QvFrame& frame, double frameAspect, CardText* text) {
    clear(frame);
    Grid(frame, frameAspect).draw();
    SecondsBar(frame).drawBoxes(frame);
    drawFieldPatch(frame);
    drawFormatBox(frame, frameAspect, text);
    drawColourBars(frame);
    const Units units(frame);
    drawGrayBars(frame, QvRect(units.u / 2, 9 * units.h, 8 * units.u, 12 * units.h));
    drawEllipse(frame, frameAspect * units.height / units.width);
}

void drawMovingParts(QvFrame& frame, int viewNr, CardText* text) {
    SecondsBar(frame).drawCursor(frame);
    drawTimecode(frame, text);
    drawViewNr(frame, viewNr, text);
}

void drawGrayCard(QvFrame& frame) {
    clear(frame);
    drawGrayBars(frame, QvRect(0, 0, frame.width() - 1, frame.height() - 1));
}
