#include <algorithm>
#include <cstdio>

#include "tarsel/commands/commands.h"
#include "tarsel/host/console.h"
#include "tarsel/host/files.h"
#include "tarsel/host/standardinput.h"
#include "tarsel/job/task/storedtask.h"
#include "tarsel/job/task/tasktext.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

std::string text(const Any& value) {
    const Any narrow = value.isWString() ? value.toString() : value;
    return narrow.isString() ? narrow.asString() : "";
}

// Of captions and subtitles. A rate says nothing about subtitles with clock times.
void describeText(const AnyDict& p, Json& stream) {
    if (p.get("textEncoding").isText()) stream["encoding"] = text(p.get("textEncoding"));
    if (p.get("count").isInt()) stream["subtitles"] = p.get("count").toInt64();
    if (p.get("framerate").isFramerate() && p.getInt32("format", QvSubtitles::SUB) == QvSubtitles::SUB)
        stream["timecode"] = formatTimecodeRate(p.get("framerate").asFramerate());
    const Any& end = p.isSet("end") ? p.get("end") : p.get("last");
    if (!p.get("first").isMediaTime() || !end.isMediaTime()) return;
    stream["first_s"] = p.get("first").asMediaTime().seconds();
    stream["last_s"] = end.asMediaTime().seconds();
}

// The usual name of speakers, or their bits as WAVEFORMATEXTENSIBLE has them.
std::string speakersOf(long long mask) {
    static constexpr struct {
        long long mask;
        const char* name;
    } kKnown[] = {{0x4, "mono"},  {0x3, "stereo"}, {0xb, "2.1"},   {0x7, "3.0"},  {0x33, "quad"},
                  {0x607, "5.0"}, {0x37, "5.0"},   {0x60f, "5.1"}, {0x3f, "5.1"}, {0x63f, "7.1"}};
    for (const auto& known : kKnown)
        if (known.mask == mask) return known.name;
    char text[32];
    std::snprintf(text, sizeof text, "mask 0x%llx", mask);
    return text;
}

Json describeStream(const QvDecodePipe& decoder, int type, int number) {
    AnyDict p;
    decoder.getStreamParams(type, number, p);
    Json stream = Json::object();
    stream["type"] = type == 1 ? "video" : type == 2 ? "audio" : "subpicture";
    stream["number"] = number;
    if (p.get("codec").isText()) stream["codec"] = text(p.get("codec"));
    const auto integer = [&](const char* key, const char* name) {
        if (p.get(key).isInt()) stream[name] = p.get(key).toInt64();
    };
    if (type == 1) {
        stream["pixel"] = fourccText(static_cast<unsigned>(p.getInt32("FOURCC", 0)));
        integer("width", "width");
        integer("height", "height");
        if (p.get("framerate").isFramerate()) {
            const QvFramerate rate = p.get("framerate").asFramerate();
            stream["rate_text"] = formatRate(rate);
            stream["rate"] = std::to_string(rate.rate().num) + "/" + std::to_string(rate.rate().den);
            stream["scan"] = rate.interlaced() == 0 ? "progressive"
                             : rate.isTopFirst()    ? "top first"
                                                    : "bottom first";
        }
        if (p.get("frameAspect").isDouble()) stream["frame_aspect"] = p.get("frameAspect").asDouble();
        integer("frames", "frames");
        integer("nrViews", "views");
    } else if (type == 4) {
        describeText(p, stream);
        integer("frames", "frames");
        integer("pairs", "pairs");
    } else {
        integer("samplerate", "samplerate");
        integer("channels", "channels");
        integer("bitsPerSample", "bits");
        if (p.get("sourceFormat").isText()) stream["source_format"] = text(p.get("sourceFormat"));
        integer("channelMask", "channel_mask");
        integer("samples", "samples");
    }
    const auto words = [&](const char* key, const char* name) {
        if (p.get(key).isText()) stream[name] = validUtf8(text(p.get(key)));
    };
    words("codecProfile", "profile");
    words("language", "language");
    words("title", "title");
    words("conversion", "conversion");
    integer("rotation", "rotation");
    integer("mirrored", "mirrored");
    if (p.get("vBitrate").isDouble() && p.get("vBitrate").asDouble() > 0)
        stream["bit_rate"] = static_cast<long long>(p.get("vBitrate").asDouble());
    if (p.get("aBitrate").isInt()) stream["bit_rate"] = p.get("aBitrate").toInt64() * 1000;
    if (p.get("duration").isDouble()) stream["duration_s"] = p.get("duration").asDouble();
    if (p.isSet("estimated")) stream["estimated"] = true;
    return stream;
}

// Of a dictionary of texts and numbers.
Json plainJson(const AnyDict& dict) {
    Json object = Json::object();
    for (const auto [key, value] : dict) {
        if (value->isText()) object[key] = validUtf8(text(*value));
        if (value->isInt()) object[key] = value->toInt64();
    }
    return object;
}

// Words and marks of a WAV.
void describeWords(const QvDecodePipe& decoder, Json& file) {
    const auto& codec = static_cast<const QvCodec&>(decoder);
    const Any chunks = codec.getParam("chunks"), others = codec.getParam("otherChunks");
    if (chunks.isVector()) {
        const AnyDict described = QvWavChunks::describe(chunks.asVector());
        for (const auto [key, value] : described) {
            if (value->isDict()) file[key] = plainJson(value->asDict());
            if (!value->isVector()) continue;
            file[key] = Json::array();
            for (const Any& entry : value->asVector()) file[key].push_back(plainJson(entry.asDict()));
        }
    }
    if (!others.isVector() || others.asVector().empty()) return;
    file["other_chunks"] = Json::array();
    for (const Any& id : others.asVector()) file["other_chunks"].push_back(id.asString(""));
}

// What a film says of itself.
void describeFilm(const QvDecodePipe& decoder, Json& file) {
    const Any meta = static_cast<const QvCodec&>(decoder).getParam("meta");
    if (!meta.isDict()) return;
    if (const Json words = plainJson(meta.asDict()); !words.empty()) file["meta"] = words;
    const Any& chapters = meta.asDict().get("chapters");
    if (!chapters.isVector()) return;
    for (const Any& chapter : chapters.asVector()) {
        if (!chapter.isDict() || !chapter.asDict().get("time").isMediaTime()) continue;
        Json entry = {{"time_s", chapter.asDict().get("time").asMediaTime().seconds()}};
        if (chapter.asDict().get("title").isText())
            entry["title"] = validUtf8(text(chapter.asDict().get("title")));
        file["chapters"].push_back(entry);
    }
}

Json describe(const Source& source) {
    Json file = Json::object();
    file["file"] = validUtf8(source.name());
    file["decoder"] = source.decoderName();
    if (source.bytes() >= 0) file["bytes"] = source.bytes();
    const double duration = source.duration();
    file["duration_s"] = duration < 0 ? Json(nullptr) : Json(duration);
    file["streams"] = Json::array();
    for (int type : {1, 2, 4})
        for (int i = 0; i < source.decoder().nrStreams(type); ++i)
            file["streams"].push_back(describeStream(source.decoder(), type, i));
    const std::string damage = source.damage();
    if (!damage.empty()) file["damage"] = damage;
    describeWords(source.decoder(), file);
    describeFilm(source.decoder(), file);
    return file;
}

// A text of the file on one line, for a terminal.
std::string oneLine(const Json& value) {
    std::string line = value.is_string() ? value.get<std::string>() : value.dump();
    for (char& c : line)
        if (static_cast<unsigned char>(c) < ' ' || c == 0x7F) c = ' ';
    // Control characters of two bytes, U+0080 to U+009F.
    for (size_t i = 0; i + 1 < line.size(); ++i)
        if (line[i] == '\xC2' && static_cast<unsigned char>(line[i + 1]) < 0xA0) line.replace(i, 2, "  ");
    return line;
}

std::string streamLine(const Json& s) {
    const auto number = [&](const char* key) { return std::to_string(s[key].get<long long>()); };
    const std::string about = s.contains("estimated") ? "about " : "";
    std::string line = s.value("codec", "");
    const auto add = [&](const std::string& part) { line += (line.empty() ? "" : ", ") + part; };
    if (s.contains("profile")) line += (line.empty() ? "" : " ") + oneLine(s["profile"]);
    if (s["type"] == "video") {
        if (s["pixel"] != s.value("codec", "")) add(s["pixel"].get<std::string>());
        if (s.contains("width") && s.contains("height")) add(number("width") + "x" + number("height"));
        if (s.contains("rate"))
            add(s["rate_text"].get<std::string>() + " fps, " + s["scan"].get<std::string>());
        if (s.contains("frames")) add(about + number("frames") + " frames");
        if (s.contains("views") && s["views"] != 1) add(number("views") + " views");
    } else if (s["type"] == "subpicture") {
        if (s.contains("encoding")) add(s["encoding"].get<std::string>());
        if (s.contains("timecode")) add(s["timecode"].get<std::string>());
        if (s.contains("subtitles"))
            add(number("subtitles") + (s["subtitles"] == 1 ? " subtitle" : " subtitles"));
        if (s.contains("frames")) add(number("frames") + " frames");
        if (s.contains("pairs")) add(number("pairs") + " pairs");
        if (s.contains("first_s"))
            add(formatTime(s["first_s"].get<double>()) + " to " + formatTime(s["last_s"].get<double>()));
        if (s.contains("language")) add(oneLine(s["language"]));
        return line;
    } else {
        if (s.contains("samplerate")) add(number("samplerate") + " Hz");
        if (s.contains("channels")) add(number("channels") + " ch");
        if (s.contains("bits")) add(number("bits") + " bit");
        if (s.contains("source_format")) add("from " + s["source_format"].get<std::string>());
        if (s.contains("channel_mask")) add(speakersOf(s["channel_mask"].get<long long>()));
        if (s.contains("samples")) add(about + number("samples") + " samples");
    }
    if (s.contains("bit_rate")) add(std::to_string(s["bit_rate"].get<long long>() / 1000) + " kbit/s");
    if (s.contains("rotation")) add("turned by " + number("rotation") + " degrees");
    if (s.contains("mirrored")) add("mirrored");
    if (s.contains("language")) add(oneLine(s["language"]));
    if (s.contains("duration_s")) add(formatTime(s["duration_s"].get<double>()));
    return line;
}

void printWord(const char* label, const std::string& words) {
    if (!words.empty()) print("  %-9s %s\n", label, words.c_str());
}

void printWords(const Json& file) {
    const auto part = [](const Json& object, const char* key) {
        return object.contains(key) ? oneLine(object[key]) : std::string();
    };
    if (file.contains("bext")) {
        const Json& bext = file["bext"];
        printWord("about", part(bext, "description"));
        printWord("by", part(bext, "originator"));
        const std::string date = part(bext, "originationDate"), time = part(bext, "originationTime");
        printWord("made", date + (date.empty() || time.empty() ? "" : " ") + time);
        printWord("reference", "sample " + part(bext, "timeReference") + " since midnight");
    }
    if (file.contains("info"))
        for (const Json& entry : file["info"]) printWord(part(entry, "id").c_str(), part(entry, "text"));
    if (file.contains("iXML")) {
        std::string line;
        for (const char* key : {"project", "scene", "take", "tape", "note"})
            if (const std::string words = part(file["iXML"], key); !words.empty())
                line += (line.empty() ? "" : ", ") + std::string(key) + " " + words;
        printWord("iXML", line.empty() ? "present" : line);
    }
    if (file.contains("cues"))
        for (const Json& cue : file["cues"])
            printWord("cue", "sample " + part(cue, "position") +
                                 (cue.contains("label") ? ", " + part(cue, "label") : ""));
    if (file.contains("meta"))  // the engine reads "startTimecode", which says no more than "timecode"
        for (const auto& [key, value] : file["meta"].items())
            if (key != "startTimecode") printWord(key == "clipName" ? "clip" : key.c_str(), oneLine(value));
    if (file.contains("chapters"))
        for (const Json& chapter : file["chapters"])
            printWord("chapter", formatTime(chapter["time_s"].get<double>()) +
                                     (chapter.contains("title") ? ", " + part(chapter, "title") : ""));
    if (file.contains("other_chunks")) {
        std::string line;
        for (const Json& id : file["other_chunks"]) line += (line.empty() ? "" : ", ") + oneLine(id);
        printWord("also has", line);
    }
}

void printFile(const Json& file) {
    print("%s\n", inQuotes(file["file"].get<std::string>()).c_str());
    print("  decoder   %s\n", file["decoder"].get<std::string>().c_str());
    if (file.contains("bytes"))
        print("  size      %s\n", formatBytes(file["bytes"].get<long long>()).c_str());
    if (!file["duration_s"].is_null())
        print("  duration  %s\n", formatTime(file["duration_s"].get<double>()).c_str());
    for (const auto& s : file["streams"])
        print("  %s %lld   %s\n", s["type"].get<std::string>().c_str(), s["number"].get<long long>(),
              streamLine(s).c_str());
    printWords(file);
    if (file.contains("damage")) print("  damaged   %s\n", file["damage"].get<std::string>().c_str());
}

// Decoders of other XML files refuse those that they don't know.
bool isTaskFile(const std::string& name) {
    const Any extension = QvFile::getExt(Any(name.c_str()), true);
    if (!(extension == "xml")) return false;
    const std::unique_ptr<QvCodec> clip(qv_registry()->newCodec("p2dec"));
    if (!clip) return true;
    clip->setParam("filename", name.c_str());
    return clip->open() != QvStatus::ok && clip->QvCodec::getParam("foreign").isTrue();
}

Json showTask(const std::string& name, bool json) {
    requireInput(name);
    const StoredTask task(name);
    if (!json) print("%s\n  a sound task\n%s", inQuotes(name).c_str(), taskBrief(task).c_str());
    Json object = {{"file", name}, {"task", "sound"}, {"bytes", fileBytes(name)}};
    object.update(taskBriefJson(task));
    return object;
}

struct Given {
    std::vector<std::string> files;
    std::string raw, inputFormat;
    bool json = false, exact = false;
};

// Looks at every file, also after one that can't be used.
void info(const Given& given) {
    Json all = Json::array();
    std::vector<std::string> failures;
    const auto standard = standardInputOf(given.files, given.inputFormat);
    for (const auto& name : given.files) {
        try {
            if (isTaskFile(name)) {
                all.push_back(showTask(name, given.json));
                continue;
            }
            const Source source(name, given.raw, standard.get(),
                                {.upright = false, .exact = given.exact, .survey = !given.exact});
            all.push_back(describe(source));
            if (!given.json) printFile(all.back());
            if (all.back().contains("damage"))
                failures.push_back(lineOf(Msg::fileDamaged, {name, source.damage()}));
            else
                printWarnings();
        } catch (const Failure& failure) {
            if (failure.exit() != Exit::input) throw;
            failures.push_back(failure.what());
        }
    }
    if (given.json) print("%s\n", all.dump(2).c_str());
    flushOutput();
    if (failures.empty()) return;
    for (size_t i = 0; i + 1 < failures.size(); ++i)
        std::fprintf(stderr, "tarsel: %s\n", failures[i].c_str());
    throw Failure(Exit::input, failures.back());
}

}  // namespace

void addInfo(CommandLine& line) {
    Command command = line.command("info", "Show streams, formats and durations of files");
    auto given = std::make_shared<Given>();
    command.arguments("FILE", given->files, "Files, testgen:..., or - for the standard input");
    command.option("--input-format", given->inputFormat,
                   "What the standard input holds, as an extension: wav, ...", "EXT");
    command.option("--raw", given->raw, "Format of a raw file: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.flag("--json", given->json, "Print JSON, one array of files");
    command.flag("--exact", given->exact, "Read all of a film, also where its tables say what is in it");
    command.action([given] { info(*given); });
}
