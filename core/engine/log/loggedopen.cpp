#include "core/engine/log/loggedopen_p.h"

#include <cerrno>
#include <string>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/value/nametext_p.h"

namespace {

void logFailure(const std::string& file, const char* mode) {
    const int reason = errno;
    qv_dbg()->log(QvLogMask::debug, "qvfopen: failed to open '%s' in mode '%s'", file.c_str(), mode);
    errno = reason;
}

}  // namespace

std::FILE* qvOpenLogged(const Any& name, const char* mode) {
    QV_ASSERT(name.isText() && mode);
    constexpr std::size_t longestWideMode = 4;
    const std::string file = qvname::narrow(name);
    const std::string how = name.isWString() ? std::string(mode).substr(0, longestWideMode) : mode;
    std::FILE* const stream = how.empty() ? nullptr : qv_platform().openFile(file.c_str(), how.c_str());
    if (!stream) logFailure(file, mode);
    return stream;
}

std::FILE* qvOpenOutputLogged(const Any& name, const std::shared_ptr<QvCancel>& cancel, bool& isStream) {
    QV_ASSERT(name.isText());
    const std::string file = qvname::narrow(name);
    std::FILE* const stream = qv_platform().openOutput(file.c_str(), cancel, isStream);
    if (!stream) logFailure(file, "wb");
    return stream;
}
