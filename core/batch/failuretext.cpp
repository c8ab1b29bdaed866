#include "core/batch/failuretext_p.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <exception>
#include <new>

#include "core/arch/qvexception.h"
#include "core/engine/status.h"

namespace {

FailureText make(int code, const char* text) {
    FailureText made{code, ""};
    std::snprintf(made.text, sizeof made.text, "%s", text && *text ? text : "unknown failure");
    std::replace(std::begin(made.text), std::end(made.text), '\n', ' ');
    return made;
}

// The message of an assertion without its place in the source, which is in the log. Without a message, the
// place.
const char* wordsOf(const QvAssertFailure& failure) {
    const char* const words = std::strstr(failure.what(), ": \n");
    return words && words[3] ? words + 3 : failure.what();
}

}  // namespace

FailureText qvCurrentFailure() noexcept {
    try {
        throw;
    } catch (const QvMemoryFailure& failure) {
        return make(QvStatus::outOfMemory, failure.what());
    } catch (const QvAssertFailure& failure) {
        return make(QvStatus::failed, wordsOf(failure));
    } catch (const QvException& failure) {
        return make(QvStatus::failed, failure.what());
    } catch (const std::bad_alloc&) {
        return make(QvStatus::outOfMemory, "out of memory");
    } catch (const std::exception& failure) {
        return make(QvStatus::failed, failure.what());
    } catch (...) {
        return make(QvStatus::failed, "unknown exception");
    }
}
