// Running a job: the transcoder with its callbacks, what is shown meanwhile, and how it ends.
#include <algorithm>
#include <atomic>
#include <cerrno>
#include <condition_variable>
#include <cstdio>
#include <mutex>
#include <new>
#include <optional>

#include "tarsel/host/command.h"
#include "tarsel/host/events.h"
#include "tarsel/host/keyboard.h"
#include "tarsel/host/memory.h"
#include "tarsel/host/plugins.h"
#include "tarsel/host/terminal.h"
#include "tarsel/job/job.h"
#include "tarsel/job/post.h"
#include "tarsel/words/fixedline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/systemcause.h"
#include "tarsel/words/timespec.h"

// The transcoder of a job. Its callbacks run on the engine's worker; the tool waits on its own thread.
class Job::Runner : public QvTranscoder {
  public:
    Runner(Job& job, Progress& progress) : job_(job), progress_(progress) {}
    ~Runner() override { QvTranscoder::stop(); }

    // The units are those of the first stream; for a report that comes on another thread.
    int cbProcess() override {
        if (stop_.load(std::memory_order_relaxed)) return 1;
        began_.store(true, std::memory_order_relaxed);
        if (first_) units_.store(first_->outProcessed(), std::memory_order_relaxed);
        if (progress_.due()) progress_.update(state("running"));
        return 0;
    }

    // The sound is read once before the run, which makes two passes of it.
    void cbMeasure(double part) override {
        read_.store(part, std::memory_order_relaxed);
        if (progress_.due()) progress_.update(readingState());
    }

    // Once all is linked.
    void ready() {
        for (const JobStream& stream : job_.streams_)
            if (!first_) first_ = getLinkForOutput(stream.type, stream.encStream);
    }

    // From any thread, at any time of the run.
    void report() {
        const char* name = isPaused() ? "paused" : phase_.load();
        const bool reading = read_ >= 0 && !began_;
        progress_.report(reading ? readingState() : stateAt(job_.streams_.front(), units_, name));
    }

    // The counts have to be taken before the links close.
    int cbMuxClose(QvMuxer*) override {
        for (JobStream& stream : job_.streams_)
            if (TransLink* link = getLinkForOutput(stream.type, stream.encStream))
                stream.written = link->outProcessed();
        takeFilterFailure();
        last_ = state("closing");
        phase_ = "closing";
        progress_.show(last_);
        return 0;
    }

    void cbPaused(bool paused) override {
        paused ? progress_.time().pause() : progress_.time().resume();
        progress_.show(state(paused ? "paused" : "running"));
    }

    void cbDone(int result) override {
        std::lock_guard guard(lock_);
        result_ = result;
        done_ = true;
        changed_.notify_all();
    }

    // The result of cbDone. `slow` runs when a requested stop takes a while.
    template <class Slow>
    int wait(Slow slow) {
        std::unique_lock guard(lock_);
        changed_.wait(guard, [this] { return done_ || stop_; });
        if (!done_ && !changed_.wait_for(guard, kSlowStop, [this] { return done_; })) slow();
        changed_.wait(guard, [this] { return done_; });
        return result_;
    }

    void requestStop() {
        {
            std::lock_guard guard(lock_);
            stop_ = true;
            changed_.notify_all();
        }
        QvTranscoder::requestStop();
    }

    // Why the run failed: a link knows it better than the log, and that better than the run.
    std::string reason() const {
        for (const JobStream& stream : job_.streams_)
            if (const TransLink* link = getLinkForOutput(stream.type, stream.encStream);
                link && link->errorCode() != 0 && *link->errorDesc())
                return link->errorDesc();
        AnyVector messages;
        qv_log()->getAll(messages);
        for (int i = 0; i < messages.size(); ++i)
            if (messages.at(i).asDict().getInt32("type", 0) == kErrorLine)
                return messages.at(i).asDict().getString("text", "");
        return *errorDesc() ? errorDesc() : "the engine gives no reason";
    }

    // On the thread of the keyboard.
    void pressed(char key) {
        if (key == 'p') isPaused() ? unpause() : pause();
        if (key == 'q') Signals::interrupt();
        if (key == '?') progress_.say("tarsel: keys: p pauses and resumes, q stops the job, ? shows this");
    }

    ProgressState state(const char* name) const {
        if (!first_) return {.state = name};
        return stateAt(job_.streams_.front(), first_->outProcessed(), name);
    }
    ProgressState readingState() const {
        ProgressState s{.part = read_, .state = "running"};
        countPasses(s, 1);
        return s;
    }
    void countPasses(ProgressState& state, int pass) const {
        if (read_ < 0) return;
        state.pass = pass;
        state.passes = 2;
        if (state.part >= 0) state.part = (state.part + pass - 1) / 2;
    }
    ProgressState stateAt(const JobStream& stream, long long processed, const char* name) const {
        ProgressState s;
        s.state = name;
        const long long units = std::max(processed, 0LL);
        if (stream.expected > 0)
            s.part = std::min(1.0, static_cast<double>(units) / static_cast<double>(stream.expected));
        const double rate = stream.type == 1 ? static_cast<double>(stream.rate.rate()) : stream.samplerate;
        s.outSeconds = static_cast<double>(units) / rate;
        if (stream.type == 1) s.frame = units;
        countPasses(s, 2);
        return s;
    }
    const ProgressState& last() const { return last_; }
    // Why a filter could not do its work; the others went on without it.
    const std::optional<Failure>& filterFailure() const { return filterFailure_; }

  private:
    void takeFilterFailure() {
        for (const JobStream& stream : job_.streams_) {
            const TransLink* link = getLinkForOutput(stream.type, stream.encStream);
            const Any& filters = stream.params.get("filters");
            if (!link || stream.type != 1 || !filters.isDict()) continue;
            for (const Any& name : FiltersState(filters.asDict()).names(true))
                for (int i = 0; const QvCodec* filter = link->filter(name.asString(""), i); ++i)
                    if (filter->errorCode() != 0 && !filterFailure_) filterFailure_ = failureOf(*filter);
        }
    }

    Failure failureOf(const QvCodec& filter) const {
        const std::string file = filterFile(filter, QV_GUI_FILESELECT_SAVE);
        const auto cause = causeIn(filter.errorDesc());
        if (!file.empty() && cause)
            return failure(Msg::filterWriteFailed,
                           {filter.name(), job_.withFinalNames(file), cause->why, cause->remedy});
        return failure(Msg::filterFailed, {filter.name(), job_.withFinalNames(filter.errorDesc())});
    }

    static constexpr auto kSlowStop = std::chrono::seconds(1);
    static constexpr int kErrorLine = 2;  // type of a message

    Job& job_;
    Progress& progress_;
    const TransLink* first_ = nullptr;  // of the first stream
    std::atomic<long long> units_{0};
    std::atomic<const char*> phase_{"running"};
    std::atomic<double> read_{-1};  // part of the sound that was measured; negative without
    std::atomic<bool> began_{false};
    ProgressState last_;
    std::optional<Failure> filterFailure_;
    std::atomic<bool> stop_{false};
    std::mutex lock_;
    std::condition_variable changed_;
    bool done_ = false;
    int result_ = 0;
};

void Job::checkSpace() const {
    if (!outputs_) return;
    const long long space = QvFile::freeSpace(Any(outputs_->hiddenName(primaryExtension()).c_str()));
    long long need = 0;
    if (kind_ != OutputKind::pictures)
        for (const JobStream& stream : streams_) need += stream.bytes(stream.expected);
    if (space >= 0 && need > space)
        throw failure(Msg::outputNoSpace, {outputName(), formatBytes(need), formatBytes(space)});
}

void Job::link(Runner& runner) const {
    runner.setEncoder(pipe_.get());
    runner.setParam("startDelay", 0);
    AnyDict off;
    off.set("off", 1);
    runner.setParam("progress", off);
    for (const JobStream& s : streams_)
        if (runner.link(&s.source->decoder(), s.type, s.decStream, s.encStream, s.params) < 0)
            throw failure(Msg::linkFailed, {s.source->name()});
    runner.ready();
}

int Job::runLinked(Runner& runner, Progress& progress) {
    if (outputs_) pipe_->setFilename(Any(outputs_->begin(primaryExtension()).c_str()));
    if (stream_) pipe_->setFilename(Any(stream_->engineName().c_str()));
    progress.start();
    qv_log()->clear();
    stopIfSignalled();
    int result = runner.transcode(false);
    // So it stays only where no worker could be started.
    if (result == QvStatus::failed && runner.isTranscoding())
        throw failure(Msg::runHasNoThread, {options_.output});
    if (result == QvStatus::ok || result == QvStatus::warning) {
        Keyboard keyboard(progress.onTerminal(), [&](char key) { runner.pressed(key); });
        result = runner.wait([&] {
            if (!options_.quiet) tell(Level::note, lineOf(Msg::stopping));
        });
    }
    ProgressState end = runner.last();
    end.state = signals_.received() != Exit::done ? "stopped" : result == 0 ? "done" : "failed";
    progress.finish(end);
    return result;
}

void Job::run() {
    Progress progress(options_.progress, options_.quiet, "task 1 of 1  ");
    std::vector<std::string> names;
    // What has begun to take its place is neither left half-way nor taken back.
    const auto leave = [&] { return files_->leave(); };
    const std::optional<Msg> last = takesOneStream() ? std::optional(Msg::stoppedWithPart) : std::nullopt;
    const Signals::Watch placing(
        signals_, {.first = [](int) {}, .second = leave, .last = last, .file = options_.output});
    checkSpace();
    storeTask();
    redirectFilters();
    {
        const MemoryWatch memory;
        Runner runner(*this, progress);
        const Signals::Watch running(signals_, {.first = [&](int) { runner.requestStop(); },
                                                .second = leave,
                                                .report = [&] { runner.report(); },
                                                .suspend = [&] { progress.time().stopping(); },
                                                .resume = [&] { progress.time().continued(); },
                                                .last = last,
                                                .file = options_.output});
        try {
            link(runner);
            const int result = runLinked(runner, progress);
            stopIfSignalled();
            if (result != 0 && result != QvStatus::endOfStream) fail(runner, result);
            if (runner.filterFailure()) throw *runner.filterFailure();
        } catch (...) {
            stopIfSignalled();
            checkLengths();
            tellBetter(memory.ranOut());
        }
        checkLengths();
        takeWarnings();
        if (const std::string lost = Events::get().lost(); !lost.empty()) warnings_.push_back(lost);
        checkResult();
        stopIfSignalled();
        checkWarnings();
        commit();
    }
    if (outputs_) names = outputs_->names();
    if (stream_) names = {stream_->name()};
    Events::get().wrote(names);
    if (options_.post.empty()) signals_.complete();
    // The result is there, whether or not there is memory to say so.
    try {
        showWarnings();
        if (!options_.quiet) report(names);
    } catch (const std::bad_alloc&) {
        writeToStderr(FixedLine(Msg::doneUnsaid).text());
    }
    if (!options_.post.empty()) runPost(names);
    signals_.complete();
}

// Of a failure on its way: that memory ran out is the reason of all that fails afterwards, and what the
// engine says about a broken contract is for its log.
void Job::tellBetter(bool ranOut) const {
    try {
        throw;
    } catch (const Failure& failure) {
        if (!ranOut || failure.exit() >= Exit::hangup) throw;
    } catch (const QvMemoryFailure&) {
    } catch (const std::bad_alloc&) {
    } catch (const QvAssertFailure&) {
        if (!ranOut) throw failure(Msg::runBroken, {options_.output});
    }
    throw failure(Msg::runOutOfMemory, {options_.output});
}

void Job::stopIfSignalled() const {
    if (const Exit signalled = signals_.received(); signalled != Exit::done) stopped(signalled);
}

// What filters write is an output like the others: it gets its name when the job is complete. A device takes
// it as it comes.
void Job::redirectFilters() {
    for (JobStream& stream : streams_) {
        const Any& filters = stream.params.get("filters");
        if (stream.type != 1 || !filters.isDict()) continue;
        FiltersState state(filters.asDict());
        renameFilterFiles(state, [&](const std::string& file, const char*) {
            const auto dump = dumps_.find(file);
            return dump == dumps_.end() ? file : dump->second->begin("");
        });
        stream.params.setFilters(state);
    }
}

void Job::commit() {
    std::vector<Outputs*> all;
    for (Outputs* const one : {outputs_.get(), taskFile_.get()})
        if (one) all.push_back(one);
    for (auto& [name, dump] : dumps_) all.push_back(dump.get());
    Outputs::commit(all);
}

std::string Job::withFinalNames(std::string text) const {
    if (stream_) text = stream_->withUserName(text);
    // The first file has the user's own extension.
    const Any file = outputs_ && pipe_ ? pipe_->getFilename() : Any();
    const std::string hidden = file.isString() ? file.asString() : "";
    for (size_t at = 0; !hidden.empty() && (at = text.find(hidden, at)) != std::string::npos;
         at += options_.output.size())
        text.replace(at, hidden.size(), options_.output);
    if (outputs_) text = outputs_->withFinalNames(std::move(text));
    if (taskFile_) text = taskFile_->withFinalNames(std::move(text));
    for (const auto& [name, dump] : dumps_) text = dump->withFinalNames(std::move(text));
    return text;
}

void Job::stopped(Exit signalled) const {
    const bool part = takesOneStream() && taken() > 0;
    throw Failure(signalled,
                  part ? lineOf(Msg::stoppedWithPart, {options_.output}) : lineOf(Msg::stoppedWithNothing));
}

bool Job::failedForMemory(const Runner& runner) const {
    const auto lacked = [](const QvCodec* codec) {
        return codec && codec->errorCode() == QvStatus::outOfMemory;
    };
    if (lacked(pipe_.get()) || lacked(pipe_->getMuxer()) || lacked(pipe_->sink())) return true;
    const auto fileLacked = [](const QvBufStream* file) { return file && file->ioError() == ENOMEM; };
    if (fileLacked(pipe_->sink()->stream())) return true;
    return std::any_of(streams_.begin(), streams_.end(), [&](const JobStream& s) {
        const TransLink* link = runner.getLinkForOutput(s.type, s.encStream);
        return lacked(&s.source->decoder()) || lacked(pipe_->encoder(s.type, s.encStream)) ||
               (link && link->errorCode() == QvStatus::outOfMemory) ||
               fileLacked(pipe_->getMuxer()->stream(s.type, s.encStream));
    });
}

// The reason stands in the object that failed: a decoder, one of the output's members, where the file knows
// what the system said, a filter, or a link.
void Job::fail(Runner& runner, int result) const {
    if (result == QvStatus::outOfMemory || failedForMemory(runner))
        throw failure(Msg::runOutOfMemory, {options_.output});
    for (const auto& source : sources_)
        if (source->decoder().errorCode() < 0 && source->decoder().errorCode() != QvStatus::endOfStream)
            throw failure(Msg::readFailed, {source->name()});
    std::string reason;
    const auto take = [&](const QvCodec* codec) {
        if (reason.empty() && codec && codec->errorCode() != 0) reason = codec->errorDesc();
    };
    for (const JobStream& s : streams_)
        if (const QvBufStream* file = pipe_->getMuxer()->stream(s.type, s.encStream);
            file && file->ioError() != 0) {
            if (stream_ && file->ioError() == EPIPE) throw failure(Msg::streamReaderGone, {stream_->name()});
            throw systemFailure(Msg::outputSystem, outputName(), file->ioError());
        }
    for (const JobStream& s : streams_) take(pipe_->encoder(s.type, s.encStream));
    take(pipe_->getMuxer());
    take(pipe_->sink());
    take(pipe_.get());
    if (!reason.empty() && (outputs_ || stream_)) throw writeFailure(outputName(), withFinalNames(reason));
    if (runner.filterFailure()) throw *runner.filterFailure();
    for (const JobStream& s : streams_)
        if (const TransLink* link = runner.getLinkForOutput(s.type, s.encStream);
            link && link->errorCode() != 0 && link->outProcessed() == 0 && s.own < s.frame)
            throw failure(Msg::inputSoundShort, {s.source->name()});
    reason = runner.reason();
    throw failure(Msg::jobFailed, {outputName(), withFinalNames(reason)});
}

void Job::checkWarnings() const {
    const int count = static_cast<int>(warnings_.size()) + pluginWarnings();
    if (!options_.strict || count == 0) return;
    showWarnings();
    throw failure(Msg::warningsCount, {outputName(), std::to_string(count)});
}

void Job::showWarnings() const {
    if (options_.quiet) return;
    for (const auto& warning : warnings_) tell(Level::warning, warning);
}

void Job::report(const std::vector<std::string>& names) const {
    std::string line = "wrote " + (names.empty() ? "nothing" : inQuotes(names.front()));
    if (names.size() == 2) line += " and " + inQuotes(names[1]);
    if (names.size() > 2) line += " and " + std::to_string(names.size() - 1) + " more files";
    for (const JobStream& s : streams_)
        line += ", " + std::to_string(s.written) + (s.type == 1 ? " frame" : " sample") +
                (s.written == 1 ? "" : "s");
    const std::size_t warnings = warnings_.size() + static_cast<std::size_t>(pluginWarnings());
    if (warnings > 0) line += " (" + std::to_string(warnings) + (warnings == 1 ? " warning)" : " warnings)");
    tell(Level::note, line);
}

void Job::runPost(const std::vector<std::string>& names) const {
    const std::string first = names.empty() ? options_.output : names.front();
    const auto stopWith = [&](Exit signalled, Msg why) { throw Failure(signalled, lineOf(why, {first})); };
    if (const Exit signalled = signals_.received(); signalled != Exit::done)
        stopWith(signalled, Msg::stoppedBeforePost);
    std::string line = postCommand(options_.post, options_.inputs, names);
    // The standard output that has the result, and a stream that has the objects of --progress, get nothing
    // else.
    const int objects = Events::get().descriptor();
    const bool noOutput = objects == 1 || (stream_ && stream_->isStandardOutput()), noErrors = objects == 2;
    if (noOutput || noErrors)
        line.insert(0, noOutput && noErrors ? "exec >/dev/null 2>&1\n"
                       : noOutput           ? "exec 1>&2\n"
                                            : "exec 2>&1\n");
    const auto report = [] { tell(Level::note, lineOf(Msg::postRuns)); };
    ShellCommand command;
    int status = 0;
    {
        const Signals::Watch running(signals_, {.first = [&](int signal) { command.signal(signal); },
                                                .second = [&] { return command.kill(), false; },
                                                .report = report,
                                                .last = Msg::stoppedInPost,
                                                .file = first});
        command.start(line);
        // One that came before there was anybody to pass it on.
        if (const int signal = signals_.number()) command.signal(signal);
        status = command.wait();
    }
    if (const Exit signalled = signals_.received(); signalled != Exit::done)
        stopWith(signalled, Msg::stoppedInPost);
    if (status == 0) return;
    const std::string name = outputName();
    if (status < 0) throw failure(Msg::postNotRun, {name});
    throw failure(Msg::postFailed, {std::to_string(status), name});
}
