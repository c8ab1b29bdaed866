// Kernels on lines of deep formats, for the best vector unit of the machine: packed pixels to planes of
// 16-bit samples and back. Each gives the same bytes on every unit, and as the plain loop that ends it.
// Packed lines may begin at any address; nothing beyond the `n` pixels is read or written. Samples fill their
// 16 bits.
#pragma once

#include <cstddef>
#include <cstdint>

namespace srk {

using Byte = unsigned char;

// Four words a pixel. `d` may be null: dropped, or written as 65535.
void splitWords4(const Byte* from, uint16_t* a, uint16_t* b, uint16_t* c, uint16_t* d, size_t n);
void joinWords4(Byte* to, const uint16_t* a, const uint16_t* b, const uint16_t* c, const uint16_t* d,
                size_t n);
// 4:2:2 by words, n / 2 chroma samples; a last odd pixel has U alone, which writes as the last one does.
// `ten`: rounded to the upper ten bits.
void splitWords422(const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, size_t n, bool lumaFirst);
void joinWords422(Byte* to, const uint16_t* y, const uint16_t* u, const uint16_t* v, size_t n, bool lumaFirst,
                  bool ten);
// Pairs of words.
void splitWords2(const Byte* from, uint16_t* a, uint16_t* b, size_t n);
void joinWords2(Byte* to, const uint16_t* a, const uint16_t* b, size_t n, bool ten);

// Samples of `depth` bits in the low end, or rounded to them; `upper`: they stay in the high end.
void raiseWords(uint16_t* to, const Byte* from, size_t n, int depth);
void lowerWords(Byte* to, const uint16_t* from, size_t n, int depth);
void roundWords(Byte* to, const uint16_t* from, size_t n, bool ten);

// Six pixels in four double words: Cb Y Cr, Y Cb Y, Cr Y Cb, Y Cr Y, low bits first. The last group is
// written whole.
void splitV210(const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, size_t n);
void joinV210(Byte* to, const uint16_t* y, const uint16_t* u, const uint16_t* v, size_t n);
// U, Y, V of ten bits from bit `low` up, 0 or 2; with 0 two bits of alpha above them. `a` may be null.
void splitTens(const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, uint16_t* a, size_t n, int low);
void joinTens(Byte* to, const uint16_t* y, const uint16_t* u, const uint16_t* v, const uint16_t* a, size_t n,
              int low);

// Four floats a pixel: a sample is value * span + zero, not a number is 0. Null planes are dropped, or
// written as 1.
struct FloatScale {
    float zero, span;
};
void splitFloats(const Byte* from, uint16_t* const planes[4], const FloatScale scales[4], size_t n);
void joinFloats(Byte* to, const uint16_t* const planes[4], const FloatScale scales[4], size_t n);

const char* rows16Unit();

}  // namespace srk
