// How text is drawn on a picture.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QV_API QvTextRenderingOptions {
  public:
    // Of the bytes in a subtitle's text.
    enum Encoding : int { ascii = 0, utf8 = 1, utf16 = 2, utf32 = 3, byCodePage = 4 };
    enum Effect : int { noEffect = 0, outline = 1, softShadow = 2, hardShadow = 3 };
    static constexpr int nrEffects = 4;

    Any fontRegular;            // file names; invalid: no font
    Any fontItalic;             // invalid: the regular one
    Any fontBold;               // invalid: the regular one
    int charSize = 50;          // points at 72 dpi, which are pixels
    int subEncoding = ascii;    // Encoding; ASCII is read as UTF-8, too
    int codePage = 0;           // with byCodePage
    int multibyteType = 0;      // kept for applications
    int fontEffect = noEffect;  // Effect
    double pixelAspect = 1;     // width to height of the picture's pixels, 0.1 to 10: letters of a picture of
                                // wide pixels are drawn narrow and come out right
    Any fontFamily;             // invalid: none; goes before the files where the system has a font of it
    bool wrap = false;          // lines that are wider than the picture, less the margins, become several
    int align = 0;              // 0: centred, at a height that depends on the letters' size alone; 1 to 9: in
                                // the picture less the margins, as on the keys of numbers (1 bottom left, 2
                                // bottom, 9 top right); a "{\anN}" in the text goes before that
    int marginX = 0;            // pixels on either side, with align or wrap
    int marginY = 0;            // pixels above and below, with align

    // Sets "fontdir_regular", "fontdir_italic", "fontdir_bold", "charSizePt", "subEncoding", "codePage",
    // "multibyteType", "fontEffect", "pixelAspect", "fontFamily", "wrap", "align", "marginX" and "marginY",
    // the last six unless they have their defaults; other keys stay. Fonts that are not set are left out.
    void store(AnyDict& dict) const;
    // Takes the keys that are there with the right type; the other fields keep their values.
    void restore(const AnyDict& dict);

    static const char* effectName(int effect);  // "Outline"; "" for an unknown one
};
