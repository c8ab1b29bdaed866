// Values of sound files in forms that the engine does not work with, made into those that it does. Rows may
// begin at any address; source and target must not overlap. Every vector unit gives the same bytes.
#pragma once

#include <cstddef>

namespace wav {

// `count` values; the result is how many of them were beyond full scale, 0 but for floating point.
using Convert = std::size_t (*)(unsigned char* to, const unsigned char* from, std::size_t count);

// --- To 24 bits in three bytes, little-endian, rounded to the nearest, halves to the even one.
// 32-bit integers: what would be rounded beyond full scale takes the bound.
std::size_t narrowInt32(unsigned char* to, const unsigned char* from, std::size_t count);
// Floating point, full scale at 1.0. Values beyond it take the nearest bound and NaN becomes 0; both are
// counted. 1.0 itself becomes the largest value and is not counted.
std::size_t narrowFloat32(unsigned char* to, const unsigned char* from, std::size_t count);
std::size_t narrowFloat64(unsigned char* to, const unsigned char* from, std::size_t count);

// --- G.711 codes of one byte to 16 bits, little-endian.
std::size_t expandALaw(unsigned char* to, const unsigned char* from, std::size_t count);
std::size_t expandMuLaw(unsigned char* to, const unsigned char* from, std::size_t count);

// Turns the bytes of each value around, in place. `width`: bytes of a value, 1 to 8.
void swapBytes(unsigned char* values, int width, std::size_t count);

}  // namespace wav
