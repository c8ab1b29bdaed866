#include <algorithm>
#include <cstring>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/stream/fifo/bufmemout_p.h"

namespace {

constexpr unsigned ringSize = 0x200000;
constexpr unsigned ringChunk = 0x40001;

}  // namespace

int BufMemOut::init() {
    ring_ = bytefifo::make(std::max(ringSize, size_), ringChunk);
    return ring_ ? Bufstream::init() : QvStatus::outOfMemory;
}

unsigned char* BufMemOut::request(unsigned n) {
    QV_ASSERT_MSG(n > 0, "numSamples > 0");
    ring_->rewindIfEmpty();
    unsigned char* block = ring_->requestWrite(n);
    qv_dbg()->debug("%p fifow_request numSamples=%u, ret=%p, empty=%u", static_cast<void*>(this), n,
                    static_cast<void*>(block), ring_->room());
    return block;
}

unsigned BufMemOut::confirm(unsigned n) {
    const unsigned done = ring_->confirmWrite(n);
    qv_dbg()->debug("%p fifow_confirm numSamples=%u, ret=%u, empty=%u", static_cast<void*>(this), n, done,
                    ring_->room());
    return done;
}

unsigned BufMemOut::copybytes(unsigned char* p, unsigned n) {
    QV_ASSERT_MSG(n > 0 && n <= ring_->start, "numSamples > 0 && numSamples <= _fifo->sampchunk");
    ring_->rewindIfEmpty();
    const unsigned done = ring_->copyIn(p, n);
    qv_dbg()->debug("%p fifow_copybytes numSamples=%u, ret=%u, empty=%u", static_cast<void*>(this), n, done,
                    ring_->room());
    return done;
}

unsigned BufMemOut::auxinfo(unsigned, unsigned id, void* info, unsigned size) {
    using namespace QvAuxId;
    qv_dbg()->debug("%p fifow_auxinfo id=%d (%s) size=%d", static_cast<void*>(this), static_cast<int>(id),
                    qvAuxInfoName(id), static_cast<int>(size));
    switch (id) {
        case VIDEO_AU_CODE:
        case AUDIO_AU_CODE: return queueAccessUnit(id, info, size);
        case ID_PICTURE_START_CODE:
        case ID_SEQ_START_CODE:
        case ID_SEQ_END_CODE:
        case ID_GOP_START_CODE:
        case STATISTIC_INFO:
        case CPB_FULLNESS:
        case AUDIO_SYNC_CODE:
        case ID_ISO_END_CODE:
        case VIDEO_STREAM_INFO:
        case VIDEO_AU_INFO:
        case AUDIO_STREAM_INFO:
        case AUDIO_AU_INFO: return 0;
        default: queueInfo(id, info, size); return BUFSTREAM_FAILED;
    }
}

void BufMemOut::queueInfo(unsigned id, void* info, unsigned size) {
    if (!info) size = 0;
    QV_ASSERT_MSG(size <= MAX_AU_SIZE, "info_size <= MAX_AU_SIZE");
    queue_->pushData(QvAuxinfoData(static_cast<int>(id), info, static_cast<int>(size), nullptr, 0));
}

unsigned BufMemOut::queueAccessUnit(unsigned id, const void* info, unsigned size) {
    QV_ASSERT_MSG(info, "info");
    QV_ASSERT_MSG(size && size <= MAX_AU_SIZE, "info_size && info_size <= MAX_AU_SIZE");
    uint32_t bytes = 0;
    std::memcpy(&bytes, info, std::min<size_t>(size, sizeof bytes));
    QV_ASSERT_MSG(bytes <= ring_->data(), "access unit is larger than what was written");

    QvAuxinfoData::Record* record =
        QvAuxinfoData::allocate(static_cast<int>(id), info, static_cast<int>(size), static_cast<int>(bytes));
    if (!record) {
        qv_log()->error("Out of memory for an access unit of %u bytes", bytes);
        return BUFSTREAM_FAILED;
    }
    const QvAuxinfoData item(record);
    takePayload(item.payload(), bytes);
    queue_->pushData(item);
    return 0;
}

void BufMemOut::takePayload(unsigned char* target, unsigned bytes) {
    while (bytes) {
        const unsigned piece = std::min(bytes, ring_->start);
        if (!ring_->copyOut(target, piece)) std::memset(target, 0, piece);
        target += piece;
        bytes -= piece;
    }
}
