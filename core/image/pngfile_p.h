// PNG files, read and written through libpng.
#pragma once

#include <cstdio>

class QvFrame;

// Reads eight bytes: whether they are the signature of a PNG.
bool qvIsPng(std::FILE* file);

// Reads the image after the signature, as QvImage::loadFrame describes it. What libpng does not like is a
// warning in the user log with `name`, and rows that could not be read keep what the frame had. 0,
// QvStatus::cannotParse with that warning, or -1 with a message if there is no memory for the picture.
int qvReadPng(std::FILE* file, const char* name, QvFrame& picture, QvFrame* alpha);

// Writes a BGR3 frame as RGB of 8 bits. False if that fails.
bool qvWritePng(const QvFrame& frame, std::FILE* file);
