// Running a job: the transcoder with its callbacks, what is shown meanwhile, and the checks afterwards.
#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <filesystem>
#include <mutex>

#include "job.h"
#include "keyboard.h"
#include "timespec.h"

namespace fs = std::filesystem;

// The transcoder of a job. Its callbacks run on the engine's worker; the tool waits on its own thread.
class Job::Runner : public QvTranscoder {
  public:
    Runner(Job& job, Progress& progress) : job_(job), progress_(progress) {}
    ~Runner() override { QvTranscoder::stop(); }

    int cbProcess() override {
        if (stop_.load(std::memory_order_relaxed)) return 1;
        if (progress_.due()) progress_.update(state("running"));
        return 0;
    }

    // The counts have to be taken before the links close.
    int cbMuxClose(QvMuxer*) override {
        for (JobStream& stream : job_.streams_)
            if (TransLink* link = getLinkForOutput(stream.type, stream.encStream))
                stream.written = link->outProcessed();
        last_ = state("closing");
        return 0;
    }

    void cbPaused(bool paused) override { progress_.update(state(paused ? "paused" : "running")); }

    void cbDone(int result) override {
        std::lock_guard guard(lock_);
        result_ = result;
        done_ = true;
        changed_.notify_all();
    }

    int wait() {
        std::unique_lock guard(lock_);
        changed_.wait(guard, [this] { return done_; });
        return result_;
    }

    void requestStop() {
        stop_ = true;
        if (isPaused()) unpause();
    }

    void togglePause() { isPaused() ? unpause() : pause(); }

    ProgressState state(const char* name) const {
        ProgressState s;
        s.state = name;
        for (const JobStream& stream : job_.streams_) {
            const TransLink* link = getLinkForOutput(stream.type, stream.encStream);
            if (!link) continue;
            const long long units = std::max(link->outProcessed(), 0LL);
            if (stream.expected > 0)
                s.part = std::min(1.0, static_cast<double>(units) / static_cast<double>(stream.expected));
            const double rate =
                stream.type == 1 ? static_cast<double>(stream.rate.rate()) : stream.samplerate;
            s.outSeconds = static_cast<double>(units) / rate;
            if (stream.type == 1) s.frame = units;
            break;
        }
        return s;
    }
    const ProgressState& last() const { return last_; }

  private:
    Job& job_;
    Progress& progress_;
    ProgressState last_;
    std::atomic<bool> stop_{false};
    std::mutex lock_;
    std::condition_variable changed_;
    bool done_ = false;
    int result_ = 0;
};

void Job::checkSpace() const {
    if (!outputs_) return;
    const long long space = QvFile::freeSpace(Any(outputs_->output().c_str()));
    long long need = 0;
    if (kind_ != OutputKind::pictures)
        for (const JobStream& stream : streams_) need += stream.bytes();
    if (space >= 0 && need > space && fs::is_directory(fs::absolute(outputs_->output()).parent_path()))
        throw Failure(Exit::output, "can't write " + inQuotes(outputs_->output().string()) + ": it needs " +
                                        formatBytes(need) + ", the disk has " + formatBytes(space) + " free");
}

void Job::run() {
    checkSpace();
    Progress progress(options_.quiet ? ProgressMode::off : options_.progress, "");
    Runner runner(*this, progress);
    runner.setEncoder(pipe_.get());
    runner.setParam("startDelay", 0);
    AnyDict off;
    off.set("off", 1);
    runner.setParam("progress", off);
    for (JobStream& s : streams_) {
        ProcessParams params;
        params.setInOutPoints(InOutPoints(s.in, s.out));
        applyFilters(params, s.type);
        if (runner.link(&s.source->decoder(), s.type, s.decStream, s.encStream, params) < 0)
            throw Failure(Exit::failed, runner.errorDesc());
    }
    signals_.watch([&] { runner.requestStop(); },
                   [&] {
                       if (outputs_) outputs_->discard();
                   });
    if (outputs_) pipe_->setFilename(Any(outputs_->begin(primaryExtension()).c_str()));
    progress.start();
    qv_log()->clear();
    int result = runner.transcode(false);
    if (result == QvStatus::ok || result == QvStatus::warning) {
        Keyboard keyboard(progress.onTerminal(), [&] { runner.togglePause(); });
        result = runner.wait();
    }
    signals_.unwatch();
    ProgressState end = runner.last();
    const Exit signalled = signals_.received();
    end.state = signalled != Exit::done ? "stopped" : result == 0 ? "done" : "failed";
    progress.finish(end);
    if (signalled != Exit::done) {
        if (outputs_) outputs_->discard();
        throw Failure(signalled, "stopped; nothing was left behind");
    }
    if (result != 0) fail(runner);
    std::vector<std::string> names;
    checkResult(names);
    if (outputs_) names = outputs_->commit("raw");
    for (const auto& warning : warnings_) std::fprintf(stderr, "tarsel: warning: %s\n", warning.c_str());
    if (options_.quiet) return;
    std::string where = names.empty() ? "nothing" : inQuotes(names.front());
    if (names.size() > 1)
        where += names.size() == 2 ? " and " + inQuotes(names[1])
                                   : " and " + std::to_string(names.size() - 1) + " more files";
    std::fprintf(stderr, "tarsel: wrote %s", where.c_str());
    for (const JobStream& s : streams_)
        std::fprintf(stderr, ", %lld %s", s.written, s.type == 1 ? "frames" : "samples");
    std::fprintf(stderr, "%s\n",
                 warnings_.empty() ? "" : (" (" + std::to_string(warnings_.size()) + " warnings)").c_str());
}

// The reason stands in the object that failed: a decoder, or one of the output's members.
void Job::fail(Runner& runner) const {
    for (const auto& source : sources_)
        if (source->decoder().errorCode() < 0 && source->decoder().errorCode() != QvStatus::endOfStream)
            throw Failure(Exit::input,
                          "can't read " + inQuotes(source->name()) + ": " + source->decoder().errorDesc());
    std::string reason;
    const auto take = [&](const QvCodec* codec) {
        if (reason.empty() && codec && codec->errorCode() != 0) reason = codec->errorDesc();
    };
    AnyVector messages;
    qv_log()->getAll(messages);
    for (int i = 0; i < messages.size() && reason.empty(); ++i)
        if (messages.at(i).asDict().getInt32("type", 0) == 2)
            reason = messages.at(i).asDict().getString("text", "");
    take(pipe_->getMuxer());
    take(pipe_->sink());
    for (const JobStream& s : streams_) take(pipe_->encoder(s.type, s.encStream));
    take(pipe_.get());
    if (reason.empty()) throw Failure(Exit::failed, runner.errorDesc());
    if (outputs_) reason = outputs_->withFinalNames(reason);
    throw Failure(Exit::output,
                  (outputs_ ? "can't write " + inQuotes(outputs_->output().string()) + ": " : "") + reason);
}

// Compares what was written with what the job asked for; an input that ended early is told apart.
void Job::checkResult(const std::vector<std::string>&) const {
    for (const JobStream& s : streams_) {
        if (s.written >= s.expected) continue;
        const char* unit = s.type == 1 ? "frames" : "samples";
        const std::string line = inQuotes(s.source->name()) + " ended early: " + std::to_string(s.written) +
                                 " of " + std::to_string(s.expected) + " " + unit + " were read";
        if (!options_.acceptPartial)
            throw Failure(Exit::input, line + "; --accept-partial keeps what is there");
        warnings_.push_back(line);
    }
    const JobStream* first = &streams_.front();
    if (!outputs_ || kind_ != OutputKind::raw || first->type != 1) return;
    std::error_code error;
    const Any name = pipe_->getMuxer()->QvCodec::getParam("filenames");
    if (!name.isVector() || name.asVector().empty() ||
        !fs::is_regular_file(name.asVector().at(0).asString(), error))
        return;
    const auto bytes = static_cast<long long>(fs::file_size(name.asVector().at(0).asString(), error));
    const long long wanted = first->expected > 0 ? first->bytes() / first->expected * first->written : 0;
    if (bytes != wanted)
        throw Failure(Exit::check, inQuotes(options_.output) + " has " + std::to_string(bytes) +
                                       " bytes instead of " + std::to_string(wanted));
}
