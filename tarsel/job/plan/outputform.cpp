#include "tarsel/job/plan/outputform.h"

#include <filesystem>
#include <string_view>
#include <vector>

#include "tarsel/host/files.h"
#include "tarsel/presets/extensions.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/rawnames.h"
#include "tarsel/words/timespec.h"

namespace {

struct KindRow {
    std::string_view extension;
    OutputKind kind;
};

// In addition to the names of raw files.
constexpr KindRow kKinds[] = {
    {"wav", OutputKind::wav},
    {"png", OutputKind::pictures},
    {"avi", OutputKind::avi},
};

// What the tool writes without a preset for an extension.
std::optional<OutputKind> ownKind(const std::string& extension) {
    for (const KindRow& row : kKinds)
        if (extension == row.extension) return row.kind;
    return rawName(extension) ? std::optional(OutputKind::raw) : std::nullopt;
}

// The kind that the preset makes. A file name that means another format is refused.
OutputKind kindOf(const PlanOptions& options, const OutputPreset& preset, OutputPlace place) {
    const auto named = ownKind(formatName(options));
    const bool avi = named == OutputKind::avi;
    const auto requireName = [&](bool fits) {
        if (!fits) throw failure(Msg::presetOutput, {options.output, preset.name()});
    };
    if (!preset.isRaw()) {
        requireName(!named || (avi && preset.muxer().ends_with("avimux")));
        return OutputKind::module;
    }
    requireName(!named || avi == (preset.muxer() == "rawavimux"));
    if (preset.muxer() == "rawavimux") return OutputKind::avi;
    if (named) return *named;
    if (place != OutputPlace::files) return OutputKind::byInput;
    return preset.has(qvVideoStream) ? OutputKind::raw : OutputKind::wav;
}

OutputKind kindOf(const PlanOptions& options, OutputPlace place) {
    if (options.kind) return *options.kind;
    if (options.preset) return kindOf(options, *options.preset, place);
    const std::string extension = formatName(options);
    if (const auto own = ownKind(extension)) return *own;
    std::vector<std::string> known;
    for (const auto& row : kKinds) known.emplace_back(row.extension);
    for (const auto& row : rawNames()) known.emplace_back(row.extension);
    const std::string near = suggestion(extension, known), hint = near.empty() ? near : "." + near;
    if (const OpenName* open = openName(extension))
        throw failure(Msg::outputNameOpen, {options.output, extension, open->instead});
    if (!options.format.empty()) throw failure(Msg::formatUnknown, {options.format, hint});
    if (options.output == "-") throw failure(Msg::streamNeedsFormat);
    if (place != OutputPlace::files) return OutputKind::byInput;
    requireNoFolder(options.output, "avi");
    if (extension.empty()) throw failure(Msg::outputFormatMissing, {options.output});
    throw failure(Msg::outputFormatUnknown, {options.output, extension, hint});
}

// A name such as "x.uyvy" says the pixel format.
std::string pixelOf(const PlanOptions& options, OutputKind kind) {
    const std::string& given = options.effects.pixel;
    const RawName* name = kind == OutputKind::raw && !options.kind ? rawName(formatName(options)) : nullptr;
    if (!name || name->fourcc == 0) return given;
    if (given.empty()) return fourccText(name->fourcc);
    const unsigned fourcc = parsePixel(given, "--pixel");
    if (nameAllows(*name, fourcc, false)) return given;
    const std::string shown = options.format.empty() ? options.output : "--format " + options.format;
    throw failure(Msg::outputNameSays, {given, shown, fourccText(name->fourcc), extensionFor(fourcc)});
}

void checkMuxer(const PlanOptions& options, OutputKind kind) {
    const char* const writer = kind == OutputKind::avi ? "rawavimux" : "rawmux";
    if (!options.kind && !options.preset && !options.muxer.empty() && options.muxer != writer)
        throw failure(Msg::muxerOther, {options.muxer, options.output, writer});
}

void checkStream(const PlanOptions& options, OutputKind kind) {
    const char* files = kind == OutputKind::avi        ? "an AVI file"
                        : kind == OutputKind::pictures ? "a sequence of PNG files"
                                                       : nullptr;
    if (files) throw failure(Msg::streamOfFiles, {options.output, files});
    if (options.splitChannels) throw failure(Msg::streamOfChannels, {options.output});
}

// Numbered names are those of pictures, of channels, and of several streams.
void takeNumbers(const PlanOptions& options, OutputForm& form) {
    if (form.kind == OutputKind::avi) return;
    const std::filesystem::path output(options.output);
    const std::string name = output.filename().string();
    const bool pictures = form.kind == OutputKind::pictures;
    form.numbered = pictures ? NumberedName::parseStrictly(name) : NumberedName::parse(name);
    if (form.numbered && !options.saveTask.empty()) throw failure(Msg::numberNotStored, {options.output});
    if (pictures && !form.numbered)
        form.name = std::filesystem::path(output).replace_filename(withoutEscapes(name)).string();
}

}  // namespace

std::string formatName(const PlanOptions& options) {
    return extensionOf(options.format.empty() ? options.output : "x." + options.format);
}

bool writesItself(const std::string& extension) { return ownKind(extension) || openName(extension); }

const char* OutputForm::muxer() const {
    if (writesNothing()) return "nullmux";
    if (kind == OutputKind::module) return muxerModule.c_str();
    return kind == OutputKind::avi ? "rawavimux" : "rawmux";
}

std::string OutputForm::extension(bool hasVideo) const {
    switch (kind) {
        case OutputKind::wav: return "wav";
        case OutputKind::avi: return "avi";
        case OutputKind::pictures: return "png";
        case OutputKind::module: return extensionOf(name);
        default: return hasVideo ? "raw" : "wav";
    }
}

OutputForm outputForm(const PlanOptions& options, OutputPlace place) {
    OutputForm form;
    form.place = place;
    form.name = options.output;
    form.pixel = options.effects.pixel;
    form.splitChannels = options.splitChannels;
    form.muxerSettings = options.muxerSettings;
    if (form.name.empty() && !options.inputs.empty()) form.name = options.inputs.front();
    if (place == OutputPlace::nowhere) return form;
    form.kind = kindOf(options, place);
    checkMuxer(options, form.kind);
    form.pixel = pixelOf(options, form.kind);
    if (form.kind == OutputKind::module) {
        form.muxerModule = options.preset ? options.preset->muxer() : options.muxer;
        const PresetExtension* const row = presetExtension(formatName(options));
        form.soundOnly = row && row->soundOnly();
        if (row && row->pixel && form.pixel.empty()) form.pixel = row->pixel;
    }
    if (form.isStream()) checkStream(options, form.kind);
    if (form.isFiles()) takeNumbers(options, form);
    return form;
}
