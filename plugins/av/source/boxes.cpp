#include "plugins/av/source/boxes.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <optional>
#include <span>

#include "core/stream/qvbytesource.h"

namespace av {

namespace {

constexpr int mostBoxes = 10000;

std::uint64_t number(const unsigned char* bytes, int count) {
    std::uint64_t value = 0;
    for (int i = 0; i < count; ++i) value = value << 8 | bytes[i];
    return value;
}

// A box: 4 bytes of size, 4 of type, and with a size of 1 the size in 8 bytes. A size of 0 reaches to the end
// of what it is in.
struct Box {
    unsigned char type[4];
    std::uint64_t data, end;  // places in the file; it may end beyond what it is in

    bool is(const char* name) const { return std::memcmp(type, name, sizeof type) == 0; }
};

constexpr int shortHead = 8;

std::size_t readAt(QvByteSource& source, std::uint64_t at, std::span<unsigned char> to) {
    return source.seek(static_cast<long long>(at)) ? source.read(to.data(), to.size()) : 0;
}

// Nothing where there is none: at the end, or for a size that is too small.
std::optional<Box> boxAt(QvByteSource& source, std::uint64_t at, std::uint64_t end) {
    unsigned char head[16] = {};
    if (end < shortHead || at > end - shortHead || readAt(source, at, head) < shortHead) return std::nullopt;
    std::uint64_t size = number(head, 4);
    const bool isLong = size == 1;
    if (isLong) size = number(head + 8, 8);
    if (size == 0) size = end - at;
    if (size < (isLong ? sizeof head : shortHead)) return std::nullopt;
    Box box{{}, at + (isLong ? sizeof head : shortHead), size > UINT64_MAX - at ? UINT64_MAX : at + size};
    std::memcpy(box.type, head + 4, sizeof box.type);
    return box;
}

struct Track {
    bool isSound = false,
         isPlain = false;  // a sample of the table is one of the sound's: they come in chunks
    std::uint64_t samples = 0;

    std::uint64_t packets() const { return isSound && isPlain ? samples / 1024 : samples; }
};

class Tables {
  public:
    explicit Tables(QvByteSource& source) : source_(source) {}

    std::uint64_t packets = 0;

    void walk(std::uint64_t at, std::uint64_t end, Track& track, int depth) {
        constexpr int deepest = 8;
        while (depth < deepest && boxes_-- > 0) {
            const auto box = boxAt(source_, at, end);
            if (!box) return;
            const std::uint64_t inner = std::min(box->end, end);
            if (box->is("trak")) {
                Track own;
                walk(box->data, inner, own, depth + 1);
                packets += own.packets();
            } else if (box->is("moov") || box->is("mdia") || box->is("minf") || box->is("stbl")) {
                walk(box->data, inner, track, depth + 1);
            } else {
                take(*box, track);
            }
            if (box->end >= end) return;
            at = box->end;
        }
    }

  private:
    QvByteSource& source_;
    int boxes_ = mostBoxes;

    // Each begins with 4 bytes of version and flags.
    void take(const Box& box, Track& track) {
        const bool handler = box.is("hdlr"), sizes = box.is("stsz"), times = box.is("stts");
        unsigned char bytes[16] = {};
        if (!(handler || sizes || times) || readAt(source_, box.data, bytes) < 12) return;
        if (handler) track.isSound = track.isSound || std::memcmp(bytes + 8, "soun", 4) == 0;
        if (sizes) track.samples += number(bytes + 8, 4);
        if (times) track.isPlain = number(bytes + 4, 4) == 1 && number(bytes + 12, 4) == 1;
    }
};

}  // namespace

bool isOneTable(QvByteSource& source) {
    const auto end = static_cast<std::uint64_t>(source.size());
    bool table = false;
    std::uint64_t at = 0;
    for (int i = 0; i < mostBoxes && at + shortHead <= end; ++i) {
        const auto box = boxAt(source, at, end);
        if (!box) return table && !source.failed();
        if (box->is("moof") || box->is("sidx")) return false;
        table = table || box->is("moov");
        if (box->end > end) return table;  // the rest is missing
        at = box->end;
    }
    return table && at + shortHead > end;
}

std::uint64_t packetsOfTables(QvByteSource& source) {
    Tables tables(source);
    Track none;
    if (source.size() > 0) tables.walk(0, static_cast<std::uint64_t>(source.size()), none, 0);
    return tables.packets;
}

}  // namespace av
