#include "builtin/video/geometry/cropgeometry.h"

#include <algorithm>
#include <cmath>

namespace {

using Geometry = CropGeometry;

constexpr double leastAspect = 0.1, mostAspect = 10.0;

int stepped(int side) { return side / Geometry::step * Geometry::step; }

// Rounded down; what lacks a millionth counts as whole.
int whole(double side) {
    return static_cast<int>(std::clamp(std::floor(side + 1e-6), 0.0, double{Geometry::mostInput}));
}

}  // namespace

double CropGeometry::shownAspect() const {
    if (inputAspect > 0) return inputAspect;
    return std::clamp(static_cast<double>(inputWidth) / inputHeight, leastAspect, mostAspect);
}

double CropGeometry::ratio() const {
    const double input = static_cast<double>(inputWidth) / inputHeight;
    if (mode == CropMode::cropTo43) return input * (4.0 / 3) / (16.0 / 9);
    if (mode != CropMode::chosenAspect) return input;
    return inputAspect > 0 ? cropAspect * input / inputAspect : cropAspect;
}

CropGeometry::Limits CropGeometry::width() const {
    int max = inputWidth - box.left(), min = leastSide;
    if (mode != CropMode::freeBox) {
        max = std::min(max, whole((inputHeight - box.top()) * ratio()));
        min = stepped(whole(leastSide * std::min(ratio(), 1.0)));
    }
    return {std::min(min, max), max};
}

CropGeometry::Limits CropGeometry::height() const {
    int max = inputHeight - box.top(), min = leastSide;
    if (mode != CropMode::freeBox) {
        max = std::min(max, whole((inputWidth - box.left()) / ratio()));
        min = stepped(whole(leastSide / std::max(ratio(), 1.0)));
    }
    return {std::min(min, max), max};
}

namespace {

bool within(const CropGeometry::Limits& limits, int side) {
    return side > 0 && side >= limits.min && side <= limits.max;
}

}  // namespace

bool CropGeometry::setWidth(int wanted) {
    const int w = stepped(wanted);
    const bool held = mode != CropMode::freeBox;
    const int h = held ? stepped(whole(w / ratio())) : box.height();
    if (!within(width(), w) || (held && !within(height(), h))) return false;
    box.setWidth(w);
    box.setHeight(h);
    return placed = true;
}

bool CropGeometry::setHeight(int wanted) {
    const int h = stepped(wanted);
    const bool held = mode != CropMode::freeBox;
    const int w = held ? stepped(whole(h * ratio())) : box.width();
    if (!within(height(), h) || (held && !within(width(), w))) return false;
    box.setWidth(w);
    box.setHeight(h);
    return placed = true;
}

bool CropGeometry::moveTo(const QvPoint& corner) {
    if (corner.x() < 0 || corner.y() < 0 || corner.x() > inputWidth - box.width() ||
        corner.y() > inputHeight - box.height())
        return false;
    box.moveTo(corner);
    return placed = true;
}

bool CropGeometry::fits(int width, int height) const {
    return box.right() <= width && box.bottom() <= height;
}

void CropGeometry::setInput(int width, int height) {
    inputWidth = width;
    inputHeight = height;
    if (box.left() >= width || box.top() >= height) placed = false;
    if (!placed || derived()) return fit();
    box = QvRect(box.left(), box.top(), std::min(box.right(), width), std::min(box.bottom(), height));
}

void CropGeometry::setMode(CropMode to) {
    if (mode == to) return;
    if (derived()) placed = false;
    mode = to;
    pads = {};
    fit();
}

void CropGeometry::place(const QvRect& wanted) {
    if (!derived())
        box = wanted;
    else if (wanted.width() == box.width() && wanted.height() == box.height())
        box.moveTo(wanted.topLeft());
    placed = true;
}

void CropGeometry::derive() {
    box = QvRect(0, 0, inputWidth, inputHeight);
    pads = {};
    if (mode == CropMode::padTo43) {
        // A multiple of four keeps fields and chroma in their places.
        pads.top = pads.bottom = stepped(inputHeight / 6);
        return;
    }
    const int width = std::max(stepped(whole(inputHeight * ratio())), 1);
    const int left = (inputWidth - width) / 2 & ~1;
    box = QvRect(left, 0, left + width, inputHeight);
}

void CropGeometry::fit() {
    if (derived()) return derive();
    if (!placed) box = QvRect(0, 0, inputWidth, inputHeight);
    if (mode == CropMode::freeBox) return;
    const int w = std::min(box.width(), whole((inputHeight - box.top()) * ratio()));
    const int h = whole(w / ratio());
    // A box that has its shape already keeps sides that are no multiples.
    if ((w == box.width() && h == box.height()) || stepped(w) == 0 || stepped(h) == 0) return;
    box.setWidth(stepped(w));
    box.setHeight(stepped(h));
}

void CropGeometry::reset() {
    placed = false;
    pads = {};
    fit();
}
