#include "tarsel/batch/taskstate.h"

#include <string_view>

#include "tarsel/host/events.h"
#include "tarsel/words/messages.h"

namespace {

TaskState stateOf(const BatchFile& file, const BatchTask& task) {
    using Step = TaskRecord::Step;
    const std::string journal = file.journal(task.id);
    TaskState state{"waiting", TaskRecord::read(journal)};
    const Step last = state.record.last;
    if (last != Step::none && RecordFile::isLocked(journal))
        state.name = "running";
    else if (!task.enabled)
        state.name = "disabled";
    else if (state.record.isDone(keyOf(task), false))
        state.name = "done";
    else if (last == Step::done)
        state.name = "changed";
    else if (last == Step::failed)
        state.name = "failed";
    else if (last != Step::none)
        state.name = "interrupted";
    return state;
}

}  // namespace

TaskStates::TaskStates(const BatchFile& file, const Scheduler& scheduler)
    : file_(file), scheduler_(scheduler), submissions_(file.queue()) {
    if (submissions_.arrays().empty()) return;
    std::vector<ClusterElement> elements;
    try {
        elements = scheduler_.elements(submissions_.names());
        answered_ = true;
    } catch (const Failure& failed) {
        tell(Level::warning, lineOf(Msg::schedulerSilent, {file.shown(), failed.what()}));
    }
    queue_ = ClusterQueue(submissions_, elements);
}

// The journal knows best what has begun since the task was submitted.
TaskState TaskStates::of(const BatchTask& task) const {
    TaskState state = stateOf(file_, task);
    const ClusterQueue::Place* place = placeOf(task);
    for (const char* final : {"done", "disabled", "running"})
        if (state.name == std::string_view(final)) place = nullptr;
    if (!place) return state;
    if (place->active)
        state.name = place->pending ? "queued" : "running";
    else if (state.record.start < place->time)
        state.name = answered_ ? "lost" : "submitted";
    return state;
}

std::string TaskStates::jobOf(const BatchTask& task) const {
    const ClusterQueue::Place* place = placeOf(task);
    return place && place->active ? place->job + "_" + std::to_string(place->index) : "";
}

std::string TaskStates::endOf(const BatchTask& task, const TaskState& state) {
    const ClusterQueue::Place* place = placeOf(task);
    if (!place || state.name != std::string_view("lost")) return "";
    if (!ends_) ends_ = scheduler_.ends(submissions_.names());
    const auto found = ends_->find({place->array, place->index});
    return found != ends_->end() ? found->second : "";
}

const ClusterQueue::Place* TaskStates::placeOf(const BatchTask& task) const {
    const auto found = queue_.tasks.find(task.id);
    return found != queue_.tasks.end() ? &found->second : nullptr;
}
