// Instants as people read them.
#pragma once

#include <ctime>
#include <string>

// "2026-03-01 22:15:09 +0100" in the zone of the user; "" for 0, which is none.
std::string localTimeText(std::time_t instant);
// "2026-03-01T21:15:09Z".
std::string utcTimeText(std::time_t instant);
