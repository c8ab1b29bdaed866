#include "core/preset/tables/pluginpresets_p.h"

#include <algorithm>
#include <optional>
#include <string_view>

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/tables/profilesymbols_p.h"
#include "core/value/utf.h"

namespace {

constexpr std::size_t kLongestName = 200;  // of a preset or a group, in bytes

bool isPrintable(std::string_view text) {
    const auto control = [](unsigned char c) { return c < 0x20 || c == 0x7F; };
    return QvUtf::isValid(text) && std::none_of(text.begin(), text.end(), control);
}

// A name for lists: not empty, on one line.
std::optional<std::string> nameOf(const Any& text) {
    if (!text.isText()) return std::nullopt;
    const Any narrow = text.toString();
    const std::string_view name = narrow.asString("");
    if (name.empty() || name.size() > kLongestName || !isPrintable(name)) return std::nullopt;
    return std::string(name);
}

// Reads the entries of one plug-in.
class PresetReader {
  public:
    PresetReader(const QvPlugin& plugin, const CodecCompat& pairs, const InstalledModules& installed)
        : plugin_(plugin), pairs_(pairs), installed_(installed) {}

    // Nothing for an entry that is ill-formed, or whose modules are not there.
    std::optional<PluginPreset> read(const Any& entry, int nr);
    std::nullopt_t refuse(int nr, const char* why) const {
        qv_dbg()->warning("[Preset] Plug-in '%s': preset %d left out: %s", plugin_.name().asString(""), nr,
                          why);
        return std::nullopt;
    }

  private:
    std::optional<AnyVector> column(const AnyDict& entry, const char* key) const;

    const QvPlugin& plugin_;
    const CodecCompat& pairs_;
    const InstalledModules& installed_;
};

// The installed modules of a column, which is a vector of names, a single name, or not there.
std::optional<AnyVector> PresetReader::column(const AnyDict& entry, const char* key) const {
    const Any& value = entry.get(key);
    if (!value.isValid()) return AnyVector();
    if (!value.isVector() && !value.isText()) return std::nullopt;
    const AnyVector names = value.isVector() ? value.asVector() : AnyVector(value);
    AnyVector list;
    for (const Any& name : names) {
        if (!name.isText()) return std::nullopt;
        const Any narrow = name.toString();
        if (installed_.has(narrow.asString("")) && !list.contains(narrow)) list.append(narrow);
    }
    return list;
}

std::optional<PluginPreset> PresetReader::read(const Any& entry, int nr) {
    if (!entry.isDict()) return refuse(nr, "it is no dictionary");
    const AnyDict& dict = entry.asDict();
    const auto name = nameOf(dict.get("name")), group = nameOf(dict.get("group"));
    if (!name) return refuse(nr, "'name' is no text of one line");
    if (!group) return refuse(nr, "'group' is no text of one line");
    const int profile = dict.getInt32("profile", -1);
    if (profile < profileScheme::firstOfPlugins) return refuse(nr, "'profile' is not a number of a plug-in");
    const auto video = column(dict, "video"), audio = column(dict, "audio"), muxers = column(dict, "muxers");
    if (!video || !audio || !muxers)
        return refuse(nr, "'video', 'audio' and 'muxers' must be vectors of names");

    const Any& wanted = dict.get("video");
    const bool soundOnly = !wanted.isValid() || (wanted.isVector() && wanted.asVector().empty());
    const AnyVector& encoders = soundOnly ? *audio : *video;
    PluginPreset preset{profile, *name, *group, *video, *audio, AnyVector()};
    for (const Any& muxer : *muxers)
        if (std::any_of(encoders.begin(), encoders.end(), [&](const Any& encoder) {
                return pairs_.isCompatible(encoder.asString(), muxer.asString());
            }))
            preset.muxers.append(muxer);
    if (preset.muxers.empty()) return std::nullopt;
    return preset;
}

bool holdsName(const AnyVector& presets, const std::string& name) {
    return std::any_of(presets.begin(), presets.end(), [&](const Any& preset) {
        return preset.isDict() && preset.asDict().get("name") == name.c_str();
    });
}

bool isEncoder(const QvModule& module) {
    const int type = module.getAttr("type").asInt32(0);
    return type == QvModuleType::videoEncoder || type == QvModuleType::audioEncoder;
}

}  // namespace

std::vector<PluginPreset> qvPluginPresets(const AnyVector& taken, const CodecCompat& pairs,
                                          const InstalledModules& installed) {
    std::vector<PluginPreset> found;
    const QvRegistry& registry = *qv_registry();
    for (int i = 0; i < registry.nrPlugins(); ++i) {
        const QvPlugin& plugin = *registry.plugin(i);
        const Any entries = plugin.getAttr("presets");
        if (!entries.isValid()) continue;
        PresetReader reader(plugin, pairs, installed);
        if (!entries.isVector()) {
            qv_dbg()->warning("[Preset] Plug-in '%s': 'presets' is no vector", plugin.name().asString(""));
            continue;
        }
        for (int nr = 0; nr < entries.asVector().size(); ++nr) {
            auto preset = reader.read(entries.asVector().at(nr), nr);
            if (!preset) continue;
            const auto holds = [&](auto same) { return std::any_of(found.begin(), found.end(), same); };
            if (holds([&](const PluginPreset& other) { return other.profile == preset->profile; }))
                reader.refuse(nr, "its number is taken");
            else if (holdsName(taken, preset->name) ||
                     holds([&](const PluginPreset& other) { return other.name == preset->name; }))
                reader.refuse(nr, "its name is taken");
            else
                found.push_back(std::move(*preset));
        }
    }
    return found;
}

namespace {

// One attribute of a module that lists modules of the other side. Nothing for one that is absent or
// ill-formed.
AnyVector partners(const QvModule& module, const char* attribute, const char* expected, bool isOne) {
    const Any listed = module.getAttr(attribute);
    if (!listed.isValid()) return {};
    const std::string name = module.name();
    // A longer name would be cut in the list and stand for another module.
    const bool fits = name.size() <= AnyDict::maxKeyLength;
    if (!listed.isVector() || !isOne || !fits) {
        const std::string other = std::string("the module is no ") + expected;
        qv_dbg()->warning("[Preset] Module '%s': '%s' ignored: %s", name.c_str(), attribute,
                          !listed.isVector() ? "it is no vector"
                          : !isOne           ? other.c_str()
                                             : "the module's name is too long");
        return {};
    }
    AnyVector names;
    for (const Any& entry : listed.asVector())
        if (entry.isText())
            names.append(entry.toString());
        else
            qv_dbg()->warning("[Preset] Module '%s': an entry of '%s' is no name", name.c_str(), attribute);
    return names;
}

}  // namespace

void qvAddPluginPairs(CodecCompat& pairs, const InstalledModules& installed) {
    const QvRegistry& registry = *qv_registry();
    for (int i = 0, n = registry.nrModules(); i < n; ++i) {
        const QvModule& module = *registry.module(i);
        const std::string name = module.name();
        const AnyVector muxers = partners(module, "compatMuxers", "encoder", isEncoder(module));
        if (muxers.size() > 0) pairs.addCodec(name.c_str());
        for (const Any& muxer : muxers)
            if (installed.has(muxer.asString(""))) pairs.add(name.c_str(), muxer.asString(""));
        for (const Any& codec : partners(module, "compatCodecs", "multiplexer",
                                         module.getAttr("type").asInt32(0) == QvModuleType::muxer)) {
            if (!installed.has(codec.asString(""))) continue;
            pairs.addCodec(codec.asString(""));
            pairs.add(codec.asString(""), name.c_str());
        }
    }
}
