#include "core/stream/qvbytesource.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <utility>

#include "core/arch/qvexception.h"
#include "core/engine/files/qvfileutil.h"

namespace {

constexpr long long mostBytes = 1LL << 60;

}  // namespace

QvByteSource::~QvByteSource() = default;

// False if the operation threw, which leaves the text of that as the reason.
template <class Operation>
bool QvByteSource::guarded(Operation&& operation) {
    try {
        operation();
        return true;
    } catch (const QvException& failure) {
        reason_ = failure.what();
    } catch (const std::exception& failure) {
        reason_ = failure.what();
    } catch (...) {
        reason_ = "an exception that is no std::exception";
    }
    return false;
}

void QvByteSource::fail(const char* what) {
    failed_ = true;
    if (reason_.empty()) reason_ = what;
}

std::size_t QvByteSource::read(void* to, std::size_t count) {
    std::size_t done = 0;
    if (closed_) reason_ = "the source is closed";
    if (failed_ || closed_) return 0;
    reason_.clear();
    while (done < count) {
        const std::size_t wanted = std::min(count - done, static_cast<std::size_t>(mostBytes));
        long long got = -1;
        if (!guarded([&] { got = readSome(static_cast<char*>(to) + done, wanted); }) || got < 0) {
            fail("the source reports a failure");
            break;
        }
        if (got == 0) break;
        if (static_cast<unsigned long long>(got) > wanted) {
            fail("the source reports more bytes than it was asked for");
            break;
        }
        done += static_cast<std::size_t>(got);
        position_ += got;
    }
    return done;
}

bool QvByteSource::seek(long long position) {
    if (position < 0 || closed_) return false;
    if (position == position_ && !failed_) return true;
    reason_.clear();
    bool moved = false;
    if (!guarded([&] { moved = canMove() && moveTo(position); }) || !moved) {
        fail(seekable() ? "the source can't be sought there" : "the source can't be sought");
        return false;
    }
    failed_ = false;
    position_ = position;
    return true;
}

bool QvByteSource::seekable() const {
    try {
        return !closed_ && canMove();
    } catch (...) {
        return false;
    }
}

long long QvByteSource::size() {
    long long bytes = unknown;
    if (closed_ || !guarded([&] { bytes = length(); })) return unknown;
    return bytes < 0 || bytes > mostBytes ? unknown : bytes;
}

void QvByteSource::close() {
    if (std::exchange(closed_, true)) return;
    guarded([this] { release(); });
}

std::string QvByteSource::problem() {
    if (!reason_.empty()) return reason_;
    const long long bytes = size();
    if (bytes == unknown || position_ >= bytes) return "";
    return "the source ends at byte " + std::to_string(position_) + " of " + std::to_string(bytes);
}

bool QvByteSource::canMove() const { return false; }

bool QvByteSource::moveTo(long long) { return false; }

long long QvByteSource::length() { return unknown; }

void QvByteSource::release() {}

Any qvSourceValue(QvByteSource* source) { return source ? Any(static_cast<const void*>(source)) : Any(); }

QvByteSource* qvSourceOf(const Any& value) {
    // Bytes that the value holds are no pointer.
    if (!value.isGeneric() || value.size() != 0) return nullptr;
    return static_cast<QvByteSource*>(value.asGeneric());
}

// --- Makers.

namespace {

class BlockSource : public QvByteSource {
  public:
    BlockSource(const void* data, std::size_t bytes) : data_(static_cast<const char*>(data)), bytes_(bytes) {}
    explicit BlockSource(std::vector<unsigned char> data)
        : own_(std::move(data)), data_(reinterpret_cast<const char*>(own_.data())), bytes_(own_.size()) {}

  protected:
    long long readSome(void* to, std::size_t count) override {
        const std::size_t got = std::min(count, bytes_ - std::min(at_, bytes_));
        if (got > 0) std::memcpy(to, data_ + at_, got);
        at_ += got;
        return static_cast<long long>(got);
    }
    bool canMove() const override { return true; }
    bool moveTo(long long position) override {
        at_ = static_cast<std::size_t>(position);
        return true;
    }
    long long length() override { return static_cast<long long>(bytes_); }

  private:
    std::vector<unsigned char> own_;
    const char* data_;
    std::size_t bytes_;
    std::size_t at_ = 0;
};

class FileSource : public QvByteSource {
  public:
    FileSource(std::FILE* file, std::size_t bufferBytes)
        : buffer_(std::make_unique_for_overwrite<char[]>(bufferBytes)), file_(file) {
        // Only a buffer that is given has the size asked for.
        std::setvbuf(file, buffer_.get(), _IOFBF, bufferBytes);
        length_ = QvFile::flength(file);
    }

  protected:
    long long readSome(void* to, std::size_t count) override {
        errno = 0;
        const std::size_t got = std::fread(to, 1, count, file_.get());
        if (got > 0 || !std::ferror(file_.get())) return static_cast<long long>(got);
        setReason(std::strerror(errno));
        return -1;
    }
    bool canMove() const override { return length_ >= 0; }
    bool moveTo(long long position) override {
        if (QvFile::fseek64(file_.get(), position, SEEK_SET) != 0) return false;
        std::clearerr(file_.get());  // the end of the file is no failure after that
        return true;
    }
    long long length() override { return length_; }
    void release() override { file_.reset(); }

  private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };
    std::unique_ptr<char[]> buffer_;  // outlives the file that reads through it
    std::unique_ptr<std::FILE, Close> file_;
    long long length_ = unknown;  // when it was opened
};

class CallbackSource : public QvByteSource {
  public:
    explicit CallbackSource(QvSourceCallbacks callbacks) : callbacks_(std::move(callbacks)) {}
    ~CallbackSource() override { close(); }

  protected:
    long long readSome(void* to, std::size_t count) override { return callbacks_.read(to, count); }
    bool canMove() const override { return static_cast<bool>(callbacks_.seek); }
    bool moveTo(long long position) override { return callbacks_.seek(position); }
    long long length() override { return callbacks_.size ? callbacks_.size() : unknown; }
    void release() override {
        if (callbacks_.close) callbacks_.close();
    }

  private:
    QvSourceCallbacks callbacks_;
};

}  // namespace

std::unique_ptr<QvByteSource> qvBlockSource(const void* data, std::size_t bytes) {
    return std::make_unique<BlockSource>(data, bytes);
}

std::unique_ptr<QvByteSource> qvBlockSource(std::vector<unsigned char> data) {
    return std::make_unique<BlockSource>(std::move(data));
}

std::unique_ptr<QvByteSource> qvFileSource(const Any& name, std::size_t bufferBytes) {
    if (!name.isText() || name.size() == 0) return nullptr;
    auto* file = static_cast<std::FILE*>(qvfopen(name, "rb"));
    if (!file) return nullptr;
    return std::make_unique<FileSource>(file, std::max<std::size_t>(bufferBytes, 1));
}

std::unique_ptr<QvByteSource> qvCallbackSource(QvSourceCallbacks callbacks) {
    if (!callbacks.read) return nullptr;
    return std::make_unique<CallbackSource>(std::move(callbacks));
}
