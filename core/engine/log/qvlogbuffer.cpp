#include <algorithm>
#include <mutex>
#include <new>
#include <string>

#include "core/arch/formattext_p.h"
#include "core/engine/log/loggedopen_p.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"

namespace {

constexpr std::size_t maxText = 2047;

// One for all buffers. Where both are held it comes before the lock of the debug log.
std::recursive_mutex& section() {
    static auto& lock = *new std::recursive_mutex;
    return lock;
}
using Lock = std::lock_guard<std::recursive_mutex>;

// The debug log takes the text as a format without arguments: "%%" becomes "%". Any other conversion is kept
// as text, because there is no argument to read.
std::string asFormatted(const char* text) {
    std::string out;
    for (const char* c = text; *c; ++c) {
        out += *c;
        if (c[0] == '%' && c[1] == '%') ++c;
    }
    return out;
}

void advance(int& counter) { counter = static_cast<int>(static_cast<unsigned>(counter) + 1u); }

void copyFrom(const AnyVector& messages, int first, AnyVector& out) {
    for (int i = first; i < messages.size(); ++i) out.append(messages.at(i));
}

}  // namespace

QvLogBuffer* qv_log() {
    static auto* buffer = new QvLogBuffer;  // never destroyed: messages may come while the process ends
    return buffer;
}

QvLogBuffer::~QvLogBuffer() {
    if (copy_) std::fclose(copy_);
}

void QvLogBuffer::trim() {
    while (messages_.size() > std::max(maxMessages_, 0)) messages_.remove(0);
}

void QvLogBuffer::logs(int mask, const char* text) {
    Lock lock(section());
    advance(writeCounter_);
    trim();
    if (!text) return;
    if (mask == QvLogMask::error) ++errors_;
    if (mask == QvLogMask::warning) ++warnings_;
    if (copy_) std::fprintf(copy_, "%s\n", text);
    try {
        AnyDict message;
        message.set("text", text);
        message.set("type", mask);
        messages_.append(message);
        qv_dbg()->logs(mask, asFormatted(text).c_str());
    } catch (const std::bad_alloc&) {
        // Clean-ups report too and must continue, so a message without memory is lost.
    }
}

void QvLogBuffer::logs(int mask, const Any& text) {
    if (text.isString()) {
        logs(mask, text.asString());
    } else if (text.isWString()) {
        const Any narrow = text.toString();
        logs(mask, narrow.asString(""));
    }
}

void QvLogBuffer::log(int mask, const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<maxText> formatted(format, args);
    va_end(args);
    logs(mask, formatted.text());
}

void QvLogBuffer::error(const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<maxText> formatted(format, args);
    va_end(args);
    logs(QvLogMask::error, formatted.text());
}

void QvLogBuffer::warning(const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<maxText> formatted(format, args);
    va_end(args);
    logs(QvLogMask::warning, formatted.text());
}

void QvLogBuffer::info(const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<maxText> formatted(format, args);
    va_end(args);
    logs(QvLogMask::info, formatted.text());
}

void QvLogBuffer::header(const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<maxText> formatted(format, args);
    va_end(args);
    logs(QvLogMask::header, formatted.text());
}

void QvLogBuffer::progress(const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<maxText> formatted(format, args);
    va_end(args);
    logs(QvLogMask::progress, formatted.text());
}

void QvLogBuffer::fappend(const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<maxText> formatted(format, args);
    va_end(args);
    logs(QvLogMask::info, formatted.text());
}

int QvLogBuffer::setLogFile(const Any& name) {
    Lock lock(section());
    if (copy_) std::fclose(copy_);
    copy_ = nullptr;
    copy_ = name.isTrue() ? qvOpenLogged(name, "w") : nullptr;
    return copy_ ? QvStatus::ok : QvStatus::failed;
}

void QvLogBuffer::setMaxMessages(int count) {
    Lock lock(section());
    maxMessages_ = count;
}

void QvLogBuffer::clear() {
    Lock lock(section());
    advance(writeCounter_);
    clearStatus();
    messages_.clear();
}

void QvLogBuffer::clearStatus() {
    Lock lock(section());
    errors_ = 0;
    warnings_ = 0;
}

int QvLogBuffer::nrMessages() const {
    Lock lock(section());
    return messages_.size();
}

int QvLogBuffer::nrErrors() const {
    Lock lock(section());
    return errors_;
}

int QvLogBuffer::nrWarnings() const {
    Lock lock(section());
    return warnings_;
}

int QvLogBuffer::getWriteCntr() const {
    Lock lock(section());
    return writeCounter_;
}

int QvLogBuffer::getAll(AnyVector& out) const { return getSince(out, -1); }

int QvLogBuffer::getSince(AnyVector& out, int last) const {
    Lock lock(section());
    out.clear();
    if (messages_.empty()) return QvStatus::failed;
    const int newest = messages_.size() - 1;
    copyFrom(messages_, last < 0 ? 0 : last < newest ? last + 1 : newest, out);
    return messages_.size();
}
