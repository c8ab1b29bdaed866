#include "tarsel/presets/presetstore.h"

#include <cerrno>
#include <cstring>
#include <new>

#include "tarsel/host/files.h"
#include "tarsel/host/memory.h"
#include "tarsel/host/outputs/sharedfile.h"
#include "tarsel/words/messages.h"

namespace {

// The reader says in the log which presets of the older form it leaves out.
class SkipLog : public QvLogBase {
  public:
    SkipLog() : before_(qv_dbg()->logger()) { qv_dbg()->setLogger(this); }
    SkipLog(const SkipLog&) = delete;
    SkipLog& operator=(const SkipLog&) = delete;
    ~SkipLog() override { qv_dbg()->setLogger(before_); }

    // A line begins with its time.
    void logs(int mask, const unsigned short* text) override {
        if (before_) before_->logs(mask, text);
        std::string line = Any(text).toString().asString("");
        line.erase(0, line.find(' ') + 1);
        if (line.starts_with("Skipping preset")) lines.push_back(line);
    }
    std::vector<std::string> lines;

  private:
    QvLogBase* before_;
};

}  // namespace

std::vector<std::string> loadPresets(const std::string& file, QvUserPresets& presets, int* form) {
    requireInput(file);
    const MemoryWatch memory;
    const Any name(file.c_str());
    const std::string fault = QvUserPresets::check(name);
    if (memory.ranOut()) throw std::bad_alloc();
    if (!fault.empty()) throw failure(Msg::presetsDamaged, {file, fault});
    // An element of the older form that is no preset is left out; the others stay.
    int version = 0;
    const SkipLog log;
    presets.load(name, QvUserPresets::clearFirst, &version);
    if (version == 0) throw failure(Msg::presetsDamaged, {file, "it changed while it was read"});
    // Whatever a file says, what is in it is a user's.
    for (Any& preset : presets)
        if (preset.isDict()) preset.asDict().set("custom", 1);
    if (form) *form = version;
    return log.lines;
}

void storePresets(const std::string& file, QvUserPresets& presets) {
    try {
        errno = 0;
        if (presets.save(Any(file.c_str())) != QvStatus::ok)
            throw writeFailure(file, "the presets can't be stored");
    } catch (const QvFileException& error) {
        throw writeFailure(file, errno != 0 ? std::string(": ") + std::strerror(errno) : error.what());
    }
}

std::string PresetStore::fileName() {
    const Any folder = qv_registry()->userSettingsDir(true);
    return QvFile::joinPath(folder, "presets.xml").toString().asString("presets.xml");
}

QvUserPresets PresetStore::read() {
    QvUserPresets presets;
    if (const std::string file = fileName(); exists(file)) loadPresets(file, presets);
    return presets;
}

void PresetStore::change(const std::function<void(QvUserPresets& presets)>& change) {
    SharedFile file(fileName());
    QvUserPresets presets;
    if (exists(fileName()))
        if (const auto skipped = loadPresets(fileName(), presets); !skipped.empty())
            throw failure(Msg::presetsDamaged, {fileName(), skipped.front()});
    const QvUserPresets before = presets;
    change(presets);
    if (presets != before) file.replace([&](const std::string& name) { storePresets(name, presets); });
}
