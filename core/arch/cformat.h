// printf and scanf work on numbers that the program's locale does not reach: the decimal point is ".".
#pragma once

#include <cstdarg>
#include <cstddef>

#include "core/arch/api.h"

// As vsnprintf: at most size - 1 characters and a NUL, and the result is the length of the whole text, which
// may be larger, or negative for a format that fails.
QV_API int qv_vformat(char* buffer, std::size_t size, const char* format, va_list args) QV_PRINTF(3, 0);
