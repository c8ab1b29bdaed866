#include "builtin/decoders/inputfile.h"

#include "core/engine/files/qvfileutil.h"
#include "core/engine/status.h"
#include "core/value/any.h"

int InputFile::open(const Any& name, std::size_t bufferBytes) {
    close();
    if (!name.isText() || name.size() == 0) return QvStatus::failed;
    file_.reset(static_cast<std::FILE*>(qvfopen(name, "rb")));
    if (!file_) return QvStatus::failed;
    // Only a buffer that is given has the size asked for.
    buffer_ = std::make_unique_for_overwrite<char[]>(bufferBytes);
    std::setvbuf(file_.get(), buffer_.get(), _IOFBF, bufferBytes);
    length_ = QvFile::flength(file_.get());
    if (length_ >= 0) return QvStatus::ok;
    close();
    return QvStatus::failed;
}

bool InputFile::seek(long long position) {
    return position >= 0 && QvFile::fseek64(file_.get(), position, SEEK_SET) == 0;
}
