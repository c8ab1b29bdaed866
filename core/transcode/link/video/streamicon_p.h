// The small picture of a stream that some formats have next to their file.
#pragma once

class QvEncodePipe;
class QvFrame;

// Saves the frame (may be null: no icon) as NAME.BMP, 80x60 pixels, if the multiplexer asks for one. Failures
// leave no icon and nothing else.
void qvMakeStreamIcon(QvEncodePipe& pipe, QvFrame* frame);
