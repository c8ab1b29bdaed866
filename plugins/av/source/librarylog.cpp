#include "plugins/av/source/librarylog.h"

#include <cstdarg>
#include <cstdio>
#include <cstring>

#include "core/engine/log/qvlog.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/concealedpackets.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

// On any thread of the libraries: the line lives on the stack.
void toEngine(void* object, int level, const char* format, va_list args) {
    if (level > AV_LOG_INFO) return;  // a demultiplexer has such a line for each packet
    ConcealedPackets::heard(object, format);
    if (level > AV_LOG_WARNING || !qv_dbg()->hasTarget()) return;
    char text[1024];
    int prefix = 1;
    av_log_format_line2(object, level, format, args, text, sizeof text, &prefix);
    text[std::strcspn(text, "\r\n")] = 0;
    if (*text) qv_dbg()->logs(QvLogMask::debug, text);
}

}  // namespace

void sendLibraryLog() {
    av_log_set_callback(toEngine);
    av_max_alloc(limits::allocation);
}

void resetLibraryLog() { av_log_set_callback(av_log_default_callback); }

}  // namespace av
