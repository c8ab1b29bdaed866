#include "core/batch/batcherror_p.h"

#include <cstdio>

#include "core/engine/log/qvlog.h"

void BatchError::set(int code, const char* format, va_list args) {
    char text[maxLength + 1];
    std::vsnprintf(text, sizeof text, format, args);
    copy(code, text);
    qv_dbg()->error("BatchProcessor: %s (%d)", text, code);
}

void BatchError::set(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    set(code, format, args);
    va_end(args);
}

void BatchError::copy(int code, const char* text) {
    const std::lock_guard guard(lock_);
    code_ = code;
    std::snprintf(text_, sizeof text_, "%s", text);
}

int BatchError::code() const {
    const std::lock_guard guard(lock_);
    return code_;
}

std::string BatchError::text() const {
    const std::lock_guard guard(lock_);
    return text_;
}
