#include "builtin/kernels/lines/samplerows.h"

#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/lines/samplerows.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

void weighBytes(Byte* dst, const Byte* src, const uint16_t* scale, const uint16_t* add, size_t bytes) {
    size_t i = 0;
#if QV_VECTORS
    const hn::Rebind<uint8_t, decltype(du16)> narrow;
    const size_t lanes = hn::Lanes(du16);
    for (; i + lanes <= bytes; i += lanes) {
        const auto wide = hn::PromoteTo(du16, hn::LoadU(narrow, src + i));
        const auto sum = hn::Add(hn::Mul(wide, hn::LoadU(du16, scale + i)), hn::LoadU(du16, add + i));
        hn::StoreU(hn::DemoteTo(narrow, hn::BitCast(d16, hn::ShiftRight<8>(sum))), narrow, dst + i);
    }
#endif
    for (; i < bytes; ++i) dst[i] = static_cast<Byte>((src[i] * scale[i] + add[i]) >> 8);
}

void weighWords(Byte* dst, const Byte* src, const uint32_t* scale, const uint32_t* add, size_t words) {
    size_t i = 0;
#if QV_VECTORS
    const hn::Repartition<uint32_t, D8> du32;
    const hn::Rebind<uint16_t, decltype(du32)> narrow;
    const hn::Repartition<uint8_t, decltype(narrow)> bytes;
    const size_t lanes = hn::Lanes(du32);
    for (; i + lanes <= words; i += lanes) {
        const auto wide = hn::PromoteTo(du32, hn::BitCast(narrow, hn::LoadU(bytes, src + 2 * i)));
        const auto sum = hn::Add(hn::Mul(wide, hn::LoadU(du32, scale + i)), hn::LoadU(du32, add + i));
        const auto done = hn::DemoteTo(narrow, hn::BitCast(d32, hn::ShiftRight<16>(sum)));
        hn::StoreU(hn::BitCast(bytes, done), bytes, dst + 2 * i);
    }
#endif
    for (; i < words; ++i) putWord(dst, i, (wordAt(src, i) * scale[i] + add[i]) >> 16);
}

void weighTens(Byte* dst, const Byte* src, const uint32_t* scale, const uint32_t* add, size_t words) {
    size_t i = 0;
#if QV_VECTORS
    const hn::Repartition<uint32_t, D8> du32;
    const size_t lanes = hn::Lanes(du32);
    for (; i + lanes <= words; i += lanes) {
        const auto three = hn::BitCast(du32, hn::LoadU(d8, src + 4 * i));
        auto s0 = hn::Zero(du32), s1 = s0, s2 = s0, a0 = s0, a1 = s0, a2 = s0;
        hn::LoadInterleaved3(du32, scale + 3 * i, s0, s1, s2);
        hn::LoadInterleaved3(du32, add + 3 * i, a0, a1, a2);
        const auto ten = hn::Set(du32, 1023);
        const auto weighed = [](auto sample, auto s, auto a) {
            return hn::ShiftRight<16>(hn::Add(hn::Mul(sample, s), a));
        };
        const auto w0 = weighed(hn::And(three, ten), s0, a0);
        const auto w1 = weighed(hn::And(hn::ShiftRight<10>(three), ten), s1, a1);
        const auto w2 = weighed(hn::And(hn::ShiftRight<20>(three), ten), s2, a2);
        const auto joined = hn::Or(w0, hn::Or(hn::ShiftLeft<10>(w1), hn::ShiftLeft<20>(w2)));
        hn::StoreU(hn::BitCast(d8, joined), d8, dst + 4 * i);
    }
#endif
    for (; i < words; ++i) {
        uint32_t three = 0, joined = 0;
        std::memcpy(&three, src + 4 * i, 4);
        for (size_t k = 0; k < 3; ++k)
            joined |= ((three >> 10 * k & 1023) * scale[3 * i + k] + add[3 * i + k]) >> 16 << 10 * k;
        std::memcpy(dst + 4 * i, &joined, 4);
    }
}

#if QV_VECTORS

// Sixteen tables of sixteen entries, of which each bit of the upper half byte halves the choice.
HWY_INLINE V8 lookUp(const Byte* table, V8 index) {
    const auto low = hn::And(index, hn::Set(d8, 15));
    const auto chosenBy = [&](int bit) { return hn::TestBit(index, hn::Set(d8, static_cast<Byte>(bit))); };
    const auto by16 = chosenBy(16), by32 = chosenBy(32), by64 = chosenBy(64), by128 = chosenBy(128);
    const auto entries = [&](int k) { return hn::TableLookupBytes(hn::LoadDup128(d8, table + 16 * k), low); };
    const auto pair = [&](int k) { return hn::IfThenElse(by16, entries(k + 1), entries(k)); };
    const auto four = [&](int k) { return hn::IfThenElse(by32, pair(k + 2), pair(k)); };
    const auto eight = [&](int k) { return hn::IfThenElse(by64, four(k + 4), four(k)); };
    return hn::IfThenElse(by128, eight(8), eight(0));
}

size_t lookUpVectors(Byte* dst, const Byte* src, const Byte* table, unsigned chosen, size_t bytes) {
    const size_t lanes = hn::Lanes(d8);
    const hn::Repartition<uint32_t, D8> du32;
    uint32_t group = 0;
    for (unsigned k = 0; k < 4; ++k) group |= (chosen >> k & 1) * (0xFFu << 8 * k);
    const auto mask = hn::MaskFromVec(hn::BitCast(d8, hn::Set(du32, group)));
    size_t i = 0;
    for (; i + lanes <= bytes; i += lanes) {
        const auto in = hn::LoadU(d8, src + i);
        hn::StoreU(hn::IfThenElse(mask, lookUp(table, in), in), d8, dst + i);
    }
    return i;
}

#endif

void lookUpBytes(Byte* dst, const Byte* src, const Byte* table, unsigned chosen, size_t bytes) {
    size_t i = 0;
#if QV_VECTORS
    i = lookUpVectors(dst, src, table, chosen, bytes);
#endif
    for (; i < bytes; ++i) dst[i] = chosen >> (i & 3) & 1 ? table[src[i]] : src[i];
}

// A table of 128 KB has no vector form that is faster than its loads.
void lookUpWords(Byte* dst, const Byte* src, const uint16_t* table, unsigned chosen, size_t words) {
    size_t i = 0;
    for (; i + 4 <= words; i += 4) {
        uint16_t group[4];
        std::memcpy(group, src + 2 * i, 8);
        for (unsigned k = 0; k < 4; ++k)
            if (chosen >> k & 1) group[k] = table[group[k]];
        std::memcpy(dst + 2 * i, group, 8);
    }
    for (; i < words; ++i) putWord(dst, i, chosen >> (i & 3) & 1 ? table[wordAt(src, i)] : wordAt(src, i));
}

const char* sampleRowsUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

HWY_EXPORT(weighBytes);
void weighBytes(Byte* dst, const Byte* src, const uint16_t* scale, const uint16_t* add, size_t bytes) {
    HWY_DYNAMIC_DISPATCH(weighBytes)(dst, src, scale, add, bytes);
}

HWY_EXPORT(weighWords);
void weighWords(Byte* dst, const Byte* src, const uint32_t* scale, const uint32_t* add, size_t words) {
    HWY_DYNAMIC_DISPATCH(weighWords)(dst, src, scale, add, words);
}

HWY_EXPORT(weighTens);
void weighTens(Byte* dst, const Byte* src, const uint32_t* scale, const uint32_t* add, size_t words) {
    HWY_DYNAMIC_DISPATCH(weighTens)(dst, src, scale, add, words);
}

HWY_EXPORT(lookUpBytes);
void lookUpBytes(Byte* dst, const Byte* src, const Byte* table, unsigned chosen, size_t bytes) {
    HWY_DYNAMIC_DISPATCH(lookUpBytes)(dst, src, table, chosen, bytes);
}

HWY_EXPORT(lookUpWords);
void lookUpWords(Byte* dst, const Byte* src, const uint16_t* table, unsigned chosen, size_t words) {
    HWY_DYNAMIC_DISPATCH(lookUpWords)(dst, src, table, chosen, words);
}

HWY_EXPORT(sampleRowsUnit);
const char* sampleRowsUnit() { return HWY_DYNAMIC_DISPATCH(sampleRowsUnit)(); }

}  // namespace srk
#endif
