#include "tarsel/split/progressreader.h"

#include "tarsel/words/failure.h"
#include "tarsel/words/json.h"

void ProgressReader::add(const std::string& text) {
    rest_ += text;
    size_t at = 0;
    for (size_t end; (end = rest_.find('\n', at)) != std::string::npos; at = end + 1)
        take(rest_.substr(at, end - at));
    rest_.erase(0, at);
}

void ProgressReader::take(const std::string& line) {
    const Json object = Json::parse(line, nullptr, false);
    if (!object.is_object()) {
        failure_ = inLine(line);
        return;
    }
    const std::string event = textIn(object, "event");
    if (event == "message") {
        if (textIn(object, "level") == "warning") warnings_.push_back(textIn(object, "text"));
        return;
    }
    const double percent = numberIn(object, "percent", done_ * 100);
    done_ = percent / 100;
    speed_ = numberIn(object, "speed", speed_);
    frames_ = static_cast<long long>(numberIn(object, "frame", 0));
    outSeconds_ = numberIn(object, "out_time_us", 0) / 1e6;
    if (event != "end") return;
    failure_ = textIn(object, "error");
    outputs_ = textsIn(object, "outputs");
}
