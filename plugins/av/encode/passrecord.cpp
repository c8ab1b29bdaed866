#include "plugins/av/encode/passrecord.h"

#include <cstdint>
#include <cstdio>
#include <memory>

#include "core/arch/platform.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/stream/auxinfoid.h"
#include "core/value/any.h"

namespace av {

namespace {

using namespace QvAuxId;

// The second ones are those of pictures that others refer to.
constexpr const char* endings[] = {"", ".mbtree", ".cutree"};
constexpr std::uint32_t most = 1u << 30;

bool tell(bufstream& record, unsigned slot, unsigned id, void* info = nullptr, unsigned size = 0) {
    return record.auxinfo(&record, slot, id, info, size) == 0;
}

struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
};
using FilePtr = std::unique_ptr<std::FILE, CloseFile>;

FilePtr openFile(const std::string& name, const char* mode) {
    return FilePtr(qv_platform().openFile(name.c_str(), mode));
}

bool readWhole(const std::string& name, std::string& text) {
    const FilePtr file = openFile(name, "rb");
    if (!file) return false;
    char block[16384];
    text.clear();
    while (const std::size_t got = std::fread(block, 1, sizeof block, file.get())) text.append(block, got);
    return std::ferror(file.get()) == 0;
}

bool writeWhole(const std::string& name, const std::string& text) {
    FilePtr file = openFile(name, "wb");
    return file && std::fwrite(text.data(), 1, text.size(), file.get()) == text.size() &&
           std::fclose(file.release()) == 0;
}

}  // namespace

bool storePass(bufstream& record, unsigned slot, std::string_view text) {
    if (text.size() > most || !tell(record, slot, METADATA_OPEN_WRITE)) return false;
    const bool written = tell(record, slot, METADATA_WRITE, const_cast<char*>(text.data()),
                              static_cast<unsigned>(text.size()));
    return tell(record, slot, METADATA_CLOSE) && written;
}

bool loadPass(bufstream& record, unsigned slot, std::string& text) {
    if (!tell(record, slot, METADATA_OPEN_READ)) return false;
    std::uint32_t bytes = 0;
    bool read = tell(record, slot, METADATA_LENGTH, &bytes, sizeof bytes) && bytes > 0 && bytes <= most;
    if (read) {
        text.resize(bytes);
        read = tell(record, slot, METADATA_READ, text.data(), bytes);
    }
    return tell(record, slot, METADATA_CLOSE) && read;
}

const std::string& PassFiles::choose() {
    remove();
    name_ = QvUtil::makeMetaName(qv_registry()->tempDir()).toString().asString("");
    name_ += "." + std::to_string(qv_platform().randomBits());
    return name_;
}

bool PassFiles::save(bufstream& record) const {
    std::string text;
    bool first = false;
    for (unsigned slot = 0; slot < std::size(endings); ++slot) {
        if (!readWhole(name_ + endings[slot], text) || text.empty()) continue;
        if (!storePass(record, slot, text)) return false;
        first = first || slot == 0;
    }
    return first;
}

bool PassFiles::restore(bufstream& record) {
    std::string text;
    for (unsigned slot = 0; slot < std::size(endings); ++slot) {
        if (!loadPass(record, slot, text)) {
            if (slot == 0) return false;
            continue;
        }
        if (!writeWhole(name_ + endings[slot], text)) return false;
    }
    return true;
}

void PassFiles::remove() {
    if (name_.empty()) return;
    for (const char* ending : endings)
        for (const char* unfinished : {"", ".temp"})
            qv_platform().removeFile((name_ + ending + unfinished).c_str());
    name_.clear();
}

}  // namespace av
