#include "core/stream/qvfileparts.h"

#include <algorithm>
#include <utility>

#include "core/engine/files/qvfileutil.h"

namespace {

constexpr long long mostBytes = 1LL << 60;  // of a source

long long bytesOf(const QvFilePart& part) {
    const bool named = part.file.isText() && part.file.size() > 0;
    const long long length = named ? QvFile::flength(part.file) : -1;
    if (length < 0 || part.first < 0 || part.first > length) return QvByteSource::unknown;
    const long long rest = length - part.first;
    if (part.bytes < 0) return rest;
    return part.bytes <= rest ? part.bytes : QvByteSource::unknown;
}

class PartsSource : public QvByteSource {
  public:
    // `parts` with the bytes of each.
    PartsSource(std::vector<QvFilePart> parts, std::size_t bufferBytes)
        : parts_(std::move(parts)), bufferBytes_(bufferBytes) {
        for (const QvFilePart& part : parts_) length_ += part.bytes;
    }

  protected:
    long long readSome(void* to, std::size_t count) override {
        while (part_ < parts_.size() && at_ == parts_[part_].bytes) enter(part_ + 1, 0);
        if (part_ == parts_.size()) return 0;
        if (!file_ && !open()) return -1;
        const auto wanted = std::min<long long>(static_cast<long long>(count), parts_[part_].bytes - at_);
        const std::size_t got = file_->read(to, static_cast<std::size_t>(wanted));
        at_ += static_cast<long long>(got);
        if (got > 0) return static_cast<long long>(got);
        const std::string why = file_->problem();
        reason_ = name() + (why.empty() ? " has become shorter" : ": " + why);
        setReason(reason_.c_str());
        return -1;
    }
    bool canMove() const override { return true; }
    bool moveTo(long long position) override {
        std::size_t part = 0;
        while (part < parts_.size() && position >= parts_[part].bytes) position -= parts_[part++].bytes;
        enter(part, part < parts_.size() ? position : 0);
        return true;
    }
    long long length() override { return length_; }
    void release() override { file_.reset(); }

  private:
    std::string name() const { return qv_os_name(parts_[part_].file); }

    void enter(std::size_t part, long long at) {
        part_ = part;
        at_ = at;
        file_.reset();
    }
    bool open() {
        file_ = qvFileSource(parts_[part_].file, bufferBytes_);
        if (file_ && file_->seek(parts_[part_].first + at_)) return true;
        file_.reset();
        reason_ = name() + " can't be opened";
        setReason(reason_.c_str());
        return false;
    }

    std::vector<QvFilePart> parts_;
    std::size_t bufferBytes_;
    long long length_ = 0;
    std::size_t part_ = 0;  // the one that is read
    long long at_ = 0;      // bytes of it that are read
    std::unique_ptr<QvByteSource> file_;
    std::string reason_;
};

}  // namespace

long long qvFilePartsBytes(const std::vector<QvFilePart>& parts) {
    long long sum = 0;
    for (const QvFilePart& part : parts) {
        const long long bytes = bytesOf(part);
        if (bytes < 0 || bytes > mostBytes - sum) return QvByteSource::unknown;
        sum += bytes;
    }
    return sum;
}

std::unique_ptr<QvByteSource> qvFilePartsSource(std::vector<QvFilePart> parts, std::size_t bufferBytes) {
    if (qvFilePartsBytes(parts) < 0) return nullptr;
    for (QvFilePart& part : parts)
        if (part.bytes < 0) part.bytes = bytesOf(part);
    return std::make_unique<PartsSource>(std::move(parts), bufferBytes);
}
