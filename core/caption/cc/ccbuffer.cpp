// Caption pairs as the cc_data structure of a bitstream.
//
//     GA94 03 | 110ccccc FF | hh b1 b2 hh b1 b2 ... | FF      A/53; A/72 has B5 00 31 in front
//             '------------ generic ---------------'
#include <algorithm>
#include <cstring>

#include "core/caption/cc/qvcc.h"
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

int QvCcData::detectBufferFmt(int size, const unsigned char* data) {
    if (size >= 7 && std::memcmp(data, a53Head, sizeof a53Head) == 0) return a53;
    // The byte that says cc_data is left to fromBuffer.
    if (size >= 9 && std::memcmp(data, a72Head, sizeof a72Head - 1) == 0) return a72;
    return -1;
}

int QvCcData::byteSize(int fmt) const {
    const Layout* layout = layoutOf(fmt);
    if (!layout) return QvStatus::invalidArgument;
    return layout->headSize + genericHead + pairBytes * count() + layout->tailSize;
}

int QvCcData::toBuffer(int fmt, int size, unsigned char* data) const {
    const Layout* layout = layoutOf(fmt);
    if (!layout) return QvStatus::invalidArgument;
    if (count() > maxBufferPairs || size < byteSize(fmt)) return QvStatus::illegalState;
    unsigned char* to = data;
    if (layout->head) to = std::copy_n(layout->head, layout->headSize, to);
    *to++ = static_cast<unsigned char>(0x80 | (processCCDataFlag() ? processFlag : 0) | count());
    *to++ = 0xFF;
    for (const auto& pair : pairs_) {
        *to++ = pair.header;
        *to++ = pair.byte1;
        *to++ = pair.byte2;
    }
    if (layout->tailSize) *to++ = 0xFF;
    return static_cast<int>(to - data);
}

int QvCcData::fromBuffer(int fmt, int size, const unsigned char* data, const MediaTime* t) {
    const Layout* layout = layoutOf(fmt);
    if (!layout) return QvStatus::invalidArgument;
    if (fmt == generic) return _fromBufferGeneric(size, data, t);
    clear();
    if (size < layout->headSize ||
        std::memcmp(data, layout->head, static_cast<std::size_t>(layout->headSize)) != 0)
        return QvStatus::illegalState;
    // What follows the structure in a longer buffer is not ours.
    return _fromBufferGeneric(std::min(size - layout->headSize, largestGeneric), data + layout->headSize, t);
}

int QvCcData::_fromBufferGeneric(int size, const unsigned char* data, const MediaTime* t) {
    clear();
    if (size < genericHead || size > largestGeneric) return QvStatus::illegalState;
    const int number = data[0] & maxBufferPairs;
    if (genericHead + pairBytes * number > size) return QvStatus::illegalState;
    setProcessCCDataFlag((data[0] & processFlag) != 0);
    const MediaTime time = t ? *t : MediaTime();
    for (const unsigned char* from = data + genericHead; count() < number; from += pairBytes) {
        QvCcBytePair pair(time, 0, from[1], from[2], false);
        pair.header = from[0];
        append(pair);
    }
    return QvStatus::ok;
}
