// The filters of PNG, which turn a row of RGB pixels into differences that deflate packs better.
#pragma once

#include <cstddef>

// Rows of an image as they go into a PNG: each is one byte for the number of its filter, and `rowBytes`
// bytes of RGB. They stand one after the other.
struct PngRows {
    unsigned char* data;
    size_t rowBytes;  // a multiple of 3, without the byte of the filter
    size_t height;

    size_t stride() const { return rowBytes + 1; }
    unsigned char* row(size_t y) const { return data + y * stride(); }
};

// The number of bytes that qvFilterRow works in.
size_t qvFilterRoom(size_t rowBytes);

// Writes row `y` as the filter leaves it that suits it best, with the number of that filter in front, to
// `to`: a place outside of `rows`, or the row itself. The row above must be unfiltered.
void qvFilterRow(const PngRows& rows, size_t y, unsigned char* to, unsigned char* room);

// `pixels` pixels of B, G and R as R, G and B. The two don't overlap.
void qvSwapRedBlue(unsigned char* to, const unsigned char* from, size_t pixels);
