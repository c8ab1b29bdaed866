// The dealing out of caption pairs to frames.
#include <algorithm>
#include <array>
#include <initializer_list>

#include "core/arch/qvassert.h"
#include "core/caption/cc/qvcc.h"
#include "core/engine/status.h"

namespace {

// What a slot takes: a pair of field 1, of field 2, or of a DTVCC packet.
enum Slot : unsigned char { field1Slot, field2Slot, dtvccSlot, slotKinds };

constexpr int slotsAt24 = 25;
constexpr int slotsAt30 = 20;
constexpr int slotsAt60 = 10;
constexpr unsigned dtvccTypes = 1u << QvCcBytePair::dtvccData | 1u << QvCcBytePair::dtvccStart;

}  // namespace

struct QvCcProcessor::Schedule {
    std::array<Slot, slotsAt24> slots{};
    int size = 0;

    // Leads with these, and fills up with packet data.
    void set(std::initializer_list<Slot> first, int total) {
        size = total;
        std::fill(std::copy(first.begin(), first.end(), slots.begin()), slots.begin() + total, dtvccSlot);
    }
    int of(Slot kind) const {
        return static_cast<int>(std::count(slots.begin(), slots.begin() + size, kind));
    }
};

// Positions in the queue, rising.
struct QvCcProcessor::Found {
    std::array<int, slotsAt24> indexes{};
    int size = 0;
    int taken = 0;
};

void QvCcProcessor::start(bool do608, bool do708, const QvFramerate& rate, int flags) {
    clear();
    do608_ = do608;
    do708_ = do708;
    rate_ = rate;
    frameCounter_ = 0;
    valid608_1Fillers_ = (flags & valid608_1) != 0;
    valid608_2Fillers_ = (flags & valid608_2) != 0;
}

void QvCcProcessor::_getNeededBytepairs(Schedule& schedule) const {
    const auto counter = static_cast<unsigned>(frameCounter_);
    if (rate_.is29p() || rate_.is30p() || ((rate_.is59i() || rate_.is60i()) && rate_.isTopFirst())) {
        schedule.set({field1Slot, field2Slot}, slotsAt30);
    } else if (rate_.is59i() || rate_.is60i()) {
        schedule.set({field2Slot, field1Slot}, slotsAt30);
    } else if (rate_.is60p() || rate_.is59p()) {
        schedule.set({counter % 2 == 0 ? field1Slot : field2Slot}, slotsAt60);
    } else if (rate_.is23p() || rate_.is24p()) {
        // Ten fields in four frames, as a 3:2 cadence has them.
        switch (counter % 4) {
            case 0: return schedule.set({field1Slot, field2Slot}, slotsAt24);
            case 1: return schedule.set({field1Slot, field2Slot, field1Slot}, slotsAt24);
            case 2: return schedule.set({field2Slot, field1Slot}, slotsAt24);
            default: return schedule.set({field2Slot, field1Slot, field2Slot}, slotsAt24);
        }
    } else {
        QV_FAIL("QvCcProcessor: framerate not supported");
    }
}

void QvCcProcessor::search(unsigned typeMask, int most, const MediaTime& t, Found& found) const {
    for (int i = 0; i < count() && found.size < most; ++i) {
        const QvCcBytePair& pair = pairs_[static_cast<std::size_t>(i)];
        if (pair.time.value() > t.value()) return;
        if (typeMask >> pair.type() & 1) found.indexes[static_cast<std::size_t>(found.size++)] = i;
    }
}

void QvCcProcessor::_copyBytePairs(const Schedule& schedule, Found* found, QvCcData& out) {
    out.clear();
    const bool validFillers[slotKinds] = {valid608_1Fillers_, valid608_2Fillers_, false};
    MediaTime last;
    for (int i = 0; i < schedule.size; ++i) {
        const Slot slot = schedule.slots[static_cast<std::size_t>(i)];
        Found& source = found[slot];
        if (source.taken == source.size) {
            out.appendFillers(1, slot, validFillers[slot], last);
            continue;
        }
        QvCcBytePair pair = at(source.indexes[static_cast<std::size_t>(source.taken++)]);
        if (validFillers[slot]) pair.invalidToNull();
        last = pair.time;
        out.append(pair);
    }
}

int QvCcProcessor::get(QvCcData& out, const MediaTime& t, int) {
    QV_ASSERT(&out != this);
    Schedule schedule;
    _getNeededBytepairs(schedule);
    Found found[slotKinds];
    if (do608_) {
        search(1u << QvCcBytePair::field1, schedule.of(field1Slot), t, found[field1Slot]);
        search(1u << QvCcBytePair::field2, schedule.of(field2Slot), t, found[field2Slot]);
    }
    if (do708_) search(dtvccTypes, schedule.of(dtvccSlot), t, found[dtvccSlot]);
    _copyBytePairs(schedule, found, out);

    std::array<int, slotsAt24> gone{};
    auto end = gone.begin();
    for (const Found& kind : found) end = std::copy_n(kind.indexes.begin(), kind.size, end);
    std::sort(gone.begin(), end);
    removeRising({gone.begin(), end});
    frameCounter_ = static_cast<int>(static_cast<unsigned>(frameCounter_) + 1);
    return QvStatus::ok;
}
