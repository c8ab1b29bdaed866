#include "core/stream/nav/navfixup_p.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <optional>

#include "core/stream/iofailure.h"
#include "core/stream/stdfile_p.h"

namespace {

constexpr size_t sectorBytes = 2048;
using Pack = std::array<unsigned char, sectorBytes>;

// Offsets of big-endian fields in a navigation pack.
constexpr size_t highlightEnd = 0x93;
constexpr size_t buttonsEnd = 0x97;
constexpr size_t objectEnd = 0x437;
constexpr size_t nextVideo = 0x4F1;
constexpr size_t forwardLast = 0x53D;  // entries stand in falling order of time
constexpr size_t nextVobu = 0x541;
constexpr size_t previousVobu = 0x545;
constexpr size_t backwardFirst = 0x549;
constexpr size_t previousVideo = 0x595;
constexpr size_t audioSync = 0x599;
constexpr size_t subpicSync = 0x5A9;

// Distances of the search table.
constexpr uint32_t distanceMask = 0x3FFFFFFF;
constexpr uint32_t hasVideo = 0x80000000;
constexpr uint32_t videoBetween = 0x40000000;
constexpr uint32_t noVobu = 0x3FFFFFFF;
constexpr uint32_t noVideo = 0xBFFFFFFF;
constexpr uint32_t videoOnTheWay =
    0x7FFFFFFF;  // no VOBU at this time, but video after the VOBU of the nearer entry
constexpr uint32_t noSubpic = 0x7FFFFFFF;

// Times of the search table in 90 kHz: each half second to 7.5 s, then 10, 30, 60 and 120 s. The last four
// also state whether there is video on the way.
constexpr int tableEntries = 19;
constexpr int halfSeconds = 15;
constexpr std::array<uint32_t, 4> farTimes = {900'000, 2'700'000, 5'400'000, 10'800'000};

uint32_t tableTime(int entry) {
    return entry < halfSeconds ? 45'000u * static_cast<uint32_t>(entry + 1)
                               : farTimes[static_cast<size_t>(entry - halfSeconds)];
}

void put16(Pack& pack, size_t at, uint32_t value) {
    pack[at] = static_cast<unsigned char>(value >> 8);
    pack[at + 1] = static_cast<unsigned char>(value);
}

void put32(Pack& pack, size_t at, uint32_t value) {
    put16(pack, at, value >> 16);
    put16(pack, at + 2, value);
}

// First and last VOBU of a cell; empty if last is below first.
struct CellRange {
    int first;
    int last;
    bool contains(int vobu) const { return vobu >= first && vobu <= last; }
};

// The VOBUs of the program, with running sums for questions about ranges.
class Vobus {
  public:
    explicit Vobus(const NavData& data) : data_(data), time_(1, 0), video_(1, 0) {
        time_.reserve(data.duration.size() + 1);
        video_.reserve(data.duration.size() + 1);
        for (size_t i = 0; i < data.duration.size(); ++i) {
            time_.push_back(time_.back() + data.duration[i]);
            video_.push_back(video_.back() + (data.flags[i] & 1));
        }
    }

    int count() const { return static_cast<int>(data_.sector.size()); }
    bool video(int i) const { return data_.flags[static_cast<size_t>(i)] & 1; }
    // 0 after the last VOBU.
    uint32_t sector(int i) const { return i < count() ? data_.sector[static_cast<size_t>(i)] : 0; }
    bool videoIn(int first, int end) const {
        return first < end && video_[static_cast<size_t>(first)] < video_[static_cast<size_t>(end)];
    }

    // The first VOBU up to `last` with which the time from the start of `i` on reaches `time`.
    std::optional<int> reach(int i, int last, uint32_t time) const {
        if (last < i) return {};
        const auto begin = time_.begin() + i + 1, end = time_.begin() + last + 2;
        const auto found = std::lower_bound(begin, end, time_[static_cast<size_t>(i)] + time);
        if (found == end) return {};
        return i + static_cast<int>(found - begin);
    }

    // The last VOBU down to `first` from whose start the time up to the start of `i` reaches `time`.
    std::optional<int> reachBack(int i, int first, uint32_t time) const {
        const uint64_t now = time_[static_cast<size_t>(i)];
        if (first >= i || now < time) return {};
        const auto begin = time_.begin() + first, end = time_.begin() + i;
        const auto found = std::upper_bound(begin, end, now - time);
        if (found == begin) return {};
        return first + static_cast<int>(found - begin) - 1;
    }

    uint32_t distance(int from, int to) const {
        const uint32_t sectors = to > from ? sector(to) - sector(from) : sector(from) - sector(to);
        return (sectors & distanceMask) | (video(to) ? hasVideo : 0);
    }

  private:
    const NavData& data_;
    std::vector<uint64_t> time_;   // time_[i]: start of VOBU i
    std::vector<uint32_t> video_;  // VOBUs with video before i
};

class SegmentFixup {
  public:
    SegmentFixup(const NavData& data, const Vobus& vobus, const NavSegment& segment)
        : data_(data),
          vobus_(vobus),
          segment_(segment),
          first_(static_cast<int>(segment.first)),
          last_(static_cast<int>(segment.first + segment.count) - 1) {}

    void run(QvIoFailure& failure);

  private:
    bool correct(StdFile& file, int i);
    void startCells();
    void followCells(int i);
    int cellStart(size_t cell) const { return static_cast<int>(data_.cellStarts[cell]); }
    void putTimes(Pack& pack) const;
    void putNext(Pack& pack, int i) const;
    void putPrevious(Pack& pack, int i) const;
    void putForward(Pack& pack, int i) const;
    void putBackward(Pack& pack, int i) const;
    void putAudio(Pack& pack, int i) const;
    void putSubpics(Pack& pack, int i) const;
    uint32_t audioField(const std::vector<uint32_t>& list, int i) const;
    uint32_t subpicField(const std::vector<uint32_t>& list, int i) const;

    const NavData& data_;
    const Vobus& vobus_;
    const NavSegment& segment_;
    const int first_, last_;
    CellRange cell_{};
    size_t nextCell_ = 0;
};

void SegmentFixup::startCells() {
    cell_ = {first_, last_};
    if (data_.cellStarts.size() < 2) return;
    cell_ = {cellStart(0), cellStart(1) - 1};
    nextCell_ = 1;
}

// One step a VOBU: cells follow each other, and each has a VOBU of its own.
void SegmentFixup::followCells(int i) {
    const size_t cells = data_.cellStarts.size();
    if (cells < 2 || nextCell_ >= cells || i < cellStart(nextCell_)) return;
    const bool lastCell = nextCell_ + 1 == cells;
    cell_ = {cellStart(nextCell_), lastCell ? last_ : cellStart(nextCell_ + 1) - 1};
    ++nextCell_;
}

void SegmentFixup::putTimes(Pack& pack) const {
    if (data_.highlight) {
        put32(pack, highlightEnd, segment_.endTime);
        put32(pack, buttonsEnd, segment_.endTime);
    }
    put32(pack, objectEnd, segment_.endTime);
}

// Forward only the immediate successor counts as the next VOBU with video; backward the nearest is searched.
void SegmentFixup::putNext(Pack& pack, int i) const {
    const bool inCell = cell_.contains(i + 1) && i + 1 < vobus_.count();
    const uint32_t distance = inCell ? vobus_.distance(i, i + 1) : noVobu;
    put32(pack, nextVideo, inCell && vobus_.video(i + 1) ? distance : noVideo);
    put32(pack, nextVobu, distance);
}

void SegmentFixup::putPrevious(Pack& pack, int i) const {
    put32(pack, previousVobu, cell_.contains(i - 1) ? vobus_.distance(i, i - 1) : noVobu);
    int j = i - 1;
    while (j >= cell_.first && !vobus_.video(j)) --j;
    put32(pack, previousVideo, j >= cell_.first ? vobus_.distance(i, j) : noVideo);
}

void SegmentFixup::putForward(Pack& pack, int i) const {
    const int last = std::min(cell_.last, vobus_.count() - 1);
    int nearer = 0;  // VOBU of the entry before; 0 if it found none, or VOBU 0
    for (int entry = 0; entry < tableEntries; ++entry) {
        const bool isFar = entry >= halfSeconds;
        const std::optional<int> found = vobus_.reach(i, last, tableTime(entry));
        uint32_t value = noVobu;
        if (found) {
            value = vobus_.distance(i, *found);
            if (isFar && vobus_.videoIn(i + 1, *found)) value |= videoBetween;
        } else if (isFar && nearer && vobus_.videoIn(nearer + 1, last + 1)) {
            value = videoOnTheWay;
        }
        nearer = found.value_or(0);
        put32(pack, forwardLast - 4 * static_cast<size_t>(entry), value);
    }
}

void SegmentFixup::putBackward(Pack& pack, int i) const {
    int nearer = 0;
    for (int entry = 0; entry < tableEntries; ++entry) {
        const bool isFar = entry >= halfSeconds;
        const std::optional<int> found = vobus_.reachBack(i, cell_.first, tableTime(entry));
        uint32_t value = noVobu;
        if (found) {
            value = vobus_.distance(i, *found);
            if (isFar && vobus_.videoIn(*found + 1, i)) value |= videoBetween;
        } else if (isFar && nearer && vobus_.videoIn(cell_.first, nearer)) {
            value = videoOnTheWay;
        }
        nearer = found.value_or(0);
        put32(pack, backwardFirst + 4 * static_cast<size_t>(entry), value);
    }
}

// Sign and magnitude; a magnitude that can't be stated becomes the largest.
uint32_t SegmentFixup::audioField(const std::vector<uint32_t>& list, int i) const {
    const size_t index = static_cast<size_t>(i);
    const int64_t value = index < list.size() ? static_cast<int32_t>(list[index]) : 0;
    int64_t magnitude = std::abs(value);
    if (data_.limit && value >= 0 && magnitude + vobus_.sector(i) > data_.limit) --magnitude;
    if (magnitude > 32767 || magnitude < 1) magnitude = 32767;
    return static_cast<uint32_t>(magnitude) | (value < 0 ? 0x8000u : 0u);
}

void SegmentFixup::putAudio(Pack& pack, int i) const {
    for (size_t a = 0; a < data_.audio.size(); ++a)
        put16(pack, audioSync + 2 * a, audioField(data_.audio[a], i));
}

uint32_t SegmentFixup::subpicField(const std::vector<uint32_t>& list, int i) const {
    const size_t index = static_cast<size_t>(i);
    const uint32_t here = vobus_.sector(i);
    const uint32_t wanted = index < list.size() ? list[index] : here;
    if (wanted >= here) return noSubpic;
    int m = i;
    while (m > first_ && vobus_.sector(m) > wanted) --m;
    return (here - vobus_.sector(m + 1)) | hasVideo;
}

void SegmentFixup::putSubpics(Pack& pack, int i) const {
    for (size_t p = 0; p < data_.subpic.size(); ++p)
        put32(pack, subpicSync + 4 * p, subpicField(data_.subpic[p], i));
}

bool SegmentFixup::correct(StdFile& file, int i) {
    Pack pack;
    const long long position = static_cast<long long>(vobus_.sector(i)) * static_cast<long long>(sectorBytes);
    if (!file.seek(position, SEEK_SET) || !file.readAll(pack.data(), sectorBytes)) return false;
    putTimes(pack);
    putNext(pack, i);
    putForward(pack, i);
    putPrevious(pack, i);
    putBackward(pack, i);
    putAudio(pack, i);
    putSubpics(pack, i);
    return file.seek(position, SEEK_SET) && file.write(pack.data(), sectorBytes);
}

void SegmentFixup::run(QvIoFailure& failure) {
    StdFile file;
    bool ok = file.open(segment_.name, "r+b");
    startCells();
    for (int i = first_; ok && i <= last_; ++i) {
        followCells(i);
        ok = correct(file, i);
    }
    if (!file.close()) ok = false;
    if (!ok) failure.note(file.error(), "Failed to correct the navigation packs of", segment_.name);
}

}  // namespace

void correctNavigation(const NavData& data, const std::vector<NavSegment>& segments, QvIoFailure& failure) {
    const Vobus vobus(data);
    for (const NavSegment& segment : segments) SegmentFixup(data, vobus, segment).run(failure);
}
