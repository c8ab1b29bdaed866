// JSON in the order in which it is written.
#pragma once

#include <nlohmann/json.hpp>

using Json = nlohmann::ordered_json;
