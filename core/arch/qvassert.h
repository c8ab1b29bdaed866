// Assertions of the engine: a broken contract is logged and thrown as QvAssertFailure, which the
// layers that drive processing catch; the process continues.
#pragma once

#include "core/arch/api.h"

// Logs "*** Assertion failed at LOCATION" with the message, if any, and throws QvAssertFailure.
// `location` is the unit and line, as in "core/any(1017)"; `message` may be null.
[[noreturn]] QV_API void qvAssertFail(const char* location, const char* message);

// Where the text of a failed assertion is logged before the throw. Null, the default: nowhere. The debug log
// sets this when it is made; before that it would have no target either.
using QvAssertLog = void (*)(const char* text);
void qvSetAssertLog(QvAssertLog log);

// What the macros call: makes the location from a source file and line ("core/value/any.cpp", 1017).
[[noreturn]] QV_API void qvAssertFailAt(const char* file, int line, const char* message);

// The same for want of memory: throws QvMemoryFailure.
[[noreturn]] QV_API void qvAssertMemoryAt(const char* file, int line, const char* message);

// Fails without and with a text, always.
#define QV_FAIL_PLAIN() qvAssertFailAt(__FILE__, __LINE__, nullptr)
#define QV_FAIL(text) qvAssertFailAt(__FILE__, __LINE__, text)

// Fails, without and with a text, unless the condition holds. Never compiled out.
#define QV_ASSERT(condition) ((condition) ? (void)0 : qvAssertFailAt(__FILE__, __LINE__, nullptr))
#define QV_ASSERT_MSG(condition, text) ((condition) ? (void)0 : qvAssertFailAt(__FILE__, __LINE__, text))
// For what fails only when there is no memory.
#define QV_ASSERT_MEMORY(condition, text) ((condition) ? (void)0 : qvAssertMemoryAt(__FILE__, __LINE__, text))
