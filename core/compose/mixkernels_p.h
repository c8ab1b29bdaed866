// Sums of weighted sound, on the vectors that the machine has.
#pragma once

#include <cstddef>
#include <cstdint>

namespace qvmix {

// sum[i] += (from[i * step] * coefficient) >> 16, an arithmetic shift of the product in 64 bits; the sums
// wrap.
void addWeighted(std::int32_t* sum, const std::int32_t* from, std::size_t step, std::size_t count,
                 std::int64_t coefficient);

// The same into sums of which nothing is set: sum[i] = ...
void setWeighted(std::int32_t* sum, const std::int32_t* from, std::size_t step, std::size_t count,
                 std::int64_t coefficient);

// to[i * step + row] = rows[row * length + i] for each row and each i below count.
void interleave(std::int32_t* to, std::size_t step, const std::int32_t* rows, std::size_t length, int nrRows,
                std::size_t count);

}  // namespace qvmix
