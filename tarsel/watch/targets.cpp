#include "tarsel/watch/targets.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <optional>

#include "tarsel/host/follow/filefacts.h"
#include "tarsel/presets/outputpreset.h"
#include "tarsel/presets/presetsearch.h"
#include "tarsel/words/messages.h"

namespace {

struct Wanted {
    QvPreset preset;
    std::string folder;  // "" if none was given
};

std::optional<QvPreset> presetNamed(const std::string& name) {
    try {
        return findPreset(name);
    } catch (const Failure&) {
        return std::nullopt;
    }
}

// Names of presets may have colons, and so may folders: the longest preset counts.
Wanted parse(const std::string& text) {
    if (auto preset = presetNamed(text)) return {*preset, ""};
    for (size_t colon = text.rfind(':'); colon != std::string::npos && colon > 0;
         colon = text.rfind(':', colon - 1)) {
        const auto preset = presetNamed(text.substr(0, colon));
        if (!preset) continue;
        if (colon + 1 == text.size()) throw failure(Msg::watchFolderMissing, {text});
        return {*preset, text.substr(colon + 1)};
    }
    return {findPreset(text.substr(0, text.find(':'))), ""};  // which throws
}

QvPreset withTarget(const Wanted& wanted, const std::string& base) {
    AnyDict target;
    target.set("outputFolder", realName(wanted.folder.empty() ? base : wanted.folder).c_str());
    target.set("presetSubfolder", wanted.folder.empty());
    QvPreset preset = wanted.preset;
    preset.set("__target__", target);
    return preset;
}

std::string extensionOf(const OutputPreset& preset) {
    const auto pipe = preset.makePipe(preset.muxer().c_str());
    Any extension;
    pipe->getParam("extension", extension);
    return extension.asString("");
}

}  // namespace

WatchTargets::WatchTargets(const std::vector<std::string>& given, const std::string& base,
                           const std::string& watched) {
    QvPresetList presets;
    for (const std::string& text : given) presets.append(withTarget(parse(text), base));
    task_ = QvWatchTask(presets);
    for (int i = 0; i < count(); ++i) {
        const OutputPreset preset(task_.preset(i), "");
        const bool raw = preset.isRaw() && preset.muxer() != "rawavimux";
        const std::string name = qv_os_name(task_.outputFilename(i, Any("x"), "y"));
        Row row{std::filesystem::path(name).parent_path().string(), raw ? "yuv" : extensionOf(preset), raw};
        if (isWithin(realName(row.folder), watched)) throw failure(Msg::watchOutputInside, {row.folder});
        for (const Row& other : rows_)
            if (other.folder == row.folder && (other.extension == row.extension || (other.raw && row.raw)))
                throw failure(Msg::watchSameOutputs, {row.folder});
        rows_.push_back(row);
    }
}

void WatchTargets::makeFolders() const {
    for (const Row& row : rows_) ::makeFolders(row.folder);
}

std::vector<std::string> WatchTargets::outputs(int target, const std::string& input, bool soundOnly) const {
    const Row& row = rows_[static_cast<size_t>(target)];
    std::string name = std::filesystem::path(input).filename().string();
    std::replace_if(
        name.begin(), name.end(), [](char c) { return c == '%' || c == '\\'; }, '_');
    // The folder is that of the task; the name is made of bytes, which need not be text.
    const auto with = [&](const std::string& extension) {
        return (std::filesystem::path(row.folder) / std::filesystem::path(name).replace_extension(extension))
            .string();
    };
    if (!row.raw) return {with(row.extension)};
    // The sound of pictures is a file next to them.
    return soundOnly ? std::vector{with("wav")} : std::vector{with(row.extension), with("wav")};
}
