#include "tarsel/presets/presetstore.h"

#include <cerrno>
#include <cstring>
#include <new>

#include "tarsel/host/files.h"
#include "tarsel/host/memory.h"
#include "tarsel/host/outputs/sharedfile.h"
#include "tarsel/words/messages.h"

void loadPresets(const std::string& file, QvUserPresets& presets, int mode, int* form) {
    requireInput(file);
    const MemoryWatch memory;
    const Any name(file.c_str());
    const std::string fault = QvUserPresets::check(name);
    if (memory.ranOut()) throw std::bad_alloc();
    if (!fault.empty()) throw failure(Msg::presetsDamaged, {file, fault});
    // An element of the older form that is no preset is left out; the others stay.
    int version = 0;
    presets.load(name, mode, &version);
    if (version == 0) throw failure(Msg::presetsDamaged, {file, "it changed while it was read"});
    // Whatever a file says, what is in it is a user's.
    for (Any& preset : presets)
        if (preset.isDict()) preset.asDict().set("custom", 1);
    if (form) *form = version;
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
    if (const std::string file = fileName(); exists(file))
        loadPresets(file, presets, QvUserPresets::clearFirst);
    return presets;
}

void PresetStore::change(const std::function<void(QvUserPresets& presets)>& change) {
    SharedFile file(fileName());
    QvUserPresets presets = read();
    const QvUserPresets before = presets;
    change(presets);
    if (presets != before) file.replace([&](const std::string& name) { storePresets(name, presets); });
}
