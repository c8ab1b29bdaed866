#include "core/engine/log/loggedopen_p.h"

#include <string>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/value/nametext_p.h"

std::FILE* qvOpenLogged(const Any& name, const char* mode) {
    QV_ASSERT(name.isText() && mode);
    constexpr std::size_t longestWideMode = 4;
    const std::string file = qvname::narrow(name);
    const std::string how = name.isWString() ? std::string(mode).substr(0, longestWideMode) : mode;
    std::FILE* const stream = how.empty() ? nullptr : qv_platform().openFile(file.c_str(), how.c_str());
    if (!stream)
        qv_dbg()->log(QvLogMask::debug, "qvfopen: failed to open '%s' in mode '%s'", file.c_str(), mode);
    return stream;
}
