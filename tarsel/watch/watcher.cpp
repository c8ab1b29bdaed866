#include "tarsel/watch/watcher.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <filesystem>

#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/follow/filemoves.h"
#include "tarsel/source/source.h"
#include "tarsel/watch/copynames.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

using State = WatchedFile::State;

// Milliseconds between two looks at the whole folder where nothing else is asked for: notices can be lost,
// and there are none of what other machines do.
constexpr long long kScanHere = 60000, kScanNetwork = 5000;
// Milliseconds for which a file waits that could not be made for a reason that is not its own, and how often
// that doubles.
constexpr long long kRetry = 5000;
constexpr int kDoublings = 7;

long long scanTime(const WatchOptions& options, bool notices) {
    if (options.scanSeconds) return static_cast<long long>(*options.scanSeconds * 1000);
    return notices && !isNetworkFolder(options.folder) ? kScanHere : kScanNetwork;
}

// Why an entry is never taken, or null.
const char* whyNever(const FileFacts& facts) {
    switch (facts.kind) {
        case FileFacts::Kind::folder: return "it is a folder";
        case FileFacts::Kind::link: return "it is a link, which may lead anywhere";
        case FileFacts::Kind::other: return "it is no regular file";
        default: return nullptr;
    }
}

// Whether a run ended so for a reason that is not in its input: the disk is full, no process could be begun,
// a person or the system, short of memory, has ended it.
bool isOfTheMoment(int status) {
    return status == static_cast<int>(Exit::output) || status > static_cast<int>(Exit::check) ||
           status == ChildProcess::kKilled;
}

// The files that a run says it has written, with their size and time now.
std::vector<MadeFile> madeFiles(const std::vector<std::string>& names, const std::string& planned) {
    std::vector<MadeFile> made;
    std::set<std::string> all(names.begin(), names.end());
    all.insert(planned);
    for (const std::string& name : all)
        if (const FileFacts facts = factsOf(name); facts.kind == FileFacts::Kind::file)
            made.push_back({name, facts.bytes, facts.modified});
    return made;
}

}  // namespace

Watcher::Watcher(const WatchOptions& options, const WatchTargets& targets, Signals& signals)
    : options_(options),
      targets_(targets),
      signals_(signals),
      memory_(options.memory),
      notices_(options.folder),
      arrivals_(static_cast<long long>(options.settleSeconds * 1000)),
      tool_(wake_, notices_.descriptor(), [this] { takeNotices(); }),
      scanEvery_(scanTime(options, notices_.descriptor() >= 0)) {}

std::string Watcher::pathOf(const std::string& name) const {
    return (fs::path(options_.folder) / name).string();
}

void Watcher::run() {
    const Signals::Watch watching(signals_, {.first = [this](int) { wake_.stop(); },
                                             .second =
                                                 [this] {
                                                     tool_.endAtOnce();
                                                     return false;
                                                 },
                                             .suspend = [this] { tool_.pause(); },
                                             .resume = [this] { tool_.resume(); },
                                             .last = Msg::stopped});
    if (signals_.received() != Exit::done) wake_.stop();
    if (!options_.quiet) tell(Level::note, lineOf(Msg::watchBegins, {options_.folder}));
    scan();
    follow();
    end();
}

void Watcher::follow() {
    while (!stopped()) {
        takeNotices();
        const long long now = Wake::now();
        if (now >= nextScan_ && !options_.once) scan();
        if (const auto name = arrivals_.due(now)) {
            handle(*name);
            continue;
        }
        if (options_.once && arrivals_.empty()) return;
        const std::array<int, 1> descriptors = {notices_.descriptor()};
        wake_.wait(descriptors, untilNext(now));
    }
}

long long Watcher::untilNext(long long now) const {
    const long long next = arrivals_.next().value_or(now + scanEvery_);
    return std::max(0LL, std::min(next, options_.once ? next : nextScan_) - now);
}

void Watcher::end() const {
    const Exit signalled = signals_.received();
    const std::string done = std::to_string(done_), failed = std::to_string(failed_ + waiting_);
    if (stopped()) throw Failure(signalled, lineOf(Msg::watchStopped, {done, failed}));
    if (failed_ + waiting_ > 0) throw failure(Msg::watchSomeFailed, {options_.folder, failed, done});
    if (!options_.quiet) tell(Level::note, lineOf(Msg::watchEnds, {options_.folder, done}));
}

void Watcher::takeNotices() {
    std::set<std::string> names;
    const bool all = notices_.take(names);
    if (notices_.folderGone() || !all) nextScan_ = 0;
    // With `once` only files that were there at the start are looked at.
    for (const std::string& name : names)
        if (!options_.once || arrivals_.facts(name)) lookAt(name);
}

void Watcher::scan() {
    for (const std::string& name : namesIn(options_.folder)) lookAt(name);
    nextScan_ = Wake::now() + scanEvery_;
}

// Each reason once, as long as nothing about the entry changes.
void Watcher::mention(const std::string& name, const char* why) {
    std::string& last = told_[name];
    if (last == why) return;
    last = why;
    if (!options_.quiet) tell(Level::note, lineOf(Msg::watchLeft, {name, why}));
}

void Watcher::lookAt(const std::string& name) {
    if (isUnfinishedName(name)) return;
    const std::string path = pathOf(name);
    const FileFacts facts = factsOf(path);
    if (path == options_.memory) return;
    if (const char* why = whyNever(facts)) {
        arrivals_.forget(name);
        if (path != options_.moveTo && path != options_.failedTo) mention(name, why);
        return;
    }
    if (facts.kind == FileFacts::Kind::absent) {
        told_.erase(name);
        delays_.erase(name);
    }
    if (isNothingToDo(name, facts)) return arrivals_.forget(name);
    arrivals_.see(name, facts, Wake::now());
}

// Decided without reading the file.
bool Watcher::isNothingToDo(const std::string& name, const FileFacts& facts) {
    const WatchedFile* const known = memory_.find(name);
    if (!known || !known->isCertainly(facts)) return false;
    if (known->state == State::failed)
        return options_.failedTo.empty() && (!options_.retryFailed || failedBefore_.count(name));
    return known->state == State::closed && options_.after == WatchOptions::After::keep &&
           missing(*known).empty();
}

void Watcher::handle(const std::string& name) {
    const std::string path = pathOf(name);
    const FileFacts facts = factsOf(path), *const seen = arrivals_.facts(name);
    const long long now = Wake::now(), settle = static_cast<long long>(options_.settleSeconds * 1000);
    const bool changed = !seen || *seen != facts, empty = facts.bytes == 0;
    if (changed && !options_.once) return lookAt(name);
    const bool written = !changed && isBeingWritten(path);
    if (changed || empty || written) {
        if (facts.kind == FileFacts::Kind::file)
            mention(name, empty ? "it is empty" : "it is still being written");
        return options_.once ? arrivals_.forget(name)
                             : arrivals_.postpone(name, now, std::max(settle, 500LL));
    }
    Ended ended = Ended::settled;
    try {
        ended = make(name, facts);
    } catch (const Failure& failed) {
        // The record of files or the folder for processed inputs can't be written, or the input can't be
        // read.
        ended = stopped() ? Ended::stopped : waitFor(name, failed.what());
    }
    if (ended == Ended::settled) {
        arrivals_.forget(name);
        delays_.erase(name);
        told_.erase(name);
        // A new file may already have the name. An input that was kept is known by now.
        if (!options_.once) lookAt(name);
    }
    if (ended == Ended::changed) {
        mention(name, factsOf(path).kind == FileFacts::Kind::absent ? "it was removed while it was read"
                                                                    : "it changed while it was read");
        arrivals_.forget(name);
        if (!options_.once) lookAt(name);
    }
}

// Reports each new reason once, and tries again after longer and longer times.
Watcher::Ended Watcher::waitFor(const std::string& name, const std::string& why) {
    std::string& last = told_[name];
    if (last != why) {
        last = why;
        tell(Level::warning, lineOf(options_.once ? Msg::watchNotMade : Msg::watchWaits, {name, why}));
    }
    if (options_.once) {
        ++waiting_;
        arrivals_.forget(name);
        return Ended::waits;
    }
    int& times = delays_[name];
    arrivals_.postpone(name, Wake::now(), kRetry << std::min(times, kDoublings));
    ++times;
    return Ended::waits;
}

std::vector<int> Watcher::missing(const WatchedFile& file) const {
    std::vector<int> targets;
    for (int i = 0; i < targets_.count(); ++i)
        if (!file.made.count(targets_.label(i))) targets.push_back(i);
    return targets;
}

Watcher::Ended Watcher::make(const std::string& name, const FileFacts& facts) {
    const auto digest = digestOf(pathOf(name), [this] { return stopped(); });
    if (!digest) return Ended::stopped;
    WatchedFile file;
    if (const WatchedFile* known = memory_.find(name)) {
        file.outputs = known->outputs;
        if (known->digest == *digest && known->facts.bytes == facts.bytes) file = *known;
    }
    file.name = name;
    file.digest = *digest;
    const bool touched = !file.isCertainly(facts);
    file.facts = facts;
    if (file.state == State::closed && options_.after != WatchOptions::After::keep) {
        // The input was moved away and is back: outputs that are missing by now are made again.
        file.state = State::begun;
        std::erase_if(file.made, [](const auto& made) {
            return !std::all_of(made.second.begin(), made.second.end(),
                                [](const MadeFile& one) { return one.stands(); });
        });
    }
    if (missing(file).empty()) {
        if (file.state == State::begun) file.state = State::done;
        if (touched || file.state == State::done) memory_.remember(file);
        return file.state == State::closed ? Ended::settled : afterwards(file);
    }
    if (file.state == State::failed && options_.failedTo.empty() && touched && !options_.retryFailed) {
        memory_.remember(file);
        return Ended::settled;
    }
    return begin(file);
}

Watcher::Ended Watcher::begin(WatchedFile& file) {
    const std::string path = pathOf(file.name);
    const std::vector<int> targets = missing(file);
    // What it may write over: its own outputs that an earlier process did not complete.
    const WatchedFile* const known = memory_.find(file.name);
    const std::set<std::string> torn =
        known && known->state == State::begun
            ? std::set<std::string>(known->outputs.begin(), known->outputs.end())
            : std::set<std::string>();
    const bool ask = std::any_of(targets.begin(), targets.end(),
                                 [&](int target) { return targets_.dependsOnStreams(target); });
    const bool soundOnly = ask && hasSoundOnly(path);
    if (stopped()) return Ended::stopped;
    std::vector<std::vector<std::string>> outputs;
    std::set<std::string> begun(file.outputs.begin(), file.outputs.end());
    for (const int target : targets) {
        outputs.push_back(targets_.outputs(target, path, soundOnly));
        for (const std::string& output : outputs.back()) {
            const std::string why = whyTaken(output, file.name, torn);
            if (!why.empty()) return waitFor(file.name, why);
        }
        begun.insert(outputs.back().begin(), outputs.back().end());
    }
    targets_.makeFolders();
    file.outputs.assign(begun.begin(), begun.end());
    file.state = State::begun;
    memory_.remember(file);
    std::vector<std::string> failures;
    for (size_t i = 0; i < targets.size(); ++i) {
        const std::string& output = outputs[i].front();
        const Ended ended = makeTarget(file, targets[i], output, torn.count(output) > 0, failures);
        if (ended != Ended::settled) return ended;
        if (i + 1 < targets.size()) memory_.remember(file);
    }
    if (!failures.empty()) return putAside(file, failures);
    file.state = State::done;
    memory_.remember(file);
    return afterwards(file);
}

// Why an output of the file may not be written, or "". `torn`: outputs of this very file.
std::string Watcher::whyTaken(const std::string& output, const std::string& name,
                              const std::set<std::string>& torn) const {
    if (factsOf(output).kind == FileFacts::Kind::absent || torn.count(output)) return "";
    const std::string* const maker = memory_.makerOf(output);
    if (maker && *maker != name) return lineOf(Msg::watchOutputOfOther, {output, *maker});
    return options_.overwrite ? "" : lineOf(Msg::outputExists, {output});
}

// In a process of its own, as opening a hostile file is work for the decoders.
bool Watcher::hasSoundOnly(const std::string& path) {
    const ToolResult result = tool_.ask({"info", "--json", path});
    const Json files = Json::parse(result.printed, nullptr, false);
    if (result.status != 0 || !files.is_array() || files.size() != 1 || !files[0].contains("streams"))
        return false;
    const Json& streams = files[0]["streams"];
    const auto isPicture = [](const Json& stream) { return stream.value("type", "") == "video"; };
    return streams.is_array() && !streams.empty() && std::none_of(streams.begin(), streams.end(), isPicture);
}

Watcher::Ended Watcher::makeTarget(WatchedFile& file, int target, const std::string& output, bool torn,
                                   std::vector<std::string>& failures) {
    const std::string path = pathOf(file.name);
    std::vector<std::string> arguments = {
        "transcode", path, "-o", output, "--preset=" + targets_.preset(target), "--unchanged"};
    if (torn || options_.overwrite) arguments.push_back("-y");
    if (!options_.raw.empty() && !Source::describesItself(path)) arguments.push_back("--raw=" + options_.raw);
    arguments.insert(arguments.end(), options_.jobOptions.begin(), options_.jobOptions.end());
    Progress progress(options_.progress, options_.quiet, inQuotes(file.name) + "  ", false);
    progress.start();
    ProgressState last;
    const ToolResult result = tool_.work(arguments, [&](const ProgressState& state) {
        last = state;
        progress.update(state);
    });
    last.state = stopped() ? "stopped" : result.status == 0 ? "done" : "failed";
    progress.finish(last);
    if (result.status != 0 && stopped()) return Ended::stopped;
    if (factsOf(path) != file.facts) return Ended::changed;
    if (isOfTheMoment(result.status)) return waitFor(file.name, result.failure);
    if (result.status != 0) {
        // Of an input that can't be opened all targets say the same.
        if (std::count(failures.begin(), failures.end(), result.failure) == 0)
            failures.push_back(result.failure);
        return Ended::settled;
    }
    file.made[targets_.label(target)] = madeFiles(result.outputs, output);
    if (!options_.quiet) sayMade(file.name, output, result);
    return Ended::settled;
}

void Watcher::sayMade(const std::string& name, const std::string& output, const ToolResult& result) const {
    for (const std::string& warning : result.warnings) tell(Level::warning, inQuotes(name) + ": " + warning);
    char figures[64] = "";
    if (result.speed >= 0)
        std::snprintf(figures, sizeof figures, " in %.1f s (%.2fx)", result.seconds, result.speed);
    tell(Level::note, lineOf(Msg::watchMade, {name, output, figures}));
}

// What is to be done with an input of which all was made. It throws where that can't be done yet.
Watcher::Ended Watcher::afterwards(WatchedFile& file) {
    const std::string path = pathOf(file.name);
    if (options_.after != WatchOptions::After::keep && isBeingWritten(path))
        throw failure(Msg::watchChanged, {path});
    if (options_.after == WatchOptions::After::move) moveInto(path, options_.moveTo, file.facts);
    if (options_.after == WatchOptions::After::remove) removeFile(path, file.facts);
    file.state = State::closed;
    ++done_;
    memory_.remember(file);
    return Ended::settled;
}

Watcher::Ended Watcher::putAside(WatchedFile& file, const std::vector<std::string>& failures) {
    const std::string why = joined(failures, " | ");
    file.state = State::failed;
    memory_.remember(file);
    failedBefore_.insert(file.name);
    ++failed_;
    tell(Level::warning, lineOf(Msg::watchFailed, {file.name, why}));
    if (options_.failedTo.empty()) return Ended::settled;
    const std::string to = moveInto(pathOf(file.name), options_.failedTo, file.facts);
    try {
        writeNewFile(to + ".txt", joined(failures, "\n") + "\n");
    } catch (const Failure& unsaid) {
        tell(Level::warning, unsaid.what());
    }
    return Ended::settled;
}
