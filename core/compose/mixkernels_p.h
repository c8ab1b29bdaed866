// Sums of weighted sound, on the vectors that the machine has.
#pragma once

#include <cstddef>
#include <cstdint>

namespace qvmix {

// A weight with 16 bits after the point, of which the lower 48 bits count: the 32 bits of a product from bit
// 16 on depend on no others.
struct Weight {
    std::uint32_t whole = 0;     // bits 16 to 47
    std::uint32_t fraction = 0;  // bits 0 to 15

    Weight() = default;
    explicit Weight(std::int64_t coefficient)
        : whole(static_cast<std::uint32_t>(static_cast<std::uint64_t>(coefficient) >> 16)),
          fraction(static_cast<std::uint32_t>(coefficient & 0xFFFF)) {}
};

// sum[i] += (from[i * step] * weight) >> 16, an arithmetic shift of the product in 64 bits; the sums wrap.
void addWeighted(std::int32_t* sum, const std::int32_t* from, std::size_t step, std::size_t count,
                 Weight weight);

}  // namespace qvmix
