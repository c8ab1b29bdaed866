#include "core/image/picturefile_p.h"

#include <cerrno>
#include <utility>

#include "core/arch/platform.h"

bool PictureFile::open(const std::string& name, const std::shared_ptr<QvCancel>& cancel) {
    finish(false);
    name_ = name;
    file_ = qv_platform().openOutput(name_.c_str(), cancel, isStream_);
    return file_ != nullptr;
}

bool PictureFile::finish(bool written) {
    if (!file_) return false;
    int reason = errno;
    if (std::fclose(std::exchange(file_, nullptr)) != 0) {
        if (written) reason = errno;
        written = false;
    }
    if (written) return true;
    QvFileStatus status;
    if (!isStream_ && qv_platform().status(name_.c_str(), status) && status.isRegular)
        qv_platform().removeFile(name_.c_str());
    errno = reason;
    return false;
}
