// The stages of a conversion over one band: each line of the target pulls the lines that it needs, so that
// what lies between the pictures stays in the cache.
//
//     source line -> [RGB to YUV] -> scaled -> [matrix, levels] -> [chroma to its size] -> target line
#pragma once

#include <type_traits>

#include "builtin/kernels/convert/plan.h"
#include "builtin/kernels/convert/workspace.h"

namespace srk {

// The memory of the stages for samples of type S.
template <class S>
struct Lines {
    using Word = std::conditional_t<sizeof(S) == 1, int16_t, float>;
    static constexpr int planes = 4;

    struct Stage {
        Ring<Word> words[planes];
        Ring<S> out[planes];
    };

    Ring<S> source[planes];
    Stage stages[2];
    Ring<S> matrixed[planes];
    Block<S> padded;  // a line with its ends repeated, or one that goes on across
    Block<float> paddedWide;
    Block<Byte> narrow;  // four lines of bytes beside 16-bit ones
    size_t narrowLength = 0;
    Block<S> neutral;
    Ring<Byte> pixels;  // lines of other RGB as four bytes a pixel

    explicit Lines(const Plan& plan);
    void forget();
};

extern template struct Lines<Byte>;
extern template struct Lines<uint16_t>;

}  // namespace srk
