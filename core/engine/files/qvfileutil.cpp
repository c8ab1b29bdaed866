#include "core/engine/files/qvfileutil.h"

#include <cstdio>
#include <ctime>
#include <type_traits>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/files/filelisting_p.h"
#include "core/engine/files/gzipfile_p.h"
#include "core/engine/files/nameparts_p.h"
#include "core/engine/log/loggedopen_p.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/datetime.h"

namespace {

using namespace qvname;

// False, too, for what is no text or empty.
bool statusOf(const Any& name, QvFileStatus& status) {
    const std::string file = qv_os_name(name);
    return !file.empty() && qv_platform().status(file.c_str(), status);
}

// An operation of the platform on a name, -1 for a name that can't be one.
template <class Operation>
int withName(const Any& name, Operation operation) {
    const std::string file = qv_os_name(name);
    return file.empty() ? -1 : operation(file.c_str());
}

std::FILE* asFile(void* stream) { return static_cast<std::FILE*>(stream); }

int makeWithParents(const std::string& folder) {
    QvPlatform& platform = qv_platform();
    for (std::size_t at = folder.find_first_not_of('/'); at < folder.size();) {
        const std::size_t end = std::min(folder.find('/', at), folder.size());
        const std::string part = folder.substr(0, end);
        QvFileStatus status;
        const bool there = platform.status(part.c_str(), status) && status.isFolder;
        if (!there && platform.makeFolder(part.c_str()) != 0) return -1;
        at = folder.find_first_not_of('/', end);
    }
    return 0;
}

}  // namespace

std::string qv_os_name(const Any& name) { return narrow(name); }

Any qv_any_name(const std::string& bytes, const Any& like) {
    return like.isWString() ? toAny(qv_wide_name(bytes)) : toAny(bytes);
}

void* qvfopen(const Any& name, const char* mode) { return qvOpenLogged(name, mode); }

const char* path_separator() { return platformSeparator; }

Any core_library_path() { return toAny(qv_platform().coreLibraryPath()); }

int execute_process(const Any& commandLine) {
    return withName(commandLine, [](const char* command) { return qv_platform().runCommand(command); });
}

void debug_trace(const char* text) { qv_platform().debugOutput(text); }

void debug_trace1(const char* first, const char* text) {
    qv_platform().debugOutput((std::string(first) + " " + text + "\n").c_str());
}

// --- Names

Any QvFile::getPath(const Any& name) {
    return inWidth(name, [](const auto& text) { return path(text); });
}

Any QvFile::getFilename(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.getFilename: invalid argument type");
    return inWidth(name, [](const auto& text) { return filename(text); });
}

Any QvFile::getBasename(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.getBasename: invalid argument type");
    return inWidth(name, [](const auto& text) { return basename(text); });
}

Any QvFile::getExt(const Any& name, bool lower) {
    QV_ASSERT_MSG(name.isText(), "QvFile.getExt: filename argument must be string");
    const Any ext = inWidth(name, [](const auto& text) { return extension(text); });
    if (!lower) return ext;
    Narrow text = narrow(ext);
    for (char& c : text)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return toAny(text);
}

Any QvFile::stripExt(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.stripExt: filename argument must be string");
    return inWidth(name, [](const auto& text) {
        const std::size_t length = extension(text).size();
        return length == 0 ? text : text.substr(0, text.size() - length - 1);
    });
}

Any QvFile::joinExt(const Any& name, const Any& ext) {
    QV_ASSERT_MSG(name.isText(), "QvFile.joinExt: filename argument must be string");
    QV_ASSERT_MSG(ext.isText(), "QvFile.joinExt: extension argument must be string");
    return inWidth(name, [&ext](const auto& text) {
        using C = typename std::decay_t<decltype(text)>::value_type;
        return joinedExt(text, textOf<C>(ext));
    });
}

Any QvFile::changeExt(const Any& name, const Any& ext) {
    const Any file = AnyVector(getBasename(name), ext).join(Any("."));
    return joinPath(getPath(name), file);
}

Any QvFile::joinPath(const Any& first, const Any& second) { return joinPath(AnyVector(first, second)); }

Any QvFile::joinPath(const AnyVector& parts) {
    if (parts.empty()) return Any("");
    if (parts.size() == 1) return parts.at(0);
    return hasWide(parts) ? toAny(joined<unsigned short>(parts)) : toAny(joined<char>(parts));
}

bool QvFile::isAbsolutePath(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.isAbsolutePath: invalid argument type");
    if (name.isWString()) {
        QV_ASSERT(name.size() > 0);
        return isAbsolute(wide(name));
    }
    QV_ASSERT(name.size() > 0);
    return isAbsolute(narrow(name));
}

void QvFile::winFname(const Any& in, Any& out) { out = osFname(in); }

Any QvFile::osFname(const Any& in) {
    return inWidth(in, [](const auto& text) { return osName(text); });
}

bool QvFile::setSeparator(Any& name, char separator) {
    bool changed = false;
    const Any unified = inWidth(name, [&](auto text) {
        using C = typename decltype(text)::value_type;
        changed = unifySeparators(text, static_cast<C>(separator));
        return text;
    });
    if (changed) name = unified;
    return changed;
}

Any QvFile::shellEscape(const Any& text) {
    return inWidth(text, [](const auto& plain) { return escaped(plain); });
}

Any QvFile::shellQuote(const Any& name) {
    if (!name.isText()) return Any();
    return qv_any_name(qv_platform().quoteForShell(qv_os_name(name)), name);
}

// --- Places and files

Any QvFile::homeDir() { return toAny(qv_platform().homeFolder()); }

Any QvFile::tempDir() {
    std::string folder = qv_platform().tempFolder();
    if (folder.empty() || folder.back() != '/') folder += '/';
    return toAny(folder);
}

bool QvFile::isFile(const Any& name) {
    QvFileStatus status;
    return statusOf(name, status) && !status.isFolder;
}

bool QvFile::isDir(const Any& name) {
    QvFileStatus status;
    return statusOf(name, status) && status.isFolder;
}

long long QvFile::flength(const Any& name) {
    QvFileStatus status;
    if (!statusOf(name, status) || !status.isRegular) return -1;  // opening a pipe would wait for its writer
    std::FILE* const stream = qv_platform().openFile(qv_os_name(name).c_str(), "rb");
    if (!stream) return -1;
    const long long length = flength(stream);
    std::fclose(stream);
    return length;
}

long long QvFile::flength(void* stream) {
    if (!stream) return -1;
    const long long position = ftell64(stream);
    if (position < 0 || fseek64(stream, 0, SEEK_END) != 0) return -1;
    const long long length = ftell64(stream);
    return fseek64(stream, position, SEEK_SET) == 0 ? length : -1;
}

QvDateTime QvFile::lastModified(const Any& name) {
    constexpr long long second = 1'000'000'000;
    QvFileStatus status;
    std::tm calendar{};
    if (!statusOf(name, status)) return {};
    const long long rest = (status.modifiedNs % second + second) % second;
    if (!qv_platform().localTime((status.modifiedNs - rest) / second, calendar)) return {};
    return {QvDate(calendar.tm_mday, calendar.tm_mon + 1, calendar.tm_year + 1900),
            QvTime(calendar.tm_hour, calendar.tm_min, calendar.tm_sec, static_cast<int>(rest / 1'000'000),
                   static_cast<int>(rest / 1000 % 1000))};
}

int QvFile::fseek64(void* stream, long long offset, int origin) {
    return stream ? qv_platform().seek(asFile(stream), offset, origin) : -1;
}

long long QvFile::ftell64(void* stream) { return stream ? qv_platform().tell(asFile(stream)) : -1; }

int QvFile::rm(const Any& name) {
    return withName(name, [](const char* file) { return qv_platform().removeFile(file); });
}

int QvFile::mkdir(const Any& name) {
    if (isDir(name)) return -1;
    return withName(name, [](const char* folder) { return qv_platform().makeFolder(folder); });
}

int QvFile::mkpath(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.mkpath: argument must be string");
    return makeWithParents(qv_os_name(name));
}

// The target is not deleted beforehand but replaced in one step, so that a failure leaves it as it was; and a
// file moved onto itself stays.
int QvFile::mv(const Any& from, const Any& to, bool overwrite) {
    QvPlatform& platform = qv_platform();
    const std::string source = qv_os_name(from), target = qv_os_name(to);
    if (source.empty() || target.empty()) return -1;
    if (overwrite) {
        if (platform.sameFile(source.c_str(), target.c_str())) return source == target ? 0 : -1;
        if (isDir(to)) return -1;
    }
    return platform.moveFile(source.c_str(), target.c_str(), overwrite);
}

bool QvFile::isSameFile(const Any& first, const Any& second) {
    const std::string a = qv_os_name(first), b = qv_os_name(second);
    return !a.empty() && !b.empty() && qv_platform().sameFile(a.c_str(), b.c_str());
}

long long QvFile::freeSpace(const Any& name) {
    const std::string file = qv_os_name(name);
    return file.empty() ? -1 : qv_platform().freeSpace(file.c_str());
}

// --- Listings and gzip files

AnyVector QvFile::ls(const Any& folder, int filesOnly) { return qvListFolder(folder, (filesOnly & 1) != 0); }
AnyVector QvFile::numberedSequence(const Any& name, int* digits) { return qvNumberedSequence(name, digits); }

int QvFile::rmdir(const Any& name) {
    return withName(name, [](const char* folder) { return qv_platform().removeTree(folder, qvIsUnlisted); });
}

int QvFile::compress(const Any& name, const unsigned char* data, int size) {
    return qvWriteGzip(name, data, size);
}
int QvFile::decompress(const Any& name, Any& out) { return qvReadGzip(name, out); }
