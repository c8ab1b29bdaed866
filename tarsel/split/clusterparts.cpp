#include "tarsel/split/clusterparts.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <utility>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/cluster/shellword.h"
#include "tarsel/host/clock.h"
#include "tarsel/host/command.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/filestamp.h"
#include "tarsel/host/outputs/owner.h"
#include "tarsel/words/messages.h"

namespace {

constexpr int kTick = 500;             // ms
constexpr int kQueryTicks = 4;         // ticks between two queries of the scheduler
constexpr int kPendingAnswers = 3;     // in a row without a running part, before the user is told why
constexpr int kShellSignal = 128;      // the shell's status for a program that was killed, less the signal
constexpr int kMostUnanswered = 30;    // unanswered queries after which a cancelled job is not waited for
constexpr size_t kNameDigits = 16;     // of the array
constexpr size_t kMostRead = 1 << 20;  // bytes of the progress file that are read at a time
constexpr size_t kMostStatus = 8;      // bytes of the file with the exit status
constexpr const char* kProgress = ".said";  // suffix of the file with its progress
constexpr const char* kStatus = ".status";  // suffix of the file with its exit status
constexpr const char* kTouched = ".look";   // see refresh

// The system may show a network folder as it was before the element ended. After a change in the folder it
// reads it again.
void refresh(const std::string& task) {
    if (writeFile(task + kTouched, "") == 0) removeFile(task + kTouched);
}

}  // namespace

ClusterParts::ClusterParts(const Scheduler& scheduler, How how)
    : scheduler_(scheduler), how_(std::move(how)) {}

ClusterParts::~ClusterParts() {
    if (!job_.empty() && !finished()) sendCancel();
}

// The script that each element runs, with the task of its index. It does nothing if the element has ended
// before, as a scheduler may start it again.
std::string ClusterParts::script(const std::vector<Part>& parts) const {
    const std::string most = std::to_string(kQvMostThreads);
    std::string script = "#!/bin/sh\nset --";
    for (const Part& part : parts) script += " " + shellWord(part.task);
    script += "\nshift " + scheduler_.indexWord() + "\n[ ! -e \"$1\"" + kStatus + " ] || exit 0\ncores=";
    script += how_.threads > 0 ? std::to_string(how_.threads) : scheduler_.coresWord();
    script += "\n[ \"$cores\" -le " + most + " ] || cores=" + most + "\n" + shellWord(ownProgram());
    for (const std::string& word : ChildProcess::passed()) script += " " + shellWord(word);
    script += " run \"$1\" -y --progress json --threads \"$cores\"";
    for (const std::string& word : how_.toolOptions) script += " " + shellWord(word);
    script += " 2>>\"$1\"" + std::string(kProgress) + "\nstatus=$?\n";
    script += "echo $status >\"$1\".new && mv \"$1\".new \"$1\"" + std::string(kStatus) + "\n";
    return script + "exit $status\n";
}

void ClusterParts::begin(const std::vector<Part>& parts) {
    scheduler_.checkOptions(how_.schedulerOptions);
    parts_ = parts;
    states_.resize(parts.size());
    progress_.resize(parts.size());
    readBytes_.resize(parts.size());
    const std::string seed =
        parts.at(0).task + "\n" + std::to_string(secondsSince1970()) + "\n" + Owner::self().text();
    name_ = "tarsel-" + digestOfText(seed).substr(0, kNameDigits);
    ClusterArray array;
    array.name = name_;
    array.script = script(parts);
    array.size = parts.size();
    array.output = (std::filesystem::path(parts.at(0).task).parent_path() / "elements.txt").string();
    array.options = how_.schedulerOptions;
    // A part that is started a second time would overwrite a file that is already being joined.
    array.options.emplace_back("--no-requeue");
    job_ = scheduler_.submit(array);
    tell(Level::note, how_.output + ": " + std::to_string(parts.size()) + " parts submitted as job " + job_);
    untilQuery_ = kQueryTicks;
}

bool ClusterParts::finished() const {
    return givenUp_ || (!states_.empty() && std::ranges::all_of(states_, &PartState::ended));
}

bool ClusterParts::wait() {
    waitForAny(std::vector<int>{bell_.descriptor()}, kTick);
    bell_.silence();
    for (size_t part = 0; part < parts_.size(); ++part)
        if (!states_[part].ended) readProgress(part);
    if (failed_ || cancelled_) cancelJob();
    if (!finished() && --untilQuery_ <= 0) queryScheduler();
    return !finished();
}

void ClusterParts::readProgress(size_t part) {
    const std::string progress = parts_[part].task + kProgress, status = parts_[part].task + kStatus;
    const bool ended = exists(status);  // looked at first, so that the progress read below is complete
    while (exists(progress)) {
        const std::string text = bytesAt(progress, readBytes_[part], kMostRead);
        readBytes_[part] += static_cast<long long>(text.size());
        progress_[part].add(text);
        if (text.size() < kMostRead) break;
    }
    PartState& state = states_[part];
    state.done = progress_[part].done();
    state.frames = progress_[part].frames();
    for (std::string& warning : progress_[part].takeWarnings()) state.warnings.push_back(std::move(warning));
    if (ended) end(part, std::atoi(firstBytes(status, kMostStatus).c_str()));
}

void ClusterParts::end(size_t part, int status) {
    PartState& state = states_[part];
    state.ended = true;
    state.status = status;
    state.outputs = progress_[part].outputs();
    if (status == 0 || failed_ || cancelled_) return;
    const int signal = std::max(status - kShellSignal, 0);
    setFailure(state, how_.output, part, status, signal, progress_[part].failure());
    failed_ = true;
}

// A part that two answers in a row don't list and that has no exit status was ended by the scheduler.
void ClusterParts::queryScheduler() {
    untilQuery_ = kQueryTicks;
    std::set<size_t> active;
    try {
        const std::vector<ClusterElement> elements = scheduler_.elements({name_});
        for (const ClusterElement& element : elements) active.insert(element.index);
        showPending(elements);
        unanswered_ = 0;
    } catch (const Failure& failed) {
        if (unanswered_++ == 0)
            tell(Level::warning, lineOf(Msg::schedulerSilent, {how_.output, failed.what()}));
        if (cancelSent_ && unanswered_ >= kMostUnanswered) givenUp_ = true;
        return;
    }
    refresh(parts_.at(0).task);
    for (size_t part = 0; part < parts_.size(); ++part) {
        if (active.count(part)) absent_.erase(part);
        if (states_[part].ended || active.count(part) || absent_.insert(part).second) continue;
        readProgress(part);
        if (states_[part].ended) continue;
        states_[part].ended = true;
        states_[part].status = static_cast<int>(Exit::failed);
        if (failed_ || cancelled_) continue;
        failed_ = true;
        states_[part].failure = lineOf(Msg::splitPartLost, {how_.output, std::to_string(part + 1)});
    }
}

// Elements are always pending for a while. If nothing of the job runs for longer, shows why.
void ClusterParts::showPending(const std::vector<ClusterElement>& active) {
    const bool held = !active.empty() && std::ranges::all_of(active, &ClusterElement::pending);
    allPending_ = held ? allPending_ + 1 : 0;
    if (allPending_ < kPendingAnswers || active.front().reason == shownReason_) return;
    shownReason_ = active.front().reason;
    tell(Level::note, lineOf(Msg::splitPartsHeld, {how_.output, shownReason_}));
}

// wait() continues until its elements have ended, as they still write into the folder.
void ClusterParts::cancelJob() {
    if (!std::exchange(cancelSent_, true) && !finished()) sendCancel();
}

void ClusterParts::sendCancel() {
    try {
        scheduler_.cancel({job_});
    } catch (const Failure& failed) {
        tell(Level::warning, failed.what());
    }
}

void ClusterParts::cancel() {
    cancelled_ = true;
    bell_.ring();
}
