#include "tarsel/job/savedtask.h"

#include <cerrno>
#include <cstring>

#include "tarsel/words/messages.h"

namespace {

// Without it a task gives a file the extension of its kind.
bool keepsExactName(const JobParts& parts, const JobOptions& options, Warnings& warnings) {
    const OutputForm& form = parts.plan.output;
    const std::string stem = QvFile::stripExt(Any(options.output.c_str())).asString(""),
                      kinds = stem + "." + form.extension(parts.plan.hasVideo());
    const bool files =
        form.isFiles() && !form.numbered && (form.kind == OutputKind::raw || form.kind == OutputKind::wav);
    if (!files || kinds == options.output) return false;
    if (parts.plan.streams.size() == 1 && !form.splitChannels) return true;
    if (parts.plan.hasVideo())
        warnings.add(lineOf(Msg::taskNamesOther, {options.saveTask, options.output, kinds}));
    return false;
}

}  // namespace

void saveTask(JobParts& parts, const JobOptions& options, Warnings& warnings, Signals& signals) {
    if (!parts.outputs.hasTask()) return;
    QvTask task;
    task.setEncoder(parts.pipe.get());
    for (const PlannedStream& s : parts.plan.streams)
        if (task.link(&parts.source(s).decoder(), s.type, s.part.stream, s.number, s.params()) < 0)
            throw failure(Msg::taskFailed, {options.saveTask});
    if (const std::string name = parts.outputs.storedName(); !name.empty())
        parts.pipe->setFilename(Any(name.c_str()));
    if (!options.post.empty()) task.setPostprocessCommand(options.post.c_str());
    const bool exact = keepsExactName(parts, options, warnings);
    if (exact) parts.pipe->getMuxer()->setParam("exactName", 1);
    AnyDict state;
    task.store(state);
    if (exact) parts.pipe->getMuxer()->setParam("exactName", 0);
    const Signals::Watch storing(signals, {.first = {}, .second = [&] { return parts.outputs.leave(); }});
    const std::string name = parts.outputs.beginTask();
    std::string reason;
    try {
        errno = 0;
        if (XmlParser::storeDict(Any(name.c_str()), state, "TranscodeTask", Any("2.0")) != QvStatus::ok)
            reason = "the job can't be stored";
    } catch (const QvFileException& error) {
        reason = errno != 0 ? std::string(": ") + std::strerror(errno) : error.what();
    }
    if (!reason.empty()) throw writeFailure(options.saveTask, parts.outputs.withFinalNames(reason));
}
