#include "plugins/av/source/boxes.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "core/stream/qvbytesource.h"

namespace av {

namespace {

constexpr int mostBoxes = 10000;

std::uint64_t number(const unsigned char* bytes, int count) {
    std::uint64_t value = 0;
    for (int i = 0; i < count; ++i) value = value << 8 | bytes[i];
    return value;
}

}  // namespace

// A box: 4 bytes of size, 4 of type, and with a size of 1 the size in 8 bytes. A size of 0 reaches to the
// end of the file.
bool isOneTable(QvByteSource& source) {
    constexpr int shortHead = 8, longHead = 16;
    const auto end = static_cast<std::uint64_t>(source.size());
    bool table = false;
    std::uint64_t at = 0;
    for (int i = 0; i < mostBoxes && at + shortHead <= end; ++i) {
        unsigned char head[longHead] = {};
        if (!source.seek(static_cast<long long>(at)) || source.read(head, longHead) < shortHead) return false;
        const auto is = [&](const char* type) { return std::memcmp(head + 4, type, 4) == 0; };
        if (is("moof") || is("sidx")) return false;
        table = table || is("moov");
        std::uint64_t size = number(head, 4);
        if (size == 1) size = number(head + 8, 8);
        if (size == 0) return table;
        if (size < shortHead || size > end - at) return table;  // the rest is missing
        at += size;
    }
    return table && at + shortHead > end;
}

}  // namespace av
