#include "tarsel/job/progress.h"

#include <cmath>
#include <cstdio>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/terminal.h"
#include "tarsel/words/json.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr double kLineInterval = 0.1;  // seconds
constexpr double kJsonInterval = 0.5;

Json orNull(double value) { return std::isfinite(value) && value >= 0 ? Json(value) : Json(nullptr); }

// Cut to the terminal's width: a line that wraps can't be overwritten.
std::string fitted(const std::string& text) {
    const int width = terminalColumns();
    if (width == 0) return text;
    std::string cut;
    int columns = 0;
    for (size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '\x1b') {  // takes no place
            const size_t end = text.find('m', i);
            cut += text.substr(i, end - i + 1);
            i = end;
        } else if (columns++ < width - 1) {
            cut += text[i];
        }
    }
    return cut;
}

// Seconds; negative when unknown.
double etaOf(const ProgressState& state, double elapsed) {
    return state.part > 0 ? elapsed * (1 - state.part) / state.part : -1;
}

double round1(double value) { return std::round(value * 10) / 10; }

}  // namespace

Progress::Progress(ProgressMode mode, std::string label) : label_(std::move(label)) {
    json_ = mode == ProgressMode::json;
    line_ = mode == ProgressMode::automatic && stderrIsTerminal();
    color_ = line_ && colourWanted();
}

Progress::~Progress() {
    if (shown_ && line_) std::fputs("\r\x1b[K", stderr);
}

void Progress::start() {
    begin_ = QvTimer::absoluteTime();
    if (json_ || line_) show("start", ProgressState{0, 0, 0, 1, 1, "running"});
}

bool Progress::due() const {
    if (!json_ && !line_) return false;
    return QvTimer::absoluteTime() - last_ >= (json_ ? kJsonInterval : kLineInterval);
}

void Progress::update(const ProgressState& state) {
    if (due()) show("progress", state);
}

void Progress::finish(const ProgressState& state) {
    if (json_) show("end", state);
    const std::lock_guard guard(lock_);
    if (line_ && shown_) std::fputs("\r\x1b[K", stderr);
    shown_ = false;
    end_ = QvTimer::absoluteTime();
}

void Progress::report(const ProgressState& state) {
    const std::lock_guard guard(lock_);
    const double elapsed = (end_ > 0 ? end_ : QvTimer::absoluteTime()) - begin_;
    const double eta = etaOf(state, elapsed);
    if (json_) return showJson("progress", state, elapsed, eta);
    std::fprintf(stderr, "%starsel:%s  %s\n", line_ ? "\r\x1b[K" : "",
                 line(state, elapsed, eta, false).c_str(), state.state);
    std::fflush(stderr);
}

void Progress::show(const char* event, const ProgressState& state) {
    const std::lock_guard guard(lock_);
    last_ = QvTimer::absoluteTime();
    const double elapsed = last_ - begin_;
    const double eta = etaOf(state, elapsed);
    if (json_)
        showJson(event, state, elapsed, eta);
    else
        showLine(state, elapsed, eta);
    shown_ = true;
}

std::string Progress::line(const ProgressState& state, double elapsed, double eta, bool color) const {
    const double speed = elapsed > 0 ? state.outSeconds / elapsed : 0;
    std::string text;
    char part[96];
    if (state.part >= 0) {
        std::snprintf(part, sizeof part, "%s%5.1f %%%s", color ? "\x1b[1m" : "", state.part * 100,
                      color ? "\x1b[0m" : "");
        text += part;
    }
    std::snprintf(part, sizeof part, "  frame %lld  %.1fx", state.frame, speed);
    text += part;
    if (eta >= 0)
        text += "  left " + formatTime(std::ceil(eta)).substr(0, formatTime(std::ceil(eta)).size() - 4);
    return text;
}

void Progress::showLine(const ProgressState& state, double elapsed, double eta) {
    std::string text = label_ + line(state, elapsed, eta, color_);
    if (std::string_view(state.state) == "paused") text += "  paused (p resumes)";
    std::fprintf(stderr, "\r%s\x1b[K", fitted(text).c_str());
    std::fflush(stderr);
}

void Progress::showJson(const char* event, const ProgressState& state, double elapsed, double eta) {
    Json line;
    line["event"] = event;
    line["percent"] = state.part < 0 ? Json(nullptr) : orNull(round1(state.part * 100));
    line["eta_s"] = eta < 0 ? Json(nullptr) : orNull(round1(eta));
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
