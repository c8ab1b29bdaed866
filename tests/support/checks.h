// What most tests of the core use: GoogleTest and the usual parts of the standard library, folders, failing
// platforms, the log, names of both widths, and the text of a failure.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>
#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include "core/arch/qvexception.h"
#include "core/arch/widename.h"
#include "core/value/anycontainer.h"
#include "tests/support/log_capture.h"
#include "tests/support/platform_scope.h"
#include "tests/support/temp_folder.h"

using Texts = std::vector<std::string>;

// The text of the engine's exception that an action ends with, of an assertion only the message after the
// place; "no failure" if there is none.
template <class Action>
std::string failureOf(Action action) {
    try {
        action();
    } catch (const QvAssertFailure& failure) {
        const std::string text = failure.what();
        const auto message = text.find(": \n");
        return message == std::string::npos ? "" : text.substr(message + 3);
    } catch (const QvException& failure) {
        return failure.what();
    }
    return "no failure";
}

inline Any narrow(const std::string& name) { return Any(name.c_str()); }
inline Any wide(const std::string& name) { return Any(qv_wide_name(name).c_str()); }

inline std::string repeated(std::string_view text, std::size_t count) {
    std::string result;
    while (count-- > 0) result += text;
    return result;
}

inline void PrintTo(const Any& value, std::ostream* out) {
    *out << Any::typeName(value.type()) << " of size " << value.size();
    if (value.isInt()) *out << ": " << value.toInt64();
    if (value.isFloat()) *out << ": " << value.asFloat();
    if (value.isText()) *out << ": \"" << value.toString().asString() << '"';
}
