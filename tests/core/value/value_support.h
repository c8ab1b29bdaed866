// What the tests of values share.
#pragma once

#include <gtest/gtest.h>

#include <clocale>
#include <cstdlib>
#include <ostream>
#include <string>

#include "core/engine/qvexception.h"
#include "core/value/anycontainer.h"
#include "tests/support/temp_folder.h"

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

// The program runs under a locale with a decimal comma while the object lives, if the machine can make one.
class CommaLocale {
  public:
    CommaLocale() : before_(std::setlocale(LC_ALL, nullptr)) {
        const std::string definition = folder_.write(
            "comma.def",
            "LC_NUMERIC\ndecimal_point \",\"\nthousands_sep \".\"\ngrouping 3;3\nEND LC_NUMERIC\n");
        const std::string command = "localedef -c -i " + definition + " " + folder_.file("comma");
        (void)!std::system((command + " >/dev/null 2>&1").c_str());  // warns of the other categories
        setenv("LOCPATH", folder_.path().c_str(), 1);
        active_ = std::setlocale(LC_ALL, "comma") && *std::localeconv()->decimal_point == ',';
    }
    CommaLocale(const CommaLocale&) = delete;
    CommaLocale& operator=(const CommaLocale&) = delete;
    ~CommaLocale() {
        std::setlocale(LC_ALL, before_.c_str());
        unsetenv("LOCPATH");
    }
    bool active() const { return active_; }

  private:
    TempFolder folder_;
    std::string before_;
    bool active_ = false;
};
