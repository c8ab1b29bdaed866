#include "core/batch/qvwatchfolderinput.h"

#include <string>
#include <vector>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreads.h"

namespace {

constexpr int settleTime = 2000;  // milliseconds

std::string shown(const Any& name) { return qv_os_name(name); }

// The name without the folder. Only '/' separates: separators and drive letters of other systems are a part
// of the name.
Any nameOf(const Any& path) {
    const std::string all = qv_os_name(path);
    return qv_any_name(all.substr(all.rfind('/') + 1), path);
}

Any inFolder(const Any& folder, const Any& name) {
    std::string path = qv_os_name(folder);
    if (!path.ends_with('/')) path += '/';
    return qv_any_name(path + qv_os_name(name), folder);
}

// The key of a name in the dictionaries.
std::string keyOf(const Any& name) {
    constexpr int maxChars = 32;
    return QvUtil::md5Digest(name, maxChars).asString("");
}

// Pipes and devices are never complete, and opening one can block.
bool isRegular(const Any& path) {
    QvFileStatus status;
    return qv_platform().status(qv_os_name(path).c_str(), status) && status.isRegular;
}

}  // namespace

// --- Opening.

int QvWatchFolderInput::open(const Any& folder, int mode, const Any* moveTo, const Any*) {
    if (opened_) close();
    if (!folder.isText() || !QvFile::isDir(folder)) {
        qv_log()->error("QvWatchFolderInput::open, %s is not folder.", shown(folder).c_str());
        return QvStatus::cannotParse;
    }
    if (mode == move && !(moveTo && moveTo->isText() && moveTo->isTrue())) {
        qv_log()->error(
            "QvWatchFolderInput::open, 'move to' folder not set, required for QV_WFINPUT_MOVE mode.");
        return QvStatus::invalidStructure;
    }
    folder_ = folder;
    mode_ = mode;
    if (mode == move) {
        moveTo_ = *moveTo;
        if (!QvFile::isDir(moveTo_)) {
            if (QvFile::mkpath(moveTo_) == 0)
                qv_log()->info("QvWatchFolderInput::open, created 'move to' folder %s.",
                               shown(moveTo_).c_str());
            else
                qv_log()->error("QvWatchFolderInput::open, can not create 'move to' folder %s.",
                                shown(moveTo_).c_str());
        }
    }
    opened_ = true;
    return scan();
}

void QvWatchFolderInput::close() {
    opened_ = false;
    queue_.clear();
    queued_.clear();
    processed_.clear();
    moveTo_.invalidate();
}

// --- Finding files.

int QvWatchFolderInput::scan() {
    if (!opened_) {
        qv_log()->error("QvWatchFolderInput::scan, not opened");
        return QvStatus::illegalState;
    }
    return _scan();
}

int QvWatchFolderInput::_scan() {
    constexpr int filesOnly = 1;
    AnyVector fresh;
    for (const Any& path : QvFile::ls(folder_, filesOnly)) {
        const Any name = nameOf(path);
        const std::string key = keyOf(name);
        if (queued_.isSet(key.c_str())) continue;
        if (mode_ == keep && processed_.isSet(key.c_str())) continue;
        if (!isRegular(path)) continue;
        qv_log()->info(" QvWatchFolderInput::_scan Found new file to process %s.", shown(name).c_str());
        fresh.append(name);
    }
    if (!fresh.empty()) _addEligibleFiles(fresh);
    return QvStatus::ok;
}

bool QvWatchFolderInput::waitForWriters(int milliseconds) {
    QVThreads::sleep(milliseconds);
    return true;
}

void QvWatchFolderInput::_addEligibleFiles(const AnyVector& names) {
    std::vector<long long> before;
    for (const Any& name : names) before.push_back(QvFile::flength(inFolder(folder_, name)));
    if (!waitForWriters(settleTime)) return;
    for (int i = 0; i < names.size(); ++i) {
        const Any& name = names.at(i);
        const Any path = inFolder(folder_, name);
        const long long former = before[static_cast<std::size_t>(i)];
        const long long now = isRegular(path) ? QvFile::flength(path) : -1;
        if (now != former || now < 1) {
            qv_log()->info("Wont add %s yet old l=%lld, newl=%lld", shown(name).c_str(), former, now);
            continue;
        }
        qv_log()->info("Adding %s, l=%lld", shown(name).c_str(), now);
        queued_.set(keyOf(name).c_str(), name);
        queue_.append(name);
    }
}

// --- The queue.

Any QvWatchFolderInput::nextFile() const {
    if (opened_ && !queue_.empty()) return inFolder(folder_, queue_.front());
    qv_log()->error("%s", opened_ ? "QvWatchFolderInput::nextFile, no files in que"
                                  : "QvWatchFolderInput::nextFile, not opened");
    return Any();
}

int QvWatchFolderInput::fileProcessed() {
    if (!opened_ || queue_.empty()) {
        qv_log()->error(
            "%s", opened_ ? "QvWatchFolderInput::fileProcessed, job que empty and fileProcessed() called."
                          : "QvWatchFolderInput::fileProcessed, not opened");
        return QvStatus::illegalState;
    }
    const Any name = queue_.front();
    queue_.remove(0);
    // The keys are digests, so this call by the name removes nothing: a file that comes back under the same
    // name is not taken again.
    queued_.remove(shown(name).c_str());
    if (const int result = _postprocess(inFolder(folder_, name)); result != QvStatus::ok) return result;
    return _scan();
}

int QvWatchFolderInput::_postprocess(const Any& path) {
    const Any name = nameOf(path);
    switch (mode_) {
        case keep: processed_.set(keyOf(name).c_str(), name); return QvStatus::ok;
        case move:
            if (QvFile::mv(path, inFolder(moveTo_, name), true) == 0) return QvStatus::ok;
            qv_log()->error("QvWatchFolderInput::_postprocess, can not move %s to %s.", shown(path).c_str(),
                            shown(moveTo_).c_str());
            return QvStatus::postProcessFailed;
        case deleteFiles:
            if (QvFile::rm(path) == 0) return QvStatus::ok;
            qv_log()->error("QvWatchFolderInput::_postprocess, can not delete %s.", shown(path).c_str());
            return QvStatus::postProcessFailed;
    }
    QV_FAIL_PLAIN();
}

void QvWatchFolderInput::debugDump() const {
    QvDbgLog& log = *qv_dbg();
    log.info("Watch folder input, dump, %d files in que, %d files processed", queue_.size(),
             processed_.size());
    log.info("Files in que:");
    for (const Any& name : queue_) log.info("  %s", shown(name).c_str());
    log.info("Processed files:");
    for (const auto& [key, name] : processed_) log.info("  %s, md5=%s", shown(*name).c_str(), key);
}
