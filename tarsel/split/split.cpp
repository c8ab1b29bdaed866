#include "tarsel/split/split.h"

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <mutex>
#include <thread>

#include "tarsel/cluster/slurm.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/workfolder.h"
#include "tarsel/job/progress.h"
#include "tarsel/job/warnings.h"
#include "tarsel/split/clusterparts.h"
#include "tarsel/split/localparts.h"
#include "tarsel/split/partjoin.h"
#include "tarsel/split/parttask.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace fs = std::filesystem;

namespace {

constexpr int kLeastParts = 2, kMostParts = 10000;
constexpr double kSoundWeight = 0.03;  // of the sound, relative to the picture
constexpr double kJoinShare = 0.05;    // of joining the parts, as a share of the whole job

class Split : public JobDivision {
  public:
    Split(int parts, SplitPlace place) : wanted_(parts), place_(std::move(place)) {}

    int parts() const override { return wanted_; }
    void plan(const JobPlan& plan) override;
    std::vector<std::string> notes() const override { return notes_; }
    std::string text() const override;
    std::vector<long long> run(const Given& given) override;
    void requestStop() override;
    void pause(bool paused) override;
    ProgressState now() const override;

  private:
    // Ends the parts that still run, also after an exception.
    struct ExecutorEnd {
        explicit ExecutorEnd(Split& of) : split(of) {}
        ~ExecutorEnd() {
            const std::lock_guard guard(split.lock_);
            split.executor_.reset();
        }
        ExecutorEnd(const ExecutorEnd&) = delete;
        ExecutorEnd& operator=(const ExecutorEnd&) = delete;
        Split& split;
    };

    void writeTasks(const Given& given, const fs::path& folder);
    void showProgress(const Given& given);
    std::string inNamesOfJob(const Given& given, std::string text) const;
    std::unique_ptr<PartExecutor> makeExecutor(const Given& given) const;
    std::vector<PartState> runParts(const Given& given);
    PartFiles filesOf(const std::vector<PartState>& states, const std::string& placeholder) const;

    const int wanted_;
    const SplitPlace place_;
    const SlurmScheduler slurm_;
    SplitPlan split_;
    bool sound_ = false;
    std::vector<std::string> notes_;
    std::vector<Part> parts_;               // of the picture, then that of the sound
    std::vector<std::string> partOutputs_;  // names of their files
    std::unique_ptr<PartExecutor> executor_;
    std::mutex lock_;  // protects executor_: requestStop and pause come from other threads
    std::atomic<bool> stop_{false}, paused_{false};
    std::atomic<double> done_{0};
    std::atomic<long long> frames_{0};
    double rate_ = 25;
};

void Split::plan(const JobPlan& plan) {
    if (!plan.hasVideo()) throw failure(Msg::splitNoPicture, {plan.output.name});
    split_ = planSplit(plan, wanted_);
    sound_ = plan.count(qvAudioStream) > 0;
    const PlannedStream& picture = pictureOf(plan);
    rate_ = static_cast<double>(picture.picture.rate.rate());
    notes_.clear();
    if (isFilm(plan) && !isCodedAlone(picture)) notes_.push_back(lineOf(Msg::splitApart, {plan.output.name}));
}

std::string Split::text() const {
    std::string text;
    for (size_t part = 0; part < split_.parts(); ++part)
        text += "part    " + std::to_string(part + 1) + ": frames " + std::to_string(split_.first(part)) +
                " to " + std::to_string(split_.points[part + 1] - 1) + "\n";
    if (sound_) text += "part    " + std::to_string(split_.parts() + 1) + ": the sound\n";
    return text;
}

void Split::writeTasks(const Given& given, const fs::path& folder) {
    const JobPlan& plan = given.parts.plan;
    const std::string stem = fs::path(given.output).stem().string();
    const auto outputOf = [&](const std::string& name, const std::string& end) {
        makeFolder((folder / name).string());
        return partOutputs_.emplace_back((folder / name / stem).string() + end);
    };
    const auto add = [&](const std::string& name, double weight, const AnyDict& task) {
        const std::string file = (folder / (name + ".xml")).string(), reason = writeTask(task, file);
        if (!reason.empty()) throw writeFailure(plan.output.name, given.parts.outputs.withFinalNames(reason));
        parts_.push_back({file, weight});
    };
    parts_.clear();
    partOutputs_.clear();
    const std::string extension = isFilm(plan) ? fs::path(given.output).extension().string()
                                  : plan.output.kind == OutputKind::pictures ? ".png"
                                                                             : ".raw";
    for (size_t part = 0; part < split_.parts(); ++part) {
        const std::string name = std::to_string(part + 1), output = outputOf(name, extension);
        add(name, static_cast<double>(split_.frames(part)),
            pictureTask(given.task, plan, split_, part, output));
    }
    if (!sound_) return;
    const std::string placeholder = (folder / "placeholder.i420").string();
    makeHole(placeholder, placeholderBytes(plan));
    add("sound", static_cast<double>(split_.points.back()) * kSoundWeight,
        soundTask(given.task, plan, placeholder, outputOf("sound", isFilm(plan) ? extension : ".raw")));
}

void Split::showProgress(const Given& given) {
    double whole = 0, done = 0;
    long long frames = 0;
    for (size_t i = 0; i < parts_.size(); ++i) {
        const PartState& state = executor_->states()[i];
        whole += parts_[i].weight;
        done += parts_[i].weight * (state.ended ? 1 : state.done);
        if (i < split_.parts()) frames += state.frames;
    }
    done_ = done / whole * (1 - kJoinShare);
    frames_ = frames;
    if (given.progress.due()) given.progress.update(now());
}

std::unique_ptr<PartExecutor> Split::makeExecutor(const Given& given) const {
    const std::string& output = given.parts.plan.output.name;
    std::vector<std::string> words;
    if (given.options.acceptPartial) words.emplace_back("--accept-partial");
    if (place_.slurm)
        return std::make_unique<ClusterParts>(
            slurm_, ClusterParts::How{words, place_.options, given.options.threads, output});
    const PartShare share = shareOf(parts_.size(), static_cast<int>(std::thread::hardware_concurrency()),
                                    given.options.threads, given.options.processors);
    words.insert(words.end(), {"--no-sync", "--threads", std::to_string(share.threads)});
    return std::make_unique<LocalParts>(share.atOnce, words, output);
}

// What a part says of its own output, as it concerns that of the job.
std::string Split::inNamesOfJob(const Given& given, std::string text) const {
    const std::string& shown = given.parts.plan.output.name;
    for (const std::string& own : partOutputs_)
        for (size_t at = 0; (at = text.find(own, at)) != std::string::npos; at += shown.size())
            text.replace(at, own.size(), shown);
    return given.parts.outputs.withFinalNames(text);
}

// Runs the parts to their end. Returns their final states; nothing if they were stopped.
std::vector<PartState> Split::runParts(const Given& given) {
    {
        const std::lock_guard guard(lock_);
        executor_ = makeExecutor(given);
    }
    const ExecutorEnd ending(*this);
    executor_->begin(parts_);
    if (paused_) executor_->pause(true);
    if (stop_) executor_->cancel();
    while (executor_->wait()) showProgress(given);
    std::vector<PartState> states = executor_->states();
    if (stop_) return {};
    for (const PartState& state : states)
        if (!state.failure.empty())
            throw Failure(static_cast<Exit>(state.status), inNamesOfJob(given, state.failure));
    return states;
}

// `placeholder`: the file of the sound task's picture, which is not used.
PartFiles Split::filesOf(const std::vector<PartState>& states, const std::string& placeholder) const {
    PartFiles files;
    for (size_t part = 0; part < split_.parts(); ++part) {
        files.pictures.push_back({states[part].outputs, split_.lead(part)});
        auto& names = files.pictures.back().files;
        std::sort(names.begin(), names.end());
    }
    if (sound_) files.sounds = states.back().outputs;
    std::erase(files.sounds, placeholder);
    std::sort(files.sounds.begin(), files.sounds.end());
    return files;
}

std::vector<long long> Split::run(const Given& given) {
    const fs::path folder = fs::path(absoluteName(given.output)).parent_path() / WorkFolder::kParts;
    makeFolder(folder.string());
    writeTasks(given, folder);
    std::vector<long long> written;
    const std::vector<PartState> states = runParts(given);
    if (states.empty()) return written;
    for (const PartState& state : states)
        for (const std::string& warning : state.warnings) given.warnings.add(inNamesOfJob(given, warning));
    const std::string placeholder = (folder / "sound" / fs::path(given.output).stem()).string() + ".raw";
    const bool joined = joinParts(given.parts, filesOf(states, placeholder), given.output, [&](double part) {
        done_ = 1 - kJoinShare + kJoinShare * part;
        if (given.progress.due()) given.progress.update(now());
        return !stop_;
    });
    if (!joined) return written;
    removeTree(folder.string());
    for (const PlannedStream& stream : given.parts.plan.streams) written.push_back(stream.expected);
    return written;
}

void Split::requestStop() {
    stop_ = true;
    const std::lock_guard guard(lock_);
    if (executor_) executor_->cancel();
}

void Split::pause(bool paused) {
    paused_ = paused;
    const std::lock_guard guard(lock_);
    if (executor_) executor_->pause(paused);
}

ProgressState Split::now() const {
    ProgressState state;
    state.part = done_;
    state.frame = frames_;
    state.outSeconds = static_cast<double>(frames_) / rate_;
    state.state = paused_ ? "paused" : "running";
    return state;
}

}  // namespace

std::shared_ptr<JobDivision> makeSplit(const std::string& parts, const SplitPlace& place) {
    if (parts.empty()) {
        if (place.slurm) throw failure(Msg::splitSlurmAlone);
        return nullptr;
    }
    // One element is for the sound.
    const int most = place.slurm ? static_cast<int>(SlurmScheduler::kMostElements) - 1 : kMostParts;
    const int count = static_cast<int>(parseNumber(parts, kLeastParts, most, "--split"));
    if (place.slurm) SlurmScheduler().checkOptions(place.options);
    return std::make_shared<Split>(count, place);
}

// Another program may have written any number into the task: an invalid one is ignored, and the job is made
// in one piece.
std::shared_ptr<JobDivision> storedSplit(const StoredTask& task) {
    const int parts = task.raw().getInt32(kSplitKey, 0);
    return parts >= kLeastParts && parts <= kMostParts ? std::make_shared<Split>(parts, SplitPlace())
                                                       : nullptr;
}
