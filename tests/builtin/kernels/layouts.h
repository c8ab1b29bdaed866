// Where the planes of a picture that the scaler knows lie in memory.
#pragma once

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>
#include <utility>

#include "builtin/kernels/formats/formats.h"
#include "core/filter/srscaler.h"
#include "core/measure/fourcc.h"

inline unsigned codeOf(const std::string& name) {
    unsigned code = 0;
    std::memcpy(&code, name.data(), std::min<size_t>(4, name.size()));
    return code;
}

// A picture in one block, with its own stride for 0; without a format if it must be refused.
inline srk::Picture layoutOf(unsigned code, int w, int h, srk::Byte* memory, int stride = 0) {
    srk::Picture picture;
    const int number = srk::formatNumber(code);
    if (number < 0 || w <= 0 || h <= 0) return picture;
    picture.format = &srk::formats()[static_cast<size_t>(number & 0xffff)];
    picture.width = w;
    picture.height = h;
    if (!srk::layOut(picture, memory, stride)) picture.format = nullptr;
    return picture;
}

// The bytes from the first to the last one that a picture uses; 0 for one that must be refused.
inline size_t bytesOf(unsigned code, int w, int h, int stride = 0) {
    srk::Byte byte = 0;
    const srk::Picture picture = layoutOf(code, w, h, &byte, stride);
    size_t bytes = 0;
    for (int p = 0; picture.format && p < picture.format->planes(); ++p) {
        const int lines = picture.planeHeight(p);
        const long long line = srk::lineBytes(*picture.format, w, p);
        if (lines == 0 || line == 0) continue;
        const auto end =
            picture.planes[p].data - &byte + std::llabs(picture.planes[p].stride) * (lines - 1) + line;
        bytes = std::max(bytes, static_cast<size_t>(end));
    }
    return bytes;
}
inline size_t bytesOf(const std::string& name, int w, int h) { return bytesOf(codeOf(name), w, h); }

// Makes the planes whose bits are set be walked upwards.
inline void walkUpwards(srk::Picture& picture, unsigned upwards) {
    for (int p = 0; p < picture.format->planes(); ++p)
        if (auto& plane = picture.planes[p]; upwards >> p & 1)
            plane = {plane.data + plane.stride * std::max(picture.planeHeight(p) - 1, 0), -plane.stride};
}

// The planes in the order of the format.
inline QvScalePicture recordOf(unsigned code, const srk::Picture& picture) {
    QvScalePicture record = {qvFourcc("EXT1"), code, picture.width, picture.height, 0, 0, 0, {}};
    int* const strides[3] = {&record.stride, &record.stride1, &record.stride2};
    const bool swapped = picture.format->planes() == 3 && !picture.format->has(srk::uBeforeV);
    for (int p = 0; p < picture.format->planes(); ++p) {
        const int at = p && swapped ? 3 - p : p;
        *strides[at] = static_cast<int>(picture.planes[p].stride);
        record.planes[at] = picture.planes[p].data;
    }
    return record;
}
