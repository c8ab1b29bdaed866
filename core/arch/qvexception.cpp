#include "core/arch/qvexception.h"

#include <cstring>
#include <new>
#include <utility>

#include "core/arch/formattext_p.h"

namespace {

constexpr std::size_t maxText = 1023;

// Null if there is no text or no memory: an exception must not fail while it is being made.
std::unique_ptr<char[]> copyText(const char* text) {
    if (!text) return nullptr;
    const std::size_t length = qvCutLength(text, maxText);
    std::unique_ptr<char[]> copy(new (std::nothrow) char[length + 1]);
    if (!copy) return nullptr;
    std::memcpy(copy.get(), text, length);
    copy[length] = 0;
    return copy;
}

}  // namespace

QvException::QvException(const char* text) : text_(copyText(text)) {}
QvException::QvException(const QvException& other) : text_(copyText(other.text_.get())) {}
QvException::~QvException() = default;

QvException& QvException::operator=(const QvException& other) {
    if (this != &other) text_ = copyText(other.text_.get());
    return *this;
}

const char* QvException::what() const { return text_ ? text_.get() : "Tarsel exception"; }

QvParamException::QvParamException(const char* text) : QvException(text ? text : "unknown parameter") {}
QvParamException::~QvParamException() = default;

QvAssertFailure::QvAssertFailure(const char* text) : QvException(text ? text : "assertion failure") {}
QvAssertFailure::~QvAssertFailure() = default;

QvMemoryFailure::QvMemoryFailure(const char* text) : QvAssertFailure(text) {}
QvMemoryFailure::~QvMemoryFailure() = default;

QvFileException::QvFileException(const char* text) : QvException(text ? text : "file access error") {}
QvFileException::~QvFileException() = default;
