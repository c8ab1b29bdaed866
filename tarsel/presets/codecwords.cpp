#include "tarsel/presets/codecwords.h"

#include <algorithm>
#include <memory>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/presets/codecnames.h"
#include "tarsel/source/source.h"
#include "tarsel/words/keyvalues.h"
#include "tarsel/words/messages.h"

namespace {

bool isEncoder(const char* module, int type) {
    const QvModule* const found = qv_registry()->module(module);
    return found && moduleKind(*found) ==
                        (type == qvVideoStream ? QvModuleType::videoEncoder : QvModuleType::audioEncoder);
}

// Whether it is the name of a module that the table knows, so that only its plug-in is missing.
bool isKnownModule(const std::string& name, int type) {
    return std::any_of(codecNames().begin(), codecNames().end(), [&](const CodecName& row) {
        const auto encoders = row.encoders();
        return row.type == type && std::find(encoders.begin(), encoders.end(), name) != encoders.end();
    });
}

bool hasStandards(const std::string& module) {
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module.c_str()));
    try {
        return codec && static_cast<const QvCodec&>(*codec).getParam("standard").isText();
    } catch (const QvParamException&) {  // not one of its parameters
        return false;
    }
}

void takeModules(CodecWords& words) {
    if (isEncoder(words.name.c_str(), words.type)) {
        words.modules = {words.name};
        return;
    }
    if (isKnownModule(words.name, words.type))
        throw failure(Msg::codecMissing, {words.option, words.name, words.name});
    const CodecName* const row = codecName(words.name, words.type);
    if (!row) {
        const std::vector<std::string> known = namesOfCodecs(words.type);
        throw failure(Msg::codecUnknown, {words.option, words.name, suggestion(words.name, known)});
    }
    for (const char* const module : row->encoders())
        if (isEncoder(module, words.type)) words.modules.emplace_back(module);
    if (words.modules.empty()) throw failure(Msg::codecMissing, {words.option, words.name, row->modules[0]});
    words.preset = row->preset ? row->preset : "";
    if (row->standard && hasStandards(words.modules.front()))
        words.settings.insert(words.settings.begin(), {"standard", row->standard});
}

}  // namespace

CodecWords parseCodec(const std::string& text, int type) {
    CodecWords words;
    words.type = type;
    words.option = type == qvVideoStream ? "--vcodec" : "--acodec";
    if (text.empty()) return words;
    const size_t colon = std::min(text.find(':'), text.size());
    words.name = text.substr(0, colon);
    if (words.name.empty()) throw failure(Msg::codecUnknown, {words.option, words.name, ""});
    if (colon < text.size())
        words.settings = KeyValues(std::string_view(text).substr(colon + 1), {}, words.typed()).all();
    words.none = words.name == "none";
    if (!words.none) takeModules(words);
    if (words.none && !words.settings.empty()) throw failure(Msg::codecNoneSet, {words.option});
    return words;
}
