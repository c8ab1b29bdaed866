#include "core/batch/batchfile_p.h"

#include <algorithm>
#include <cstdio>
#include <string>

#include "core/arch/platform.h"
#include "core/arch/qvexception.h"
#include "core/document/xmldom.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/preset/qvpresetmgr.h"

namespace {

constexpr const char *doctype = "BatchList", *formerDoctype = "QvBatch", *version = "2.0";

int refuse(const char* text) {
    qv_dbg()->error("%s", text);
    return QvStatus::failed;
}

// A random name next to the file.
std::string temporaryName(const std::string& file) {
    char mark[24];
    std::snprintf(mark, sizeof mark, ".%08x.tmp", qv_platform().randomBits());
    return file + mark;
}

bool syncToDisc(const std::string& file) {
    QvPlatform& system = qv_platform();
    std::FILE* const written = system.openFile(file.c_str(), "rb");
    if (!written) return false;
    const bool synced = system.sync(written) == 0;
    return std::fclose(written) == 0 && synced;
}

// Writes the document next to the existing file, and on the disc, before it is renamed: after a power cut
// there is either the old file or the new one. Throws QvFileException.
int replaceFile(const Any& file, const AnyDict& list) {
    const std::string name = qv_os_name(file), fresh = temporaryName(name);
    const Any target = qv_any_name(fresh, file);
    int result = QvStatus::failed;
    try {
        result = XmlParser::storeDict(target, list, doctype, version);
        if (result == QvStatus::ok && !syncToDisc(fresh))
            throw QvFileException("Can not bring the new file to the disc");
        if (result == QvStatus::ok && qv_platform().moveFile(fresh.c_str(), name.c_str(), true) != 0)
            throw QvFileException("Can not replace the file by what was written next to it");
    } catch (...) {
        qv_platform().removeFile(fresh.c_str());
        throw;
    }
    return result;
}

// The vector under a key; null if there is none.
AnyVector* vectorIn(AnyDict& dict, const char* key) {
    Any& found = dict.get(key);
    return found.isVector() ? &found.asVector() : nullptr;
}

// Likewise, the dictionary.
AnyDict* dictIn(AnyDict& dict, const char* key) {
    Any& found = dict.get(key);
    return found.isDict() ? &found.asDict() : nullptr;
}

// Replaces the name of a codec that is not installed, if it has a substitute.
void substitute(AnyDict& codec) {
    const Any name = codec.get("name");
    if (!name.isString() || qv_registry()->module(name.asString())) return;
    const char* other = qv_registry()->presetMgr()->getSubstitute(name.asString());
    if (!other || !qv_registry()->module(other)) return;
    qv_dbg()->debug("BatchList: substituting '%s' for '%s'", other, name.asString());
    codec.set("name", other);
}

void substituteCodecs(AnyDict& task) {
    AnyDict* const encoder = dictIn(task, "encoder");
    AnyVector* const streams = encoder ? vectorIn(*encoder, "streams") : nullptr;
    if (!streams) return;
    for (Any& stream : *streams)
        if (AnyDict* codec = stream.isDict() ? dictIn(stream.asDict(), "codec") : nullptr) substitute(*codec);
}

}  // namespace

int qvWriteBatchFile(const Any& file, const AnyDict& list) {
    const std::string name = qv_os_name(file);
    try {
        if (!name.empty()) {
            QvFileStatus status;
            const bool regular = qv_platform().status(name.c_str(), status) && status.isRegular;
            const int result =
                regular ? replaceFile(file, list) : XmlParser::storeDict(file, list, doctype, version);
            if (result == QvStatus::ok) return result;
        }
    } catch (const QvFileException& failure) {
        qv_dbg()->error("%s", failure.what());
    }
    qv_dbg()->error("Failed to save batch to '%s'", name.c_str());
    return QvStatus::failed;
}

int qvReadBatchFile(const Any& file, AnyVector& tasks) {
    const std::string name = qv_os_name(file);
    AnyDict dict;
    Any root, written;
    if (!file.isText() || XmlParser::restoreDict(file, dict, root, written) != QvStatus::ok) {
        qv_dbg()->error("Failed to load batch from '%s', could not parse file", name.c_str());
        return QvStatus::cannotParse;
    }
    const bool former = root == formerDoctype;
    if (dict.empty() || (!former && root != doctype))
        qv_dbg()->error("Failed to load batch from '%s', invalid file contents", name.c_str());
    if (former && dict.get("batchJob").isVector())
        return refuse("Failed to import batch data, old format not supported.");
    AnyVector* const list = former ? nullptr : vectorIn(dict, "taskList");
    if (!list || !std::all_of(list->begin(), list->end(), [](const Any& task) { return task.isDict(); }))
        return refuse("Failed to import batch data, invalid format");
    for (Any& task : *list) substituteCodecs(task.asDict());
    tasks.swap(*list);
    return QvStatus::ok;
}
