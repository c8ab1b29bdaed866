#include "plugins/av/source/fileextent.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <optional>

#include "core/stream/qvbytesource.h"

namespace av {

namespace {

constexpr int mostElements = 1'000'000;
constexpr std::int64_t unknownSize = -1;
constexpr std::uint32_t header = 0x1A45DFA3, segment = 0x18538067;
// What a segment consists of: seek head, information, tracks, clusters, cues, chapters, tags, attachments; a
// checksum and filling.
constexpr std::uint32_t parts[] = {0x114D9B74, 0x1549A966, 0x1654AE6B, 0x1F43B675, 0x1C53BB6B,
                                   0x1043A770, 0x1254C367, 0x1941A469, 0xBF,       0xEC};

// An element's head: an identifier and a size, each as long as the zeros before its first bit say.
struct Element {
    std::uint32_t id = 0;
    std::int64_t data = 0,
                 size = 0;  // where its data begin, and how many bytes; unknownSize where not stated
};

int lengthOf(unsigned char first) {
    int length = 1;
    while (length <= 8 && !(first & 0x80 >> (length - 1))) ++length;
    return length;
}

// Nothing for what is no head of an element.
std::optional<Element> elementAt(QvByteSource& source, std::int64_t at) {
    unsigned char bytes[12] = {};
    if (!source.seek(at)) return std::nullopt;
    const auto got = static_cast<int>(source.read(bytes, sizeof bytes));
    const int idBytes = got > 0 ? lengthOf(bytes[0]) : 9;
    if (idBytes > 4 || idBytes >= got) return std::nullopt;
    const int sizeBytes = lengthOf(bytes[idBytes]);
    if (sizeBytes > 8 || idBytes + sizeBytes > got) return std::nullopt;
    Element element;
    for (int i = 0; i < idBytes; ++i) element.id = element.id << 8 | bytes[i];
    std::uint64_t size = bytes[idBytes] & (0xFFu >> sizeBytes);
    for (int i = 1; i < sizeBytes; ++i) size = size << 8 | bytes[idBytes + i];
    const bool stated = size != (std::uint64_t{1} << 7 * sizeBytes) - 1;
    element.size = stated ? static_cast<std::int64_t>(size) : unknownSize;
    element.data = at + idBytes + sizeBytes;
    return element;
}

// `first`: the file's first element.
FileExtent matroska(QvByteSource& source, const Element& first) {
    FileExtent extent;
    if (first.size == unknownSize) return extent;
    const auto whole = elementAt(source, first.data + first.size);
    if (!whole || whole->id != segment || whole->size == unknownSize) return extent;
    extent.bytes = whole->data + whole->size;
    const std::int64_t end = std::min<std::int64_t>(extent.bytes, source.size());
    std::int64_t at = whole->data;
    for (int i = 0; i < mostElements && at < end; ++i) {
        const auto part = elementAt(source, at);
        if (!part || std::find(std::begin(parts), std::end(parts), part->id) == std::end(parts)) {
            extent.broken = true;
            break;
        }
        if (part->size == unknownSize) break;
        at = part->data + part->size;
    }
    return extent;
}

// "riff" and its size, which counts all of the file.
FileExtent wave64(const unsigned char* head) {
    std::uint64_t size = 0;
    for (int i = 7; i >= 0; --i) size = size << 8 | head[16 + i];
    return {size >> 60 ? 0 : static_cast<long long>(size), false};
}

}  // namespace

FileExtent extentOf(QvByteSource& source) {
    constexpr unsigned char riff[] = {'r',  'i',  'f',  'f',  0x2E, 0x91, 0xCF, 0x11,
                                      0xA5, 0xD6, 0x28, 0xDB, 0x04, 0xC1, 0x00, 0x00};
    unsigned char head[24] = {};
    if (!source.seek(0) || source.read(head, sizeof head) < sizeof head) return {};
    if (std::memcmp(head, riff, sizeof riff) == 0) return wave64(head);
    const auto first = elementAt(source, 0);
    return first && first->id == header ? matroska(source, *first) : FileExtent{};
}

}  // namespace av
