#include "tarsel/job/progress.h"

#include <cmath>
#include <cstdio>
#include <cstdlib>

#include <sys/ioctl.h>
#include <unistd.h>
#include <nlohmann/json.hpp>

#include "tarsel/words/timespec.h"

namespace {

constexpr auto kLineInterval = std::chrono::milliseconds(100);
constexpr auto kJsonInterval = std::chrono::milliseconds(500);

nlohmann::ordered_json orNull(double value) {
    return std::isfinite(value) && value >= 0 ? nlohmann::ordered_json(value)
                                              : nlohmann::ordered_json(nullptr);
}

// Cut to the terminal's width: a line that wraps can't be overwritten.
std::string fitted(const std::string& text) {
    winsize size{};
    if (ioctl(STDERR_FILENO, TIOCGWINSZ, &size) != 0 || size.ws_col == 0) return text;
    std::string cut;
    int columns = 0;
    for (size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '\x1b') {  // takes no place
            const size_t end = text.find('m', i);
            cut += text.substr(i, end - i + 1);
            i = end;
        } else if (columns++ < size.ws_col - 1) {
            cut += text[i];
        }
    }
    return cut;
}

double round1(double value) { return std::round(value * 10) / 10; }

}  // namespace

Progress::Progress(ProgressMode mode, std::string label) : label_(std::move(label)) {
    json_ = mode == ProgressMode::json;
    line_ = mode == ProgressMode::automatic && isatty(STDERR_FILENO) == 1;
    const char* noColor = std::getenv("NO_COLOR");
    color_ = line_ && !(noColor && *noColor);
}

Progress::~Progress() {
    if (shown_ && line_) std::fputs("\r\x1b[K", stderr);
}

void Progress::start() {
    begin_ = Clock::now();
    if (json_ || line_) show("start", ProgressState{0, 0, 0, 1, 1, "running"});
}

bool Progress::due() const {
    if (!json_ && !line_) return false;
    return Clock::now() - last_ >= (json_ ? kJsonInterval : kLineInterval);
}

void Progress::update(const ProgressState& state) {
    if (due()) show("progress", state);
}

void Progress::finish(const ProgressState& state) {
    if (json_) show("end", state);
    if (line_ && shown_) std::fputs("\r\x1b[K", stderr);
    shown_ = false;
}

void Progress::show(const char* event, const ProgressState& state) {
    last_ = Clock::now();
    const double elapsed = std::chrono::duration<double>(last_ - begin_).count();
    const double eta = state.part > 0 ? elapsed * (1 - state.part) / state.part : -1;
    if (json_)
        showJson(event, state, elapsed, eta);
    else
        showLine(state, elapsed, eta);
    shown_ = true;
}

void Progress::showLine(const ProgressState& state, double elapsed, double eta) {
    const double speed = elapsed > 0 ? state.outSeconds / elapsed : 0;
    std::string text = label_;
    char part[96];
    if (state.part >= 0) {
        std::snprintf(part, sizeof part, "%s%5.1f %%%s", color_ ? "\x1b[1m" : "", state.part * 100,
                      color_ ? "\x1b[0m" : "");
        text += part;
    }
    std::snprintf(part, sizeof part, "  frame %lld  %.1fx", state.frame, speed);
    text += part;
    if (eta >= 0)
        text += "  left " + formatTime(std::ceil(eta)).substr(0, formatTime(std::ceil(eta)).size() - 4);
    if (std::string_view(state.state) == "paused") text += "  paused (p resumes)";
    std::fprintf(stderr, "\r%s\x1b[K", fitted(text).c_str());
    std::fflush(stderr);
}

void Progress::showJson(const char* event, const ProgressState& state, double elapsed, double eta) {
    nlohmann::ordered_json line;
    line["event"] = event;
    line["percent"] = state.part < 0 ? nlohmann::ordered_json(nullptr) : orNull(round1(state.part * 100));
    line["eta_s"] = eta < 0 ? nlohmann::ordered_json(nullptr) : orNull(round1(eta));
    line["pass"] = state.pass;
    line["passes"] = state.passes;
    line["frame"] = state.frame;
    line["fps"] = elapsed > 0 ? orNull(round1(static_cast<double>(state.frame) / elapsed)) : nullptr;
    line["speed"] = elapsed > 0 ? orNull(std::round(state.outSeconds / elapsed * 100) / 100) : nullptr;
    line["out_time_us"] = static_cast<long long>(state.outSeconds * 1e6);
    line["state"] = state.state;
    std::fprintf(stderr, "%s\n", line.dump().c_str());
    std::fflush(stderr);
}
