#include "tarsel/sound/channelmap.h"

#include <algorithm>
#include <charconv>
#include <optional>
#include <string_view>

#include "tarsel/words/messages.h"

namespace {

constexpr std::string_view kSound = "a:";

std::vector<std::string_view> split(std::string_view text, char at) {
    std::vector<std::string_view> parts;
    for (size_t end = 0; end != std::string_view::npos; text.remove_prefix(std::min(end + 1, text.size()))) {
        end = text.find(at);
        parts.push_back(text.substr(0, end));
    }
    return parts;
}

// Up to three digits.
std::optional<int> number(std::string_view text) {
    int value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size() || text[0] == '-' || text.size() > 3)
        return std::nullopt;
    return value;
}

// "3", a channel of the first sound, or "a:1.3".
std::optional<ChannelMap::Input> input(std::string_view text) {
    ChannelMap::Input in;
    if (text.starts_with(kSound)) {
        const size_t dot = text.find('.');
        const auto sound = number(text.substr(kSound.size(), dot - std::min(dot, kSound.size())));
        if (dot == std::string_view::npos || !sound) return std::nullopt;
        in.sound = *sound;
        text.remove_prefix(dot + 1);
    }
    const auto channel = number(text);
    if (!channel) return std::nullopt;
    in.channel = *channel;
    return in;
}

}  // namespace

bool ChannelMap::copies() const {
    return std::all_of(rows.begin(), rows.end(), [](const auto& row) { return row.size() < 2; });
}

std::vector<int> ChannelMap::sounds() const {
    std::vector<int> all;
    for (const auto& row : rows)
        for (const Input& in : row) all.push_back(in.sound);
    std::sort(all.begin(), all.end());
    all.erase(std::unique(all.begin(), all.end()), all.end());
    return all.empty() ? std::vector<int>{0} : all;
}

AnyVector ChannelMap::matrix(const std::vector<int>& first) const {
    const std::vector<int> parts = sounds();
    AnyVector all;
    for (const auto& row : rows) {
        AnyVector sources;
        for (const Input& in : row) {
            const auto part = std::lower_bound(parts.begin(), parts.end(), in.sound) - parts.begin();
            sources.append(Any(AnyDict("channel", first.at(static_cast<size_t>(part)) + in.channel)));
        }
        all.append(row.empty() ? Any(0) : Any(sources));
    }
    return all;
}

ChannelMap parseChannelMap(const std::string& text) {
    const std::string most = std::to_string(ChannelMap::most);
    ChannelMap map;
    for (const std::string_view out : split(text, ',')) {
        std::vector<ChannelMap::Input>& row = map.rows.emplace_back();
        if (out == "-") continue;
        for (const std::string_view in : split(out, '+')) {
            const auto source = input(in);
            if (!source) throw failure(Msg::mapWrong, {text});
            row.push_back(*source);
        }
        if (row.size() > ChannelMap::most) throw failure(Msg::mapLong, {"the mean of more inputs", most});
    }
    if (map.rows.size() > ChannelMap::most) throw failure(Msg::mapLong, {"more channels", most});
    return map;
}
