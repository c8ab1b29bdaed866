#include "tarsel/presets/presettext.h"

#include <vector>

#include "tarsel/presets/outputpreset.h"
#include "tarsel/presets/presetsearch.h"
#include "tarsel/presets/presetwords.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/timespec.h"
#include "tarsel/words/valuetext.h"

namespace {

constexpr const char* kOwnGroup = "Your presets";

Json wordsOf(const AnyVector& names) {
    Json words = Json::array();
    for (const Any& name : names) words.push_back(validUtf8(name.toString().asString("")));
    return words;
}

std::string textOf(const Any& value) { return value.toString().asString(""); }

Json rowOf(const QvPreset& preset, const std::string& group) {
    return {{"name", validUtf8(preset.name())},
            {"symbol", preset.symbol()},
            {"group", group},
            {"own", preset.isCustom()},
            {"video", wordsOf(preset.videoCodecs())},
            {"audio", wordsOf(preset.audioCodecs())},
            {"muxers", wordsOf(preset.muxers())}};
}

void addOwn(const QvUserPresets& own, bool all, Json& rows) {
    for (int i = 0; i < own.count(); ++i) {
        QvPreset preset = withInstalledModules(own.at(i));
        if (preset.isDisabled() && !all) continue;
        Json row = rowOf(preset, kOwnGroup);
        preset.createInfo();
        row["info"] = validUtf8(textOf(preset.info()));
        if (!preset.isValid()) row["error"] = validUtf8(textOf(preset.error()));
        rows.push_back(row);
    }
}

void addMissing(const char* group, const AnyVector& missing, Json& rows) {
    for (const Any& one : missing) {
        const AnyDict& preset = one.asDict();
        if (preset.get("group") != group) continue;
        rows.push_back({{"name", preset.getString("name", "")},
                        {"symbol", qvProfileToSym(preset.getInt32("profile", -1))},
                        {"group", group},
                        {"own", false},
                        {"waits_for", wordsOf(preset.getVector("waitsFor"))}});
    }
}

std::string listOf(const Json& words) {
    std::vector<std::string> all;
    for (const Json& word : words) all.push_back(word.get<std::string>());
    return joined(all);
}

std::string lineOf(const Json& row) {
    const auto text = [&](const char* key) { return onOneLine(row[key].get<std::string>()); };
    std::string line = "  " + text("name");
    const std::string symbol = text("symbol");
    line.append(line.size() < 44 ? 44 - line.size() : 1, ' ');
    line += symbol;
    line.append(symbol.size() < 26 ? 26 - symbol.size() : 1, ' ');
    if (row.contains("waits_for")) return line + "waits for " + listOf(row["waits_for"]) + "\n";
    if (row.contains("error")) return line + "can't be used: " + text("error") + "\n";
    if (row.contains("info")) return line + text("info") + "\n";
    return line + listOf(row["muxers"]) + "\n";
}

Json valueOf(const Any& value) {
    if (value.isDict()) {
        Json all = Json::object();
        for (const auto [key, entry] : value.asDict())
            if (key[0] != '#' && key[0] != '_') all[validUtf8(key)] = valueOf(*entry);
        return all;
    }
    if (value.isVector()) {
        Json all = Json::array();
        for (const Any& one : value.asVector()) all.push_back(valueOf(one));
        return all;
    }
    if (value.isInt()) return value.toInt64();
    if (value.isFloat()) return value.asDouble();
    return validUtf8(value.isText() ? textOf(value) : valueText(value));
}

// The settings of one module; those of the raw encoders lie in a dictionary of their own.
void addValues(const AnyDict& settings, bool raw, std::string& text) {
    for (const auto [key, value] : settings) {
        const std::string name = key;
        if (key[0] == '#' || key[0] == '_' || name == "name") continue;
        if (value->isDict()) {
            addValues(value->asDict(), raw, text);
            continue;
        }
        const bool format = raw && name == "type" && value->isInt();
        const std::string shown =
            format ? fourccText(static_cast<unsigned>(value->toInt32())) : valueText(*value);
        text.append("  ").append(onOneLine(name)).append(" = ").append(onOneLine(shown)).append("\n");
    }
}

void addSettings(const char* title, const Any& settings, std::string& text) {
    if (!settings.isDict()) return;
    const std::string name = textOf(settings.asDict().get("name"));
    text += title + onOneLine(name) + "\n";
    addValues(settings.asDict(), isRawEncoderName(name), text);
}

// Profiles of plug-ins have no symbol.
std::string profileText(const QvPreset& preset) {
    if (*preset.symbol()) return preset.symbol();
    if (preset.profile() < 0) return "none";
    return Any::sprintf("0x%X", static_cast<unsigned>(preset.profile())).asString("");
}

const char* titleOf(int type) {
    return type == qvVideoStream ? "picture  " : type == qvAudioStream ? "sound    " : "other    ";
}

}  // namespace

Json presetRows(const QvUserPresets& own, bool all) {
    Json rows = Json::array();
    addOwn(own, all, rows);
    const QvPresetMgr& catalogue = *qvPresetMgr();
    const AnyVector missing = all ? catalogue.missingPresets() : AnyVector();
    const PresetGroupList& groups = catalogue.builtinGroups();
    for (int g = 0; g < groups.size(); ++g) {
        const PresetGroup& group = groups.at(g);
        for (int i = 0; i < group.size(); ++i)
            rows.push_back(rowOf(catalogue.builtinPreset(group.preset(i)), group.name()));
        addMissing(group.name(), missing, rows);
    }
    // Groups of which nothing is there.
    for (const Any& one : missing) {
        const char* const name = one.asDict().getString("group", "");
        bool listed = groups.findByName(name) >= 0;
        for (const Json& row : rows) listed = listed || row["group"] == name;
        if (!listed) addMissing(name, missing, rows);
    }
    return rows;
}

std::string presetListText(const Json& rows) {
    std::string text, group;
    for (const Json& row : rows) {
        if (row["group"].get<std::string>() != group) {
            group = row["group"].get<std::string>();
            text += (text.empty() ? "" : "\n") + group + "\n";
        }
        text += lineOf(row);
    }
    return text;
}

Json presetJson(const QvPreset& preset) {
    QvPreset checked = preset;
    Json row = rowOf(checked, checked.isCustom() ? kOwnGroup : "");
    row.erase("group");
    row["valid"] = checked.checkValid();
    if (!row["valid"].get<bool>()) row["error"] = validUtf8(textOf(checked.error()));
    checked.createInfo();
    row["info"] = validUtf8(textOf(checked.info()));
    for (const char* key : {"muxer", "streams", "programs", "extension", "PresetMeta"})
        if (checked.isSet(key)) row["settings"][key] = valueOf(checked.get(key));
    return row;
}

std::string presetText(const QvPreset& preset) {
    QvPreset checked = preset;
    const bool valid = checked.checkValid();
    checked.createInfo();
    std::string text = onOneLine(checked.name()) + "\n";
    text += "profile  " + profileText(checked) + "\n";
    text += "info     " + onOneLine(textOf(checked.info())) + "\n";
    if (!valid) text += "error    " + onOneLine(faultOf(checked)) + "\n";
    text += "video    " + listOf(wordsOf(checked.videoCodecs())) + "\n";
    text += "audio    " + listOf(wordsOf(checked.audioCodecs())) + "\n";
    text += "muxers   " + listOf(wordsOf(checked.muxers())) + "\n";
    if (!checked.isCustom()) return text;
    addSettings("muxer    ", checked.get("muxer"), text);
    for (const Any& stream : checked.getVector("streams"))
        if (stream.isDict())
            addSettings(titleOf(stream.asDict().getInt32("type", -1)), stream.asDict().get("codec"), text);
    return text;
}
