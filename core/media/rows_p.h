// Moving rows of pixels.
#pragma once

#include <cstddef>
#include <cstring>

namespace qvrows {

// Copies `rows` rows of `bytes` bytes; strides may be negative. Rows that follow each other are one block.
inline void copy(unsigned char* dst, std::ptrdiff_t dstStride, const unsigned char* src,
                 std::ptrdiff_t srcStride, std::ptrdiff_t bytes, int rows) {
    if (rows <= 0 || bytes <= 0) return;
    if (dstStride == bytes && srcStride == bytes) {
        std::memmove(dst, src, static_cast<std::size_t>(bytes) * static_cast<std::size_t>(rows));
        return;
    }
    for (int row = 0; row < rows; ++row) {
        std::memmove(dst, src, static_cast<std::size_t>(bytes));
        dst += dstStride;
        src += srcStride;
    }
}

// Copies the first row over the rest of a plane, whose last row may be cut off.
inline void repeatFirst(unsigned char* plane, std::ptrdiff_t stride, std::ptrdiff_t planeBytes) {
    if (stride <= 0) return;
    for (std::ptrdiff_t at = stride; at < planeBytes; at += stride)
        std::memcpy(plane + at, plane,
                    static_cast<std::size_t>(planeBytes - at < stride ? planeBytes - at : stride));
}

}  // namespace qvrows
