// A task as a stored dictionary, and back.
#pragma once

#include <memory>

#include "core/transcode/task/qvtranscodetask.h"
#include "core/transcode/task/taskcheck_p.h"

namespace qvtaskstore {

void store(const QvTask& task, AnyDict& dict);
// The version and the class are those of a task.
bool isTask(const AnyDict& state);
// An open decoder for an entry of "files", for the caller. Null when it can't be opened, also because its
// settings are of a decoder that is not installed.
QvDecodePipe* openInput(const AnyDict& file, QvFileOpenCb* callback);
// Into a task without links: see QvTask::restore. A fault without a text is one that the task has reported
// itself.
TaskFault restore(QvTask& task, const AnyDict& state, QvDPipeList& decoders, QvEncodePipe** encoderOut,
                  QvFileOpenCb* callback);
// See QvTask::fromStateWithSource.
std::unique_ptr<QvTask> fromTemplate(const AnyDict& state, QvDecodePipe* decoder, int typeMask);

}  // namespace qvtaskstore
