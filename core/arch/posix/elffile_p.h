// Shared libraries as files: whether one can be mapped at all.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

// Why an open file of `size` bytes is not a whole shared library of this machine, as the end of a sentence
// that begins with the file; "" if it is one. The loader maps a file by what its headers say: where bytes are
// missing, reading them ends the process.
std::string qvElfFault(int descriptor, std::uint64_t size);

// The value of a 32-bit number that the library exports, read from the file. Nothing if it exports no such
// number, or if the file has no list of sections.
std::optional<std::uint32_t> qvElfNumber(int descriptor, std::uint64_t size, std::string_view symbol);
