#include "tarsel/job/progress.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <utility>
#include <vector>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/terminal.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr double kLineInterval = 0.1;  // seconds
constexpr double kJsonInterval = 0.5;
constexpr double kLongStep = 0.2;  // seconds: a step that may have been a stop

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

}  // namespace

ProgressMode parseProgress(const std::string& text) {
    using How = ProgressMode::How;
    const size_t colon = std::min(text.find(':'), text.size());
    const std::string name = text.substr(0, colon), rest = text.substr(std::min(colon + 1, text.size()));
    const bool more = colon < text.size();
    if (name == "json" && more != rest.empty()) return {How::json, rest};
    if (name == "log" && more)
        return {How::log, "", static_cast<double>(parseNumber(rest, 1, 86400, "--progress log"))};
    const std::vector<std::string> known = {"auto", "json",        "json:FD", "json:FILE",
                                            "log",  "log:SECONDS", "none"};
    if (more || (name != "auto" && name != "none" && name != "log"))
        throw failure(Msg::choiceUnknown, {"--progress", text, suggestion(text, known), joined(known)});
    return {name == "auto" ? How::automatic : name == "log" ? How::log : How::off, ""};
}

// --- The time of a job.

void RunningTime::start(double before) {
    const std::lock_guard guard(lock_);
    tick_ = QvTimer::absoluteTime();
    begin_ = tick_ - before;
    away_ = 0;
    paused_ = stopped_ = longStepEnd_ = -1;
}

double RunningTime::tick() {
    const double now = QvTimer::absoluteTime();
    if (now - tick_.load(std::memory_order_relaxed) < kLongStep) {
        tick_.store(now, std::memory_order_relaxed);
        return now;
    }
    const std::lock_guard guard(lock_);
    if (now - tick_ >= kLongStep) {
        longStep_ = now - tick_;
        longStepEnd_ = now;
    }
    tick_ = now;
    return now;
}

void RunningTime::pause() {
    const std::lock_guard guard(lock_);
    if (paused_ < 0) paused_ = QvTimer::absoluteTime();
}

void RunningTime::resume() {
    const std::lock_guard guard(lock_);
    const double now = tick_ = QvTimer::absoluteTime();
    if (paused_ >= 0) away_ += now - paused_;
    paused_ = -1;
}

void RunningTime::stopping() {
    const std::lock_guard guard(lock_);
    stopped_ = QvTimer::absoluteTime();
}

// A stop within a pause is part of it. The job may have ended a step before this is called: then that step
// has the stop in it.
void RunningTime::continued() {
    const std::lock_guard guard(lock_);
    const double now = QvTimer::absoluteTime();
    const double step = now - longStepEnd_ < kLongStep ? longStep_ : now - std::max(tick_.load(), begin_);
    if (paused_ < 0) away_ += stopped_ >= 0 ? now - stopped_ : step;
    tick_ = now;
    stopped_ = longStepEnd_ = -1;
}

double RunningTime::seconds() const {
    const std::lock_guard guard(lock_);
    const double until = paused_ >= 0 ? paused_ : stopped_ >= 0 ? stopped_ : QvTimer::absoluteTime();
    return std::max(until - begin_ - away_, 0.0);
}

// --- What is shown.

Progress::Progress(const ProgressMode& mode, bool quiet, std::string label, bool keys)
    : label_(std::move(label)), keys_(keys) {
    using How = ProgressMode::How;
    const bool automatic = mode.how == How::automatic && !quiet;
    json_ = mode.how == How::json;
    line_ = automatic && stderrIsTerminal();
    log_ = (automatic && !line_) || (mode.how == How::log && !quiet);
    color_ = line_ && colourWanted();
    interval_ = json_ ? kJsonInterval : line_ ? kLineInterval : mode.logSeconds;
}

Progress::~Progress() {
    if (shown_ && line_) std::fputs("\r\x1b[K", stderr);
}

void Progress::start(const ProgressState& first, double before) {
    time_.start(before);
    last_ = time_.tick();
    show(first);
}

bool Progress::due() {
    const double now = time_.tick();
    return (json_ || line_ || log_) && now - last_ >= interval_;
}

void Progress::update(const ProgressState& state) {
    if (!due()) return;
    if (!log_) return show(state);
    last_ = QvTimer::absoluteTime();
    std::fprintf(stderr, "tarsel:%s\n", line(state, false).c_str());
    std::fflush(stderr);
}

void Progress::show(const ProgressState& state) {
    if (!json_ && !line_) return;
    const std::lock_guard guard(lock_);
    last_ = QvTimer::absoluteTime();
    if (json_) return Events::get().progress(figures(state));
    showLine(state);
    shown_ = true;
}

void Progress::finish(const ProgressState& state) {
    if (json_) Events::get().remember(figures(state));
    const std::lock_guard guard(lock_);
    if (line_ && shown_) std::fputs("\r\x1b[K", stderr);
    shown_ = false;
}

void Progress::report(const ProgressState& state) {
    if (json_) return Events::get().progress(figures(state));
    say("tarsel:" + line(state, false) + "  " + state.state);
}

void Progress::say(const std::string& text) {
    const std::lock_guard guard(lock_);
    std::fprintf(stderr, "%s%s\n", line_ ? "\r\x1b[K" : "", text.c_str());
    std::fflush(stderr);
}

std::string Progress::line(const ProgressState& state, bool color) const {
    const double elapsed = time_.seconds(), eta = etaOf(state, elapsed);
    const double speed = elapsed > 0 ? state.outSeconds / elapsed : 0;
    std::string text;
    char part[96];
    if (state.part >= 0) {
        std::snprintf(part, sizeof part, "%s%5.1f %%%s", color ? "\x1b[1m" : "", state.part * 100,
                      color ? "\x1b[0m" : "");
        text += part;
    }
    if (state.frame >= 0) text += "  frame " + std::to_string(state.frame);
    std::snprintf(part, sizeof part, "  %.1fx", speed);
    text += part;
    if (eta >= 0)
        text += "  left " + formatTime(std::ceil(eta)).substr(0, formatTime(std::ceil(eta)).size() - 4);
    return text;
}

void Progress::showLine(const ProgressState& state) {
    const std::string_view name = state.state;
    const char* const more = name == "paused"    ? "  paused (p resumes, q stops)"
                             : name == "closing" ? "  closing"
                             : keys_             ? "  keys: p q ?"
                                                 : "";
    const std::string text = label_ + line(state, color_) + more;
    std::fprintf(stderr, "\r%s\x1b[K", fitted(text).c_str());
    std::fflush(stderr);
}

JobFigures Progress::figures(const ProgressState& state) const {
    const double elapsed = time_.seconds();
    JobFigures figures;
    figures.percent = state.part < 0 ? -1 : state.part * 100;
    figures.etaSeconds = etaOf(state, elapsed);
    figures.elapsedSeconds = elapsed;
    if (elapsed > 0) figures.fps = static_cast<double>(state.frame) / elapsed;
    if (elapsed > 0) figures.speed = state.outSeconds / elapsed;
    figures.frame = state.frame;
    figures.outMicroseconds = static_cast<long long>(state.outSeconds * 1e6);
    figures.pass = state.pass;
    figures.passes = state.passes;
    figures.state = state.state;
    return figures;
}
