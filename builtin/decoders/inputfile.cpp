#include "builtin/decoders/inputfile.h"

#include "core/engine/status.h"
#include "core/value/any.h"

int InputFile::open(const Any& name, std::size_t bufferBytes) {
    close();
    auto file = qvFileSource(name, bufferBytes);
    if (!file || file->size() == QvByteSource::unknown) return QvStatus::failed;
    file_ = std::move(file);
    source_ = file_.get();
    length_ = file_->size();
    return QvStatus::ok;
}

int InputFile::open(QvByteSource& source) {
    close();
    const long long bytes = source.size();
    if (bytes == QvByteSource::unknown)
        refusal_ = "the source does not say how long it is";
    else if (!source.seekable())
        refusal_ = "the source can't be sought";
    else if (!source.seek(0))
        refusal_ = source.problem();
    if (!refusal_.empty()) return QvStatus::failed;
    source_ = &source;
    length_ = bytes;
    return QvStatus::ok;
}

int InputFile::open(const Any& name, std::size_t bufferBytes, QvByteSource* source) {
    return source ? open(*source) : open(name, bufferBytes);
}

void InputFile::close() {
    file_.reset();
    source_ = nullptr;
    refusal_.clear();
}

std::string InputFile::problem() const {
    const std::string why = !source_ ? refusal_ : file_ ? "" : source_->problem();
    return why.empty() ? why : ": " + why;
}
