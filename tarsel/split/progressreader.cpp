#include "tarsel/split/progressreader.h"

#include "tarsel/words/failure.h"
#include "tarsel/words/json.h"

namespace {

double numberOf(const Json& object, const char* key, double otherwise) {
    const auto found = object.find(key);
    return found != object.end() && found->is_number() ? found->get<double>() : otherwise;
}

std::string textOf(const Json& object, const char* key) {
    const auto found = object.find(key);
    return found != object.end() && found->is_string() ? found->get<std::string>() : "";
}

}  // namespace

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
    const std::string event = textOf(object, "event");
    if (event == "message") {
        if (textOf(object, "level") == "warning") warnings_.push_back(textOf(object, "text"));
        return;
    }
    const double percent = numberOf(object, "percent", done_ * 100);
    done_ = percent / 100;
    speed_ = numberOf(object, "speed", speed_);
    frames_ = static_cast<long long>(numberOf(object, "frame", 0));
    outSeconds_ = numberOf(object, "out_time_us", 0) / 1e6;
    if (event != "end") return;
    failure_ = textOf(object, "error");
    const auto outputs = object.find("outputs");
    if (outputs == object.end() || !outputs->is_array()) return;
    for (const Json& output : *outputs)
        if (output.is_string()) outputs_.push_back(output.get<std::string>());
}
