#include "tarsel/split/localparts.h"

#include <algorithm>
#include <utility>

#include "tarsel/words/messages.h"

namespace {

constexpr int kTick = 200;  // ms

}  // namespace

LocalParts::LocalParts(int atOnce, std::vector<std::string> options, std::string output)
    : atOnce_(atOnce), options_(std::move(options)), output_(std::move(output)) {}

void LocalParts::begin(const std::vector<Part>& parts) {
    parts_ = parts;
    states_.resize(parts.size());
    children_.resize(parts.size());
    startParts();
}

void LocalParts::startParts() {
    auto running = std::ranges::count_if(children_, [](const auto& child) { return child != nullptr; });
    const std::lock_guard guard(lock_);
    for (; next_ < parts_.size() && running < atOnce_ && !failed_ && !cancelled_; ++next_, ++running) {
        std::vector<std::string> words = {"run", parts_[next_].task, "--progress", "json"};
        words.insert(words.end(), options_.begin(), options_.end());
        children_[next_] = std::make_unique<ChildTask>(words, Descriptor());
        if (paused_) children_[next_]->process().pause();
    }
}

bool LocalParts::wait() {
    std::vector<int> handles = {bell_.descriptor()};
    for (const auto& child : children_)
        if (child) handles.push_back(child->process().descriptor());
    if (handles.size() == 1) return false;
    waitForAny(handles, kTick);
    bell_.silence();
    for (size_t part = 0; part < children_.size(); ++part)
        if (children_[part]) readProgress(part);
    if (failed_) stopAll();
    startParts();
    return std::ranges::any_of(children_, [](const auto& child) { return child != nullptr; });
}

void LocalParts::readProgress(size_t part) {
    ChildTask& child = *children_[part];
    const bool open = child.readProgress();
    PartState& state = states_[part];
    state.done = child.done();
    state.frames = child.frames();
    for (std::string& warning : child.takeWarnings()) state.warnings.push_back(std::move(warning));
    if (!open) end(part);
}

void LocalParts::end(size_t part) {
    std::unique_ptr<ChildTask> child;
    const int status = children_[part]->process().wait();
    {
        const std::lock_guard guard(lock_);
        child = std::move(children_[part]);
    }
    PartState& state = states_[part];
    state.ended = true;
    state.outputs = child->outputs();
    state.status = status < 0 ? static_cast<int>(Exit::failed) : status;
    if (status == 0 || failed_ || cancelled_) return;
    setFailure(state, output_, part, status, std::max(-status, 0), child->failure());
    failed_ = true;
}

void LocalParts::stopAll() {
    const std::lock_guard guard(lock_);
    for (const auto& child : children_)
        if (child) child->process().askToEnd();
}

void LocalParts::cancel() {
    cancelled_ = true;
    stopAll();
    bell_.ring();
}

void LocalParts::pause(bool paused) {
    const std::lock_guard guard(lock_);
    paused_ = paused;
    for (const auto& child : children_)
        if (child) paused ? child->process().pause() : child->process().resume();
}
