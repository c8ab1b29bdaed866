// Code pages: numbers, names, and which of them this system can convert.
#pragma once

#include "core/arch/api.h"
#include "core/value/anycontainer.h"

// Replaces `out` by one Dict for each of the code pages for text files that this system can convert, in
// rising order: "identifier" (Int32, the number) and "name" (String, as "windows-1252"). The answer is worked
// out once a process. 0.
QV_API int available_codepages(AnyVector& out);

struct QvCodepageName {
    const char* description;  // "Western European; Western European (Windows)"
    const char* name;         // "windows-1252"
};

// Two empty texts for an unknown number.
QV_API QvCodepageName codepage_name(int number);
