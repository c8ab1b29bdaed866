// What an error of the system means to a user, and what helps.
#pragma once

#include <optional>
#include <string>
#include <string_view>

struct SystemCause {
    std::string why, remedy;
};

// Of an errno value. One that the table does not hold has the system's own words.
SystemCause causeOf(int error);
// Of a sentence of the engine that ends with the system's own words for an error of the table.
std::optional<SystemCause> causeIn(std::string_view sentence);
