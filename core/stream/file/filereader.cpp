#include "core/stream/file/filereader_p.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "core/stream/auxinfoid.h"

FileReader::FileReader(const QvWideString& name, unsigned size, std::shared_ptr<QvIoFailure> failure)
    : buffer_(size), size_(size), name_(name), failure_(std::move(failure)) {}

std::unique_ptr<FileReader> FileReader::open(const QvWideString& name, unsigned size,
                                             std::shared_ptr<QvIoFailure> failure) {
    std::unique_ptr<FileReader> reader(new FileReader(name, size, std::move(failure)));
    if (!reader->buffer_.data()) {
        reader->failure_->note(ENOMEM, "No memory to read", name);
        return nullptr;
    }
    if (!reader->file_.open(name, "rb")) {
        reader->failure_->note(reader->file_.error(), "Can not open file", name);
        return nullptr;
    }
    reader->fileSize_ = static_cast<uint64_t>(std::max(reader->file_.length(), 0LL));
    return reader;
}

unsigned FileReader::fetchPlain(unsigned char* target, unsigned n) {
    const size_t got = file_.read(target, n);
    if (got < n && file_.failedRead()) failure_->report(file_.error(), "Failed to read", name_);
    return static_cast<unsigned>(got);
}

// An odd fill splits a pair: its second byte is delivered now, as the pair's first after the swap, and the
// other one is held for the next fill.
unsigned FileReader::fetchSwapped(unsigned char* target, unsigned n) {
    if (!n) return 0;
    unsigned delivered = 0;
    if (hasHeld_) {
        target[delivered++] = held_;
        hasHeld_ = false;
    }
    unsigned char* fresh = target + delivered;
    const unsigned wanted = n - delivered;
    const unsigned got = fetchPlain(fresh, wanted);
    for (unsigned i = 0; i + 1 < got; i += 2) std::swap(fresh[i], fresh[i + 1]);
    if (got == wanted && wanted % 2) {
        unsigned char second;
        if (fetchPlain(&second, 1)) {
            held_ = std::exchange(fresh[got - 1], second);
            hasHeld_ = true;
        }
    }
    return delivered + got;
}

unsigned FileReader::fetch(unsigned char* target, unsigned n) {
    return swap_ ? fetchSwapped(target, n) : fetchPlain(target, n);
}

unsigned char* FileReader::request(unsigned n) {
    if (n <= usable()) return buffer_.data() + read_;
    if (read_ == end_) read_ = end_ = 0;
    if (n > size_ - read_) {
        std::memmove(buffer_.data(), buffer_.data() + read_, usable());
        end_ -= read_;
        read_ = 0;
    }
    end_ += fetch(buffer_.data() + end_, size_ - end_);
    return n <= usable() ? buffer_.data() + read_ : nullptr;
}

unsigned FileReader::confirm(unsigned n) {
    n = std::min(n, usable());
    read_ += n;
    position_ += n;
    return n;
}

unsigned FileReader::copybytes(unsigned char* p, unsigned n) {
    unsigned count = std::min(n, usable());
    if (count) std::memcpy(p, buffer_.data() + read_, count);
    read_ += count;
    if (count < n) {
        read_ = end_ = 0;
        count += fetch(p + count, n - count);
    }
    position_ += count;
    return count;
}

unsigned FileReader::auxinfo(bufstream*, unsigned, unsigned id, void* info, unsigned size) {
    using namespace QvAuxId;
    switch (id) {
        case BYTECOUNT_INFO:
            if (info && size == sizeof position_) std::memcpy(info, &position_, sizeof position_);
            return 0;
        case FILE_SIZE_INFO:
            if (info && size == sizeof fileSize_) std::memcpy(info, &fileSize_, sizeof fileSize_);
            return 0;
        case FILE_SWAP_BYTES: swap_ = true; return 0;
        default: return 0;
    }
}
