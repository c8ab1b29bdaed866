// A job as a task file.
#include <cerrno>
#include <cstring>

#include "tarsel/job/job.h"
#include "tarsel/words/messages.h"

void Job::saveTask() {
    taskFile_ = std::make_unique<Outputs>(options_.saveTask, "--save-task", options_.inputs, options_.policy);
    if (outputs_ && taskFile_->output() == outputs_->output())
        throw failure(Msg::outputIsOutput, {options_.saveTask});
    QvTask task;
    task.setEncoder(pipe_.get());
    for (const JobStream& s : streams_)
        if (task.link(&s.source->decoder(), s.type, s.decStream, s.encStream, s.params) < 0)
            throw failure(Msg::taskFailed, {options_.saveTask});
    if (outputs_) pipe_->setFilename(Any(outputs_->output().c_str()));
    if (stream_) pipe_->setFilename(Any(stream_->engineName().c_str()));
    if (!options_.post.empty()) task.setPostprocessCommand(options_.post.c_str());
    AnyDict state;
    task.store(state);
    const std::string name = taskFile_->begin("xml");
    std::string reason;
    try {
        errno = 0;
        if (XmlParser::storeDict(Any(name.c_str()), state, "TranscodeTask", Any("2.0")) != QvStatus::ok)
            reason = "the job can't be stored";
    } catch (const QvFileException& error) {
        reason = errno != 0 ? std::string(": ") + std::strerror(errno) : error.what();
    }
    if (!reason.empty()) throw writeFailure(options_.saveTask, reason);
    taskFile_->commit("xml");
}
