// Line kernels on every vector unit of the machine, compared with the plain loops byte for byte: lines of any
// length at any place, in place where that is allowed, with bytes before and behind that must stay and a page
// without access behind.
#pragma once

#include <gtest/gtest.h>
#include <sys/mman.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string>

#include "tests/builtin/kernels/targets.h"

// Bytes of a line for n pixels: (n + more) / per * times; where its samples may begin.
struct LineSize {
    size_t times = 0, per = 1, align = 1, more = 0;
    size_t of(size_t n) const { return (n + more) / per * times; }
};
constexpr LineSize none{}, one{1}, half{1, 2}, twoBytes{2}, three{3}, four{4};
constexpr LineSize word{2, 1, 2}, halfWord{2, 2, 2}, eight{8}, sixteen{16}, v210Groups{16, 6, 1, 5};

struct LineCase {
    unsigned char* in[4];
    unsigned char* out[4];
    size_t n;
    uint16_t* words(int i) const { return reinterpret_cast<uint16_t*>(in[i]); }
    uint16_t* wordsOut(int i) const { return reinterpret_cast<uint16_t*>(out[i]); }
};

struct LineKernel {
    const char* name;
    LineSize in[4], out[4];
    void (*run)(const LineCase&);
    bool inPlace = false;  // the first output may be the first input
};

// One line at a time, ending `gap` bytes before the page without access.
class LineMemory {
  public:
    LineMemory()
        : map_(static_cast<unsigned char*>(
              mmap(nullptr, 2 * room, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0))) {
        mprotect(map_ + room, room, PROT_NONE);
    }
    ~LineMemory() { munmap(map_, 2 * room); }
    LineMemory(const LineMemory&) = delete;
    LineMemory& operator=(const LineMemory&) = delete;

    unsigned char* place(size_t bytes, size_t gap, unsigned seed) {
        line_ = map_ + room - gap - bytes;
        bytes_ = bytes;
        std::memset(line_ - around, mark, around);
        std::memset(line_ + bytes, mark, gap);
        unsigned value = seed * 2654435761u + 1;
        for (size_t i = 0; i < bytes; ++i) {
            value = value * 1664525u + 1013904223u;
            line_[i] = static_cast<unsigned char>(value >> 24);
        }
        return line_;
    }
    std::string bytes() const { return {reinterpret_cast<const char*>(line_), bytes_}; }
    bool intact() const {
        for (const unsigned char* at = line_ - around; at < map_ + room; ++at)
            if ((at < line_ || at >= line_ + bytes_) && *at != mark) return false;
        return true;
    }

  private:
    static constexpr size_t room = 4096, around = 64;
    static constexpr unsigned char mark = 0xA5;
    unsigned char* map_;
    unsigned char* line_ = nullptr;
    size_t bytes_ = 0;
};

class UnitRunner {
  public:
    // What is in the lines behind a run.
    std::string run(const LineKernel& kernel, size_t n, size_t gap, bool inPlace, int64_t target) {
        LineCase lines{{}, {}, n};
        for (unsigned i = 0; i < 4; ++i) {
            const LineSize &in = kernel.in[i], &out = kernel.out[i];
            lines.in[i] = in_[i].place(in.of(n), gap * in.align, i + static_cast<unsigned>(n));
            lines.out[i] = out_[i].place(out.of(n), gap * out.align, 77 + i);
            if (inPlace) lines.out[i] = lines.in[i];
        }
        {
            const OnTarget only(target);
            kernel.run(lines);
        }
        std::string result;
        for (int i = 0; i < 4; ++i) {
            result += in_[i].bytes() + out_[i].bytes();
            if (!in_[i].intact() || !out_[i].intact()) result += "written beside the line";
        }
        return result;
    }

  private:
    LineMemory in_[4], out_[4];
};

// Widths 1 to 129, and every distance from the end of the memory up to a vector.
inline void compareUnits(std::span<const LineKernel> kernels) {
    UnitRunner runner;
    const auto targets = machineTargets();
    for (const auto& kernel : kernels)
        for (size_t n = 1; n <= 129; ++n)
            for (size_t gap = 0; gap < 32; ++gap)
                for (const bool inPlace : {false, true}) {
                    if (inPlace && !kernel.inPlace) continue;
                    const std::string expected = runner.run(kernel, n, gap, inPlace, HWY_STATIC_TARGET);
                    ASSERT_EQ(expected.find("written beside"), std::string::npos) << kernel.name;
                    for (const auto target : targets)
                        ASSERT_TRUE(runner.run(kernel, n, gap, inPlace, target) == expected)
                            << kernel.name << ' ' << n << (inPlace ? " in place" : "") << " at " << gap
                            << " on " << hwy::TargetName(target);
                }
}
