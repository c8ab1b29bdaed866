#include "builtin/kernels/convert/stages.h"

#include <algorithm>
#include <bit>
#include <cstdio>
#include <iterator>
#include <utility>

namespace srk {

namespace {

constexpr const char* names[] = {
    "source",      "neutral",     "unpack",      "raise",     "change",      "across",     "down",
    "downSamples", "twice",       "between",     "evens",     "lower",       "pack",       "copy",
    "shuffle",     "unpackToYuv", "packFromYuv", "pixelLuma", "pixelChroma", "packedLuma", "packedChroma"};
static_assert(std::size(names) == static_cast<size_t>(Work::packedChroma) + 1);

constexpr size_t cacheLine = 64;
// Luma and chroma around one target line find their lines again.
constexpr int linesBetweenPlanes = 8;

size_t roundedUp(size_t bytes) { return (bytes + cacheLine - 1) / cacheLine * cacheLine; }

bool packs(Work work) {
    return work == Work::pack || work == Work::packFromYuv || work == Work::copy || work == Work::shuffle;
}

template <class List, class Each>
void eachFeed(List& list, const Each& each) {
    for (auto& stage : list.stages)
        for (auto& feed : stage.reads)
            if (!feed.none()) each(stage, feed);
}

// One line is enough where a single reader makes one line out of one.
int slotsOf(const StageList& list, int stage, int window) {
    const Stage* reader = nullptr;
    const Feed* first = nullptr;
    bool several = false;
    eachFeed(list, [&](const Stage& by, const Feed& feed) {
        if (feed.stage != stage) return;
        if (reader && (reader != &by || first->down != feed.down)) several = true;
        reader = &by;
        first = &feed;
    });
    const bool asked = std::any_of(list.outputs.begin(), list.outputs.end(),
                                   [&](const Output& output) { return output.stage == stage; });
    if (!reader) return 1;
    return several || asked || reader->readsWindow() ? static_cast<int>(std::bit_ceil(unsigned(window))) : 1;
}

// -1: several.
int planeOf(const Stage& stage) {
    int found = 0, planes = 0;
    for (int p = 0; p < 4; ++p)
        if (stage.gives[static_cast<size_t>(p)].width > 0) {
            found = p;
            ++planes;
        }
    return planes > 1 ? -1 : found;
}

// Each stage but those of the source is in the work of one output.
bool outputsApart(const StageList& list) {
    std::vector<int> owner(list.stages.size(), -1);
    int number = 0;
    const auto owned = [&](const auto& self, int index) -> bool {
        const Stage& stage = list.at(index);
        if (stage.work == Work::source || stage.work == Work::neutral) return true;
        int& by = owner[static_cast<size_t>(index)];
        if (by >= 0 && by != number) return false;
        by = number;
        return std::all_of(stage.reads.begin(), stage.reads.end(),
                           [&](const Feed& feed) { return feed.none() || self(self, feed.stage); });
    };
    return std::all_of(list.outputs.begin(), list.outputs.end(), [&](const Output& output) {
        const bool own = owned(owned, output.stage);
        ++number;
        return own;
    });
}

}  // namespace

const char* nameOf(Work work) { return names[static_cast<size_t>(work)]; }

size_t Stage::itemBytes() const {
    if (work == Work::source) return format->packing == Packing::planar16 ? 2 : 1;
    if (packs(work)) return 1;
    if (work == Work::across) return words ? sizeof(float) : sizeof(int16_t);
    return words ? sizeof(uint16_t) : 1;
}

bool Stage::writesBytes() const { return itemBytes() == 1 || work == Work::lower; }

bool Stage::readsWindow() const {
    return work == Work::down || work == Work::downSamples || work == Work::pixelChroma ||
           work == Work::packedChroma;
}

int StageList::add(Stage stage) {
    stages.push_back(std::move(stage));
    return static_cast<int>(stages.size()) - 1;
}

void StageList::redirect(int stage, int plane, const Feed& feed) {
    eachFeed(*this, [&](const Stage&, Feed& reader) {
        if (reader.is(stage, plane)) reader = through(reader, feed);
    });
}

int StageList::readers(int stage, int plane) const {
    int count = 0;
    eachFeed(*this, [&](const Stage&, const Feed& feed) { count += feed.is(stage, plane); });
    for (const auto& output : outputs)
        count += output.stage == stage && at(stage).gives[static_cast<size_t>(plane)].target >= 0;
    return count;
}

Feed* StageList::onlyReader(int stage, int plane, Stage** reader) {
    if (readers(stage, plane) != 1) return nullptr;
    Feed* found = nullptr;
    eachFeed(*this, [&](Stage& by, Feed& feed) {
        if (!feed.is(stage, plane)) return;
        found = &feed;
        if (reader) *reader = &by;
    });
    return found;
}

void StageList::sweep() {
    std::vector<int> place(stages.size(), -1);
    std::vector<Stage> kept;
    const auto keep = [&](const auto& self, int index) -> int {
        auto& at = place[static_cast<size_t>(index)];
        if (at >= 0) return at;
        Stage stage = stages[static_cast<size_t>(index)];
        for (auto& feed : stage.reads)
            if (!feed.none()) feed.stage = self(self, feed.stage);
        kept.push_back(std::move(stage));
        return at = static_cast<int>(kept.size()) - 1;
    };
    for (auto& output : outputs) output.stage = keep(keep, output.stage);
    stages = std::move(kept);
}

void StageList::place() {
    int window = 1;
    bytes = 0;
    tags = sourceWidth = neutral = 0;
    for (const auto& stage : stages)
        if (stage.down) window = std::max(window, stage.down->axis.taps);
    window += linesBetweenPlanes;
    apart = outputsApart(*this);
    for (size_t i = 0; i < stages.size(); ++i) {
        Stage& stage = stages[i];
        stage.item = stage.itemBytes();
        stage.anywhere = stage.writesBytes();
        stage.plane = planeOf(stage);
        if (stage.work == Work::across) sourceWidth = std::max(sourceWidth, stage.across->axis.source);
        if (stage.work == Work::neutral) neutral = std::max(neutral, stage.gives[0].width);
        if (stage.work == Work::source || stage.work == Work::neutral) continue;
        stage.slots = slotsOf(*this, static_cast<int>(i), window);
        stage.tags = tags;
        tags += stage.slots;
        for (int p = 0; p < 4; ++p) {
            Buffer& buffer = stage.gives[static_cast<size_t>(p)];
            // A band asks a stage of one plane for the lines of its own target only; words may have to
            // be put together elsewhere.
            if (buffer.width == 0 || (buffer.target >= 0 && stage.plane >= 0 && stage.anywhere)) continue;
            buffer.offset = bytes;
            buffer.stride = roundedUp(static_cast<size_t>(buffer.width + wordBlock) * stage.itemBytes());
            bytes += buffer.stride * static_cast<size_t>(stage.slots);
        }
    }
}

Feed through(const Feed& reader, const Feed& removed) {
    return {removed.stage, removed.plane, reader.down + removed.down, reader.across + removed.across};
}

std::string describe(const StageList& list) {
    std::string text;
    const auto print = [&](const char* format, auto... values) {
        char piece[96];
        std::snprintf(piece, sizeof piece, format, values...);
        text += piece;
    };
    for (size_t i = 0; i < list.stages.size(); ++i) {
        const Stage& stage = list.stages[i];
        print("%zu %s", i, nameOf(stage.work));
        for (const auto& feed : stage.reads) {
            if (feed.none()) continue;
            print(" %d.%d", feed.stage, feed.plane);
            if (!feed.straight()) print("%+d%+d", feed.across, feed.down);
        }
        if (stage.across) print(", %d taps", stage.across->axis.taps);
        if (stage.down) print(", %d lines", stage.down->axis.taps);
        for (size_t p = 0; p < 4; ++p) {
            const Buffer& buffer = stage.gives[p];
            if (buffer.width == 0) continue;
            print(" -> %zu: %d", p, buffer.width);
            if (buffer.target >= 0) print(" in target %d", buffer.target);
            if (buffer.stride) print(" in %d x %zu bytes", stage.slots, buffer.stride);
        }
        text += '\n';
    }
    return text;
}

std::string worksOf(const StageList& list) {
    std::string text;
    for (const auto& stage : list.stages) (text += text.empty() ? "" : " ") += nameOf(stage.work);
    return text;
}

}  // namespace srk
