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

constexpr int kTick = 500;                  // ms
constexpr int kEvery = 4;                   // ticks between two questions to the scheduler
constexpr int kHeld = 3;                    // answers in a row without a running part, before that is told
constexpr int kMostSilent = 30;             // answers that may be missing before its end is not waited for
constexpr size_t kNameDigits = 16;          // of the array
constexpr size_t kMostSaid = 1 << 20;       // bytes that are read at a time
constexpr size_t kMostStatus = 8;           // bytes of the file with a status
constexpr const char* kSaid = ".said";      // what an element says
constexpr const char* kStatus = ".status";  // how it ended
constexpr const char* kMark = ".look";      // see refresh

// A network folder may be remembered as it was before the element ended; a change in it ends that.
void refresh(const std::string& task) {
    if (writeFile(task + kMark, "") == 0) removeFile(task + kMark);
}

}  // namespace

ClusterParts::ClusterParts(const Scheduler& scheduler, How how)
    : scheduler_(scheduler), how_(std::move(how)) {}

ClusterParts::~ClusterParts() {
    if (job_.empty() || finished()) return;
    try {
        scheduler_.cancel({job_});
    } catch (const Failure& failed) {
        tell(Level::warning, failed.what());
    }
}

// An element that the scheduler starts again does nothing once it has ended.
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
    script += " 2>>\"$1\"" + std::string(kSaid) + "\nstatus=$?\n";
    script += "echo $status >\"$1\".new && mv \"$1\".new \"$1\"" + std::string(kStatus) + "\n";
    return script + "exit $status\n";
}

void ClusterParts::begin(const std::vector<Part>& parts) {
    scheduler_.checkOptions(how_.schedulerOptions);
    parts_ = parts;
    states_.resize(parts.size());
    talks_.resize(parts.size());
    heard_.resize(parts.size());
    const std::string seed =
        parts.at(0).task + "\n" + std::to_string(secondsSince1970()) + "\n" + Owner::self().text();
    name_ = "tarsel-" + digestOfText(seed).substr(0, kNameDigits);
    ClusterArray array;
    array.name = name_;
    array.script = script(parts);
    array.size = parts.size();
    array.output = (std::filesystem::path(parts.at(0).task).parent_path() / "elements.txt").string();
    array.options = how_.schedulerOptions;
    // A part that were begun again while it runs would write what is being put together.
    array.options.emplace_back("--no-requeue");
    job_ = scheduler_.submit(array);
    tell(Level::note, how_.output + ": " + std::to_string(parts.size()) + " parts submitted as job " + job_);
    untilLook_ = kEvery;
}

bool ClusterParts::finished() const {
    return gone_ || (!states_.empty() && std::ranges::all_of(states_, &PartState::ended));
}

bool ClusterParts::wait() {
    waitForAny(std::vector<int>{bell_.descriptor()}, kTick);
    bell_.silence();
    for (size_t part = 0; part < parts_.size(); ++part)
        if (!states_[part].ended) listen(part);
    if (failed_ || cancelled_) takeBack();
    if (!finished() && --untilLook_ <= 0) look();
    return !finished();
}

void ClusterParts::listen(size_t part) {
    const std::string said = parts_[part].task + kSaid, status = parts_[part].task + kStatus;
    const bool ended = exists(status);  // before what it says is read, so that nothing is missed
    while (exists(said)) {
        const std::string text = bytesAt(said, heard_[part], kMostSaid);
        heard_[part] += static_cast<long long>(text.size());
        talks_[part].hear(text);
        if (text.size() < kMostSaid) break;
    }
    PartState& state = states_[part];
    state.done = talks_[part].part();
    state.frames = talks_[part].frames();
    for (std::string& warning : talks_[part].takeWarnings()) state.warnings.push_back(std::move(warning));
    if (ended) end(part, std::atoi(firstBytes(status, kMostStatus).c_str()));
}

void ClusterParts::end(size_t part, int status) {
    PartState& state = states_[part];
    state.ended = true;
    state.status = status;
    state.outputs = talks_[part].outputs();
    if (status == 0 || failed_ || cancelled_) return;
    state.failure = talks_[part].failure();
    const std::string number = std::to_string(part + 1);
    if (status > 128) {
        state.status = static_cast<int>(Exit::failed);
        state.failure = lineOf(Msg::splitPartKilled, {how_.output, number, std::to_string(status - 128)});
    } else if (state.failure.empty()) {
        state.failure = lineOf(Msg::splitPartFailed, {how_.output, number, std::to_string(status)});
    }
    failed_ = true;
}

// An element that the scheduler does not have, twice, and that has left no status, has not come to its end.
void ClusterParts::look() {
    untilLook_ = kEvery;
    std::set<size_t> living;
    try {
        const std::vector<ClusterElement> elements = scheduler_.elements({name_});
        for (const ClusterElement& element : elements) living.insert(element.index);
        tellWhatHolds(elements);
        silent_ = 0;
    } catch (const Failure& failed) {
        if (silent_++ == 0) tell(Level::warning, lineOf(Msg::schedulerSilent, {how_.output, failed.what()}));
        if (takenBack_ && silent_ >= kMostSilent) gone_ = true;
        return;
    }
    refresh(parts_.at(0).task);
    for (size_t part = 0; part < parts_.size(); ++part) {
        if (living.count(part)) missed_.erase(part);
        if (states_[part].ended || living.count(part) || missed_.insert(part).second) continue;
        listen(part);
        if (states_[part].ended) continue;
        states_[part].ended = true;
        states_[part].status = static_cast<int>(Exit::failed);
        if (failed_ || cancelled_) continue;
        failed_ = true;
        states_[part].failure = lineOf(Msg::splitPartLost, {how_.output, std::to_string(part + 1)});
    }
}

// Elements wait for a while before each start; where nothing of the job runs, its user wants to know why.
void ClusterParts::tellWhatHolds(const std::vector<ClusterElement>& living) {
    const bool held = !living.empty() && std::ranges::all_of(living, &ClusterElement::waits);
    held_ = held ? held_ + 1 : 0;
    if (held_ < kHeld || living.front().reason == reason_) return;
    reason_ = living.front().reason;
    tell(Level::note, lineOf(Msg::splitPartsHeld, {how_.output, reason_}));
}

// They are then waited for, as they still write into the folder.
void ClusterParts::takeBack() {
    if (std::exchange(takenBack_, true) || finished()) return;
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
