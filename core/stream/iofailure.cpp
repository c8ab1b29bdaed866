#include "core/stream/iofailure.h"

#include <cerrno>
#include <new>
#include <system_error>

#include "core/engine/log/qvlog.h"

bool QvIoFailure::keep(int code, const char* what, const QvWideString& name) {
    if (code_) return false;
    code_ = code ? code : EIO;
    try {
        text_ = std::string(what) + " '" + qv_narrow_name(name.data(), name.size()) +
                "': " + std::generic_category().message(code_);
    } catch (const std::bad_alloc&) {
        text_.clear();  // destructors come here too
    }
    return true;
}

void QvIoFailure::report(int code, const char* what, const QvWideString& name) {
    if (keep(code, what, name) && code != ECANCELED) qv_log()->logs(QvLogMask::error, text_.c_str());
}

void QvIoFailure::note(int code, const char* what, const QvWideString& name) { keep(code, what, name); }

void QvIoFailure::take(int code, const std::string& text) {
    if (code_) return;
    text_ = text;
    code_ = code ? code : EIO;
}

void QvIoFailure::clear() {
    code_ = 0;
    text_.clear();
    taken_ = 0;
}
