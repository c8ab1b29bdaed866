// Any text of an option for sound is read, to values in their ranges, or refused in one line.
#include <cmath>
#include <cstdint>
#include <string>
#include <vector>

#include "tarsel/sound/channelmap.h"
#include "tarsel/sound/soundeffects.h"
#include "tarsel/words/failure.h"
#include "tests/fuzz/fuzz.h"

namespace {

template <class Parse>
void readOrRefuse(Parse parse) {
    try {
        parse();
    } catch (const Failure& failure) {
        const std::string text = failure.what();
        require(failure.exit() == Exit::usage && !text.empty() && text.find('\n') == std::string::npos);
    }
}

void readMap(const std::string& text) {
    const ChannelMap map = parseChannelMap(text);
    const std::vector<int> sounds = map.sounds();
    std::vector<int> first;
    for (const int sound : sounds) {
        require(sound >= 0 && sound < 1000);
        first.push_back(static_cast<int>(first.size()) * 1000);
    }
    require(!map.rows.empty() && map.rows.size() <= ChannelMap::most);
    for (const auto& row : map.rows) require(row.size() <= ChannelMap::most);
    require(map.matrix(first).size() == static_cast<int>(map.rows.size()));
}

void readVolumes(const std::string& text) {
    std::vector<std::string> given;
    for (size_t from = 0; from <= text.size(); from = text.find('\n', from) + 1) {
        given.push_back(text.substr(from, text.find('\n', from) - from));
        if (text.find('\n', from) == std::string::npos) break;
    }
    const Volumes volumes = parseVolumes(given);
    for (int sound = 0; sound <= volumes.highest() + 1; ++sound)
        require(volumes.of(sound) >= -120 && volumes.of(sound) <= 48);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    readOrRefuse([&] { readMap(text); });
    readOrRefuse([&] { readVolumes(text); });
    readOrRefuse([&] {
        const SoundTarget target = parseTarget(text);
        require(target.level >= -70 && target.level <= 0);
    });
    readOrRefuse([&] {
        const double seconds = parseDelay(text, QvFramerate(25.0)).seconds();
        require(std::abs(seconds) <= 3600);
    });
    return 0;
}
