// JSON in the order in which it is written.
#pragma once

#include <string>
#include <vector>

#include <nlohmann/json.hpp>

using Json = nlohmann::ordered_json;

// A member of an object, or its default if it is missing or of another type.
double numberIn(const Json& object, const char* key, double otherwise);
std::string textIn(const Json& object, const char* key);                // ""
std::vector<std::string> textsIn(const Json& object, const char* key);  // the strings of an array; none

// Names of files may have any bytes, JSON only texts: what is not plain ASCII is "%c3", as is '%' itself.
std::string escapedBytes(const std::string& bytes);
std::string unescapedBytes(const std::string& text);

// File names need not be UTF-8; JSON does.
inline std::string validUtf8(const std::string& bytes) {
    return Json::parse(Json(bytes).dump(-1, ' ', false, Json::error_handler_t::replace)).get<std::string>();
}
