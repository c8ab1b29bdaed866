// Line kernels on every vector unit of the machine, compared with the plain loops byte for byte: lines of any
// length at any place, in place where that is allowed, with bytes before and after that must stay and a page
// without access after those.
#pragma once

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <functional>
#include <span>
#include <string>
#include <tuple>
#include <type_traits>
#include <vector>

#include "tests/support/guarded.h"
#include "tests/support/vector_targets.h"

// Bytes of a line for n pixels: (n + more) / per * times; where its samples may begin.
struct LineSize {
    size_t times = 0, per = 1, align = 1, more = 0;
    size_t of(size_t n) const { return (n + more) / per * times; }
};
constexpr LineSize one{1}, half{1, 2}, twoBytes{2}, three{3}, four{4};
constexpr LineSize word{2, 1, 2}, halfWord{2, 2, 2}, eight{8}, sixteen{16}, v210Groups{16, 6, 1, 5};

struct LineCase {
    unsigned char* in[8];
    unsigned char* out[4];
    size_t n;
    const uint16_t* words(int i) const { return reinterpret_cast<uint16_t*>(in[i]); }
    uint16_t* wordsOut(int i) const { return reinterpret_cast<uint16_t*>(out[i]); }
};

struct LineKernel {
    const char* name;
    LineSize in[8], out[4];
    std::function<void(const LineCase&)> run;
    bool inPlace = false;  // each output may be the input of its number
};

// Calls a kernel with the lines to read and to write in their order, null where the row has no more, and with
// the number of pixels and what is given by their types.
template <class... P, class... Given>
auto onLines(void (*kernel)(P...), Given... given) {
    return [=](const LineCase& l) {
        auto in = l.in;
        auto out = l.out;
        const auto argument = [&]<class T>(std::type_identity<T>) -> std::decay_t<T> {
            if constexpr (!std::is_pointer_v<T>)
                return std::get<std::decay_t<T>>(std::tuple(l.n, given...));
            else if constexpr (std::is_const_v<std::remove_pointer_t<T>>)
                return reinterpret_cast<T>(*in++);
            else
                return reinterpret_cast<T>(*out++);
        };
        std::apply(kernel, std::tuple<std::decay_t<P>...>{argument(std::type_identity<P>())...});
    };
}

template <class Sample>
Sample sampleAt(const unsigned char* line, size_t i) {
    Sample sample;
    std::memcpy(&sample, line + i * sizeof sample, sizeof sample);
    return sample;
}

// Runs a kernel and checks that each sample of the first output is what a formula gives for its place, which
// sees all lines as they were before.
template <class Sample, class Run, class Formula>
auto checked(Run run, Formula formula) {
    return [=](const LineCase& l) {
        std::vector<Sample> wanted, got;
        for (size_t i = 0; i < l.n; ++i) wanted.push_back(static_cast<Sample>(formula(l, i)));
        run(l);
        for (size_t i = 0; i < l.n; ++i) got.push_back(sampleAt<Sample>(l.out[0], i));
        ASSERT_EQ(got, wanted);
    };
}

// What is in the lines after a run.
inline std::string linesBehind(const LineKernel& kernel, size_t n, size_t gap, bool inPlace, int64_t target) {
    static Guarded memory[12];
    LineCase lines{{}, {}, n};
    for (unsigned i = 0; i < 12; ++i) {
        const LineSize& size = i < 8 ? kernel.in[i] : kernel.out[i - 8];
        unsigned char* const line =
            memory[i].place(size.of(n), gap * size.align, i + static_cast<unsigned>(n));
        if (size.times) (i < 8 ? lines.in[i] : lines.out[i - 8]) = i < 8 || !inPlace ? line : lines.in[i - 8];
    }
    {
        const OnTarget only(target);
        kernel.run(lines);
    }
    std::string result;
    for (const Guarded& line : memory) result += line.intact() ? line.bytes() : "written outside of the line";
    return result;
}

// Widths 1 to 129, and every distance from the end of the memory up to a vector.
inline void compareUnits(std::span<const LineKernel> kernels,
                         const std::vector<int64_t>& targets = machineTargets()) {
    for (const auto& kernel : kernels)
        for (size_t n = 1; n <= 129; ++n)
            for (size_t gap = 0; gap < 32; ++gap)
                for (const bool inPlace : {false, true}) {
                    if (inPlace && !kernel.inPlace) continue;
                    const std::string expected = linesBehind(kernel, n, gap, inPlace, HWY_STATIC_TARGET);
                    ASSERT_EQ(expected.find("written outside"), std::string::npos) << kernel.name;
                    ASSERT_FALSE(testing::Test::HasFailure()) << kernel.name << ' ' << n << " at " << gap;
                    for (const auto target : targets)
                        ASSERT_TRUE(linesBehind(kernel, n, gap, inPlace, target) == expected)
                            << kernel.name << ' ' << n << (inPlace ? " in place" : "") << " at " << gap
                            << " on " << hwy::TargetName(target);
                }
}
