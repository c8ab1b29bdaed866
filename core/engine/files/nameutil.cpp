// Names: what other units ask of QvUtil instead of QvFile, and names that the engine makes up.
#include <cstdint>
#include <string>

#include "core/arch/platform.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/qvutil.h"
#include "core/value/nametext_p.h"

Any QvUtil::tempDir() { return QvFile::tempDir(); }
void QvUtil::winFname(const Any& in, Any& out) { QvFile::winFname(in, out); }
Any QvUtil::getExt(const Any& name, bool lower) { return QvFile::getExt(name, lower); }
Any QvUtil::getBasename(const Any& name) { return QvFile::getBasename(name); }
Any QvUtil::getPath(const Any& name) { return QvFile::getPath(name); }
bool QvUtil::isAbsolutePath(const Any& name) { return QvFile::isAbsolutePath(name); }

// From the system's entropy: two processes that start in one second must not meet in one folder.
Any QvUtil::makeMetaName(const Any& folder) {
    const std::uint32_t number = qv_platform().randomBits() >> 1;
    const long long seconds = qv_platform().systemNs() / 1'000'000'000;
    const std::string name = qv_os_name(folder) + path_separator() + "Tarsel_metadata_" +
                             std::to_string(number) + "_" + std::to_string(seconds);
    return qv_any_name(name, folder);
}

AnyVector QvUtil::getP2FolderStructure(const Any& root) {
    AnyVector folders;
    if (!root.isText()) return folders;
    const Any contents = QvFile::joinPath(root, Any("CONTENTS"));
    folders.append(contents);
    for (const char* name : {"CLIP", "VIDEO", "AUDIO", "ICON", "PROXY", "VOICE"})
        folders.append(QvFile::joinPath(contents, Any(name)));
    return folders;
}
