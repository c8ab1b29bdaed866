// Binary data as text: bytes as "1A ", runs of three or more equal ones as "10x AB ".
#pragma once

#include <string>
#include <string_view>
#include <vector>

std::string qvGenericText(std::string_view bytes);
// The number of bytes that a text describes, damaged or not. Never negative.
long long qvGenericLength(std::string_view text);
// These bytes; `length` is their number.
std::vector<char> qvGenericBytes(std::string_view text, long long length);
