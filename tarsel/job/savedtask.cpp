#include "tarsel/job/savedtask.h"

#include <filesystem>

#include "tarsel/job/task/storedtask.h"
#include "tarsel/job/task/taskfiles.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/xmlnames.h"

namespace fs = std::filesystem;

namespace {

// An application that runs the task would otherwise get the extension of its kind.
bool keepsExactName(const JobParts& parts, const JobOptions& options) {
    const OutputForm& form = parts.plan.output;
    const bool file =
        form.isFiles() && !form.numbered && (form.kind == OutputKind::raw || form.kind == OutputKind::wav);
    const std::string stem = QvFile::stripExt(Any(options.output.c_str())).asString("");
    return file && parts.plan.streams.size() == 1 && !form.splitChannels &&
           options.output != stem + "." + form.extension(parts.plan.hasVideo());
}

AnyDict newState(const JobParts& parts, const JobOptions& options) {
    QvTask task;
    task.setEncoder(parts.pipe.get());
    for (const PlannedStream& s : parts.plan.streams)
        if (task.link(&parts.source(s).decoder(), s.type, s.part.stream, s.number, s.params()) < 0)
            throw failure(Msg::taskFailed, {options.saveTask});
    if (const std::string name = parts.outputs.storedName(); !name.empty())
        parts.pipe->setFilename(Any(name.c_str()));
    const bool exact = keepsExactName(parts, options);
    if (exact) parts.pipe->getMuxer()->setParam("exactName", 1);
    AnyDict state;
    task.store(state);
    if (exact) parts.pipe->getMuxer()->setParam("exactName", 0);
    return state;
}

// A task has to find its files again.
void requireNames(const AnyDict& state, const JobOptions& options) {
    const std::string place = options.saveTask.empty() ? "the task" : options.saveTask;
    AnyDict looked = state;
    changeTaskFiles(looked, [&](const std::string& name, TaskFileUse) {
        if (!xmlKeeps(name)) throw failure(Msg::xmlNameLost, {place, name});
        return name;
    });
    if (!xmlKeeps(options.post)) throw failure(Msg::xmlNameLost, {place, options.post});
}

}  // namespace

AnyDict storedState(JobParts& parts, const JobOptions& options) {
    AnyDict state =
        parts.stored ? static_cast<const AnyDict&>(parts.stored->state()) : newState(parts, options);
    if (!options.post.empty()) state.set("postProcess", options.post.c_str());
    state.remove(kSplitKey);
    if (options.division) state.set(kSplitKey, options.division->parts());
    makeAbsolute(state);
    requireNames(state, options);
    return state;
}

void saveTask(JobParts& parts, const JobOptions& options, Signals& signals) {
    if (!parts.outputs.hasTask()) return;
    AnyDict state = storedState(parts, options);
    const Signals::Watch storing(signals, {.first = {}, .second = [&] { return parts.outputs.leave(); }});
    if (options.relative) makeRelative(state, fs::path(options.saveTask).parent_path().string());
    const std::string reason = writeTask(state, parts.outputs.beginTask());
    if (!reason.empty()) throw writeFailure(options.saveTask, parts.outputs.withFinalNames(reason));
}
