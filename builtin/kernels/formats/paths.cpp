#include "builtin/kernels/formats/paths.h"

#include <array>
#include <memory>
#include <span>
#include <vector>

namespace srk {

namespace {

struct KernelRow {
    int format;
    Core core;
    int cost;
};

struct Bridge {
    Core from, to;
    int cost;
};

// Costs of kernels: 0 in place, 1 shuffles, 4 matrices, 5 and 6 words, 7 floats.
constexpr int inPlace = 0, shuffle = 1, matrix = 4, words = 5, wordsAndBytes = 6, floats = 7;
// On top: where levels change, and where RGB meets YUV, so that no path goes there without need.
constexpr int levelChange = 128, familyChange = 256;

constexpr Bridge bridges[] = {
    {Core::rgb8, Core::rgb8, 0},         {Core::video8, Core::video8, 0},
    {Core::yuv8, Core::yuv8, 0},         {Core::rgb16, Core::rgb16, 0},
    {Core::video16, Core::video16, 0},   {Core::yuv16, Core::yuv16, 0},
    {Core::rgb8, Core::video8, shuffle}, {Core::video8, Core::rgb8, shuffle},
    {Core::rgb16, Core::video16, words}, {Core::video16, Core::rgb16, words},
    {Core::rgb8, Core::yuv8, matrix},    {Core::video8, Core::yuv8, matrix},
    {Core::yuv8, Core::rgb8, matrix},    {Core::yuv8, Core::video8, matrix},
    {Core::rgb16, Core::yuv16, words},   {Core::video16, Core::yuv16, words},
    {Core::yuv16, Core::rgb16, words},   {Core::yuv16, Core::video16, words},
    {Core::packed8, Core::packed8, 0},
};

Core coreOf(const Format& format, bool deep) {
    switch (format.family()) {
        case Family::rgb: return deep ? Core::rgb16 : Core::rgb8;
        case Family::video: return deep ? Core::video16 : Core::video8;
        case Family::yuv: return deep ? Core::yuv16 : Core::yuv8;
    }
    return Core::none;
}

int deepCost(const Format& format) {
    if (format.packing == Packing::floatRgb || format.packing == Packing::floatYuv) return floats;
    return format.packing == Packing::planar16 ? shuffle : words;
}

// The same rows serve as input and as output kernels: each has its inverse. 8-bit formats also go to words,
// to meet deep ones.
std::vector<KernelRow> makeKernels() {
    std::vector<KernelRow> rows;
    for (int i = 0; i < formatCount; ++i) {
        const Format& format = formats()[static_cast<size_t>(i)];
        if (format.deep()) {
            rows.push_back({i, coreOf(format, true), deepCost(format)});
            continue;
        }
        rows.push_back({i, coreOf(format, false), format.planar() ? inPlace : 2 * shuffle});
        rows.push_back({i, coreOf(format, true), wordsAndBytes});
        if (format.packing == Packing::bytes4 || format.packing == Packing::bytes3)
            rows.push_back({i, Core::packed8, format.packing == Packing::bytes4 ? inPlace : shuffle});
    }
    return rows;
}

int surcharge(const Format& a, const Format& b) {
    return (a.has(videoLevels) != b.has(videoLevels) ? levelChange : 0) +
           (a.has(isYuv) != b.has(isYuv) ? familyChange : 0);
}

using Table = std::array<std::array<Path, formatCount>, formatCount>;

Path cheapest(std::span<const KernelRow> kernels, int source, int target, Use use) {
    if (use == Use::plain && source == target) return {Core::lines, Core::lines, 0};
    const Format& a = formats()[static_cast<size_t>(source)];
    const Format& b = formats()[static_cast<size_t>(target)];
    Path best;
    best.cost = 9999;
    for (const auto& in : kernels) {
        if (in.format != source) continue;
        for (const auto& out : kernels) {
            if (out.format != target) continue;
            for (const auto& bridge : bridges) {
                if (bridge.from != in.core || bridge.to != out.core) continue;
                // Shuffles of whole pixels know neither scaling nor levels.
                if (in.core == Core::packed8 && (use == Use::scaling || a.family() != b.family())) continue;
                const int cost = in.cost + bridge.cost + out.cost + surcharge(a, b);
                if (cost < best.cost) best = {in.core, out.core, cost};
            }
        }
    }
    return best;
}

std::array<Table, 2> makeTables() {
    const auto kernels = makeKernels();
    std::array<Table, 2> tables;
    for (const Use use : {Use::plain, Use::scaling})
        for (int s = 0; s < formatCount; ++s)
            for (int t = 0; t < formatCount; ++t)
                tables[static_cast<size_t>(use)][static_cast<size_t>(s)][static_cast<size_t>(t)] =
                    cheapest(kernels, s, t, use);
    return tables;
}

}  // namespace

const Path& pathOf(int source, int target, Use use) {
    static const auto tables = makeTables();
    return tables[static_cast<size_t>(use)][static_cast<size_t>(source)][static_cast<size_t>(target)];
}

}  // namespace srk
