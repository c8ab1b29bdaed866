// Transcodes the files that a watch folder has found, each to all targets of a task, on the caller's thread.
// It takes them off the input in any case, so that a file that fails is not tried again.
//
//     QvWatchFolderInput input;
//     QvWatchProcessor processor;
//     input.open("/in", QvWatchFolderInput::keep);
//     processor.process(input, QvWatchTask(presets));  // what happens is in qv_log()
#pragma once

#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/batch/qvwatchfolderinput.h"
#include "core/batch/qvwatchtask.h"

class QvTranscoder;

class QV_API QvWatchProcessor {
  public:
    virtual ~QvWatchProcessor() = default;

    // Runs until the input has no more files. `flags` is not used. 0 if every target of every file was
    // made; -1 if one failed, or could not be begun as its folder can't be made. A target whose output would
    // be the input itself, in the watched folder, or that of another target of the file, fails; an older file
    // of that name is replaced.
    int process(QvWatchFolderInput& input, const QvWatchTask& task, int flags = 0);

  protected:
    // Gives a new pipe its output name before it is used: by QvWatchTask::outputFilename, unless overridden.
    virtual int nameOutput(QvEncodePipe& pipe, const QvWatchTask& task, int target, const Any& inputFile);

  private:
    int _tryTarget(QvDecodePipe& decoder, const QvWatchTask& task, int target, const Any& inputFile,
                   std::vector<std::string>& outputs);
    int _transcodeTarget(QvDecodePipe& decoder, const QvWatchTask& task, int target, const Any& inputFile,
                         std::vector<std::string>& outputs);
};
