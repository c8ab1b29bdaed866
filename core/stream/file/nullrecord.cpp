#include "core/stream/file/nullrecord_p.h"

#include <cstdint>
#include <cstdio>
#include <cstring>

#include "core/stream/auxinfoid.h"
#include "core/stream/platformblock_p.h"
#include "core/stream/recordof_p.h"

namespace {

class NullOutput {
  public:
    explicit NullOutput(unsigned size) : buffer_(size), size_(size) {}

    bool hasBuffer() const { return buffer_.data(); }
    unsigned usable() const { return size_; }
    unsigned char* request(unsigned n) { return n <= size_ ? buffer_.data() : nullptr; }
    unsigned confirm(unsigned n) {
        count_ += n;
        return n;
    }
    unsigned copybytes(const unsigned char*, unsigned n) { return confirm(n); }
    unsigned chunksize() const { return size_; }
    unsigned auxinfo(bufstream*, unsigned, unsigned id, void* info, unsigned size);
    unsigned split() { return 0; }
    void done(int) {}

  private:
    PlatformBlock buffer_;
    unsigned size_;
    uint64_t count_ = 0;
};

unsigned NullOutput::auxinfo(bufstream*, unsigned, unsigned id, void* info, unsigned size) {
    if (id == QvAuxId::BYTECOUNT_INFO && info && size == sizeof count_)
        std::memcpy(info, &count_, sizeof count_);
    if (id != QvAuxId::ACCESS_INFO) return 0;
    uint32_t words[4];
    if (!info || size < sizeof words) return BUFSTREAM_FAILED;
    std::memset(static_cast<unsigned char*>(info) + 3 * sizeof words[0], 0, sizeof words[0]);
    return 0;
}

}  // namespace

bufstream* nullRecordNew(unsigned size, void (*onError)(const char* text)) {
    std::unique_ptr<NullOutput> output(new (std::nothrow) NullOutput(size));
    bufstream* record = nullptr;
    char text[80] = "Unable to allocate memory for null buffstream";
    if (output && !output->hasBuffer())
        std::snprintf(text, sizeof text, "Unable to allocate memory for bitstream buffer=%u", size);
    else
        record = RecordOf<NullOutput>::make(std::move(output), BUFSTREAM_WRITER);
    if (!record && onError) onError(text);
    return record;
}
