// The samples of one component of a picture, wherever they stand in its planes. Internal to the library.
//
//     YUY2   Y U Y V   U: data at byte 1, a sample every 4 bytes, half the columns
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>

class QvFrame;

struct SampleView {
    char name = 'Y';  // Y, U, V, R, G, B
    const unsigned char* data = nullptr;
    std::ptrdiff_t stride = 0;  // bytes from a row to the next
    int step = 1;               // bytes from a sample to the next
    int width = 0;              // samples
    int height = 0;
    int bytes = 1;  // of a sample; two are a word in the machine's order

    int peak() const { return bytes == 1 ? 255 : 65535; }
    const unsigned char* row(int y) const { return data + y * stride; }
};

struct SampleViews {
    int count = 0;  // 0: no samples of whole bytes can be taken from this format
    std::array<SampleView, 3> view;
};

SampleViews qvSampleViews(const QvFrame& frame);

// Sample x of a row; Word is uint8_t or uint16_t. Words may stand on odd addresses.
template <class Word>
inline int qvSampleAt(const unsigned char* row, int step, int x) {
    Word value;
    std::memcpy(&value, row + static_cast<std::ptrdiff_t>(x) * step, sizeof value);
    return value;
}
