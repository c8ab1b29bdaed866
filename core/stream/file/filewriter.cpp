#include "core/stream/file/filewriter_p.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstring>

#include "core/stream/auxinfoid.h"

namespace {

constexpr size_t longestName = 2047;  // units

// The width of a file's number follows the count of splits so far, so the thousandth is "1000".
int numberWidth(int splits) {
    int width = 3;
    for (long long limit = 1000; splits >= limit && width < 10; limit *= 10) ++width;
    return width;
}

QvWideString wideNumber(int number, int width) {
    char text[16];
    const int length = std::snprintf(text, sizeof text, "%0*d", width, number);
    return QvWideString(text, text + length);
}

}  // namespace

FileWriter::FileWriter(const QvWideString& name, unsigned size, std::shared_ptr<QvIoFailure> failure,
                       std::shared_ptr<QvCancel> cancel)
    : buffer_(size), capacity_(size), path_(name), failure_(std::move(failure)), cancel_(std::move(cancel)) {}

std::unique_ptr<FileWriter> FileWriter::open(const QvWideString& name, unsigned size,
                                             std::shared_ptr<QvIoFailure> failure,
                                             std::shared_ptr<QvCancel> cancel) {
    if (name.empty() || name.size() > longestName) return nullptr;
    std::unique_ptr<FileWriter> writer(new FileWriter(name, size, std::move(failure), std::move(cancel)));
    if (!writer->buffer_.data()) {
        writer->failure_->note(ENOMEM, "No memory to write", name);
        return nullptr;
    }
    if (writer->file_.openOutput(name, writer->cancel_)) return writer;
    writer->failure_->note(writer->file_.error(), "Can not open file", name);
    return nullptr;
}

bool FileWriter::fail() {
    broken_ = true;
    failure_->report(file_.error(), "Failed to write to", path_);
    return false;
}

bool FileWriter::flushBuffer() {
    if (broken_) return false;
    const unsigned bytes = fill_;
    fill_ = 0;
    return !bytes || file_.write(buffer_.data(), bytes) || fail();
}

bool FileWriter::writeOut() { return flushBuffer() && (file_.flush() || fail()); }

// Closing may be where the C library finds out that the disc is full.
bool FileWriter::closeFile() {
    if (file_.isOpen()) failure_->countTaken(file_.written());
    return file_.close() || broken_ || fail();
}

unsigned char* FileWriter::request(unsigned n) {
    if (broken_ || n > capacity_) return nullptr;
    if (n > capacity_ - fill_ && !flushBuffer()) return nullptr;
    return buffer_.data() + fill_;
}

// A full buffer goes out at once: writers that ask for what usable() says must not get 0 for ever.
unsigned FileWriter::confirm(unsigned n) {
    n = std::min(n, usable());
    fill_ += n;
    total_ += n;
    if (fill_ == capacity_) flushBuffer();
    return n;
}

unsigned FileWriter::copybytes(const unsigned char* p, unsigned n) {
    if (!flushBuffer()) return 0;
    const size_t written = file_.writeSome(p, n);
    total_ += written;
    if (written == n) return n;
    fail();
    return 0;
}

unsigned FileWriter::nameInfo(void* info, unsigned size) const {
    const size_t bytes = path_.size() * sizeof path_[0];
    if (!info || size <= bytes) return BUFSTREAM_FAILED;
    std::memcpy(info, path_.c_str(), std::min<size_t>(size, bytes + sizeof path_[0]));
    return 0;
}

unsigned FileWriter::auxinfo(bufstream* record, unsigned offset, unsigned id, void* info, unsigned size) {
    using namespace QvAuxId;
    switch (id) {
        case BYTECOUNT_INFO:
            if (info && size == sizeof total_) std::memcpy(info, &total_, sizeof total_);
            return 0;
        case FLUSH_BUFFER: return broken_ || file_.flush() || fail() ? 0 : BUFSTREAM_FAILED;
        case SPLIT_OUTPUT: record->split(record); return 0;
        case FILE_SPLIT_COUNT_INFO:
            if (info && size == sizeof splits_) std::memcpy(info, &splits_, sizeof splits_);
            return 0;
        case FILE_NAME_INFO: return nameInfo(info, size);
        case NAV_COLLECT_BEGIN: nav_.begin(path_); return 0;
        default: return nav_.take(offset, id, info, size);
    }
}

void FileWriter::takeStem() {
    stem_ = path_;
    const size_t dot = stem_.rfind(static_cast<unsigned short>('.'));
    if (dot == QvWideString::npos) return;
    suffix_ = stem_.substr(dot);
    stem_.resize(dot);
}

unsigned FileWriter::split() {
    const bool complete = flushBuffer();
    if (!closeFile() || !complete) return BUFSTREAM_FAILED;
    if (stem_.empty()) takeStem();
    if (splits_ < 0 || splits_ == INT_MAX) return BUFSTREAM_FAILED;
    path_ = stem_ + wideNumber(splits_ + 1, numberWidth(splits_)) + suffix_;
    if (!file_.openOutput(path_, cancel_)) {
        broken_ = true;
        failure_->report(file_.error(), "Can not open file", path_);
        return BUFSTREAM_FAILED;
    }
    ++splits_;
    total_ = 0;
    nav_.nextSegment(path_);
    return 0;
}

void FileWriter::done(int) {
    flushBuffer();
    closeFile();
    nav_.correctFiles(*failure_);
}
