// QvAuxinfoData: one block with info and payload, shared by its handles.
#include <atomic>
#include <cstring>
#include <new>

#include "core/arch/qvassert.h"
#include "core/stream/fifo/qvbufmem.h"

// The payload follows the record in the same block. The count is atomic since a writer drops its handle while
// a consumer already has the queue's.
struct alignas(16) QvAuxinfoData::Record {
    std::atomic<int32_t> references{1};
    int32_t id;
    int32_t infoSize;
    unsigned char info[MAX_AU_SIZE];
    int32_t payloadSize;
    unsigned char* payload;
};

QvAuxinfoData::Record* QvAuxinfoData::allocate(int id, const void* info, int infoSize, int payloadSize) {
    static_assert(sizeof(Record) == 288);
    const size_t payloadBytes = static_cast<size_t>(payloadSize);
    void* block =
        ::operator new(sizeof(Record) + payloadBytes, std::align_val_t(alignof(Record)), std::nothrow);
    if (!block) return nullptr;
    auto* record = new (block) Record;
    record->id = id;
    record->infoSize = infoSize;
    if (infoSize && info)
        std::memcpy(record->info, info, static_cast<size_t>(infoSize));
    else
        std::memset(record->info, 0, static_cast<size_t>(infoSize));
    record->payloadSize = payloadSize;
    record->payload = payloadSize ? static_cast<unsigned char*>(block) + sizeof(Record) : nullptr;
    return record;
}

QvAuxinfoData::QvAuxinfoData(int id, void* info, int infoSize, unsigned char* payload, int payloadSize) {
    QV_ASSERT_MSG(infoSize <= MAX_AU_SIZE, "info_size <= MAX_AU_SIZE");
    QV_ASSERT(infoSize >= 0 && payloadSize >= 0);
    record_ = allocate(id, info, infoSize, payloadSize);
    if (!record_) throw std::bad_alloc();
    if (!payloadSize) return;
    if (payload)
        std::memcpy(record_->payload, payload, static_cast<size_t>(payloadSize));
    else
        std::memset(record_->payload, 0, static_cast<size_t>(payloadSize));
}

QvAuxinfoData::QvAuxinfoData(const QvAuxinfoData& other) : record_(other.record_) {
    record_->references.fetch_add(1, std::memory_order_relaxed);
}

QvAuxinfoData& QvAuxinfoData::operator=(const QvAuxinfoData& other) {
    other.record_->references.fetch_add(1, std::memory_order_relaxed);
    release();
    record_ = other.record_;
    return *this;
}

QvAuxinfoData::~QvAuxinfoData() { release(); }

void QvAuxinfoData::release() {
    if (record_->references.fetch_sub(1, std::memory_order_acq_rel) != 1) return;
    record_->~Record();
    ::operator delete(record_, std::align_val_t(alignof(Record)));
}

int QvAuxinfoData::infoId() const { return record_->id; }
int QvAuxinfoData::infoSize() const { return record_->infoSize; }
void* QvAuxinfoData::info() const { return record_->infoSize ? record_->info : nullptr; }
int QvAuxinfoData::payloadSize() const { return record_->payloadSize; }
unsigned char* QvAuxinfoData::payload() const { return record_->payload; }
