#include "core/caption/cc/ccbuffer_p.h"

#include <algorithm>
#include <cstring>

#include "core/engine/status.h"

namespace {

constexpr unsigned char a53Head[] = {'G', 'A', '9', '4', 0x03};
constexpr unsigned char a72Head[] = {0xB5, 0x00, 0x31, 'G', 'A', '9', '4', 0x03};
constexpr int genericHead = 2;
constexpr int pairBytes = 3;
constexpr int largestGeneric = genericHead + pairBytes * QvCcData::maxBufferPairs;
constexpr unsigned char processFlag = 0x40;

struct Layout {
    const unsigned char* head;
    int headSize;
    int tailSize;  // marker bytes
};

const Layout* layoutOf(int fmt) {
    static constexpr Layout plain{nullptr, 0, 0};
    static constexpr Layout wrapped{a53Head, sizeof a53Head, 1};
    static constexpr Layout country{a72Head, sizeof a72Head, 1};
    switch (fmt) {
        case QvCcData::generic: return &plain;
        case QvCcData::a53: return &wrapped;
        case QvCcData::a72: return &country;
        default: return nullptr;
    }
}

}  // namespace

int qvCcBufferFormat(int size, const unsigned char* data) {
    if (size >= 7 && std::memcmp(data, a53Head, sizeof a53Head) == 0) return QvCcData::a53;
    // The byte that says cc_data is checked when the buffer is read.
    if (size >= 9 && std::memcmp(data, a72Head, sizeof a72Head - 1) == 0) return QvCcData::a72;
    return -1;
}

int qvCcBufferSize(int fmt, int count) {
    const Layout* layout = layoutOf(fmt);
    if (!layout) return QvStatus::invalidArgument;
    return layout->headSize + genericHead + pairBytes * count + layout->tailSize;
}

int qvWriteCcBuffer(const QvCcData& captions, int fmt, int size, unsigned char* data) {
    const Layout* layout = layoutOf(fmt);
    if (!layout) return QvStatus::invalidArgument;
    const int count = captions.count();
    if (count > QvCcData::maxBufferPairs || size < qvCcBufferSize(fmt, count)) return QvStatus::illegalState;
    unsigned char* to = data;
    if (layout->head) to = std::copy_n(layout->head, layout->headSize, to);
    *to++ = static_cast<unsigned char>(0x80 | (captions.processCCDataFlag() ? processFlag : 0) | count);
    *to++ = 0xFF;
    for (const auto& pair : captions.pairs()) {
        *to++ = pair.header;
        *to++ = pair.byte1;
        *to++ = pair.byte2;
    }
    if (layout->tailSize) *to++ = 0xFF;
    return static_cast<int>(to - data);
}

int qvReadCcBuffer(QvCcData& captions, int fmt, int size, const unsigned char* data, const MediaTime* t) {
    const Layout* layout = layoutOf(fmt);
    if (!layout) return QvStatus::invalidArgument;
    if (fmt == QvCcData::generic) return qvReadCcPairs(captions, size, data, t);
    captions.clear();
    if (size < layout->headSize ||
        std::memcmp(data, layout->head, static_cast<std::size_t>(layout->headSize)) != 0)
        return QvStatus::illegalState;
    // What follows the structure in a longer buffer is not ours.
    return qvReadCcPairs(captions, std::min(size - layout->headSize, largestGeneric), data + layout->headSize,
                         t);
}

int qvReadCcPairs(QvCcData& captions, int size, const unsigned char* data, const MediaTime* t) {
    captions.clear();
    if (size < genericHead || size > largestGeneric) return QvStatus::illegalState;
    const int number = data[0] & QvCcData::maxBufferPairs;
    if (genericHead + pairBytes * number > size) return QvStatus::illegalState;
    captions.setProcessCCDataFlag((data[0] & processFlag) != 0);
    const MediaTime time = t ? *t : MediaTime();
    for (const unsigned char* from = data + genericHead; captions.count() < number; from += pairBytes) {
        QvCcBytePair pair(time, 0, from[1], from[2], false);
        pair.header = from[0];
        captions.append(pair);
    }
    return QvStatus::ok;
}
