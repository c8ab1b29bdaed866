#include <cerrno>

#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/loggedopen_p.h"
#include "core/stream/stdfile_p.h"
#include "core/value/any.h"

bool StdFile::check(bool ok) {
    if (!ok) error_ = errno ? errno : EIO;
    return ok;
}

void StdFile::begin() {
    close();
    error_ = 0;
    isStream_ = false;
    written_ = 0;
    errno = 0;
}

bool StdFile::open(const QvWideString& name, const char* mode) {
    begin();
    file_ = static_cast<std::FILE*>(qvfopen(Any(name.c_str()), mode));
    return check(file_ != nullptr);
}

bool StdFile::openOutput(const QvWideString& name, const std::shared_ptr<QvCancel>& cancel) {
    begin();
    file_ = qvOpenOutputLogged(Any(name.c_str()), cancel, isStream_);
    return check(file_ != nullptr);
}

void StdFile::setUnbuffered() {
    if (file_) std::setvbuf(file_, nullptr, _IONBF, 0);
}

size_t StdFile::writeSome(const void* data, size_t bytes) {
    errno = 0;
    const size_t done = file_ ? std::fwrite(data, 1, bytes, file_) : 0;
    check(done == bytes);
    written_ += done;
    return done;
}

size_t StdFile::read(void* data, size_t bytes) {
    errno = 0;
    const size_t done = file_ ? std::fread(data, 1, bytes, file_) : 0;
    if (done != bytes && failedRead()) check(false);
    return done;
}

bool StdFile::readAll(void* data, size_t bytes) {
    errno = 0;
    return check(read(data, bytes) == bytes);
}

bool StdFile::seek(long long offset, int origin) {
    errno = 0;
    return check(file_ && QvFile::fseek64(file_, offset, origin) == 0);
}

long long StdFile::tell() { return file_ ? QvFile::ftell64(file_) : -1; }

long long StdFile::length() { return file_ ? QvFile::flength(file_) : -1; }

bool StdFile::flush() {
    errno = 0;
    return check(file_ && std::fflush(file_) == 0);
}

bool StdFile::close() {
    if (!file_) return true;
    errno = 0;
    const bool ok = std::fclose(file_) == 0;
    file_ = nullptr;
    return check(ok);
}
