// What is drawn on a picture: options as the stored states of filters. Each throws Failure for what it can't
// use, with its option in the line.
#pragma once

#include <string>

#include "tarsel/picture/picture.h"

// "FILE@X,Y,OPACITY" of --logo.
AnyDict logoState(const std::string& spec, const PictureFormat& picture);
// `acceptPartial`: subtitles that can't be read may be left out.
AnyDict subtitleState(const std::string& file, const std::string& style, const PictureFormat& picture,
                      bool acceptPartial);
// `alone`: as in PictureEffects::filters. `atTop`: out of the way of subtitles.
AnyDict timecodeState(const std::string& spec, const PictureFormat& picture, bool alone, bool atTop);
AnyDict fadeState(const std::string& spec, const PictureFormat& picture, long long frames);

// Throws Failure if `filter` reads `file` and can't use it: a picture, subtitles or a font. `acceptPartial`
// as above.
void requireFilterFile(const QvCodec& filter, const std::string& file, bool acceptPartial);

// Whether the logo of --logo is a file with moving pictures.
bool logoIsMoving(const std::string& spec);

// The rectangle that --crop keeps of a picture.
QvRect parseCrop(const std::string& text, const PictureFormat& picture);
