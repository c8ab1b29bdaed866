#include "tarsel/job/storedjob.h"

#include "tarsel/host/events.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/job/task/taskfilters.h"
#include "tarsel/job/task/taskplan.h"
#include "tarsel/words/messages.h"

namespace {

bool isNullDevice(const std::string& output) {
    const auto stream = output.empty() ? nullptr : StreamOutput::find(output, {});
    return stream && stream->discards();
}

}  // namespace

void openStoredJob(StoredTask& task, JobOptions& job, bool allowPost) {
    if (job.output.empty()) job.output = task.output();
    checkTaskFilters(task, job.acceptPartial);
    // A multiplexer that goes back to its header can't write there.
    if (isNullDevice(job.output)) task.discardOutput();
    task.open();
    const QvMuxer* const muxer = task.task().encoder()->getMuxer();
    job.kind = taskOutputKind(task);
    job.muxer = muxer ? muxer->name() : "nullmux";
    job.inputs = task.inputs();
    job.splitChannels = job.muxer == "rawmux" && muxer->QvCodec::getParam("splitAudio").isTrue();
    job.post = allowPost ? task.postProcess() : "";
    if (const std::string command = task.postProcess(); !command.empty() && !allowPost)
        tell(Level::warning, lineOf(Msg::taskPostLeft, {task.name(), command}));
    for (const std::string& log : task.qualityLogs())
        job.warnings.push_back(lineOf(Msg::taskLogLeft, {task.name(), log}));
}
