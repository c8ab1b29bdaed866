#include "core/caption/cc/qvcc.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/caption/cc/ccbuffer_p.h"
#include "core/caption/cc/sccpairs_p.h"
#include "core/engine/status.h"
#include "core/measure/exactmath_p.h"
#include "core/measure/timecode.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

namespace {

constexpr char dataName[] = "cc_data";
constexpr int nullByte = 0x80;  // zero with odd parity

MediaTime atDefaultScale(const MediaTime& t) {
    if (t.timescale() == MediaTime::defaultTimescale) return t;
    return MediaTime(qvmath::mulDiv(t.value(), MediaTime::defaultTimescale, 1, t.timescale()));
}

bool earlier(const QvCcBytePair& a, const QvCcBytePair& b) { return a.time.value() < b.time.value(); }

}  // namespace

// --- One pair.

QvCcBytePair::QvCcBytePair(int type, int b1, int b2, bool valid)
    : QvCcBytePair(MediaTime(), type, b1, b2, valid) {}

QvCcBytePair::QvCcBytePair(const MediaTime& t, int type, int b1, int b2, bool valid)
    : time(atDefaultScale(t)),
      header(static_cast<unsigned char>(0xF8 | (valid ? 4 : 0) | (type & 3))),
      byte1(static_cast<unsigned char>(b1)),
      byte2(static_cast<unsigned char>(b2)) {}

void QvCcBytePair::invalidToNull() {
    if (valid() || !is608()) return;
    byte1 = byte2 = nullByte;
    setValid(true);
}

bool QvCcBytePair::isFiller() const { return !valid() || (is608() && ((byte1 | byte2) & 0x7F) == 0); }

void QvCcBytePair::store(AnyDict& dict) const {
    dict.set("d", header << 16 | byte1 << 8 | byte2);
    dict.set("t", time);
}

int QvCcBytePair::restore(const AnyDict& dict) {
    const Any& data = dict["d"];
    const Any& t = dict["t"];
    if (!data.isInt32() || !t.isMediaTime()) return QvStatus::failed;
    header = static_cast<unsigned char>(data.asInt32() >> 16);
    byte1 = static_cast<unsigned char>(data.asInt32() >> 8);
    byte2 = static_cast<unsigned char>(data.asInt32());
    time = atDefaultScale(t.asMediaTime());
    return QvStatus::ok;
}

// --- The list.

QvCcBytePair& QvCcData::at(int index) { return const_cast<QvCcBytePair&>(std::as_const(*this).at(index)); }

const QvCcBytePair& QvCcData::at(int index) const {
    QV_ASSERT(index >= 0 && index < count());
    return pairs_[static_cast<std::size_t>(index)];
}

void QvCcData::remove(int index) {
    if (index >= 0 && index < count()) pairs_.erase(pairs_.begin() + index);
}

void QvCcData::remove(const AnyVector& indexes, bool sorted) {
    std::vector<int> rising;
    for (const Any& index : indexes)
        if (index.isInt32() && index.asInt32() >= 0 && index.asInt32() < count())
            rising.push_back(index.asInt32());
    if (!sorted || !std::is_sorted(rising.begin(), rising.end())) std::sort(rising.begin(), rising.end());
    rising.erase(std::unique(rising.begin(), rising.end()), rising.end());
    removeRising(rising);
}

void QvCcData::removeRising(std::span<const int> indexes) {
    if (indexes.empty()) return;
    auto to = pairs_.begin() + indexes.front();
    for (std::size_t i = 0; i < indexes.size(); ++i) {
        const auto from = pairs_.begin() + indexes[i] + 1;
        const auto until = i + 1 < indexes.size() ? pairs_.begin() + indexes[i + 1] : pairs_.end();
        to = std::move(from, until, to);
    }
    pairs_.erase(to, pairs_.end());
}

void QvCcData::select(const AnyVector& indexes, TPtrList<QvCcBytePair>& to) {
    for (const Any& index : indexes) to.append(&at(index.toInt32()));
}

void QvCcData::extend(const QvCcData& other, const AnyVector* indexes) {
    if (!indexes) {
        const std::size_t added = other.pairs_.size();  // the other may be this list
        pairs_.reserve(pairs_.size() + added);
        std::copy_n(other.pairs_.begin(), added, std::back_inserter(pairs_));
        return;
    }
    for (const Any& index : *indexes) append(QvCcBytePair(other.at(index.toInt32())));
}

void QvCcData::appendFillers(int number, int type, bool valid, const MediaTime& t) {
    QvCcBytePair filler(t, type, 0, 0, valid);
    if (valid && filler.is608()) filler.byte1 = filler.byte2 = nullByte;
    pairs_.insert(pairs_.end(), static_cast<std::size_t>(std::max(number, 0)), filler);
}

int QvCcData::removeFillers(const MediaTime& t) {
    const long long until = atDefaultScale(t).value();
    return static_cast<int>(std::erase_if(
        pairs_, [until](const QvCcBytePair& pair) { return pair.isFiller() && pair.time.value() <= until; }));
}

// --- Times.

void QvCcData::setTime(const MediaTime& t, int first, int last) {
    if (first < 0 || first >= count()) first = 0;
    if (last < 0 || last >= count()) last = count() - 1;
    for (int i = first; i <= last; ++i) at(i).time = atDefaultScale(t);
}

MediaTime QvCcData::minTime(bool sorted) const {
    if (pairs_.empty()) return MediaTime();
    return sorted ? pairs_.front().time : std::min_element(pairs_.begin(), pairs_.end(), earlier)->time;
}

MediaTime QvCcData::maxTime(bool sorted) const {
    if (pairs_.empty()) return MediaTime();
    return sorted ? pairs_.back().time : std::max_element(pairs_.begin(), pairs_.end(), earlier)->time;
}

void QvCcData::shiftTimes(const MediaTime& delta) {
    const MediaTime by = atDefaultScale(delta);
    for (auto& pair : pairs_) pair.time = pair.time + by;
}

bool QvCcData::isSorted() const { return std::is_sorted(pairs_.begin(), pairs_.end(), earlier); }

void QvCcData::sort() { std::stable_sort(pairs_.begin(), pairs_.end(), earlier); }

AnyVector QvCcData::find(const int* typeMask, const int* start, const int* end, const MediaTime* tMin,
                         const MediaTime* tMax, const bool* valid, bool stopAtMax,
                         const int* maxCount) const {
    AnyVector found;
    const int first = start ? std::max(std::min(*start, count() - 1), 0) : 0;
    const int last = end && *end >= 0 ? std::min(*end, count() - 1) : count() - 1;
    for (int i = first; i <= last; ++i) {
        if (maxCount && found.size() >= *maxCount) break;
        const QvCcBytePair& pair = pairs_[static_cast<std::size_t>(i)];
        if (tMax && pair.time.value() > tMax->value()) {
            if (stopAtMax) break;
            continue;
        }
        if (tMin && pair.time.value() < tMin->value()) continue;
        if (typeMask && !(*typeMask >> pair.type() & 1)) continue;
        if (valid && pair.valid() != *valid) continue;
        found.append(i);
    }
    return found;
}

// --- Stored form.

void QvCcData::store(AnyDict& dict) const {
    dict.set("name", dataName);
    dict.set("process", process_ ? 1 : 0);
    AnyVector data;
    for (const auto& pair : pairs_) pair.store(data.append(AnyDict()));
    dict.set("data", std::move(data));
}

int QvCcData::restore(const AnyDict& dict) {
    const Any& data = dict["data"];
    if (dict["name"] != Any(dataName) || !data.isVector()) return QvStatus::failed;
    std::vector<QvCcBytePair> restored;
    restored.reserve(static_cast<std::size_t>(data.asVector().size()));
    for (const Any& entry : data.asVector())
        if (!entry.isDict() || restored.emplace_back().restore(entry.asDict()) != QvStatus::ok)
            return QvStatus::failed;
    pairs_ = std::move(restored);
    process_ = dict["process"].isTrue();
    return QvStatus::ok;
}

// --- Bitstreams and files.

int QvCcData::detectBufferFmt(int size, const unsigned char* data) { return qvCcBufferFormat(size, data); }
int QvCcData::byteSize(int fmt) const { return qvCcBufferSize(fmt, count()); }
int QvCcData::toBuffer(int fmt, int size, unsigned char* data) const {
    return qvWriteCcBuffer(*this, fmt, size, data);
}
int QvCcData::fromBuffer(int fmt, int size, const unsigned char* data, const MediaTime* t) {
    return qvReadCcBuffer(*this, fmt, size, data, t);
}
int QvCcData::_fromBufferGeneric(int size, const unsigned char* data, const MediaTime* t) {
    return qvReadCcPairs(*this, size, data, t);
}

int QvCcData::readScc(const Any& filename, int type, bool detect, QvFramerate& rate, const bool* dropFrame,
                      bool dropFrameLines) {
    return qvReadScc(nullptr, filename, type, detect, rate, dropFrame, dropFrameLines, pairs_);
}
int QvCcData::readScc(QvByteSource& source, const Any& name, int type, bool detect, QvFramerate& rate,
                      const bool* dropFrame, bool dropFrameLines) {
    return qvReadScc(&source, name, type, detect, rate, dropFrame, dropFrameLines, pairs_);
}
std::string QvCcData::sccText(const QvFramerate& rate, const QvSccWriting& options) const {
    return qvSccText(pairs_, rate, options);
}
int QvCcData::writeScc(const Any& filename, const QvFramerate& rate, const QvSccWriting& options) const {
    return qvSaveScc(filename, sccText(rate, options));
}

// --- Log.

namespace {

std::string timeText(const MediaTime& t, const QvFramerate* rate) {
    if (!rate) return Any::sprintf("%f", t.seconds()).asString();
    char text[QvTimecode::textSize];
    t.timecode(*rate).pprint(text, rate->df());
    return text;
}

}  // namespace

std::string QvCcData::dbgDump(const QvFramerate* rate) const {
    static constexpr const char* typeNames[] = {"608-1", "608-2", "708-d", "708-s"};
    std::string text = Any::sprintf("cnt=%d, process=%d", count(), process_ ? 1 : 0).asString();
    const QvCcBytePair* before = nullptr;  // that the present group of words began with
    for (auto pair = pairs_.begin(); pair != pairs_.end();) {
        if (pair->isFiller()) {
            const auto end = std::find_if(pair, pairs_.end(), [](const auto& p) { return !p.isFiller(); });
            text += Any::sprintf(", %d fillers", static_cast<int>(end - pair)).asString();
            before = nullptr;
            pair = end;
            continue;
        }
        if (!before || before->type() != pair->type() || !(before->time == pair->time)) {
            text += std::string(", ") + typeNames[pair->type()] + " " + timeText(pair->time, rate);
            before = &*pair;
        }
        text += Any::sprintf(" %02x%02x", pair->byte1, pair->byte2).asString();
        ++pair;
    }
    return text;
}
