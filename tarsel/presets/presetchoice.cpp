#include "tarsel/presets/presetchoice.h"

#include <algorithm>
#include <optional>
#include <vector>

#include "tarsel/presets/codecnames.h"
#include "tarsel/presets/extensions.h"
#include "tarsel/presets/presetsearch.h"
#include "tarsel/words/messages.h"

namespace {

using Names = std::vector<std::string>;

int kindOf(const CodecWords& words) {
    return words.type == qvVideoStream ? QvModuleType::videoEncoder : QvModuleType::audioEncoder;
}

bool installed(const std::string& module) { return qv_registry()->module(module.c_str()) != nullptr; }

Names namesIn(const AnyVector& modules) {
    Names names;
    for (const Any& module : modules) names.emplace_back(module.toString().asString(""));
    return names;
}

// As people call them, each once.
std::string codecsOf(const Names& modules) {
    Names names;
    for (const std::string& module : modules)
        if (const std::string name = codecOfModule(module);
            std::find(names.begin(), names.end(), name) == names.end())
            names.push_back(name);
    return names.empty() ? "none" : joined(names);
}

// An empty one stands for any multiplexer.
Names encodersOf(const QvPreset& preset, const std::string& muxer, int kind) {
    return namesIn(muxer.empty() ? preset.codecs(kind) : preset.getCompatible(muxer.c_str(), kind));
}

// The encoder for the words under a preset; empty where they leave it open, nothing where it has none.
std::optional<std::string> encoderFor(const CodecWords& words, const QvPreset& preset,
                                      const std::string& muxer) {
    if (words.modules.empty()) return "";
    const Names there = encodersOf(preset, muxer, kindOf(words));
    for (const std::string& module : words.modules)
        if (std::find(there.begin(), there.end(), module) != there.end()) return module;
    return std::nullopt;
}

std::optional<ChosenEncoders> encodersFor(const OutputWish& wish, const QvPreset& preset,
                                          const std::string& muxer) {
    const auto video = encoderFor(wish.video, preset, muxer), audio = encoderFor(wish.audio, preset, muxer);
    if (!video || !audio) return std::nullopt;
    return ChosenEncoders{*video, *audio};
}

// The multiplexers that can write the output, the preferred one first; none where any may.
Names muxersOf(const OutputWish& wish, const PresetExtension* row) {
    if (!wish.muxer.empty()) return {wish.muxer};
    Names muxers;
    if (row)
        for (const char* const muxer : {row->muxer, row->otherMuxer})
            if (muxer) muxers.emplace_back(muxer);
    return muxers;
}

// Of a name or a symbol; nothing if it is not installed.
std::optional<QvPreset> installedPreset(const std::string& name) {
    const QvPresetMgr& catalogue = *qvPresetMgr();
    int index = catalogue.builtinPresets().indexOfName(name.c_str());
    if (const int profile = qvSymToProfile(name.c_str()); index < 0 && profile >= 0)
        index = catalogue.findByProfile(profile);
    return index < 0 ? std::nullopt : std::optional(catalogue.builtinPreset(index));
}

// All presets in the order in which they are tried: those of the codecs and of the extension, then the
// others, of which the one with the most encoders is made for the least particular purpose.
std::vector<QvPreset> candidates(const OutputWish& wish, const PresetExtension* row) {
    std::vector<QvPreset> all;
    const auto add = [&](const std::string& name) {
        if (const auto preset = installedPreset(name)) all.push_back(*preset);
    };
    for (const CodecWords* const words : {&wish.video, &wish.audio})
        if (!words->preset.empty()) add(words->preset);
    if (row)
        for (const char* const name : row->presets)
            if (name) add(name);
    const auto first = static_cast<std::ptrdiff_t>(all.size());
    const QvPresetList& builtin = qvPresetMgr()->builtinPresets();
    for (int i = 0; i < builtin.size(); ++i) all.push_back(builtin.preset(i));
    std::stable_sort(all.begin() + first, all.end(), [](const QvPreset& a, const QvPreset& b) {
        const auto encoders = [](const QvPreset& preset) {
            return preset.videoCodecs().size() + preset.audioCodecs().size();
        };
        return encoders(a) > encoders(b);
    });
    return all;
}

std::string reasonFor(const OutputWish& wish, const std::string& muxer) {
    std::string reason;
    for (const CodecWords* const words : {&wish.video, &wish.audio})
        if (words->given() && !words->none)
            reason += (reason.empty() ? "for " : " and ") + words->option + " " + inQuotes(words->name);
    if (reason.empty()) return "the first installed one for ." + wish.extension;
    return reason + (muxer.empty() ? "" : " in " + muxer);
}

// Null if no preset joins them.
std::shared_ptr<const OutputPreset> search(const OutputWish& wish, const PresetExtension* row) {
    Names muxers = muxersOf(wish, row);
    if (muxers.empty()) muxers = {""};
    for (const QvPreset& preset : candidates(wish, row))
        for (const std::string& muxer : muxers) {
            if (!muxer.empty() && !preset.muxerAllowed(muxer.c_str())) continue;
            if (const auto encoders = encodersFor(wish, preset, muxer))
                return std::make_shared<OutputPreset>(preset, muxer, *encoders, reasonFor(wish, muxer));
        }
    return nullptr;
}

void requireMuxer(const OutputWish& wish, const Names& muxers) {
    if (!muxers.empty() && std::none_of(muxers.begin(), muxers.end(), installed))
        throw failure(Msg::muxerMissing, {wish.output, joined(muxers, " or ")});
}

[[noreturn]] void refuse(const OutputWish& wish, const Names& muxers) {
    requireMuxer(wish, muxers);
    const QvPresetMgr& catalogue = *qvPresetMgr();
    Names all;
    for (const CodecWords* const words : {&wish.video, &wish.audio}) {
        if (words->modules.empty()) continue;
        all.push_back(words->modules.front());
        Names taken;
        for (const std::string& muxer : muxers)
            for (const std::string& module : namesIn(catalogue.getCompatible(muxer.c_str(), kindOf(*words))))
                taken.push_back(module);
        const bool fits = std::any_of(words->modules.begin(), words->modules.end(), [&](const auto& module) {
            return std::find(taken.begin(), taken.end(), module) != taken.end();
        });
        if (!muxers.empty() && !fits)
            throw failure(Msg::codecMuxer,
                          {words->option, words->name, joined(muxers, " or "), wish.output, codecsOf(taken)});
    }
    if (!muxers.empty()) all.push_back(joined(muxers, " or "));
    throw failure(Msg::codecsApart, {wish.output, joined(all, " and ")});
}

// The words of an extension's own codec; without modules where none is installed.
CodecWords defaultWords(const char* codec, int type, std::string& missing) {
    CodecWords words;
    words.type = type;
    const CodecName* const row = codec ? codecName(codec, type) : nullptr;
    if (!row) return words;
    for (const char* const module : row->encoders())
        if (installed(module)) words.modules.emplace_back(module);
    if (words.modules.empty()) missing += (missing.empty() ? "" : ", ") + std::string(row->modules[0]);
    return words;
}

// The first preset of an extension, or one with the codecs that are usual for it.
std::shared_ptr<const OutputPreset> byExtension(const OutputWish& wish, const PresetExtension& row) {
    const Names muxers = muxersOf(wish, &row);
    for (const char* const name : row.presets)
        if (const auto preset = name ? installedPreset(name) : std::nullopt)
            for (const char* const muxer : {row.muxer, row.otherMuxer})
                if (muxer && preset->muxerAllowed(muxer))
                    return std::make_shared<OutputPreset>(*preset, wish.muxer.empty() ? muxer : wish.muxer,
                                                          ChosenEncoders(), reasonFor(wish, ""));
    std::string missing;
    OutputWish usual = wish;
    usual.video = defaultWords(row.video, qvVideoStream, missing);
    usual.audio = defaultWords(row.audio, qvAudioStream, missing);
    const CodecWords& needed = row.soundOnly() ? usual.audio : usual.video;
    if (!needed.modules.empty()) {
        if (auto found = search(usual, &row)) return found;
        if (!row.soundOnly()) usual.audio.modules.clear();
        if (auto found = search(usual, &row)) return found;
    }
    std::string absent;
    for (const std::string& muxer : muxers)
        if (!installed(muxer)) absent += (absent.empty() ? "" : ", ") + muxer;
    if (!needed.modules.empty()) missing = "";
    if (!absent.empty()) missing += (missing.empty() ? "" : ", ") + absent;
    throw failure(Msg::outputNoPreset, {wish.output, missing.empty() ? "no installed preset writes it"
                                                                     : "not installed: " + missing});
}

// Files that the tool writes without a preset hold raw streams.
std::shared_ptr<const OutputPreset> ownOutput(const OutputWish& wish, const PresetExtension* row) {
    const auto isRaw = [](const CodecWords& words) {
        return std::all_of(words.modules.begin(), words.modules.end(), isRawEncoderName);
    };
    const auto takesRaw = [](const CodecWords& words) {
        return words.modules.empty() || isRawEncoderName(words.modules.front());
    };
    if (takesRaw(wish.video) && takesRaw(wish.audio)) {
        const bool avi = wish.extension == "avi";
        const auto preset = installedPreset(avi ? "AVI_RAW" : "RAW");
        return preset ? std::make_shared<OutputPreset>(*preset, avi ? "rawavimux" : "rawmux") : nullptr;
    }
    for (const CodecWords* const words : {&wish.video, &wish.audio})
        if (!row && !isRaw(*words))
            throw failure(Msg::codecFormat, {words->option, words->name, wish.output, "raw streams alone"});
    return nullptr;
}

std::shared_ptr<const OutputPreset> namedPreset(const OutputWish& wish, const PresetExtension* row) {
    const QvPreset preset = findPreset(wish.preset);
    std::string muxer = wish.muxer;
    // A user's preset was kept for a multiplexer, but the output is what its name says.
    const Any kept = preset.isCustom() ? preset.defaultMuxer() : Any();
    const bool fits = row && kept.isText() && (kept == row->muxer || kept == row->otherMuxer);
    for (const std::string& own : muxersOf(wish, fits ? nullptr : row))
        if (muxer.empty() && preset.muxerAllowed(own.c_str())) muxer = own;
    const std::string writer = muxer.empty() ? preset.defaultMuxer().toString().asString("") : muxer;
    ChosenEncoders encoders;
    for (const CodecWords* const words : {&wish.video, &wish.audio}) {
        const auto encoder = encoderFor(*words, preset, writer);
        if (!encoder)
            throw failure(Msg::codecPreset, {words->option, words->name, preset.name(),
                                             codecsOf(encodersOf(preset, writer, kindOf(*words)))});
        (words->type == qvVideoStream ? encoders.video : encoders.audio) = *encoder;
    }
    return std::make_shared<OutputPreset>(preset, muxer, encoders);
}

}  // namespace

std::shared_ptr<const OutputPreset> outputPreset(const OutputWish& wish) {
    const PresetExtension* const row = presetExtension(wish.extension);
    if (!wish.preset.empty()) return namedPreset(wish, row);
    if (!wish.namesCodecs()) return row && !wish.own ? byExtension(wish, *row) : nullptr;
    if (wish.own)
        if (auto raw = ownOutput(wish, row)) return raw;
    if (row && row->soundOnly() && !wish.video.modules.empty())
        throw failure(Msg::codecFormat, {wish.video.option, wish.video.name, wish.output, "sound alone"});
    // An extension that means nothing is refused where the output's form is known.
    if (!row && wish.muxer.empty() && !wish.extension.empty()) return nullptr;
    OutputWish whole = wish;
    std::string missing;
    if (row && wish.video.modules.empty() && !wish.video.none && !row->soundOnly())
        whole.video = defaultWords(row->video, qvVideoStream, missing);
    if (row && wish.audio.modules.empty() && !wish.audio.none)
        whole.audio = defaultWords(row->audio, qvAudioStream, missing);
    if (auto found = search(whole, row)) return found;
    if (auto found = search(wish, row)) return found;
    refuse(wish, muxersOf(wish, row));
}
