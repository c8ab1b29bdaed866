#include "tarsel/batch/taskrun.h"

#include <filesystem>
#include <memory>
#include <new>
#include <set>

#include "tarsel/batch/journal.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/recovery.h"
#include "tarsel/job/job.h"
#include "tarsel/job/storedjob.h"
#include "tarsel/job/task/taskfiles.h"
#include "tarsel/split/split.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

// A set that was being placed when its run was ended is completed or taken back.
void recoverAround(const TaskRecord& record, const OutputPolicy& policy) {
    std::set<std::string> folders;
    for (const RecordedFile& file : record.files)
        folders.insert(fs::path(resolvedName(file.name)).parent_path().string());
    for (const std::string& folder : folders)
        recoverPlace(folder, {.stale = policy.stale, .sync = policy.sync});
}

// What happened is said in any case; that it could not be noted changes nothing.
template <class Note>
void noteIfPossible(const std::string& name, Note note) {
    try {
        note();
    } catch (const Failure& failed) {
        tell(Level::warning, lineOf(Msg::batchNotNoted, {name, failed.what()}));
    }
}

}  // namespace

std::string shownTask(const BatchFile& file, const BatchTask& task) {
    return file.shown() + " (task " + std::to_string(task.number) + ")";
}

void requireSound(const BatchTask& task, const std::string& shown) {
    if (!task.fault.empty()) throw failure(Msg::batchTaskDamaged, {shown, task.fault});
    if (!task.isPlanned()) return;
    const QvTaskFault fault = QvTaskFile::check(task.state);
    if (fault.status == QvStatus::outOfMemory) throw std::bad_alloc();
    if (fault.status == QvStatus::ok) return;
    const Msg kind = fault.status == QvStatus::failed ? Msg::batchTaskLacks : Msg::batchTaskDamaged;
    throw failure(kind, {shown, fault.path.empty() ? fault.reason : fault.path + ": " + fault.reason});
}

void requireFonts(const AnyDict& state, const std::string& shown) {
    const char* family = state.getString("font_family");
    if (family && *family && !qv_registry()->hasFontFamily(family))
        throw failure(Msg::batchTaskLacks, {shown, "there is no font '" + std::string(family) + "' here"});
    const auto look = [&](const Any& value) {
        if (value.isDict()) requireFonts(value.asDict(), shown);
        if (!value.isVector()) return;
        for (const Any& one : value.asVector())
            if (one.isDict()) requireFonts(one.asDict(), shown);
    };
    for (auto [key, value] : state) look(*value);
}

void tidyAfter(const BatchTask& task, const OutputPolicy& policy) {
    if (task.output.empty()) return;
    const std::string folder = fs::path(resolvedName(task.output)).parent_path().string();
    recoverPlace(folder, {.stale = policy.stale, .sync = policy.sync});
}

void TaskRun::carryOut(const BatchFile& file, const BatchTask& task, const OutputPolicy& policy,
                       Signals& signals) const {
    const std::string shown = shownTask(file, task);
    JobOptions options = job;
    options.policy = policy;
    if (!task.isPlanned()) {
        enterFolder(task.folder);
        plan(task.words, options);
        if (!options.post.empty() && !allowPost) {
            tell(Level::warning, lineOf(Msg::taskPostLeft, {shown, options.post}));
            options.post.clear();
        }
        return runJob(options, [&] { return std::make_unique<Job>(options, signals); });
    }
    requireSound(task, shown);
    AnyDict state = task.state;
    const std::vector<std::string> logs = takeQualityLogs(state);
    runJob(options, [&] {
        JobOptions one = options;
        for (const std::string& log : logs) one.warnings.push_back(lineOf(Msg::taskLogLeft, {shown, log}));
        auto stored = std::make_unique<StoredTask>(state, shown);
        openStoredJob(*stored, one, allowPost);
        one.division = storedSplit(*stored);
        return std::make_unique<Job>(one, std::move(stored), signals);
    });
}

void TaskRun::run(const BatchFile& file, const BatchTask& task, Signals& signals) const {
    const std::string name = file.journal(task.id);
    const std::string key = keyOf(task);
    TaskJournal journal(name, key);
    if (!journal.tryLock()) {
        const TaskRecord other = TaskRecord::read(name);
        tell(Level::note,
             lineOf(Msg::batchTaskElsewhere, {shownTask(file, task), std::to_string(other.pid), other.host}));
        journal.lock();
    }
    const TaskRecord record = TaskRecord::read(name);
    if (record.isDone(key, verify)) {
        if (!job.quiet) tell(Level::note, shownTask(file, task) + " is done already");
        return;
    }
    if (record.last == TaskRecord::Step::placing && record.key == key) {
        recoverAround(record, job.policy);
        if (!record.files.empty() && record.stands(true)) return journal.settled(record.files);
    }
    journal.started();
    OutputPolicy policy = job.policy;
    policy.placing = [&](const std::vector<PlacedFile>& files) { journal.placing(files); };
    try {
        if (ready) ready();
        carryOut(file, task, policy, signals);
    } catch (const Failure& failed) {
        // What -n keeps is not this task's work.
        if (failed.exit() != Exit::done)
            noteIfPossible(name, [&] { journal.failed(static_cast<int>(failed.exit()), failed.what()); });
        throw;
    } catch (...) {
        noteIfPossible(name, [&] { journal.failed(static_cast<int>(Exit::failed), ""); });
        throw;
    }
    noteIfPossible(name, [&] { journal.done(); });
}
