// Lists of stages: what they say, what each rewrite leaves of the picture, and which lines a band writes.
#include "builtin/kernels/convert/stages.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "builtin/kernels/convert/plan.h"
#include "builtin/kernels/convert/rewrites.h"
#include "builtin/kernels/convert/workspace.h"
#include "tests/builtin/kernels/layouts.h"
#include "tests/support/vector_targets.h"

namespace {

using srk::Filter;
using Bytes = std::vector<unsigned char>;

struct Case {
    const char *from, *to;
    int w, h, tw, th;
    Filter filter = Filter::cubic;
    bool interlaced = false, otherMatrix = false;
    int left = 0, top = 0;  // of a crop: the target has the size of what is left
};

srk::Request requestOf(const Case& c) {
    srk::Request request;
    const int from = srk::formatNumber(codeOf(c.from)), to = srk::formatNumber(codeOf(c.to));
    request.source = from & 0xffff;
    request.target = to & 0xffff;
    request.sourceDepth = from >> 16 ? from >> 16 : 16;
    request.targetDepth = to >> 16 ? to >> 16 : 16;
    request.sourceWidth = c.w;
    request.sourceHeight = c.h;
    request.width = c.tw;
    request.height = c.th;
    request.filter = c.filter;
    request.standard = c.filter == Filter::cubic;
    request.interlaced = c.interlaced;
    if (c.otherMatrix) request.targetMatrix = srk::Matrix::bt709;
    const auto mapping = [](int source, int target, int offset) {
        if (offset > 0 || source == target) return srk::Mapping{static_cast<double>(offset), 1};
        const double step = static_cast<double>(source) / target;
        return srk::Mapping{step / 2 - 0.5, step};
    };
    request.across = mapping(c.w, c.tw, c.left);
    request.down = mapping(c.h, c.th, c.top);
    return request;
}

Bytes noise(size_t bytes, unsigned seed) {
    Bytes made(bytes);
    for (auto& byte : made) byte = static_cast<unsigned char>((seed = seed * 1664525u + 1013904223u) >> 24);
    return made;
}

// Converts target lines first to last - 1 of each field; without a line: all.
Bytes pictureOf(const srk::Plan& plan, const Case& c, int first = 0, int last = 1 << 20) {
    Bytes from = noise(bytesOf(c.from, c.w, c.h) + 1, 5), to(bytesOf(c.to, c.tw, c.th), 0x5A);
    srk::Picture source = layoutOf(codeOf(c.from), c.w, c.h, from.data());
    srk::Picture target = layoutOf(codeOf(c.to), c.tw, c.th, to.data());
    source.depth = plan.route.request.sourceDepth;
    target.depth = plan.route.request.targetDepth;
    srk::Workspace workspace(plan);
    for (int field = 0; field < plan.route.fields; ++field)
        srk::runBand(plan, workspace, source, target, field, first,
                     std::min(last, srk::fieldLines(c.th, plan.route.fields, field)));
    return to;
}

std::string listOf(const Case& c) { return srk::worksOf(srk::makePlan(requestOf(c))->lists[0]); }

// The largest difference between two samples, of words where the format has them.
int difference(const Case& c, const Bytes& a, const Bytes& b) {
    const auto& format = srk::formats()[static_cast<size_t>(requestOf(c).target)];
    const bool words = format.packing == srk::Packing::planar16 || format.bits == 64;
    int most = 0;
    for (size_t i = 0; i + (words ? 1 : 0) < a.size(); i += words ? 2 : 1) {
        const int x = words ? a[i] | a[i + 1] << 8 : a[i], y = words ? b[i] | b[i + 1] << 8 : b[i];
        most = std::max(most, std::abs(x - y));
    }
    return most;
}

constexpr Case cases[] = {
    {"I420", "I420", 34, 18, 34, 18},
    {"YUYV", "YUYV", 34, 9, 34, 9, Filter::cubic, true},
    {"BGR4", "BGR3", 35, 7, 35, 7},
    {"BGR3", "BGR4", 35, 7, 35, 7},
    {"I420", "YV12", 34, 18, 34, 18},
    {"I420", "BGR4", 67, 22, 67, 22, Filter::nearest},
    {"I420", "BGR3", 66, 23, 66, 23},
    {"YV12", "BGR3", 67, 23, 67, 23, Filter::nearest, true},
    {"I420", "R565", 40, 20, 62, 14, Filter::sinc},
    {"YUYV", "I420", 66, 22, 66, 22},
    {"UYVY", "I420", 67, 23, 67, 23, Filter::nearest, true},
    {"YUYV", "I420", 66, 22, 50, 16, Filter::cubic, false, false, 6, 4},
    {"BGR4", "I420", 66, 22, 66, 22},
    {"BGR3", "YV12", 66, 22, 66, 22, Filter::nearest},
    {"R565", "YUYV", 67, 21, 67, 21},
    {"BGR4", "I444", 31, 9, 31, 9},
    {"BGR4", "GRAY", 31, 9, 31, 9},
    {"BGR4", "GRAY", 31, 9, 20, 17},
    {"R32C", "BGR4", 31, 9, 31, 9},
    {"I420", "W016", 34, 18, 34, 18},
    {"I420", "W016", 34, 18, 20, 10, Filter::cubic, false, false, 4, 2},
    {"W010", "W216", 34, 18, 34, 18, Filter::nearest},
    {"v210", "W016", 36, 18, 36, 18},
    {"Y216", "Y416", 36, 18, 36, 18, Filter::nearest, true},
    {"Y216", "Y416", 36, 18, 36, 18},
    {"BGR4", "W016", 36, 18, 50, 31},
    {"B64A", "W416", 36, 18, 36, 18},
    {"B64A", "Y16", 36, 18, 36, 18},
    {"I420", "I420", 36, 20, 36, 20, Filter::cubic, true, true},
    {"I422", "VUY4", 36, 20, 36, 20, Filter::cubic, false, true},
    {"GRAY", "I420", 36, 20, 36, 20},
    {"I420", "I422", 1, 1, 1, 1},
    {"YUYV", "I420", 3, 3, 3, 3},
};

std::string nameOf(const Case& c) {
    return std::string(c.from) + " to " + c.to + ' ' + std::to_string(c.w) + 'x' + std::to_string(c.h) +
           " to " + std::to_string(c.tw) + 'x' + std::to_string(c.th);
}

}  // namespace

TEST(Stages, AreThoseThatAConversionNeeds) {
    const struct {
        Case conversion;
        const char* works;
    } rows[] = {
        {{"I420", "I420", 64, 32, 64, 32}, "source copy copy copy"},
        {{"BGR4", "BGR3", 64, 32, 64, 32}, "source shuffle"},
        {{"I420", "YV12", 64, 32, 64, 32}, "source lower lower lower"},
        {{"I420", "BGR4", 64, 32, 64, 32, Filter::nearest}, "source downSamples downSamples packFromYuv"},
        {{"I420", "BGR4", 64, 32, 64, 32}, "source downSamples between downSamples between packFromYuv"},
        {{"I420", "BGR4", 64, 32, 128, 64, Filter::sinc},
         "source across down across down across down packFromYuv"},
        {{"YUYV", "I420", 64, 32, 64, 32}, "source packedLuma packedChroma"},
        {{"YUYV", "I420", 64, 32, 96, 48}, "source unpack across down across down across down"},
        {{"BGR4", "I420", 64, 32, 64, 32}, "source pixelLuma pixelChroma"},
        {{"R555", "I420", 64, 32, 64, 32}, "source unpack pack pixelLuma pixelChroma"},
        {{"BGR4", "GRAY", 64, 32, 64, 32}, "source unpackToYuv"},
        {{"I420", "W016", 64, 32, 64, 32}, "source raise raise raise"},
        {{"v210", "W010", 64, 32, 64, 32}, "source unpack lower downSamples lower downSamples lower"},
        {{"I420", "I420", 64, 32, 64, 32, Filter::cubic, false, true},
         "source downSamples between downSamples between change across down across down"},
    };
    for (const auto& row : rows) EXPECT_EQ(listOf(row.conversion), row.works) << nameOf(row.conversion);
    const auto plan = srk::makePlan(requestOf({"YUYV", "I420", 64, 32, 64, 16, Filter::sinc}));
    EXPECT_EQ(srk::describe(plan->lists[0]),
              "0 source\n"
              "1 unpack 0.0 -> 0: 64 in 16 x 128 bytes -> 1: 32 in 16 x 64 bytes -> 2: 32 in 16 x 64 bytes\n"
              "2 downSamples 1.0, 8 lines -> 0: 64 in target 0\n"
              "3 downSamples 1.1, 8 lines -> 1: 32 in target 1\n"
              "4 downSamples 1.2, 8 lines -> 2: 32 in target 2\n");
}

TEST(Stages, EachRewriteLeavesThePicture) {
    std::set<std::string> seen;
    for (const auto& c : cases) {
        const auto plan = srk::makePlan(requestOf(c));
        ASSERT_TRUE(plan) << nameOf(c);
        const Bytes with = pictureOf(*plan, c);
        // A matrix makes more of a difference of 1.
        const int step = plan->route.change == srk::Change::toRgb ? 3 : 1;
        const auto compare = [&](unsigned without, const char* name) {
            const auto other = srk::makePlan(requestOf(c), without);
            EXPECT_EQ(other->rewritten & without, 0u);
            int allowed = 0;
            unsigned row = 1;
            for (const auto& rewrite : srk::rewrites()) {
                // Without one rewrite another may find nothing either.
                if (rewrite.rounds && (plan->rewritten & ~other->rewritten & row)) allowed = step;
                row <<= 1;
            }
            EXPECT_NE(srk::describe(plan->lists[0]), srk::describe(other->lists[0])) << name;
            EXPECT_LE(difference(c, with, pictureOf(*other, c)), allowed) << nameOf(c) << " without " << name;
        };
        unsigned row = 1;
        for (const auto& rewrite : srk::rewrites()) {
            if (plan->rewritten & row) {
                seen.insert(rewrite.name);
                compare(row, rewrite.name);
            }
            row <<= 1;
        }
        compare(~0u, "any rewrite");
    }
    for (const auto& rewrite : srk::rewrites()) EXPECT_TRUE(seen.count(rewrite.name)) << rewrite.name;
}

TEST(Stages, ABandWritesItsOwnLinesOnly) {
    for (const auto& c : cases) {
        const auto plan = srk::makePlan(requestOf(c));
        const int step = plan->route.target->down(), lines = srk::fieldLines(c.th, plan->route.fields, 0);
        const int first = lines / 3, last = lines * 2 / 3;
        const Bytes whole = pictureOf(*plan, c);
        Bytes band = pictureOf(*plan, c, first, last);
        const srk::Picture target = layoutOf(codeOf(c.to), c.tw, c.th, band.data());
        for (int p = 0; p < target.format->planes(); ++p)
            for (int y = 0; y < target.planeHeight(p); ++y) {
                const auto* at = target.planes[p].data + target.planes[p].stride * y;
                const int line = y / plan->route.fields * (p ? step : 1);
                const bool inside = line >= first && line < last;
                const auto bytes = static_cast<size_t>(srk::lineBytes(*target.format, c.tw, p));
                if (bytes == 0) continue;
                const Bytes unwritten(bytes, 0x5A);
                const auto* expected = inside ? whole.data() + (at - band.data()) : unwritten.data();
                ASSERT_EQ(std::memcmp(at, expected, bytes), 0)
                    << nameOf(c) << " plane " << p << " line " << y << " of " << first << " to " << last;
            }
    }
}
