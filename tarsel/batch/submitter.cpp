#include "tarsel/batch/submitter.h"

#include <qvplugcore/qvplugcore.h>

#include "tarsel/batch/journal.h"
#include "tarsel/batch/snapshot.h"
#include "tarsel/host/childprocess.h"
#include "tarsel/host/clock.h"
#include "tarsel/host/command.h"
#include "tarsel/host/files.h"
#include "tarsel/host/filestamp.h"
#include "tarsel/host/outputs/owner.h"
#include "tarsel/words/messages.h"

namespace {

constexpr size_t kNameDigits = 16;  // of an array
// So long are cancelled elements waited for: Slurm kills them after 30 s, where a site has set nothing else.
constexpr int kEndTries = 80;
constexpr int kEndPause = 500;  // ms between two questions

}  // namespace

Submitter::Submitter(const BatchFile& file, const Scheduler& scheduler, const SubmitOptions& options)
    : file_(file), scheduler_(scheduler), options_(options), submissions_(file.queue()) {}

void Submitter::submit() {
    scheduler_.checkOptions(options_.options);
    list_ = file_.load();
    tasks_ = file_.tasksOf(list_);
    if (tasks_.empty()) throw failure(Msg::batchEmpty, {file_.shown()});
    // Neither another submission nor a run of the list changes meanwhile what is left to do.
    const NamedLock lock(file_.runLock(), file_.shown());
    submissions_ = Submissions(file_.queue());
    queue_ = ClusterQueue(submissions_, scheduler_.elements(submissions_.names()));
    forgetEnded();
    order_ = orderOf(tasks_);
    for (const TaskArray& array : arraysOf(places(), order_, options_.arraySize)) {
        try {
            jobs_.push_back(submitArray(array));
        } catch (const Failure& failed) {
            if (submitted_ == 0) throw;
            throw failure(Msg::schedulerPartly,
                          {file_.shown(), std::to_string(submitted_), std::to_string(due_), failed.what()});
        }
        submitted_ += array.tasks.size();
    }
}

// What an array printed is of use until its tasks are submitted again.
void Submitter::forgetEnded() {
    const std::vector<std::string> living = queue_.activeArrays();
    const std::set<std::string> kept(living.begin(), living.end());
    for (const std::string& name : submissions_.names())
        if (!kept.count(name)) removeFiles(name);
    submissions_.keep(living);
}

void Submitter::removeFiles(const std::string& array) const {
    removeFile(file_.elementOutput(array));
    removeFile(file_.elementTasks(array));
}

std::vector<TaskPlace> Submitter::places() {
    std::vector<TaskPlace> places(tasks_.size());
    std::set<std::string> names;
    for (size_t i = 0; i < tasks_.size(); ++i) {
        const BatchTask& task = tasks_[i];
        const std::string journal = file_.journal(task.id);
        if (!task.enabled || !names.insert(task.id).second) continue;
        if (queue_.isActive(task.id)) {
            places[i].job = queue_.tasks.at(task.id).job;
            ++living_;
        } else if (RecordFile::isLocked(journal)) {
            ++living_;
        } else if (TaskRecord::read(journal).isDone(keyOf(task), options_.verify)) {
            ++done_;
        } else {
            places[i].due = true;
            ++due_;
        }
    }
    return places;
}

std::string Submitter::newName() {
    const std::string seed = file_.name() + "\n" + std::to_string(secondsSince1970()) + "\n" +
                             std::to_string(++count_) + "\n" + Owner::self().text();
    return "tarsel-" + digestOfText(seed).substr(0, kNameDigits);
}

std::string Submitter::submitArray(const TaskArray& array) {
    ClusterArray wanted;
    wanted.name = newName();
    ElementScript script;
    Snapshot snapshot;
    for (const size_t task : array.tasks) {
        std::vector<size_t> makers;
        for (const Before& before : order_[task])
            if (before.gives) makers.push_back(before.task);
        script.tasks.push_back(tasks_[task].id);
        script.places.push_back(snapshot.add(list_, task, makers));
    }
    script.snapshot = file_.elementTasks(wanted.name);
    script.words = {ownProgram()};
    script.words.insert(script.words.end(), options_.command.begin(), options_.command.end());
    script.log = options_.log;
    script.index = scheduler_.indexWord();
    script.cores = scheduler_.coresWord();
    script.mostCores = kQvMostThreads;
    wanted.script = script.text();
    wanted.size = array.tasks.size();
    wanted.atOnce = options_.atOnce;
    for (const size_t earlier : array.after) wanted.after.push_back(jobs_.at(earlier));
    wanted.after.insert(wanted.after.end(), array.jobs.begin(), array.jobs.end());
    wanted.output = file_.elementOutput(wanted.name);
    wanted.options = options_.options;
    const std::vector<std::string> before = submissions_.names();
    submissions_.add({wanted.name, secondsSince1970(), script.tasks});
    try {
        snapshot.write(script.snapshot);
        return scheduler_.submit(wanted);
    } catch (const Failure&) {
        // One that did not answer in time may have taken it.
        if (isUnknown(wanted.name)) forget(wanted.name, before);
        throw;
    }
}

// On a disk that is full the files make room; if it still is, the next submission forgets the array.
void Submitter::forget(const std::string& array, const std::vector<std::string>& others) {
    removeFiles(array);
    try {
        submissions_.keep(others);
    } catch (const Failure&) {
    }
}

bool Submitter::isUnknown(const std::string& name) const {
    try {
        return scheduler_.elements({name}).empty();
    } catch (const Failure& failed) {
        return failed.exit() == Exit::module;  // there is no scheduler
    }
}

CancelledJobs cancelSubmitted(const BatchFile& file, const Scheduler& scheduler) {
    requireFile(file.name());
    const Submissions submissions(file.queue());
    const std::vector<std::string> names = submissions.names();
    std::vector<ClusterElement> elements = scheduler.elements(names);
    CancelledJobs cancelled;
    cancelled.jobs = ClusterQueue(submissions, elements).jobs();
    scheduler.cancel(cancelled.jobs);
    // Those that run clean up first. Only then does a submission take them.
    for (int tries = 0; !cancelled.jobs.empty(); ++tries) {
        elements = scheduler.elements(names);
        if (elements.empty() || tries == kEndTries) break;
        waitForAny({}, kEndPause);
    }
    cancelled.left = cancelled.jobs.empty() ? 0 : elements.size();
    return cancelled;
}
