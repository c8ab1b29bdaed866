// A job as a task file.
#include "job.h"

void Job::saveTask() const {
    QvTask task;
    task.setEncoder(pipe_.get());
    for (const JobStream& s : streams_) {
        ProcessParams params;
        params.setInOutPoints(InOutPoints(s.in, s.out));
        applyFilters(params, s.type);
        if (task.link(&s.source->decoder(), s.type, s.decStream, s.encStream, params) < 0)
            throw Failure(Exit::failed, task.errorDesc());
    }
    if (outputs_) pipe_->setFilename(Any(outputs_->output().c_str()));
    AnyDict state;
    task.store(state);
    try {
        if (XmlParser::storeDict(Any(options_.saveTask.c_str()), state, "TranscodeTask", Any("2.0")) ==
            QvStatus::ok)
            return;
    } catch (const QvFileException& error) {
        throw Failure(Exit::output, error.what());
    }
    throw Failure(Exit::output, "can't write the task file " + inQuotes(options_.saveTask));
}
