// The standard streams. What is printed is data for the standard output; it is gathered and goes out in
// blocks, so that a stream that takes nothing is noticed while it can still be reported.
#pragma once

#include <string>

// Opens what the caller left closed of the three streams, so that no file takes their place.
void claimStreams();

[[gnu::format(printf, 1, 2)]] void print(const char* format, ...);
void printText(const std::string& text);

// Writes out what was printed. Throws Failure (output), with an empty line when the reader has gone, which is
// how `| head` ends.
void flushOutput();
