#include "core/stream/nav/metadatarecord_p.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <new>

#include "core/engine/files/qvfileutil.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/stdfile_p.h"

namespace {

constexpr size_t longestName = 2047;
constexpr unsigned slotCount = 8;

struct Slot {
    StdFile file;
    bool used = false;  // its file was opened by this record
};

class MetadataStorage {
  public:
    MetadataStorage(const QvWideString& baseName, bufstream* inner) : baseName_(baseName), inner_(inner) {}

    bufstream* inner() const { return inner_; }
    unsigned auxinfo(unsigned slot, unsigned id, void* info, unsigned size);
    void closeAll();

  private:
    QvWideString name(unsigned slot) const;
    bool open(unsigned slot, const char* mode);
    bool remove(unsigned slot);
    static bool length(StdFile& file, void* info, unsigned size);

    QvWideString baseName_;
    std::array<Slot, slotCount> slots_;
    bool deleteAtEnd_ = false;
    bufstream* inner_;
};

QvWideString MetadataStorage::name(unsigned slot) const {
    const char ending[] = {'.', 'm', 'd', static_cast<char>('0' + slot)};
    return baseName_ + QvWideString(std::begin(ending), std::end(ending));
}

bool MetadataStorage::open(unsigned slot, const char* mode) {
    Slot& s = slots_[slot];
    if (s.file.isOpen() || !s.file.open(name(slot), mode)) return false;
    s.used = true;
    return true;
}

bool MetadataStorage::remove(unsigned slot) {
    if (slots_[slot].file.isOpen()) return false;
    slots_[slot].used = false;
    const Any file(name(slot).c_str());
    return QvFile::rm(file) == 0 || !QvFile::isFile(file);
}

bool MetadataStorage::length(StdFile& file, void* info, unsigned size) {
    if (!file.isOpen() || !info || (size && size < sizeof(uint32_t))) return false;
    const long long bytes = file.length();
    if (bytes < 0) return false;
    const auto word = static_cast<uint32_t>(std::min<long long>(bytes, UINT32_MAX));
    std::memcpy(info, &word, sizeof word);
    return true;
}

unsigned MetadataStorage::auxinfo(unsigned slot, unsigned id, void* info, unsigned size) {
    using namespace QvAuxId;
    if (id < METADATA_OPEN_WRITE || id > METADATA_LENGTH)
        return inner_ ? inner_->auxinfo(inner_, slot, id, info, size) : BUFSTREAM_FAILED;
    if (slot >= slotCount) return BUFSTREAM_FAILED;
    const auto result = [](bool ok) { return ok ? 0 : BUFSTREAM_FAILED; };
    StdFile& file = slots_[slot].file;
    switch (id) {
        case METADATA_OPEN_WRITE: return result(open(slot, "wb"));
        case METADATA_OPEN_READ: return result(open(slot, "rb"));
        case METADATA_CLOSE: return result(file.close());
        case METADATA_WRITE: return result(file.isOpen() && (info || !size) && file.write(info, size));
        case METADATA_READ: return result(file.isOpen() && (info || !size) && file.readAll(info, size));
        case METADATA_REWIND: return result(file.isOpen() && file.seek(0, SEEK_SET));
        case METADATA_DELETE: return result(remove(slot));
        case METADATA_DELETE_AT_END: deleteAtEnd_ = true; return 0;
        default: return result(length(file, info, size));
    }
}

void MetadataStorage::closeAll() {
    for (unsigned slot = 0; slot < slotCount; ++slot) {
        slots_[slot].file.close();
        if (deleteAtEnd_ && slots_[slot].used) remove(slot);
    }
}

MetadataStorage* of(bufstream* bs) { return static_cast<MetadataStorage*>(bs->context); }

void done(bufstream* bs, int abort) {
    of(bs)->closeAll();
    if (bufstream* inner = of(bs)->inner()) inner->done(inner, abort);
}

void freeRecord(bufstream* bs) {
    of(bs)->closeAll();
    delete of(bs);
    delete bs;
}

}  // namespace

bufstream* metadataRecordNew(const QvWideString& baseName, bufstream* inner) {
    if (baseName.empty() || baseName.size() > longestName) return nullptr;
    auto* storage = new (std::nothrow) MetadataStorage(baseName, inner);
    if (!storage) return nullptr;
    auto* record = new (std::nothrow) bufstream{};
    if (!record) {
        delete storage;
        return nullptr;
    }
    record->usable = [](bufstream* bs) {
        bufstream* in = of(bs)->inner();
        return in ? in->usable(in) : 0u;
    };
    record->request = [](bufstream* bs, unsigned n) -> unsigned char* {
        bufstream* in = of(bs)->inner();
        return in ? in->request(in, n) : nullptr;
    };
    record->confirm = [](bufstream* bs, unsigned n) {
        bufstream* in = of(bs)->inner();
        return in ? in->confirm(in, n) : 0u;
    };
    record->copybytes = [](bufstream* bs, unsigned char* p, unsigned n) {
        bufstream* in = of(bs)->inner();
        return in ? in->copybytes(in, p, n) : 0u;
    };
    record->chunksize = [](bufstream* bs) {
        bufstream* in = of(bs)->inner();
        return in ? in->chunksize(in) : 0u;
    };
    record->auxinfo = [](bufstream* bs, unsigned offset, unsigned id, void* info, unsigned size) {
        return of(bs)->auxinfo(offset, id, info, size);
    };
    record->done = done;
    record->free = freeRecord;
    record->flags = BUFSTREAM_WRITER;
    record->context = storage;
    return record;
}
