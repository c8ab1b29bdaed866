#include "tarsel/job/savedtask.h"

#include <cerrno>
#include <cstring>

#include "tarsel/words/messages.h"

void saveTask(JobParts& parts, const JobOptions& options, Signals& signals) {
    if (!parts.outputs.hasTask()) return;
    QvTask task;
    task.setEncoder(parts.pipe.get());
    for (const PlannedStream& s : parts.plan.streams)
        if (task.link(&parts.source(s).decoder(), s.type, s.part.stream, s.number, s.params()) < 0)
            throw failure(Msg::taskFailed, {options.saveTask});
    if (const std::string name = parts.outputs.storedName(); !name.empty())
        parts.pipe->setFilename(Any(name.c_str()));
    if (!options.post.empty()) task.setPostprocessCommand(options.post.c_str());
    AnyDict state;
    task.store(state);
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
