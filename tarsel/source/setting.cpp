#include "tarsel/source/setting.h"

#include <charconv>
#include <cstdlib>

#include "tarsel/source/source.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/listvalue.h"

namespace {

Any valueOf(const std::string& text) {
    char* end = nullptr;
    const long long whole = std::strtoll(text.c_str(), &end, 10);
    if (!text.empty() && *end == '\0' && whole >= INT32_MIN && whole <= INT32_MAX)
        return Any(static_cast<int>(whole));
    double number = 0;
    const auto [rest, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error == std::errc() && rest == text.data() + text.size()) return Any(number);
    return Any(text.c_str());
}

}  // namespace

void setGuessed(QvCodec& codec, const std::string& key, const std::string& text, const std::string& option) {
    Any before;
    try {
        before = static_cast<const QvCodec&>(codec).getParam(key.c_str());
    } catch (const QvParamException&) {  // not one of its parameters, or one that is only set
    }
    if (before.isVector()) return setChecked(codec, key, parseList(text, option + " " + key), option);
    const Any value = valueOf(text);
    if (!value.isText() && before.isText()) {
        try {
            return setChecked(codec, key, Any(text.c_str()), option);
        } catch (const Failure&) {  // it takes numbers, too
        }
    }
    setChecked(codec, key, value, option);
}
