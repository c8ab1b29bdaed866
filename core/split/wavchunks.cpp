#include "core/split/wavchunks.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>

#include "core/measure/exactmath_p.h"

namespace {

std::string bytesOf(const Any& data) {
    if (!data.isGeneric() || data.size() == 0) return "";
    return {static_cast<const char*>(data.asGeneric()), static_cast<size_t>(data.size())};
}

Any chunkOf(const char* id, const std::string& data) {
    return AnyDict("id", id, "data",
                   Any(static_cast<const void*>(data.data()), static_cast<int>(data.size())));
}

// Numbers in a chunk, little-endian. The caller has checked that they lie in it.
uint32_t u32(std::string_view bytes, size_t at) {
    uint32_t value = 0;
    for (size_t i = 4; i-- > 0;) value = value << 8 | static_cast<unsigned char>(bytes[at + i]);
    return value;
}
void put(std::string& bytes, size_t at, uint64_t value, size_t width) {
    for (size_t i = 0; i < width; ++i) bytes[at + i] = static_cast<char>(value >> (8 * i));
}

std::string textOf(std::string_view bytes) {
    bytes = bytes.substr(0, bytes.find('\0'));
    while (!bytes.empty() && (bytes.back() == ' ' || bytes.back() == '\n' || bytes.back() == '\r'))
        bytes.remove_suffix(1);
    return std::string(bytes);
}

// The chunks inside a LIST, from after its kind, as long as they are whole.
template <class Visit>
void forEachInside(std::string_view list, Visit visit) {
    for (size_t at = 4; at + 8 <= list.size();) {
        const size_t size = u32(list, at + 4);
        if (size > list.size() - at - 8) return;
        visit(list.substr(at, 4), list.substr(at + 8, size));
        at += 8 + size + size % 2;
    }
}

// --- "bext", by offset.

constexpr struct {
    const char* name;
    size_t at, bytes;
} bextTexts[] = {
    {"description", 0, 256},      {"originator", 256, 32},     {"originatorReference", 288, 32},
    {"originationDate", 320, 10}, {"originationTime", 330, 8},
};
constexpr size_t bextTimeReference = 338, bextVersion = 346, bextLoudness = 412, bextHistory = 602;
constexpr size_t bextLoudnessBytes = 10;  // five numbers of 16 bits
constexpr int bextWithLoudness = 2;       // the first version that has them
constexpr uint64_t loudnessUnknown = 0x7FFF;

bool isBext(std::string_view data) { return data.size() >= bextHistory; }
uint64_t timeReference(std::string_view bext) {
    return u32(bext, bextTimeReference) | static_cast<uint64_t>(u32(bext, bextTimeReference + 4)) << 32;
}
int versionOf(std::string_view bext) { return static_cast<int>(u32(bext, bextVersion) & 0xFFFF); }

// --- iXML: few elements count, and the rest must not change.

std::optional<std::pair<size_t, size_t>> elementIn(std::string_view xml, const std::string& name) {
    const std::string begin = "<" + name + ">", end = "</" + name + ">";
    const size_t from = xml.find(begin);
    if (from == std::string_view::npos) return std::nullopt;
    const size_t text = from + begin.size(), to = xml.find(end, text);
    if (to == std::string_view::npos) return std::nullopt;
    return std::pair(text, to - text);
}

std::optional<uint64_t> numberIn(std::string_view xml, const std::string& name) {
    const auto place = elementIn(xml, name);
    if (!place) return std::nullopt;
    const std::string_view text = xml.substr(place->first, place->second);
    uint64_t value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
    return value;
}

void replaceNumber(std::string& xml, const std::string& name, uint64_t value) {
    if (const auto place = elementIn(xml, name))
        xml.replace(place->first, place->second, std::to_string(value));
}

// --- Cue points.

constexpr size_t cueBytes = 24;  // id, position, "data", two places of lists, sample
constexpr size_t cuePosition = 4, cueSample = 20;

// The records of a "cue " chunk that are there.
template <class Visit>
void forEachCue(std::string_view cue, Visit visit) {
    if (cue.size() < 4) return;
    const size_t count = std::min<size_t>(u32(cue, 0), (cue.size() - 4) / cueBytes);
    for (size_t i = 0; i < count; ++i) visit(cue.substr(4 + i * cueBytes, cueBytes));
}

class Mover {
  public:
    explicit Mover(const QvWavChunks::Part& part) : part_(part) {}

    // Of a cue point; nothing for one outside the part.
    std::optional<uint32_t> position(uint32_t sample) const {
        const long long inside = sample - part_.first;
        if (inside < 0 || (part_.samples >= 0 && inside > part_.samples)) return std::nullopt;
        const long long moved = scaled(inside);
        return moved <= UINT32_MAX ? std::optional(static_cast<uint32_t>(moved)) : std::nullopt;
    }
    uint64_t reference(uint64_t sample) const {
        if (sample > INT64_MAX / 2) return sample;  // no time of any day
        return static_cast<uint64_t>(scaled(std::max(static_cast<long long>(sample) + part_.first, 0LL)));
    }

    std::string bext(std::string data) const {
        if (!isBext(data)) return data;
        put(data, bextTimeReference, reference(timeReference(data)), 8);
        if (versionOf(data) >= bextWithLoudness && (part_.changed || part_.first != 0 || part_.samples >= 0))
            for (size_t i = 0; i < bextLoudnessBytes; i += 2) put(data, bextLoudness + i, loudnessUnknown, 2);
        return data;
    }

    std::string ixml(std::string xml) const {
        constexpr const char* stamps[][2] = {
            {"TIMESTAMP_SAMPLES_SINCE_MIDNIGHT_HI", "TIMESTAMP_SAMPLES_SINCE_MIDNIGHT_LO"},
            {"BWF_TIME_REFERENCE_HIGH", "BWF_TIME_REFERENCE_LOW"},
        };
        for (const auto& [high, low] : stamps) {
            const auto upper = numberIn(xml, high), lower = numberIn(xml, low);
            if (!upper || !lower || *upper > UINT32_MAX || *lower > UINT32_MAX) continue;
            const uint64_t moved = reference(*upper << 32 | *lower);
            replaceNumber(xml, high, moved >> 32);
            replaceNumber(xml, low, moved & UINT32_MAX);
        }
        const auto from = static_cast<uint64_t>(part_.fromRate);
        for (const char* rate : {"FILE_SAMPLE_RATE", "TIMESTAMP_SAMPLE_RATE"})
            if (numberIn(xml, rate) == from) replaceNumber(xml, rate, static_cast<uint64_t>(part_.toRate));
        if (part_.bits > 0) replaceNumber(xml, "AUDIO_BIT_DEPTH", static_cast<uint64_t>(part_.bits));
        return xml;
    }

    // Remembers which points stay.
    std::string cue(std::string_view data) {
        std::string moved(4, '\0');
        forEachCue(data, [&](std::string_view point) {
            const auto place = position(u32(point, cueSample));
            if (!place) {
                gone_.insert(u32(point, 0));
                return;
            }
            std::string record(point);
            put(record, cuePosition, *place, 4);
            put(record, cueSample, *place, 4);
            moved += record;
        });
        put(moved, 0, (moved.size() - 4) / cueBytes, 4);
        return moved;
    }

    std::string labels(std::string_view list) const {
        std::string kept(list.substr(0, 4));
        forEachInside(list, [&](std::string_view id, std::string_view entry) {
            if (entry.size() >= 4 && gone_.count(u32(entry, 0))) return;
            std::string data(entry);
            if (id == "ltxt" && data.size() >= 8) {
                const long long length = scaled(u32(data, 4));
                put(data, 4, static_cast<uint64_t>(std::min<long long>(length, UINT32_MAX)), 4);
            }
            kept += id;
            kept.append(4, '\0');
            put(kept, kept.size() - 4, data.size(), 4);
            kept += data;
            if (data.size() % 2) kept += '\0';
        });
        return kept;
    }

  private:
    const QvWavChunks::Part& part_;
    std::set<uint32_t> gone_;

    long long scaled(long long samples) const {
        return part_.fromRate == part_.toRate ? samples
                                              : qvmath::mulDiv(samples, part_.toRate, 1, part_.fromRate);
    }
};

std::string idOf(const Any& chunk) { return chunk.isDict() ? chunk.asDict().getString("id", "") : ""; }

}  // namespace

AnyVector QvWavChunks::ofPart(const AnyVector& chunks, const Part& part) {
    Mover mover(part);
    const bool whole = part.first == 0 && part.samples < 0 && part.fromRate == part.toRate;
    // The points come first: labels follow them.
    std::map<int, std::string> cues;
    for (int i = 0; i < chunks.size(); ++i)
        if (!whole && idOf(chunks.at(i)) == "cue ")
            cues[i] = mover.cue(bytesOf(chunks.at(i).asDict().get("data")));
    AnyVector result;
    for (int i = 0; i < chunks.size(); ++i) {
        const std::string id = idOf(chunks.at(i));
        if (id.empty()) continue;
        const std::string data = bytesOf(chunks.at(i).asDict().get("data"));
        if (id == "bext")
            result.append(chunkOf("bext", mover.bext(data)));
        else if (id == "iXML")
            result.append(chunkOf("iXML", mover.ixml(data)));
        else if (id == "cue " && !whole && cues[i].size() <= 4)
            continue;
        else if (id == "cue " && !whole)
            result.append(chunkOf("cue ", cues[i]));
        else if (id == "LIST" && !whole && data.rfind("adtl", 0) == 0)
            result.append(chunkOf("LIST", mover.labels(data)));
        else
            result.append(chunks.at(i));
    }
    return result;
}

namespace {

AnyDict describeBext(const std::string& data) {
    AnyDict bext;
    const std::string_view bytes = data;
    for (const auto& field : bextTexts)
        bext.set(field.name, textOf(bytes.substr(field.at, field.bytes)).c_str());
    bext.set("timeReference",
             Any(static_cast<long long>(std::min<uint64_t>(timeReference(data), INT64_MAX))));
    bext.set("version", versionOf(data));
    bext.set("codingHistory", textOf(bytes.substr(bextHistory)).c_str());
    return bext;
}

AnyDict describeIxml(const std::string& data) {
    const std::string xml = textOf(data);
    AnyDict described("xml", xml.c_str());
    constexpr const char* elements[][2] = {
        {"PROJECT", "project"}, {"SCENE", "scene"}, {"TAKE", "take"}, {"TAPE", "tape"}, {"NOTE", "note"}};
    for (const auto& [element, key] : elements)
        if (const auto place = elementIn(xml, element); place && place->second > 0)
            described.set(key, xml.substr(place->first, place->second).c_str());
    return described;
}

}  // namespace

AnyDict QvWavChunks::describe(const AnyVector& chunks) {
    AnyDict all;
    AnyVector info, cues;
    std::map<uint32_t, std::string> labels;
    for (const Any& chunk : chunks) {
        const std::string id = idOf(chunk);
        if (id.empty()) continue;
        const std::string data = bytesOf(chunk.asDict().get("data"));
        if (id == "bext" && isBext(data)) all.set("bext", describeBext(data));
        if (id == "iXML") all.set("iXML", describeIxml(data));
        if (id != "LIST") continue;
        const bool isInfo = data.rfind("INFO", 0) == 0;
        forEachInside(data, [&](std::string_view entry, std::string_view bytes) {
            if (isInfo)
                info.append(AnyDict("id", std::string(entry).c_str(), "text", textOf(bytes).c_str()));
            else if (entry == "labl" && bytes.size() > 4)
                labels[u32(bytes, 0)] = textOf(bytes.substr(4));
        });
    }
    for (const Any& chunk : chunks)
        if (idOf(chunk) == "cue ")
            forEachCue(bytesOf(chunk.asDict().get("data")), [&](std::string_view point) {
                const uint32_t id = u32(point, 0);
                AnyDict cue("id", Any(static_cast<long long>(id)), "position",
                            Any(static_cast<long long>(u32(point, cueSample))));
                if (const auto label = labels.find(id); label != labels.end())
                    cue.set("label", label->second.c_str());
                cues.append(cue);
            });
    if (!info.empty()) all.set("info", info);
    if (!cues.empty()) all.set("cues", cues);
    return all;
}
