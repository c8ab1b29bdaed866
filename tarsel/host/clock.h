// The time of day.
#pragma once

#include <ctime>

std::time_t secondsSince1970();
