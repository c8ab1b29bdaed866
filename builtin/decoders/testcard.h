// The pictures of the test generator.
//
//     +------------------------------------------------+   W x H, in units u = W/16, h = H/16, k = h/2
//     | [format box]                     [field patch] |   format: size, rate, aspects
//     | [colour bars]           |                      |   field patch: swapped or lost fields show at once
//     |                         |       ( circle )     |   circle: a wrong aspect shows
//     | [gray bars]             |                      |
//     | [timecode, number]                [view #1]    |   moving
//     | [#][ ][ ][ ] ... seconds bar, a box a frame    |   cursor moving
//     +------------------------------------------------+
//
// All frames are RGB of four bytes a pixel; others are an assertion. What would leave the frame is cut off,
// so any size will do.
#pragma once

class QvFrame;

// Draws one line of text. A generator without it shows no text.
class CardText {
  public:
    virtual ~CardText() = default;
    // With its top left corner at x, y, counted from the top left corner of the frame.
    virtual void draw(QvFrame& frame, int x, int y, const char* text) = 0;
};

// Everything that does not move; the rate is that of the frame. frameAspect: width to height as shown.
// `text` may be null.
void drawTestCard(QvFrame& frame, double frameAspect, CardText* text);

// The cursor in the seconds bar, timecode and frame number, and the number of the view, on a card.
void drawMovingParts(QvFrame& frame, int viewNr, CardText* text);

// Eleven bars from black to white over the whole frame.
void drawGrayCard(QvFrame& frame);
