// What the vector kernels share, compiled once for each vector unit: include inside the foreach_target file
// after <hwy/highway.h>.

#ifndef QV_KERNEL
#include <bit>
#include <cstdint>
#include <cstring>

// One line a kernel: exported by name, called through the table of the machine's units.
#define QV_KERNEL(name, parameters, arguments) \
    HWY_EXPORT(name);                          \
    void name parameters { HWY_DYNAMIC_DISPATCH(name) arguments; }  // NOLINT(bugprone-macro-parentheses)
#endif

#if defined(QV_KERNEL_VECTORS_INL) == defined(HWY_TARGET_TOGGLE)
#ifdef QV_KERNEL_VECTORS_INL
#undef QV_KERNEL_VECTORS_INL
#else
#define QV_KERNEL_VECTORS_INL
#endif

// Without a vector unit the plain loops do all of the work, and are what the units are compared with.
#undef QV_VECTORS
#define QV_VECTORS (HWY_TARGET != HWY_SCALAR && HWY_TARGET != HWY_EMU128)

// Kernels that count on how this unit packs and multiplies; elsewhere the plain loops do their work.
#undef QV_WIDE
#define QV_WIDE (QV_VECTORS && HWY_ARCH_X86)

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// Words at any address, in the order of memory.
HWY_INLINE uint16_t wordAt(const Byte* from, size_t i) {
    static_assert(std::endian::native == std::endian::little, "words are read in the order of memory");
    uint16_t word;
    std::memcpy(&word, from + 2 * i, 2);
    return word;
}
HWY_INLINE void putWord(Byte* to, size_t i, unsigned value) {
    const auto word = static_cast<uint16_t>(value);
    std::memcpy(to + 2 * i, &word, 2);
}

#if QV_VECTORS

// At most 32 bytes: wider vectors gain nothing here, and cost clock.
const hn::CappedTag<uint8_t, 32> d8;
using D8 = decltype(hn::CappedTag<uint8_t, 32>());
const hn::Repartition<int8_t, D8> di8;
const hn::Repartition<int16_t, D8> d16;
const hn::Repartition<uint16_t, D8> du16;
const hn::Repartition<int32_t, D8> d32;
using V8 = hn::Vec<D8>;
using VI8 = hn::Vec<decltype(hn::Repartition<int8_t, D8>())>;
using V16 = hn::Vec<decltype(hn::Repartition<int16_t, D8>())>;
using V32 = hn::Vec<decltype(hn::Repartition<int32_t, D8>())>;

// Each 32-bit lane: the products of its two halves added up.
HWY_INLINE V32 pairDot(V16 a, V16 b) {
#if HWY_ARCH_X86
    V32 unused = hn::Zero(d32);
    return hn::ReorderWidenMulAccumulate(d32, a, b, hn::Zero(d32), unused);
#else
    const auto x = hn::BitCast(d32, a), y = hn::BitCast(d32, b);
    const auto low =
        hn::Mul(hn::ShiftRight<16>(hn::ShiftLeft<16>(x)), hn::ShiftRight<16>(hn::ShiftLeft<16>(y)));
    return hn::Add(low, hn::Mul(hn::ShiftRight<16>(x), hn::ShiftRight<16>(y)));
#endif
}

// Each 16-bit lane: the products of its two bytes, pixels by signed weights, added up. The sum must fit.
HWY_INLINE V16 pairDotBytes(V8 pixels, VI8 weights) {
#if HWY_ARCH_X86
#if HWY_TARGET <= HWY_AVX2
    return V16{_mm256_maddubs_epi16(pixels.raw, weights.raw)};
#else
    return V16{_mm_maddubs_epi16(pixels.raw, weights.raw)};
#endif
#else
    const auto p = hn::BitCast(du16, pixels);
    const auto w = hn::BitCast(d16, weights);
    const auto low =
        hn::Mul(hn::BitCast(d16, hn::And(p, hn::Set(du16, 255))), hn::ShiftRight<8>(hn::ShiftLeft<8>(w)));
    return hn::Add(low, hn::Mul(hn::BitCast(d16, hn::ShiftRight<8>(p)), hn::ShiftRight<8>(w)));
#endif
}

// Two 16-bit weights side by side, for pairDot.
HWY_INLINE V16 pairOf(int first, int second) {
    const auto packed = static_cast<uint32_t>(static_cast<uint16_t>(first)) | static_cast<uint32_t>(second)
                                                                                  << 16;
    return hn::BitCast(d16, hn::Set(d32, static_cast<int32_t>(packed)));
}

// The lower and upper halves of each 16-byte block with zeros between the bytes, and back with clamping.
HWY_INLINE V16 lowWords(V8 bytes) { return hn::BitCast(d16, hn::InterleaveLower(d8, bytes, hn::Zero(d8))); }
HWY_INLINE V16 highWords(V8 bytes) { return hn::BitCast(d16, hn::InterleaveUpper(d8, bytes, hn::Zero(d8))); }
HWY_INLINE V8 joinWords(V16 low, V16 high) {
#if HWY_ARCH_X86 && HWY_TARGET <= HWY_AVX2
    return V8{_mm256_packus_epi16(low.raw, high.raw)};
#elif HWY_ARCH_X86
    return V8{_mm_packus_epi16(low.raw, high.raw)};
#else
    const hn::Half<decltype(hn::CappedTag<uint8_t, 32>())> half;
    return hn::Combine(d8, hn::DemoteTo(half, high), hn::DemoteTo(half, low));
#endif
}

#endif

#if QV_WIDE

// --- Whole vectors, where there is enough to do for each byte.

const hn::ScalableTag<uint8_t> hBytes;
using HB = decltype(hn::ScalableTag<uint8_t>());
const hn::RepartitionToWide<HB> huWords;
const hn::Repartition<int16_t, HB> hWords;
const hn::Repartition<int32_t, HB> hInts;
using HV8 = hn::Vec<HB>;
using HV16 = hn::Vec<decltype(hn::Repartition<int16_t, HB>())>;
using HV32 = hn::Vec<decltype(hn::Repartition<int32_t, HB>())>;

HWY_INLINE size_t byteLanes() { return hn::Lanes(hBytes); }

HWY_INLINE HV32 dot(HV16 a, HV16 b) {
    auto unused = hn::Zero(hInts);
    return hn::ReorderWidenMulAccumulate(hInts, a, b, hn::Zero(hInts), unused);
}

HWY_INLINE HV16 dotBytes(HV8 pixels, HV8 weights) {
#if HWY_TARGET <= HWY_AVX3
    return HV16{_mm512_maddubs_epi16(pixels.raw, weights.raw)};
#elif HWY_TARGET <= HWY_AVX2
    return HV16{_mm256_maddubs_epi16(pixels.raw, weights.raw)};
#else
    return HV16{_mm_maddubs_epi16(pixels.raw, weights.raw)};
#endif
}

HWY_INLINE HV8 clampBytes(HV16 low, HV16 high) {
#if HWY_TARGET <= HWY_AVX3
    return HV8{_mm512_packus_epi16(low.raw, high.raw)};
#elif HWY_TARGET <= HWY_AVX2
    return HV8{_mm256_packus_epi16(low.raw, high.raw)};
#else
    return HV8{_mm_packus_epi16(low.raw, high.raw)};
#endif
}

HWY_INLINE HV16 pairWeights(int first, int second) {
    const auto packed = static_cast<uint32_t>(static_cast<uint16_t>(first)) | static_cast<uint32_t>(second)
                                                                                  << 16;
    return hn::BitCast(hWords, hn::Set(hInts, static_cast<int32_t>(packed)));
}

// Four vectors of 32-bit lanes to bytes in their order: packing goes block by block, so double word d of the
// result lies in block d % blocks at place d / blocks.
class Packer {
  public:
    Packer() : order_(hn::SetTableIndices(hInts, places())) {}
    HWY_INLINE HV8 operator()(const HV32 v[4]) const {
        return ordered(
            clampBytes(hn::ReorderDemote2To(hWords, v[0], v[1]), hn::ReorderDemote2To(hWords, v[2], v[3])));
    }
    // The last step alone.
    HWY_INLINE HV8 ordered(HV8 bytes) const {
        return hn::BitCast(hBytes, hn::TableLookupLanes(hn::BitCast(hInts, bytes), order_));
    }

  private:
    static const int32_t* places() {
        static const struct Table {
            int32_t at[16];
            Table() {
                const auto blocks = static_cast<int>(byteLanes() / 16);
                for (int d = 0; d < 4 * blocks; ++d) at[d] = d % blocks * 4 + d / blocks;
            }
        } table;
        return table.at;
    }
    decltype(hn::SetTableIndices(hInts, static_cast<const int32_t*>(nullptr))) order_;
};
#endif

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#endif
