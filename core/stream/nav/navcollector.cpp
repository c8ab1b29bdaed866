#include "core/stream/nav/navcollector_p.h"

#include <array>
#include <cstring>
#include <new>

#include "core/stream/auxinfoid.h"
#include "core/stream/bufstream.h"
#include "core/stream/nav/navfixup_p.h"

namespace {

template <size_t N>
bool words(std::array<uint32_t, N>& out, const void* info, unsigned size) {
    if (!info || size < sizeof out) return false;
    std::memcpy(out.data(), info, sizeof out);
    return true;
}

}  // namespace

// All memory is taken now, so that gathering can't fail half-way.
void NavCollector::begin(const QvWideString& name) {
    if (collecting_) return;
    try {
        for (auto* list : {&data_.sector, &data_.duration, &data_.flags}) list->reserve(maxVobus);
        data_.cellStarts.reserve(maxNavCells);
        data_.audio.reserve(maxNavAudioLists);
        data_.subpic.reserve(maxNavSubpicLists);
        segments_.assign(1, NavSegment{.name = name});
        collecting_ = true;
    } catch (const std::bad_alloc&) {
        data_ = {};
        segments_.clear();
    }
}

void NavCollector::nextSegment(const QvWideString& name) {
    if (!collecting_) return;
    try {
        segments_.push_back({.first = static_cast<uint32_t>(data_.sector.size()), .name = name});
    } catch (const std::bad_alloc&) {
        // The present segment continues.
    }
}

void NavCollector::addVobu(const void* info, unsigned size) {
    std::array<uint32_t, 3> vobu;
    if (data_.sector.size() >= maxVobus || !words(vobu, info, size)) return;
    data_.sector.push_back(vobu[0]);
    data_.duration.push_back(vobu[1]);
    data_.flags.push_back(vobu[2]);
    ++segments_.back().count;
}

unsigned NavCollector::addList(Lists& lists, unsigned most) {
    if (lists.size() >= most) return BUFSTREAM_FAILED;
    try {
        std::vector<uint32_t> list;
        list.reserve(maxVobus);
        lists.push_back(std::move(list));
    } catch (const std::bad_alloc&) {
        return BUFSTREAM_FAILED;
    }
    return static_cast<unsigned>(lists.size() - 1);
}

void NavCollector::append(Lists& lists, const void* info, unsigned size) {
    std::array<uint32_t, 2> entry;
    if (size != sizeof entry || !words(entry, info, size) || entry[0] >= lists.size()) return;
    std::vector<uint32_t>& list = lists[entry[0]];
    if (list.size() < maxVobus) list.push_back(entry[1]);
}

unsigned NavCollector::take(unsigned offset, unsigned id, const void* info, unsigned size) {
    using namespace QvAuxId;
    if (id == NAV_COLLECT_SKIP) skip_ = true;
    if (!collecting_) return 0;
    std::array<uint32_t, 1> word;
    switch (id) {
        case NAV_VOBU_INFO: addVobu(info, size); return 0;
        case NAV_SEGMENT_END_TIME:
            if (words(word, info, size)) segments_.back().endTime = word[0];
            return 0;
        case NAV_HAS_HIGHLIGHT: data_.highlight = true; return 0;
        case NAV_CELL_START:
            if (data_.cellStarts.size() < maxNavCells)
                data_.cellStarts.push_back(static_cast<uint32_t>(data_.sector.size()));
            return 0;
        case NAV_AUDIO_LIST_ADD: return addList(data_.audio, maxNavAudioLists);
        case NAV_AUDIO_LIST_APPEND: append(data_.audio, info, size); return 0;
        case NAV_SUBPIC_LIST_ADD: return addList(data_.subpic, maxNavSubpicLists);
        case NAV_SUBPIC_LIST_APPEND: append(data_.subpic, info, size); return 0;
        case NAV_LAST_POSITION: data_.limit = offset; return 0;
        default: return 0;
    }
}

void NavCollector::correctFiles(QvIoFailure& failure) {
    if (collecting_ && !skip_) correctNavigation(data_, segments_, failure);
    collecting_ = false;
    data_ = {};
    segments_.clear();
}
