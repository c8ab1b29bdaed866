#include "tarsel/host/clocktext.h"

namespace {

std::string textOf(const std::tm& time, const char* form) {
    char text[64];
    return std::string(text, std::strftime(text, sizeof text, form, &time));
}

}  // namespace

std::string localTimeText(std::time_t instant) {
    std::tm time{};
    if (instant == 0 || !::localtime_r(&instant, &time)) return "";
    return textOf(time, "%Y-%m-%d %H:%M:%S %z");
}

std::string utcTimeText(std::time_t instant) {
    std::tm time{};
    if (instant == 0 || !::gmtime_r(&instant, &time)) return "";
    return textOf(time, "%Y-%m-%dT%H:%M:%SZ");
}
