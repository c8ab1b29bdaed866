#include "core/stream/file/rwfile_p.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>

#include "core/stream/auxinfoid.h"
#include "core/stream/platformblock_p.h"
#include "core/stream/stdfile_p.h"

namespace {

struct Allocator {
    void* (*allocate)(unsigned) = [](unsigned bytes) { return std::malloc(bytes); };
    void (*release)(void*) = [](void* block) { std::free(block); };

    explicit Allocator(RcLookup lookup) {
        if (!lookup) return;
        if (void* found = lookup("malloc")) allocate = reinterpret_cast<void* (*)(unsigned)>(found);
        if (void* found = lookup("free")) release = reinterpret_cast<void (*)(void*)>(found);
    }
};

class RwFile {
  public:
    RwFile(const QvWideString& name, unsigned size, std::shared_ptr<QvIoFailure> failure, Allocator allocator)
        : buffer_(size), size_(size), name_(name), failure_(std::move(failure)), allocator_(allocator) {
        if (buffer_.data() && !file_.open(name, "w+b"))
            failure_->note(file_.error(), "Can not open file", name);
    }

    bool isOpen() const { return file_.isOpen(); }
    const Allocator& allocator() const { return allocator_; }

    unsigned usable() const { return size_ - index_; }
    unsigned char* request(unsigned n) { return reading_ ? requestRead(n) : requestWrite(n); }
    unsigned copybytes(unsigned char* p, unsigned n) { return reading_ ? copyOut(p, n) : copyIn(p, n); }
    unsigned confirm(unsigned n);
    unsigned chunksize() const { return size_; }
    unsigned auxinfo(unsigned origin, unsigned id, void* info, unsigned size);
    void done(int abort);

  private:
    unsigned char* requestRead(unsigned n);
    unsigned char* requestWrite(unsigned n);
    unsigned copyOut(unsigned char* p, unsigned n);
    unsigned copyIn(const unsigned char* p, unsigned n);
    bool seek(const void* info, unsigned size, unsigned origin);
    bool patch(const void* info, unsigned size);
    bool setReading(bool on);
    bool writeOut();
    bool fail(const char* what);
    void advance(unsigned n);

    StdFile file_;
    PlatformBlock buffer_;
    unsigned index_ = 0;  // of the next byte in the buffer, in either direction
    unsigned size_;
    unsigned end_ = 0;  // reading: one past the last valid byte
    int64_t position_ = 0;
    int64_t highWater_ = 0;
    bool reading_ = false;
    bool broken_ = false;
    QvWideString name_;
    std::shared_ptr<QvIoFailure> failure_;
    Allocator allocator_;
};

bool RwFile::fail(const char* what) {
    broken_ = true;
    failure_->report(file_.error(), what, name_);
    return false;
}

bool RwFile::writeOut() {
    if (broken_) return false;
    const unsigned bytes = index_;
    index_ = 0;
    return !bytes || file_.write(buffer_.data(), bytes) || fail("Failed to write to");
}

void RwFile::advance(unsigned n) {
    position_ += n;
    highWater_ = std::max(highWater_, position_);
}

unsigned RwFile::confirm(unsigned n) {
    n = std::min(n, (reading_ ? end_ : size_) - index_);
    index_ += n;
    advance(n);
    if (!reading_ && index_ == size_) writeOut();
    return n;
}

unsigned char* RwFile::requestWrite(unsigned n) {
    if (broken_ || n > size_) return nullptr;
    if (n > size_ - index_ && !writeOut()) return nullptr;
    return buffer_.data() + index_;
}

unsigned RwFile::copyIn(const unsigned char* p, unsigned n) {
    if (!writeOut()) return 0;
    const size_t written = file_.writeSome(p, n);
    advance(static_cast<unsigned>(written));
    if (written == n) return n;
    fail("Failed to write to");
    return 0;
}

unsigned char* RwFile::requestRead(unsigned n) {
    if (n <= end_ - index_) return buffer_.data() + index_;
    if (index_ == end_) index_ = end_ = 0;
    if (n > size_ - index_) {
        std::memmove(buffer_.data(), buffer_.data() + index_, end_ - index_);
        end_ -= index_;
        index_ = 0;
    }
    end_ += static_cast<unsigned>(file_.read(buffer_.data() + end_, size_ - end_));
    if (file_.failedRead()) fail("Failed to read");
    return n <= end_ - index_ ? buffer_.data() + index_ : nullptr;
}

unsigned RwFile::copyOut(unsigned char* p, unsigned n) {
    unsigned count = std::min(n, end_ - index_);
    if (count) std::memcpy(p, buffer_.data() + index_, count);
    index_ += count;
    if (count < n) {
        index_ = end_ = 0;
        count += static_cast<unsigned>(file_.read(p + count, n - count));
        if (file_.failedRead()) fail("Failed to read");
    }
    advance(count);
    return count;
}

// The position becomes the argument whatever the origin: senders pass what they know the result to be.
bool RwFile::seek(const void* info, unsigned size, unsigned origin) {
    static constexpr int origins[] = {SEEK_SET, SEEK_CUR, SEEK_END};
    if (!info || size != sizeof position_ || origin >= std::size(origins)) return false;
    int64_t target;
    std::memcpy(&target, info, sizeof target);
    if (!reading_ && !writeOut()) return false;
    if (!file_.seek(target, origins[origin])) return false;
    index_ = end_ = 0;
    position_ = target;
    return true;
}

bool RwFile::patch(const void* info, unsigned size) {
    if (!info || size != sizeof(BufSeekInfo)) return false;
    BufSeekInfo change;
    std::memcpy(&change, info, sizeof change);
    if (!reading_ && !writeOut()) return false;
    const int64_t resume = file_.tell();
    if (!file_.seek(change.position, SEEK_SET)) return false;
    const bool written = file_.write(change.data, change.size) || fail("Failed to write to");
    return file_.seek(resume, SEEK_SET) && written;
}

bool RwFile::setReading(bool on) {
    if (reading_ == on) return true;
    if (on && !writeOut()) return false;
    if (!file_.seek(position_, SEEK_SET)) return false;
    index_ = end_ = 0;
    reading_ = on;
    return true;
}

unsigned RwFile::auxinfo(unsigned origin, unsigned id, void* info, unsigned size) {
    using namespace QvAuxId;
    const auto result = [](bool ok) { return ok ? 0 : BUFSTREAM_FAILED; };
    const auto answer = [&](int64_t value) {
        if (info && size == sizeof value) std::memcpy(info, &value, sizeof value);
        return 0u;
    };
    switch (id) {
        case FILE_SEEK: return result(seek(info, size, origin));
        case BUF_SEEK_INFO: return result(patch(info, size));
        case BYTECOUNT_INFO: return answer(position_);
        case FILE_SIZE_INFO: return answer(highWater_);
        case FILE_MODE_WRITE: return result(setReading(false));
        case FILE_MODE_READ: return result(setReading(true));
        default: return result(id < FILE_SEEK);
    }
}

void RwFile::done(int abort) {
    if (!file_.isOpen()) return;
    if (!abort && !reading_) writeOut();
    if (!file_.close() && !abort && !broken_) fail("Failed to write to");
    broken_ = true;
}

RwFile* of(bufstream* bs) { return static_cast<RwFile*>(bs->context); }

void freeRecord(bufstream* bs) {
    RwFile* file = of(bs);
    file->done(0);
    const Allocator allocator = file->allocator();
    file->~RwFile();
    allocator.release(file);
    allocator.release(bs);
}

void fillRecord(bufstream* bs, RwFile* file) {
    *bs = {
        .usable = [](bufstream* self) { return of(self)->usable(); },
        .request = [](bufstream* self, unsigned n) { return of(self)->request(n); },
        .confirm = [](bufstream* self, unsigned n) { return of(self)->confirm(n); },
        .copybytes = [](bufstream* self, unsigned char* p, unsigned n) { return of(self)->copybytes(p, n); },
        .chunksize = [](bufstream* self) { return of(self)->chunksize(); },
        .auxinfo = [](bufstream* self, unsigned offset, unsigned id, void* info,
                      unsigned size) { return of(self)->auxinfo(offset, id, info, size); },
        .split = nullptr,
        .done = [](bufstream* self, int abort) { of(self)->done(abort); },
        .free = freeRecord,
        .reserved = {},
        .flags = BUFSTREAM_WRITER,
        .state = nullptr,
        .context = file,
    };
}

}  // namespace

bufstream* rwFileNew(const QvWideString& name, unsigned size, std::shared_ptr<QvIoFailure> failure,
                     RcLookup lookup) {
    const Allocator allocator(lookup);
    void* record = allocator.allocate(sizeof(bufstream));
    void* context = allocator.allocate(sizeof(RwFile));
    RwFile* file =
        record && context ? new (context) RwFile(name, size, std::move(failure), allocator) : nullptr;
    if (file && file->isOpen()) {
        fillRecord(static_cast<bufstream*>(record), file);
        return static_cast<bufstream*>(record);
    }
    if (file) file->~RwFile();
    if (context) allocator.release(context);
    if (record) allocator.release(record);
    return nullptr;
}
