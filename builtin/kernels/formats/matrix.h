// The arithmetic between RGB and YUV and between the two kinds of YUV: tables of integers, and the wide forms
// that deep samples are worked on with.
#pragma once

#include <cstdint>

namespace srk {

enum class Matrix : uint8_t { bt601, bt709 };

// 8-bit RGB to YUV: Y = (b B + g G + r R + add) >> 15, and so for U and V. Each chroma row adds up to 0, so
// that grey has no colour. Rounded to the nearest.
struct ToYuv {
    int16_t y[3], u[3], v[3];  // B, G, R
    int32_t yAdd, chromaAdd;
};
const ToYuv& toYuv(Matrix matrix, bool videoLevels);

// 8-bit YUV to RGB in 1/16384. Each product is cut to 1/64, that of Cb to B to 1/32, their sum is rounded to
// the nearest; the result lies within 0.56 of the exact one.
struct ToRgb {
    int16_t yOffset, y, cbToB, cbToG, crToG, crToR;  // cbToB is half of the coefficient
};
const ToRgb& toRgb(Matrix matrix, bool videoLevels);

// 8-bit YUV from one matrix to the other, in 1/16384; the rows of Y, U and V take all of Y - 16, U - 128,
// V - 128 and are rounded to the nearest.
struct ToOther {
    int16_t m[3][3];
};
const ToOther& toOther(Matrix from);

// The same for 16-bit samples, exact up to one rounding: out[i] = m[i][0..2] * in + add[i], clamped. RGB has
// the order B, G, R; full-level RGB reaches from 0 to 65535, all else is 256 times the 8-bit scale.
struct Deep {
    double m[3][3];
    double add[3];
};
Deep deepToYuv(Matrix matrix, bool videoLevels);
Deep deepToRgb(Matrix matrix, bool videoLevels);
Deep deepToOther(Matrix from);
Deep deepLevels(bool toVideo);
// From RGB floats, whose luma has weights and chroma divisors of its own: 16-bit RGB in full range to YUV and
// back.
Deep floatToYuv(Matrix matrix);
Deep floatToRgb(Matrix matrix);

}  // namespace srk
