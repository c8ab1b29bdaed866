// How a picture goes from one format to another: by way of which core form, chosen by cost, once for the
// process.
#pragma once

#include <cstdint>

#include "builtin/kernels/formats/formats.h"

namespace srk {

// What is worked on between the input and the output kernels. Planes of samples of one width; chroma planes
// have the size that their format gives them until a matrix needs them at full size.
enum class Core : uint8_t { rgb8, video8, yuv8, rgb16, video16, yuv16, packed8, lines, none };

constexpr bool isDeep(Core core) {
    return core == Core::rgb16 || core == Core::video16 || core == Core::yuv16;
}

// Paths that copy or shuffle lines (`packed8`, `lines`) are for conversions without scaling and without a
// change of matrix.
enum class Use : uint8_t { plain, scaling };

struct Path {
    Core from = Core::none, to = Core::none;
    int cost = 0;
    explicit operator bool() const { return from != Core::none; }
};

// The cheapest path, or none, between two formats by their numbers.
const Path& pathOf(int source, int target, Use use);

}  // namespace srk
