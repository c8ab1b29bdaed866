// Arithmetic on rows of samples: weighted sums and tables. Every vector unit gives the same bytes. Rows may
// begin at any address and have any length; dst may be src, but must not overlap it otherwise. Words are
// 16-bit samples in the machine's order, counted in words, at any address.
#pragma once

#include <cstddef>
#include <cstdint>

namespace srk {

using Byte = unsigned char;

// dst = (src * scale + add) >> 8, each sample with its own scale (0 to 256) and add. The sum must fit 16
// bits.
void weighBytes(Byte* dst, const Byte* src, const uint16_t* scale, const uint16_t* add, size_t bytes);
// dst = (src * scale + add) >> 16, scale 0 to 65536. The sum must fit 32 bits.
void weighWords(Byte* dst, const Byte* src, const uint32_t* scale, const uint32_t* add, size_t words);

// The same on three samples of 10 bits in each 32-bit word, the first in the lowest bits; three weights a
// word. The upper two bits become 0.
void weighTens(Byte* dst, const Byte* src, const uint32_t* scale, const uint32_t* add, size_t words);

// dst = table[src] for the samples that `chosen` names, which has a bit for each place in a group of four,
// the first sample's being bit 0; the other samples are copied.
void lookUpBytes(Byte* dst, const Byte* src, const Byte* table, unsigned chosen, size_t bytes);
void lookUpWords(Byte* dst, const Byte* src, const uint16_t* table, unsigned chosen, size_t words);

// Which unit these run on, as in "AVX2".
const char* sampleRowsUnit();

}  // namespace srk
