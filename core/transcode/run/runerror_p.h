// Why a transcoder has failed.
#pragma once

#include <cstdarg>
#include <string>

#include "core/arch/api.h"

class RunError {
  public:
    // Keeps code and text (at most 1,023 characters) and logs both. The code.
    int set(int code, const char* format, ...) QV_PRINTF(3, 4);
    int set(int code, const char* format, va_list args) QV_PRINTF(3, 0);
    void copy(int code, const char* text);  // without a line in the log
    void clear() { copy(0, ""); }
    int code() const { return code_; }
    const char* text() const { return text_.c_str(); }

  private:
    int code_ = 0;
    std::string text_;
};
