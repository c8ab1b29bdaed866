#include "tarsel/watch/toolrun.h"

#include <array>

#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace {

ProgressState progressOf(const Json& object) {
    ProgressState state;
    const double percent = numberIn(object, "percent", -1);
    state.part = percent < 0 ? -1 : percent / 100;
    state.frame = static_cast<long long>(numberIn(object, "frame", 0));
    state.outSeconds = numberIn(object, "out_time_us", 0) / 1e6;
    return state;
}

void takeEnd(const Json& object, ToolResult& result) {
    result.failure = textIn(object, "error");
    result.seconds = numberIn(object, "elapsed_s", 0);
    result.speed = numberIn(object, "speed", -1);
    result.outputs = textsIn(object, "outputs");
}

void takeObject(const std::string& line, ToolResult& result,
                const std::function<void(const ProgressState&)>& progress) {
    const Json object = Json::parse(line, nullptr, false);
    if (!object.is_object()) return;
    const std::string event = textIn(object, "event");
    if (event == "progress") progress(progressOf(object));
    if (event == "message" && textIn(object, "level") == "warning")
        result.warnings.push_back(textIn(object, "text"));
    if (event == "end") takeEnd(object, result);
}

}  // namespace

// While it lives, signals reach the process.
class ToolRun::Running {
  public:
    Running(ToolRun& run, ChildProcess& process) : run_(run) {
        const std::lock_guard guard(run_.lock_);
        run_.running_ = &process;
    }
    ~Running() {
        const std::lock_guard guard(run_.lock_);
        run_.running_ = nullptr;
    }
    Running(const Running&) = delete;
    Running& operator=(const Running&) = delete;

  private:
    ToolRun& run_;
};

ToolResult ToolRun::run(const std::vector<std::string>& arguments, ChildProcess::Stream stream,
                        const std::function<void(std::string&)>& got) {
    ChildProcess process(arguments, stream);
    const Running running(*this, process);
    // A stop that came before could not reach it.
    bool stopping = false;
    std::string text;
    for (bool open = true; open;) {
        const std::array<int, 2> descriptors = {process.descriptor(), other_};
        if (wake_.stopped() && !stopping) process.askToEnd();
        stopping = stopping || wake_.stopped();
        if (stopping) {
            waitForAny({descriptors.data(), 1}, -1);
        } else {
            wake_.wait(descriptors, -1);
            arrived_();
        }
        open = process.read(text);
        got(text);
    }
    ToolResult result;
    result.status = process.wait();
    return result;
}

ToolResult ToolRun::ask(const std::vector<std::string>& arguments) {
    std::string all;
    ToolResult result = run(arguments, ChildProcess::Stream::output, [&](std::string& text) {
        all += text;
        text.clear();
    });
    result.printed = all;
    return result;
}

ToolResult ToolRun::work(std::vector<std::string> arguments,
                         const std::function<void(const ProgressState&)>& progress) {
    arguments.insert(arguments.end(), {"--progress", "json"});
    ToolResult reported;
    const ToolResult ended = run(arguments, ChildProcess::Stream::error, [&](std::string& text) {
        size_t at = 0;
        for (size_t end = 0; (end = text.find('\n', at)) != std::string::npos; at = end + 1)
            takeObject(text.substr(at, end - at), reported, progress);
        text.erase(0, at);
    });
    reported.status = ended.status;
    if (reported.status < 0)
        reported.failure = lineOf(Msg::watchRunCrashed, {std::to_string(-reported.status)});
    else if (reported.status != 0 && reported.failure.empty())
        reported.failure = lineOf(Msg::watchRunSilent, {std::to_string(reported.status)});
    return reported;
}

void ToolRun::reach(void (ChildProcess::*call)() const) const {
    const std::lock_guard guard(lock_);
    if (running_) (running_->*call)();
}

void ToolRun::endAtOnce() const {
    constexpr int patience = 2000;  // ms
    const std::lock_guard guard(lock_);
    if (!running_) return;
    running_->askToEnd();
    if (!running_->endsWithin(patience)) running_->kill();
}

void ToolRun::pause() const { reach(&ChildProcess::pause); }
void ToolRun::resume() const { reach(&ChildProcess::resume); }
