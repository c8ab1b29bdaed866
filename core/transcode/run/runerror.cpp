#include "core/transcode/run/runerror_p.h"

#include <new>

#include "core/arch/formattext_p.h"
#include "core/engine/log/qvlog.h"

int RunError::set(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    set(code, format, args);
    va_end(args);
    return code;
}

int RunError::set(int code, const char* format, va_list args) {
    const QvFormattedText<1023> formatted(format, args);
    copy(code, formatted.text());
    qv_dbg()->log(QvLogMask::error, "Transcoder: %s (%d)", formatted.text(), code);
    return code;
}

void RunError::copy(int code, const char* text) {
    code_ = code;
    try {
        text_ = text;
    } catch (const std::bad_alloc&) {
        text_.clear();  // a failure is never reported by throwing
    }
}
