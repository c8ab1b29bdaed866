// What the tests of values share.
#pragma once

#include <gtest/gtest.h>

#include <ostream>
#include <string>

#include "core/engine/qvexception.h"
#include "core/value/anycontainer.h"
#include "tests/support/comma_locale.h"

// The text of the assertion that an action fails with, without its location; "no failure" if there is none.
template <class Action>
std::string failureOf(Action action) {
    try {
        action();
    } catch (const QvAssertFailure& failure) {
        const std::string text = failure.what();
        const auto message = text.find(": \n");
        return message == std::string::npos ? "" : text.substr(message + 3);
    }
    return "no failure";
}

inline const std::string nullAssignment = "Attempt to assign to Any::null()";

inline void PrintTo(const Any& value, std::ostream* out) {
    *out << Any::typeName(value.type()) << " of size " << value.size();
    if (value.isInt()) *out << ": " << value.toInt64();
    if (value.isFloat()) *out << ": " << value.asFloat();
    if (value.isText()) *out << ": \"" << value.toString().asString() << '"';
}
