// A conversion as a list of stages. Each makes lines of up to four planes from lines of other stages. YUYV,
// 64 pixels wide, to I422 of half the height, as describe() prints it:
//
//     0 source
//     1 unpack 0.0 -> 0: 64 in 16 x 128 bytes -> 1: 32 in 16 x 64 bytes -> 2: 32 in 16 x 64 bytes
//     2 downSamples 1.0, 8 lines -> 0: 64 in target 0
//
// Stage 2 reads plane 0 of stage 1, eight lines for each of its own, and writes into plane 0 of the target.
// The planner makes a plain list from formats and sizes; rewrites then replace its stages by cheaper ones.
// Work is done on demand: a line of the target makes the lines that it needs.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "builtin/kernels/formats/formats.h"
#include "builtin/kernels/scale/axis.h"
#include "builtin/kernels/scale/deep.h"
#include "builtin/kernels/scale/scale8.h"

namespace srk {

// Samples in work have 8 bits, or 16 in a list for deep formats. Planes are B, G, R, A or Y, U, V, A.
enum class Work : uint8_t {
    source,       // lines of the source's planes, where they are
    neutral,      // a line of chroma without colour
    unpack,       // packed pixels to planes
    raise,        // samples of a plane to the bits of samples in work
    change,       // three planes by a matrix, or to other levels
    across,       // one plane scaled across, to exact sums
    down,         // sums scaled down, and rounded
    downSamples,  // samples scaled down, and rounded; a line of weight 1 is used without a copy
    twice,        // each sample twice
    between,      // one more sample between each two, as their mean
    evens,        // every second sample
    lower,        // the inverse of raise
    pack,         // planes to packed pixels

    // What only rewrites put in.
    copy,          // bytes of a line
    shuffle,       // pixels of three bytes to four, or of four to three
    unpackToYuv,   // pixels of four bytes to Y, U, V
    packFromYuv,   // Y, U, V to pixels of three or four bytes
    pixelLuma,     // pixels of four bytes to Y
    pixelChroma,   // pixels of four bytes to U and V of every second pixel, filtered before the matrix
    packedLuma,    // packed 4:2:2 to Y
    packedChroma,  // packed 4:2:2 to U and V, scaled down
};
const char* nameOf(Work work);

// Line y of a stage is made from line y + down of what it reads, from its sample `across` on. Stages that
// scale down choose the lines themselves, and add `down` to these.
struct Feed {
    int stage = -1;  // -1: nothing
    int plane = 0;
    int down = 0, across = 0;
    bool none() const { return stage < 0; }
    bool is(int otherStage, int otherPlane) const { return stage == otherStage && plane == otherPlane; }
    bool straight() const { return down == 0 && across == 0; }
};

// Where the lines of a plane go.
struct Buffer {
    int width = 0;      // samples of a line, bytes of packed pixels; 0: not made
    int target = -1;    // into this plane of the target, if it is not -1 and the line belongs to the band
    int shift = 0;      // line y is the target's line y - shift
    size_t offset = 0;  // of line 0 in the memory of a band, in bytes
    size_t stride = 0;  // of its lines
};

struct AcrossPass {
    Mapping mapping;
    Filter filter = Filter::nearest;
    Axis axis;
    Across bytes;  // 8-bit samples
    DeepAcross words;
};

struct DownPass {
    Axis axis;
    std::vector<int8_t> bytes;  // downSamples of 8 bits: weights of each line
    std::vector<Byte> pixels;   // pixelChroma and packedChroma: four for each line, or four for all
};

struct Stage {
    Work work = Work::source;
    bool words = false;  // gives samples of 16 bits, or their sums
    std::array<Feed, 4> reads;
    std::array<Buffer, 4> gives;
    const Format* format = nullptr;  // of packed pixels
    int pixels = 0;                  // pack, packFromYuv, shuffle: of a line
    int bits = 8;                    // raise, lower: of the other samples
    bool full = false;               // raise, lower: 8-bit samples reach to the end of their range
    bool halves = false;             // packFromYuv: chroma has half the width;
                                     // pixelChroma: it is filtered across
    std::shared_ptr<const AcrossPass> across;
    std::shared_ptr<const DownPass> down;
    int slots = 1;  // lines that are kept: a power of two
    int tags = 0;   // where the numbers of these lines begin

    // Worked out by place().
    size_t item = 1;       // itemBytes()
    bool anywhere = true;  // writesBytes()
    int plane = 0;         // that it gives; -1: several

    size_t itemBytes() const;  // of what a width counts
    bool writesBytes() const;  // its lines may begin anywhere
    bool readsWindow() const;  // reads more than one line for one of its own
};

// A stage that makes lines of the target. For target lines y that are multiples of `down` it makes its line y
// / down.
struct Output {
    int stage = 0;
    int down = 1, lines = 0, shift = 0;
};

struct StageList {
    std::vector<Stage> stages;
    std::vector<Output> outputs;
    size_t bytes = 0;     // memory of a band
    int tags = 0;         // lines in it
    int sourceWidth = 0;  // samples of the longest line that is scaled across
    int neutral = 0;      // samples of the longest neutral line
    bool apart = false;   // no output needs lines of another one

    int add(Stage stage);
    Stage& at(int stage) { return stages[static_cast<size_t>(stage)]; }
    const Stage& at(int stage) const { return stages[static_cast<size_t>(stage)]; }
    // Readers of plane `plane` of a stage get `feed` instead.
    void redirect(int stage, int plane, const Feed& feed);
    int readers(int stage, int plane) const;  // feeds and outputs
    // The only feed that reads a plane, and whose it is; null: there are none or several.
    Feed* onlyReader(int stage, int plane, Stage** reader = nullptr);
    // Leaves out what no output needs, and sorts the rest in the order of work.
    void sweep();
    // Decides how many lines are kept, and where.
    void place();
};

// A feed of a stage that is left out: what it reads there.
Feed through(const Feed& reader, const Feed& removed);

// One line a stage: its work, what it reads, and widths, lines and places of what it gives.
std::string describe(const StageList& list);
// The works in their order, with a blank between.
std::string worksOf(const StageList& list);

}  // namespace srk
