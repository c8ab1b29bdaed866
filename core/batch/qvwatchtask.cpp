#include "core/batch/qvwatchtask.h"

#include <algorithm>
#include <memory>
#include <string>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/status.h"

namespace {

// A preset's name as the name of one folder.
std::string folderName(const QvPreset& preset) {
    std::string name = preset.name() ? preset.name() : "";
    std::replace_if(
        name.begin(), name.end(), [](char c) { return c == '/' || c == '\\'; }, '_');
    return name == "." || name == ".." ? "_" + name : name;
}

const AnyDict& targetOf(const QvWatchTask& task, int target) {
    QV_ASSERT_MSG(target >= 0 && target < task.nrTargets(), "Invalid list index");
    const Any& preset = task.at(target);
    return preset.isDict() ? preset.asDict().getDict("__target__") : AnyDict::null();
}

// The standard that a target asks for, where the preset leaves it open and the encoder knows both.
void setStandard(QvEncodePipe& pipe, const QvPreset& preset, const Any& standard) {
    const QvCodec* const encoder = pipe.videoEncoder(0);
    if (preset.isCustom() || !standard.isInt32() || !encoder) return;
    const Any known = encoder->getParam("palRange"), current = encoder->getParam("pal");
    const AnyVector allowed = known.isVector() ? known.asVector() : AnyVector(0, 1);
    if (current == standard || !allowed.contains(standard)) return;
    if (qvSetOptionalParam(pipe, "pal", standard) == QvStatus::ok)
        qv_log()->info("setting %s mode", standard.isTrue() ? "PAL" : "NTSC");
}

bool addStreams(QvEncodePipe& pipe, int type, int count, const char* failure) {
    for (int i = 0; i < count; ++i)
        if (pipe.addStream(type, Any()) < 0) {
            qv_log()->error(failure, i);
            return false;
        }
    return true;
}

}  // namespace

QvWatchTask::QvWatchTask(const QvPresetList& presets) : QvPresetList(presets) {}

Any QvWatchTask::_targetFolder(int target) const {
    const AnyDict& settings = targetOf(*this, target);
    const Any& folder = settings.get("outputFolder");
    if (!folder.isText() || qv_os_name(folder).empty()) return Any();  // not where the process happens to be
    if (settings.get("presetSubfolder").isFalse()) return folder;
    return QvFile::joinPath(folder, Any(folderName(preset(target)).c_str()));
}

int QvWatchTask::createOutputFolders() const {
    for (int i = 0; i < nrTargets(); ++i) {
        const Any folder = _targetFolder(i);
        const std::string name = qv_os_name(folder);
        if (QvFile::isDir(folder)) {
            qv_log()->info("Checking output folder %s, already exists OK.", name.c_str());
            continue;
        }
        qv_log()->info("Creating output folder %s.", name.c_str());
        if (!folder.isText() || QvFile::mkpath(folder) != 0) {
            qv_log()->error("Can not create folder %s", name.c_str());
            return QvStatus::failed;
        }
        qv_log()->info("OK");
    }
    return QvStatus::ok;
}

Any QvWatchTask::outputFilename(int target, const Any& inputFile, const char* extension) const {
    return QvFile::joinPath(_targetFolder(target),
                            QvFile::changeExt(QvFile::getFilename(inputFile), Any(extension)));
}

QvEncodePipe* QvWatchTask::createEncoder(int target, QvDecodePipe* decoder) const {
    QV_ASSERT(decoder);
    const AnyDict& settings = targetOf(*this, target);
    const QvPreset wanted = preset(target);
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    if (!pipe || pipe->applyPreset(wanted, 0) != QvStatus::ok) {
        qv_log()->error("Failed to crerate encode pipe for preset %s", wanted.name());
        return nullptr;
    }
    const int video = std::max(0, std::min(decoder->nrVideoStreams(), pipe->maxStreams(qvVideoStream)));
    const int audio = std::max(0, std::min(decoder->nrAudioStreams(), pipe->maxStreams(qvAudioStream)));
    // The preset has come with streams of its own; those that are added have its settings again.
    pipe->clearStreams();
    if (!addStreams(*pipe, qvVideoStream, video, "Failed to add video stream %d") ||
        !addStreams(*pipe, qvAudioStream, audio, "Failed to add audio stream %d"))
        return nullptr;
    qv_log()->info("%d video streams, %d audio streams.", video, audio);
    setStandard(*pipe, wanted, settings.get("pal"));
    return pipe.release();
}
