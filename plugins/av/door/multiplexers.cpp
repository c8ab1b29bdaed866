#include <sstream>
#include <string>

#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "plugins/av/door/avmodules.h"
#include "plugins/av/door/containers.h"
#include "plugins/av/door/ownpresets.h"

namespace av {

namespace {

AnyVector words(const char* text) {
    AnyVector all;
    std::istringstream stream(text);
    for (std::string word; stream >> word;) all.append(Any(word.c_str()));
    return all;
}

AnyVector encodersOf(int profile) {
    for (const OwnPreset& preset : ownPresets)
        if (preset.profile == profile) return words((std::string(preset.video) + " " + preset.audio).c_str());
    return {};
}

}  // namespace

void addMultiplexers(QvPlugin& plugin, const std::shared_ptr<CodecLibrary>& library) {
    for (const MuxerModule& row : muxerModules) {
        QvModule* const module =
            newModule(library, QvModuleType::muxer, row.name, row.description, row.displayName);
        module->setAttr("exts", words(row.extensions));
        module->setAttr("compatEncoders", words(row.encoders));
        module->setAttr("sizedStreams", 1);
        module->setAttr("recorder", recorderModule);
        if (row.samplerate > 0) module->setAttr("samplerates", AnyVector(Any(row.samplerate)));
        if (row.transportStream) module->setAttr("transportStream", 1);
        plugin.addModule(module);
    }
    QvModule* const recorder =
        newModule(library, QvModuleType::muxer, recorderModule, "Recorder of encoded units", "Units");
    recorder->setAttr("compatEncoders", encodersOf(ownPresetOfAll));
    recorder->setAttr("sizedStreams", 1);
    recorder->setAttr("internal", 1);
    recorder->setAttr("profile", ownPresetOfAll);
    plugin.addModule(recorder);
}

}  // namespace av
