// Coverage of text: how much of each pixel letters, outlines and shadows take, as GRAY pictures.
#pragma once

#include "core/measure/qvgeometry.h"

class AnyVector;
class QvFrame;
struct TextLine;

// What a line covers, in pixels from the start of its band, whose baseline is `baseline` rows down; at least
// `wide` columns and `high` rows. What lies too far off to be shown anywhere is cut off.
QvRect coveredArea(const TextLine& line, int baseline, int wide, int high);

// Replaces `mask`, whose top left corner is that of `area`, by the coverage of the letters. fieldMasks: see
// QvSubtitle.
void drawLetters(const TextLine& line, int baseline, const AnyVector& fieldMasks, const QvRect& area,
                 QvFrame& mask);

// What letters cover together with their outline: each pixel takes the greatest coverage within `radius`;
// with a radius above 1 it takes the bits of its own and of the four corners', but not at the border.
void outlineMask(const QvFrame& letters, QvFrame& mask, int radius);

// Adds a shadow one pixel to the right and below, its edge blurred if it is `soft`.
void addShadow(QvFrame& mask, bool soft);

constexpr int effectMargin = 4;  // columns and rows that outline and shadow take around the letters
