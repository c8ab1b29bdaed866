// tarsel presets: lists the presets, and keeps those of the user.
#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/signals.h"
#include "tarsel/presets/encoderoptions.h"
#include "tarsel/presets/outputpreset.h"
#include "tarsel/presets/presetchoice.h"
#include "tarsel/presets/presetimport.h"
#include "tarsel/presets/presetsearch.h"
#include "tarsel/presets/presetstore.h"
#include "tarsel/presets/presettext.h"
#include "tarsel/presets/presetwords.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/rawnames.h"
#include "tarsel/words/timespec.h"

namespace {

std::string presetsText(int count) { return std::to_string(count) + (count == 1 ? " preset" : " presets"); }

struct Given {
    std::string action = "list";
    std::vector<std::string> words;
    std::string output;
    bool all = false, json = false, overwrite = false;
    // Of save.
    std::string base, muxer, size, rate, pixel, samplerate, channels, bits, vcodec, acodec;
    EncoderOptions encoders;
    bool noVideo = false, noAudio = false;
};

void say(const std::string& line) { tell(Level::note, line); }

void list(const Given& given) {
    const Json rows = presetRows(PresetStore::read(), given.all);
    if (given.json)
        print("%s\n", rows.dump(2).c_str());
    else
        printText(presetListText(rows));
}

void show(const Given& given) {
    const QvPreset preset = findPreset(given.words[0]);
    if (given.json)
        print("%s\n", presetJson(preset).dump(2).c_str());
    else
        printText(presetText(preset));
}

// --- save

void setPicture(const Given& given, QvEncoder& encoder) {
    if (!given.size.empty()) {
        const Size size = parseSize(given.size, "--size");
        setChecked(encoder, "width", size.width, "--size");
        setChecked(encoder, "height", size.height, "--size");
    }
    if (!given.rate.empty()) setChecked(encoder, "framerate", Any(parseRate(given.rate, "--rate")), "--rate");
    if (!given.pixel.empty())
        setChecked(encoder, "type", static_cast<int>(parsePixel(given.pixel, "--pixel")), "--pixel");
}

void setSound(const Given& given, QvEncoder& encoder) {
    const struct {
        const std::string& text;
        const char *param, *option;
        int low, high;
    } rows[] = {{given.samplerate, "samplerate", "--samplerate", 1000, 768000},
                {given.channels, "channels", "--channels", 1, 8},
                {given.bits, "bitsPerSample", "--bits", 8, 24}};
    for (const auto& row : rows)
        if (!row.text.empty())
            setChecked(encoder, row.param,
                       static_cast<int>(parseNumber(row.text, row.low, row.high, row.option)), row.option);
}

// A raw encoder takes what comes. What nobody asked it for is left to the inputs, and not to its defaults.
void leaveOpen(const Given& given, const OutputPreset& base, QvPreset& preset) {
    const struct {
        const char* param;
        bool asked;
    } rows[] = {{"width", !given.size.empty()},
                {"height", !given.size.empty()},
                {"framerate", !given.rate.empty()},
                {"type", !given.pixel.empty()},
                {"samplerate", !given.samplerate.empty()},
                {"channels", !given.channels.empty()},
                {"bitsPerSample", !given.bits.empty()}};
    for (Any& stream : preset.get("streams").asVector()) {
        AnyDict& codec = stream.asDict().get("codec").asDict();
        if (!isRawEncoderName(codec.getString("name", "")) || !codec.get("settingsDict").isDict()) continue;
        AnyDict& settings = codec.get("settingsDict").asDict();
        const AnyDict before = base.storedCodec(stream.asDict().getInt32("type"));
        for (const auto& row : rows)
            if (!row.asked && !before.isSet(row.param)) settings.remove(row.param);
        stream.asDict().remove("codecInfo");  // it is of the defaults, too
    }
}

// What the preset asks for, and nothing that it leaves open.
std::string infoOf(const OutputPreset& preset, const QvEncodePipe& pipe) {
    std::vector<std::string> parts = {std::string("Format: ") + pipe.getMuxer()->displayName()};
    if (const QvEncoder* const encoder = pipe.videoEncoder(0)) {
        const PresetPicture picture = preset.picture(*encoder, 0, false);
        std::string text = std::string("Video: ") + encoder->displayName();
        if (picture.width && picture.height)
            text += ", " + std::to_string(*picture.width) + "x" + std::to_string(*picture.height);
        if (picture.rate) text += ", " + formatRate(*picture.rate);
        if (picture.fourcc) text += ", " + fourccText(*picture.fourcc);
        parts.push_back(text);
    }
    if (const QvEncoder* const encoder = pipe.audioEncoder(0)) {
        const PresetSound sound = preset.sound(*encoder, 0, false);
        std::string text = std::string("Audio: ") + encoder->displayName();
        if (sound.samplerate) text += ", " + std::to_string(*sound.samplerate) + "Hz";
        if (sound.channels) text += ", " + std::to_string(*sound.channels) + " ch";
        if (sound.bits) text += ", " + std::to_string(*sound.bits) + " bit";
        parts.push_back(text);
    }
    return joined(parts, "; ");
}

QvPreset presetOf(const Given& given, const std::string& name) {
    OutputWish wish;
    wish.output = name;
    wish.muxer = given.muxer;
    wish.video = parseCodec(given.vcodec, qvVideoStream);
    wish.audio = parseCodec(given.acodec, qvAudioStream);
    wish.preset = given.base.empty() && !wish.namesCodecs() ? "RAW" : given.base;
    EncoderOptions encoders = given.encoders;
    encoders.video = wish.video.settings;
    encoders.audio = wish.audio.settings;
    encoders.check();
    const auto chosen = outputPreset(wish);  // there is one: a preset is named, or a codec is
    const OutputPreset& base = *chosen;
    const auto pipe = base.makePipe(base.muxer().c_str());
    const auto add = [&](int type, bool without, auto set) {
        if (!base.has(type) || without) {
            if (const std::string option = encoders.given(type); !option.empty())
                throw failure(Msg::encoderNoStream, {option, type == qvVideoStream ? "picture" : "sound"});
            return;
        }
        QvEncoder& encoder = base.addStream(*pipe, type);
        set(given, encoder);
        setEncoder(encoder, type, encoders, name);
        type == qvVideoStream ? checkQuality(encoder) : setSoundRate(encoder, encoders);
    };
    add(qvVideoStream, given.noVideo || wish.video.none, setPicture);
    add(qvAudioStream, given.noAudio || wish.audio.none, setSound);
    QvPreset preset(pipe.get(), name.c_str());
    preset.setShortName(name.c_str());
    leaveOpen(given, base, preset);
    if (base.isRaw()) preset.setInfo(infoOf(OutputPreset(preset, ""), *pipe).c_str());
    return preset;
}

void save(const Given& given) {
    const std::string& name = given.words[0];
    requireFreeName(name);
    const QvPreset preset = presetOf(given, name);
    PresetStore::change([&](QvUserPresets& presets) {
        const int place = presetPlace(presets, name);
        if (place >= 0 && !given.overwrite) throw failure(Msg::presetExists, {presets.at(place).name()});
        presets.set(place >= 0 ? presets.at(place).name() : name.c_str(), preset);
    });
    say("saved the preset " + inQuotes(name));
}

// --- changes of what is stored

void remove(const Given& given) {
    PresetStore::change(
        [&](QvUserPresets& presets) { presets.remove(findUserPreset(presets, given.words[0])); });
    say("removed the preset " + inQuotes(given.words[0]));
}

void rename(const Given& given) {
    const std::string& name = given.words[1];
    requireFreeName(name);
    PresetStore::change([&](QvUserPresets& presets) {
        const int place = findUserPreset(presets, given.words[0]);
        const int used = presetPlace(presets, name);
        if (used >= 0 && used != place) throw failure(Msg::presetExists, {presets.at(used).name()});
        QvPreset renamed = presets.at(place);
        renamed.setName(name.c_str());
        renamed.setShortName(name.c_str());
        presets.AnyVector::set(place, Any(renamed));
    });
    say("renamed the preset " + inQuotes(given.words[0]) + " to " + inQuotes(name));
}

void import(const Given& given) {
    ImportReport report;
    PresetStore::change(
        [&](QvUserPresets& presets) { report = importPresets(given.words[0], given.overwrite, presets); });
    for (const std::string& line : report.lines) say(line);
    for (const std::string& line : report.skipped) tell(Level::warning, inLine(line));
    say("imported " + std::to_string(report.added + report.replaced) + " of " +
        presetsText(report.added + report.replaced + static_cast<int>(report.skipped.size())));
}

void exportTo(const Given& given, Signals& signals) {
    if (given.output.empty()) throw failure(Msg::presetWords, {"export", "-o FILE as well"});
    const QvUserPresets own = PresetStore::read();
    QvUserPresets chosen;
    for (const std::string& name : given.words) chosen.append(own.at(findUserPreset(own, name)));
    Outputs outputs(given.output, "-o", {PresetStore::fileName()}, OutputPolicy(given.overwrite));
    const Signals::Watch placing(signals, {.first = {}, .second = [&] { return outputs.leave(); }});
    storePresets(outputs.begin("xml"), chosen);
    outputs.commit();
    say("wrote " + inQuotes(given.output) + ", " + presetsText(chosen.count()));
}

void check(const Given& given) {
    QvUserPresets presets;
    std::vector<std::string> skipped;
    const std::string file = given.words.empty() ? PresetStore::fileName() : given.words[0];
    if (!given.words.empty() || exists(file)) skipped = loadPresets(file, presets);
    for (const std::string& line : skipped) tell(Level::warning, inLine(line));
    // As they are used.
    const int valid = presets.checkPresets(QvUserPresets::describeInvalid | QvUserPresets::substituteModules);
    for (int i = 0; i < presets.count(); ++i)
        if (QvPreset preset = presets.at(i); !preset.isValid())
            tell(Level::warning, inQuotes(preset.name()) + ": " + inLine(onOneLine(faultOf(preset))));
    const int invalid = presets.count() - valid + static_cast<int>(skipped.size());
    if (invalid > 0) throw failure(Msg::presetsInvalid, {file, std::to_string(invalid)});
    say(presetsText(valid) + (valid == 1 ? " is sound" : " are sound"));
}

// --- what is chosen

struct Action {
    const char* name;
    size_t fewest, most;
    const char* words;
    void (*run)(const Given& given);  // null for export
};

constexpr size_t kMany = 1000000;
constexpr Action kActions[] = {
    {"list", 0, 0, "no further word", list}, {"show", 1, 1, "the NAME of a preset", show},
    {"save", 1, 1, "one NAME", save},        {"remove", 1, 1, "the NAME of a preset", remove},
    {"rename", 2, 2, "OLD and NEW", rename}, {"export", 1, kMany, "NAMEs", nullptr},
    {"import", 1, 1, "one FILE", import},    {"check", 0, 1, "one FILE at most", check},
};

std::vector<std::string> actionNames() {
    std::vector<std::string> names;
    for (const Action& action : kActions) names.emplace_back(action.name);
    return names;
}

void run(const Given& given, Signals& signals) {
    for (const Action& action : kActions) {
        if (given.action != action.name) continue;
        const size_t count = given.words.size();
        if (count < action.fewest || count > action.most)
            throw failure(Msg::presetWords, {given.action, action.words});
        action.run ? action.run(given) : exportTo(given, signals);
    }
}

}  // namespace

void addPresets(CommandLine& line, Signals& signals) {
    Command command = line.command("presets", "List the presets, or keep your own");
    auto given = std::make_shared<Given>();
    command.choiceArgument("ACTION", given->action,
                           "list, show, save, remove, rename, export, import or check", actionNames(),
                           Need::optional);
    command.arguments("NAME", given->words,
                      "Presets; for rename OLD and NEW; for import and check a file of presets", 0,
                      Need::optional);
    command.flag("--all", given->all, "List hidden presets too, and those that wait for a module");
    command.flag("--json", given->json, "Print JSON");
    command.option("-o,--output", given->output, "What export writes", "FILE");
    command.flag("--overwrite", given->overwrite, "Replace presets of the same name, or the file of export");
    command.group("Settings that save keeps");
    command.option("--preset", given->base, "The preset that it rests on (RAW)", "NAME");
    command.option("--muxer", given->muxer, "One of those that the preset allows", "NAME");
    command.option("--vcodec", given->vcodec, "Encoder of the picture; settings as h264:tune=film",
                   "NAME[:K=V,...]");
    command.option("--acodec", given->acodec, "Encoder of the sound; settings as aac:profile=1",
                   "NAME[:K=V,...]");
    command.option("--crf", given->encoders.crf, "Quality that the picture's encoder keeps", "N");
    command.option("--bitrate", given->encoders.bitrate, "Bit rate of the picture: 800k, 5M, ...", "RATE");
    command.option("--audio-bitrate", given->encoders.audioBitrate, "Bit rate of the sound: 128k, ...",
                   "RATE");
    command.flag("--two-pass", given->encoders.twoPass, "Read the picture twice");
    command.option("--size", given->size, "Size of the picture", "WxH");
    command.option("--rate", given->rate, "Frames a second: 25, 30000/1001, 25i, pal, ntsc, film", "RATE");
    command.option("--pixel", given->pixel, "Pixel format, see 'tarsel formats'", "FOURCC");
    command.option("--samplerate", given->samplerate, "Samples a second", "N");
    command.option("--channels", given->channels, "Channels of the sound, 1 to 8", "N");
    command.option("--bits", given->bits, "Bits of a sample: 8, 16 or 24", "N");
    command.flag("--no-video", given->noVideo, "Without pictures");
    command.flag("--no-audio", given->noAudio, "Without sound");
    command.action([&signals, given] { run(*given, signals); });
}
