#include "core/decode/qvdecoderstate.h"

#include <algorithm>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>

#include "core/arch/qvexception.h"
#include "core/document/xmldom.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/measure/datetime.h"

namespace {

constexpr const char* rootName = "decoderState";
constexpr const char* version = "2.0";
constexpr std::string_view blobPrefix = "BLOB_";
constexpr int largestInline = 128;  // bytes of a Generic that stays in the XML
constexpr std::size_t digestLength = 32;

// File names come from keys, and keys from a file that anybody may have written: a name must not lead out of
// its folder.
bool isPlainName(std::string_view key) {
    return !key.empty() && key.find_first_of("/\\") == std::string_view::npos && key != "." && key != "..";
}

Any blobFile(const Any& folder, const char* key) {
    return QvFile::joinPath(folder, Any::sprintf("%s.dat", key));
}

bool isDigest(std::string_view name) {
    const auto isHex = [](char c) { return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f'); };
    return name.size() == digestLength && std::all_of(name.begin(), name.end(), isHex);
}

// Characters of the name's digest; its leading zeros are not printed by md5Digest.
std::string digestOf(const Any& file) {
    const std::string digest = QvUtil::md5Digest(file, static_cast<int>(digestLength)).asString("");
    return std::string(digestLength - std::min(digest.size(), digestLength), '0') + digest;
}

}  // namespace

QvDecoderState::~QvDecoderState() = default;

QvDecoderStateManager::QvDecoderStateManager(const char* name, const Any& dir) {
    Any folder = dir;
    if (!folder.isText() || folder.size() == 0) {
        folder = QvFile::joinPath(qv_registry()->userSettingsDir(false), "decstate");
        if (!QvFile::isDir(folder)) QvFile::mkdir(folder);
    }
    path_ = QvFile::joinPath(folder, name);
    if (QvFile::isDir(path_) || QvFile::mkdir(path_) == QvStatus::ok) return;
    qv_log()->error("Filed to create %s, decder state managing will be disabled",
                    path_.toString().asString(""));
    disabled_ = true;
}

Any QvDecoderStateManager::_fileStateDir(const Any& file) const {
    return QvFile::joinPath(path_, Any(digestOf(file).c_str()));
}

// --- Looking.

bool QvDecoderStateManager::stateStored(const Any& file) { return _stateStored(file, nullptr); }

bool QvDecoderStateManager::_stateStored(const Any& file, AnyDict* out) {
    if (disabled_) return false;
    const Any folder = _fileStateDir(file);
    if (!QvFile::isDir(folder)) return false;

    const auto readState = [&](AnyDict& decoder) {
        const Any document = QvFile::joinPath(folder, "state.xml");
        if (!QvFile::isFile(document)) return false;
        AnyDict dict;
        Any root;
        Any storedVersion;
        if (XmlParser::restoreDict(document, dict, root, storedVersion) != QvStatus::ok) return false;
        if (root != rootName) return false;
        if (!dict["modified"].isInt64() || !dict["decoder"].isDict()) return false;
        QvDateTime modified;
        modified.fromI64(dict["modified"].asInt64());
        if (!(modified == QvFile::lastModified(file))) return false;
        decoder = dict["decoder"].asDict();
        return true;
    };
    AnyDict decoder;
    if (!readState(decoder)) {
        QvFile::rmdir(folder);
        return false;
    }
    if (out) *out = std::move(decoder);
    return true;
}

// --- Storing.

// Under a name that leaves no room for the prefix the value would not be found again, and some are no names
// at all of a file: such a value stays in the document.
bool QvDecoderStateManager::_shouldBeStoredAsBlob(const char* name, const Any& value) const {
    return value.isGeneric() && value.size() > largestInline && isPlainName(name) &&
           std::strlen(name) + blobPrefix.size() <= AnyDict::maxKeyLength;
}

int QvDecoderStateManager::_storeBlob(const Any& file, const char* key, const Any& value, AnyDict& out) {
    const auto* bytes = static_cast<const unsigned char*>(value.asGeneric());
    const int result = QvFile::compress(blobFile(_fileStateDir(file), key), bytes, value.size());
    if (result == QvStatus::ok) out.set((std::string(blobPrefix) + key).c_str(), Any(""));
    return result;
}

int QvDecoderStateManager::storeState(const Any& file, const QvDecoderState& state) {
    if (disabled_) return QvStatus::failed;
    const Any folder = _fileStateDir(file);
    QvFile::rmdir(folder);
    QvFile::mkdir(folder);

    AnyDict decoder;
    for (const auto [key, value] : state) {
        if (_shouldBeStoredAsBlob(key, *value))
            _storeBlob(file, key, *value, decoder);
        else
            decoder.set(key, *value);
    }
    AnyDict dict;
    dict.set("decoder", decoder);
    dict.set("modified", Any(QvFile::lastModified(file).toI64()));
    dict.set("__version__", Any(version));
    dict.set("filename", file);
    try {
        return XmlParser::storeDict(QvFile::joinPath(folder, "state.xml"), dict, rootName, version);
    } catch (const QvFileException& failure) {
        qv_dbg()->error("%s", failure.what());
        QvFile::rmdir(folder);
        return QvStatus::failed;
    }
}

// --- Restoring.

int QvDecoderStateManager::_restoreBlob(const Any& file, const char* name, Any& out) {
    if (!isPlainName(name)) return QvStatus::failed;
    const Any source = blobFile(_fileStateDir(file), name);
    return QvFile::isFile(source) ? QvFile::decompress(source, out) : QvStatus::failed;
}

int QvDecoderStateManager::restoreState(const Any& file, QvDecoderState& state) {
    AnyDict stored;
    if (!_stateStored(file, &stored)) return QvStatus::failed;
    state.clear();
    for (const auto [key, value] : stored) {
        if (std::strncmp(key, blobPrefix.data(), blobPrefix.size()) != 0) {
            state.set(key, *value);
            continue;
        }
        const char* name = key + blobPrefix.size();
        Any blob;
        if (_restoreBlob(file, name, blob) != QvStatus::ok) {
            QvFile::rmdir(_fileStateDir(file));
            return QvStatus::failed;
        }
        state.set(name, std::move(blob));
    }
    return QvStatus::ok;
}

// --- Removing.

int QvDecoderStateManager::deleteState(const Any& file) { return QvFile::rmdir(_fileStateDir(file)); }

void QvDecoderStateManager::clearStates() {
    for (const Any& entry : QvFile::ls(path_, 0)) {
        const Any name = QvFile::getBasename(entry).toString();
        if (isDigest(name.asString("")) && QvFile::isDir(entry)) QvFile::rmdir(entry);
    }
}
