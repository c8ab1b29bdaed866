// QV_API marks what the library exports: the classes and free functions of the public interface.
// Everything else stays hidden (the build compiles with hidden visibility).
#pragma once

#define QV_API __attribute__((visibility("default")))

// Lets the compiler check printf-style arguments. For member functions `this` counts as argument 1.
#define QV_PRINTF(formatIndex, firstArg) __attribute__((format(printf, formatIndex, firstArg)))
