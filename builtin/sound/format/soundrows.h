// Arithmetic on rows of samples of sound, compiled for each vector unit; every unit gives the same bytes.
// Counts are in values: samples times channels. A wide value has 32 bits, of which 24 are the range. Rows of
// 32-bit values are aligned to 4 bytes, others may begin at any address; source and target must not overlap.
#pragma once

#include <cstddef>
#include <cstdint>

namespace snd {

// --- From 8 (unsigned), 16 and 24 bits (little-endian) to wide values.
void widen8(int32_t* to, const unsigned char* from, size_t count);
void widen16(int32_t* to, const unsigned char* from, size_t count);
void widen24(int32_t* to, const unsigned char* from, size_t count);

// --- From wide values to 8, 16 and 24 bits. Lower bits are cut off; what is out of range takes the nearest
// bound, and the result is true if there was such a value.
bool narrow8(unsigned char* to, const int32_t* from, size_t count);
bool narrow16(unsigned char* to, const int32_t* from, size_t count);
bool narrow24(unsigned char* to, const int32_t* from, size_t count);

// The same with noise of triangular distribution, two steps of the output wide, before rounding to the
// nearest. `place` is the number of the first value in its stream: the noise depends on the place alone.
bool dither8(unsigned char* to, const int32_t* from, size_t count, uint32_t place);
bool dither16(unsigned char* to, const int32_t* from, size_t count, uint32_t place);

// --- to = from * gain. `gains` has one gain for each value of a period, which is repeated.
// 5 fraction bits, the product modulo 2^32.
void gain5(int32_t* to, const int32_t* from, size_t count, const int32_t* gains, size_t period);
// 16 fraction bits, rounded to the nearest, values out of range take the nearest bound. Gains 0 to 2^25.
void gain16(int32_t* to, const int32_t* from, size_t count, const int32_t* gains, size_t period);

// Which unit these run on, as in "AVX2".
const char* soundRowsUnit();

}  // namespace snd
