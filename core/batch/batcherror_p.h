// The last failure of a batch processor, code and text. Any thread may set and read it.
#pragma once

#include <cstdarg>
#include <mutex>
#include <string>

#include "core/arch/api.h"

class BatchError {
  public:
    static constexpr int maxLength = 511;

    // The text is cut to maxLength characters. Writes a line to the debug log.
    void set(int code, const char* format, va_list args) QV_PRINTF(3, 0);
    void set(int code, const char* format, ...) QV_PRINTF(3, 4);
    void copy(int code, const char* text);  // without a line in the log
    int code() const;
    std::string text() const;

  private:
    mutable std::mutex lock_;
    int code_ = 0;
    char text_[maxLength + 1] = "";
};
