// A job as a task file.
#include <cerrno>
#include <cstring>

#include "tarsel/job/job.h"
#include "tarsel/words/messages.h"

void Job::storeTask() {
    if (!taskFile_ && !taskStream_) return;
    QvTask task;
    task.setEncoder(pipe_.get());
    for (const JobStream& s : streams_)
        if (task.link(&s.source->decoder(), s.type, s.decStream, s.encStream, s.params) < 0)
            throw failure(Msg::taskFailed, {options_.saveTask});
    if (outputs_) pipe_->setFilename(Any(outputs_->output().c_str()));
    if (stream_) pipe_->setFilename(Any(stream_->engineName().c_str()));
    if (!options_.post.empty()) task.setPostprocessCommand(options_.post.c_str());
    // Without it a task gives a file the extension of its kind.
    const std::string stem = QvFile::stripExt(Any(options_.output.c_str())).asString(""),
                      kinds = stem + "." + primaryExtension();
    const bool files = outputs_ && !numbered_ && (kind_ == OutputKind::raw || kind_ == OutputKind::wav);
    const bool differs = files && kinds != options_.output;
    const bool exact = differs && streams_.size() == 1 && !options_.splitChannels;
    if (differs && hasVideo() && !exact)
        warnings_.push_back(lineOf(Msg::taskNamesOther, {options_.saveTask, options_.output, kinds}));
    if (exact) pipe_->getMuxer()->setParam("exactName", 1);
    AnyDict state;
    task.store(state);
    if (exact) pipe_->getMuxer()->setParam("exactName", 0);
    // A stream may wait for its reader, which the first signal ends.
    const Signals::Watch storing(signals_, {.first = {}, .second = [&] { return files_->leave(); }});
    // The engine has a name for the standard output, which it writes where it stands.
    const std::string name = taskFile_                         ? taskFile_->begin("xml")
                             : taskStream_->isStandardOutput() ? "stdout"
                                                               : taskStream_->engineName();
    std::string reason;
    try {
        errno = 0;
        if (XmlParser::storeDict(Any(name.c_str()), state, "TranscodeTask", Any("2.0")) != QvStatus::ok)
            reason = "the job can't be stored";
    } catch (const QvFileException& error) {
        reason = errno != 0 ? std::string(": ") + std::strerror(errno) : error.what();
    }
    if (!reason.empty()) throw writeFailure(options_.saveTask, withFinalNames(reason));
}
