// A locale in which printf and scanf write numbers with a comma.
#pragma once

#include <clocale>
#include <cstdlib>
#include <string>

#include "tests/support/temp_folder.h"

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
