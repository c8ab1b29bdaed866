// Task files of any origin: whether one is sound, and if not, what is wrong at which place.
//
//     const QvTaskFault fault = QvTaskFile::check("job.xml");
//     if (fault.status != 0)
//         printf("job.xml, line %d: %s: %s\n", fault.line, fault.path.c_str(), fault.reason.c_str());
//
// Nothing here throws. QvTask::restore and fromState are for dictionaries that the application itself has
// made: they assert (QvAssertFailure) if it is no valid task. Check files of other origin first, or open them
// with QvTaskFile::open.
#pragma once

#include <string>

#include "core/arch/api.h"
#include "core/decode/qvdpipelist.h"
#include "core/transcode/batch/qvbatchtask.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvEncodePipe;
struct QvFileOpenCb;
class QvTask;

struct QvTaskFault {
    // 0 for a sound file. QvStatus::cannotParse: it can't be opened, or is no XML. invalidStructure: it is no
    // task, or a part is missing or damaged. failed: its output or its inputs can't be made here, as for want
    // of a module. outOfMemory.
    int status = 0;
    std::string path;    // the keys that lead to the element, numbers (from 1) in vectors: "streams/2/type"
    int line = 0;        // of the file, from 1; 0 if unknown
    std::string reason;  // a sentence without its dot; it begins with a small letter
};

class QV_API QvTaskFile {
  public:
    // The document, its values and what a task must hold; then the modules that it names are looked for, and
    // the output is made once, which opens no file. Inputs are not opened.
    static QvTaskFault check(const Any& file) noexcept;
    // The same for a task that is a part of another document, as of a batch list: a dictionary that holds its
    // own "__class__" and "__version__". `line` is 0 always.
    static QvTaskFault check(const AnyDict& state) noexcept;

    // Checks a file and restores its task: the caller owns the task, the pipe and the decoders. A task with
    // one segment that is not disabled is restored as QvTask::fromState does, any other is a QvBatchTask with
    // these options. After a fault the result is null, nothing was made, and `fault`, if given, is the
    // reason.
    static QvTask* open(const Any& file, QvDPipeList& decoders, QvEncodePipe** encoder,
                        QvFileOpenCb* callback = nullptr, QvTaskFault* fault = nullptr,
                        int options = QvBatchTask::skipDisabled | QvBatchTask::everySegmentOpens) noexcept;
};
