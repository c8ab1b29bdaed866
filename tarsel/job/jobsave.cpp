// A job as a task file.
#include "tarsel/job/job.h"

void Job::saveTask() {
    taskFile_ = std::make_unique<Outputs>(options_.saveTask, "--save-task", options_.inputs, options_.policy);
    if (outputs_ && taskFile_->output() == outputs_->output())
        throw Failure(Exit::output, "can't write " + inQuotes(options_.saveTask) + ": it is also the output");
    QvTask task;
    task.setEncoder(pipe_.get());
    for (const JobStream& s : streams_)
        if (task.link(&s.source->decoder(), s.type, s.decStream, s.encStream, s.params) < 0)
            throw Failure(Exit::failed, inLine(task.errorDesc()));
    if (outputs_) pipe_->setFilename(Any(outputs_->output().c_str()));
    if (stream_) pipe_->setFilename(Any(stream_->engineName().c_str()));
    if (!options_.post.empty()) task.setPostprocessCommand(options_.post.c_str());
    AnyDict state;
    task.store(state);
    const std::string name = taskFile_->begin("xml");
    std::string reason;
    try {
        if (XmlParser::storeDict(Any(name.c_str()), state, "TranscodeTask", Any("2.0")) != QvStatus::ok)
            reason = "the file can't be written";
    } catch (const QvFileException& error) {
        reason = taskFile_->withFinalNames(error.what());
    }
    if (!reason.empty())
        throw Failure(Exit::output,
                      "can't write the task file " + inQuotes(options_.saveTask) + ": " + inLine(reason));
    taskFile_->commit("xml");
}
