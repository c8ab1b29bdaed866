// Windows bitmaps, written.
#pragma once

#include <cstdio>

class QvFrame;

// Writes a BGR3 frame with its rows as wide as its stride; bytes after the last pixel are 0. False if the
// file does not take it all.
bool qvWriteBmp(const QvFrame& frame, std::FILE* file);
