#include "core/arch/platform.h"

#if defined(__x86_64__) || defined(__i386__)
#include <cpuid.h>
#endif

#if defined(__x86_64__) || defined(__i386__)

namespace {

enum Register { eax, ebx, ecx, edx };

struct Feature {
    const char* name;
    unsigned leaf;
    Register where;
    unsigned bit;
    bool wide = false;  // also needs the system to save the registers of AVX
};

// In the order of the printed text.
constexpr Feature features[] = {
    {"MMX", 1, edx, 23},
    {"MMXEXT", 0x80000001, edx, 22},
    {"CMOV", 1, edx, 15},
    {"3DNOW", 0x80000001, edx, 31},
    {"3DNOWEXT", 0x80000001, edx, 30},
    {"SSEFP", 1, edx, 25},
    {"SSE2", 1, edx, 26},
    {"SSE3", 1, ecx, 0},
    {"SSSE3", 1, ecx, 9},
    {"SSE4.1", 1, ecx, 19},
    {"SSE4.2", 1, ecx, 20},
    {"POPCNT", 1, ecx, 23},
    {"AES", 1, ecx, 25},
    {"AVX", 1, ecx, 28, true},
    {"F16C", 1, ecx, 29, true},
    {"FMA3", 1, ecx, 12, true},
    {"BMI1", 7, ebx, 3},
    {"AVX2", 7, ebx, 5, true},
    {"BMI2", 7, ebx, 8},
    {"AVX512F", 7, ebx, 16, true},
    {"AVX512BW", 7, ebx, 30, true},
};

bool processorHas(const Feature& feature) {
    unsigned registers[4] = {};
    if (!__get_cpuid_count(feature.leaf, 0, &registers[eax], &registers[ebx], &registers[ecx],
                           &registers[edx]))
        return false;
    return registers[feature.where] >> feature.bit & 1;
}

// The compiler's own test knows what the system saves.
bool usable(const Feature& feature) {
    if (!processorHas(feature)) return false;
    if (!feature.wide) return true;
    return std::string_view(feature.name).starts_with("AVX512") ? __builtin_cpu_supports("avx512f")
                                                                : __builtin_cpu_supports("avx");
}

}  // namespace

std::string QvPlatform::cpuFeatures() {
    std::string text;
    for (const Feature& feature : features)
        if (usable(feature)) text.append(text.empty() ? "" : " ").append(feature.name);
    return text;
}

#elif defined(__aarch64__)

#include <sys/auxv.h>

std::string QvPlatform::cpuFeatures() {
    struct Feature {
        const char* name;
        unsigned long bit;
    };
    constexpr Feature features[] = {{"NEON", 1ul << 1},  {"AES", 1ul << 3},      {"CRC32", 1ul << 7},
                                    {"FP16", 1ul << 10}, {"DOTPROD", 1ul << 20}, {"SVE", 1ul << 22}};
    const unsigned long found = getauxval(AT_HWCAP);
    std::string text;
    for (const Feature& feature : features)
        if (found & feature.bit) text.append(text.empty() ? "" : " ").append(feature.name);
    return text;
}

#else

std::string QvPlatform::cpuFeatures() { return ""; }

#endif
