// Lines of packed pixels to planes of samples and back: 8-bit samples for 8-bit formats, 16-bit samples that
// fill their 16 bits for deep ones.
#pragma once

#include <cstdint>

#include "builtin/kernels/formats/formats.h"

namespace srk {

// A line of a picture, one pointer for each plane: B, G, R, A or Y, U, V, A. Chroma is as wide as the format
// has it; alpha may be null where it is not wanted, and is written as opaque where it is not there.
struct Line8 {
    Byte* plane[4] = {};
};
struct Line16 {
    uint16_t* plane[4] = {};
};

// Of 8-bit formats that are not planar.
void unpackLine(const Format& format, const Byte* from, const Line8& to, int width);
void packLine(const Format& format, const Line8& from, Byte* to, int width);
// Of deep formats that are not planar. `chroma` is the second plane of P210 and P216, and null otherwise.
void unpackLine(const Format& format, const Byte* from, const Byte* chroma, const Line16& to, int width);
void packLine(const Format& format, const Line16& from, Byte* to, Byte* chroma, int width);

}  // namespace srk
