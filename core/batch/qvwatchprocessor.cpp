#include "core/batch/qvwatchprocessor.h"

#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "core/batch/failuretext_p.h"
#include "core/batch/qvtranscodewatch_p.h"
#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"

namespace {

// Closes and destroys a decoder.
struct CloseDecoder {
    void operator()(QvDecodePipe* decoder) const {
        const std::unique_ptr<QvDecodePipe> owned(decoder);
        try {
            decoder->close();
        } catch (...) {  // its destructor does the rest
        }
    }
};
using OpenDecoder = std::unique_ptr<QvDecodePipe, CloseDecoder>;

OpenDecoder openInput(const Any& file) {
    try {
        return OpenDecoder(QvDecFactory::decodePipe(file));
    } catch (...) {
        qv_log()->error("%s", qvCurrentFailure().text);
        return nullptr;
    }
}

// The next target starts at the beginning again.
void rewind(QvDecodePipe& decoder) {
    for (int k = 0; k < decoder.nrVideoStreams(); ++k)
        if (decoder.isSelected(qvVideoStream, k)) decoder.seekToFrame(0, k);
    for (int k = 0; k < decoder.nrAudioStreams(); ++k)
        if (decoder.isSelected(qvAudioStream, k)) decoder.seekToSample(0, k);
}

// Why the output must not be written; null if it may.
const char* unusable(const Any& output, const Any& input, const std::vector<std::string>& others) {
    if (QvFile::isSameFile(output, input)) return "is the input";
    if (std::find(others.begin(), others.end(), qv_os_name(output)) != others.end())
        return "is the output of another target";
    // There it would be found as a new input, and its own outputs again.
    if (QvFile::isSameFile(QvFile::getPath(output), QvFile::getPath(input)))
        return "would be in the watched folder";
    return nullptr;
}

// An input's name without its folder. A backslash is replaced: the operations on file names take it for a
// separator, so that the output would get the name of another file.
Any nameToMake(const Any& file) {
    const std::string path = qv_os_name(file);
    std::string name = path.substr(path.rfind('/') + 1);
    std::replace(name.begin(), name.end(), '\\', '_');
    return qv_any_name(name, file);
}

}  // namespace

int QvWatchProcessor::process(QvWatchFolderInput& input, const QvWatchTask& task, int) {
    if (const int result = task.createOutputFolders(); result != QvStatus::ok) return result;
    int good = 0, bad = 0;
    while (input.nrFiles() > 0) {
        qv_log()->info("%d files in que for processing", input.nrFiles());
        const Any file = input.nextFile();
        const std::string name = qv_os_name(file);
        qv_log()->info("Transcoding %s", name.c_str());
        if (const OpenDecoder decoder = openInput(file)) {
            std::vector<std::string> outputs;
            for (int target = 0; target < task.nrTargets(); ++target)
                ++(_tryTarget(*decoder, task, target, file, outputs) == QvStatus::ok ? good : bad);
        } else {
            qv_log()->error("Failed to open %s", name.c_str());
            bad += task.nrTargets();
        }
        input.fileProcessed();
    }
    qv_log()->info("Watch folder processing finished, transcoded %d files, failed %d files", good, bad);
    return bad == 0 ? QvStatus::ok : QvStatus::failed;
}

int QvWatchProcessor::nameOutput(QvEncodePipe& pipe, const QvWatchTask& task, int target,
                                 const Any& inputFile) {
    Any extension;
    pipe.getParam("extension", extension);
    return pipe.setFilename(task.outputFilename(target, nameToMake(inputFile), extension.asString("")));
}

// An exception fails this target only; the next one still starts at the beginning.
int QvWatchProcessor::_tryTarget(QvDecodePipe& decoder, const QvWatchTask& task, int target,
                                 const Any& inputFile, std::vector<std::string>& outputs) {
    try {
        return _transcodeTarget(decoder, task, target, inputFile, outputs);
    } catch (...) {
        const FailureText failure = qvCurrentFailure();
        qv_log()->error("    Transcoding error: %s", failure.text);
        try {
            if (target + 1 < task.nrTargets()) rewind(decoder);
        } catch (...) {  // the next target reports it
        }
        return failure.code;
    }
}

int QvWatchProcessor::_transcodeTarget(QvDecodePipe& decoder, const QvWatchTask& task, int target,
                                       const Any& inputFile, std::vector<std::string>& outputs) {
    const std::unique_ptr<QvEncodePipe> pipe(task.createEncoder(target, &decoder));
    if (!pipe) {
        qv_log()->error("    Failed to create encoder instance");
        return QvStatus::notCreated;
    }
    if (nameOutput(*pipe, task, target, inputFile) != QvStatus::ok) {
        qv_log()->error("    Failed to name the output: %s", pipe->errorDesc());
        return QvStatus::failed;
    }
    const Any output = pipe->getFilename();
    const std::string name = qv_os_name(output);
    qv_log()->info("   ->%s", name.c_str());
    qv_log()->info("    preset:");
    if (const char* reason = unusable(output, inputFile, outputs)) {
        qv_log()->error("    %s %s", name.c_str(), reason);
        return QvStatus::invalidArgument;
    }
    outputs.push_back(name);
    const auto transcoder = QvTranscodeWatch::create(*this, decoder, *pipe);
    if (!transcoder) {
        qv_log()->error("    Failed to create transcoder instance");
        return QvStatus::notCreated;
    }
    QvTimer timer;
    const int result = transcoder->transcode(true);
    const double seconds = timer.stop();
    if (target + 1 < task.nrTargets()) rewind(decoder);
    if (result == QvStatus::ok)
        qv_log()->info("    Done in %dsec.", static_cast<int>(seconds));
    else
        qv_log()->error("    Transcoding error");
    return result;
}
