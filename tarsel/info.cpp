#include <cstdio>

#include <nlohmann/json.hpp>

#include "commands.h"
#include "failure.h"
#include "source.h"
#include "timespec.h"

namespace {

using Json = nlohmann::ordered_json;

std::string text(const Any& value) {
    const Any narrow = value.isWString() ? value.toString() : value;
    return narrow.isString() ? narrow.asString() : "";
}

// File names need not be UTF-8; JSON does.
std::string validUtf8(const std::string& bytes) {
    return Json::parse(Json(bytes).dump(-1, ' ', false, Json::error_handler_t::replace)).get<std::string>();
}

Json describeStream(const QvDecodePipe& decoder, int type, int number) {
    AnyDict p;
    decoder.getStreamParams(type, number, p);
    Json stream;
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
            stream["rate"] = std::to_string(rate.rate().num) + "/" + std::to_string(rate.rate().den);
            stream["scan"] = rate.interlaced() == 0 ? "progressive"
                             : rate.isTopFirst()    ? "top first"
                                                    : "bottom first";
        }
        if (p.get("frameAspect").isDouble()) stream["frame_aspect"] = p.get("frameAspect").asDouble();
        integer("frames", "frames");
        integer("nrViews", "views");
    } else if (type == 4) {
        if (p.get("framerate").isFramerate())
            stream["timecode"] = text(p.get("framerate").asFramerate().desc(true, false));
        integer("frames", "frames");
        integer("pairs", "pairs");
    } else {
        integer("samplerate", "samplerate");
        integer("channels", "channels");
        integer("bitsPerSample", "bits");
        integer("samples", "samples");
    }
    if (p.get("duration").isDouble()) stream["duration_s"] = p.get("duration").asDouble();
    return stream;
}

Json describe(const Source& source) {
    Json file;
    file["file"] = validUtf8(source.name());
    file["decoder"] = source.decoder().name();
    const Any bytes = source.decoder().QvCodec::getParam("filesize");
    if (bytes.isInt()) file["bytes"] = bytes.toInt64();
    const double duration = source.duration();
    file["duration_s"] = duration < 0 ? Json(nullptr) : Json(duration);
    file["streams"] = Json::array();
    for (int type : {1, 2, 4})
        for (int i = 0; i < source.decoder().nrStreams(type); ++i)
            file["streams"].push_back(describeStream(source.decoder(), type, i));
    const std::string damage = source.damage();
    if (!damage.empty()) file["damage"] = damage;
    return file;
}

void print(const Json& file) {
    std::printf("%s\n", inQuotes(file["file"].get<std::string>()).c_str());
    std::printf("  decoder   %s\n", file["decoder"].get<std::string>().c_str());
    if (file.contains("bytes"))
        std::printf("  size      %s\n", formatBytes(file["bytes"].get<long long>()).c_str());
    if (!file["duration_s"].is_null())
        std::printf("  duration  %s\n", formatTime(file["duration_s"].get<double>()).c_str());
    for (const auto& s : file["streams"]) {
        std::printf("  %s %lld  ", s["type"].get<std::string>().c_str(), s["number"].get<long long>());
        bool first = true;
        for (const auto& [key, value] : s.items()) {
            if (key == "type" || key == "number") continue;
            std::printf("%s%s %s", first ? "" : ", ", key.c_str(),
                        value.is_string() ? value.get<std::string>().c_str() : value.dump().c_str());
            first = false;
        }
        std::printf("\n");
    }
    if (file.contains("damage")) std::printf("  damaged: %s\n", file["damage"].get<std::string>().c_str());
}

}  // namespace

void addInfo(CLI::App& app, Action& chosen) {
    CLI::App* command = app.add_subcommand("info", "Show streams, formats and durations of files");
    struct Given {
        std::vector<std::string> files;
        std::string raw;
        bool json = false;
    };
    auto given = std::make_shared<Given>();
    command->add_option("FILE", given->files, "Files, or testgen:...")->required();
    command->add_option("--raw", given->raw, "Format of a raw file: size=WxH,pixel=FORMAT,rate=R")
        ->type_name("K=V,...");
    command->add_flag("--json", given->json, "Print JSON, one array of files");
    command->callback([&chosen, given] {
        chosen = [given] {
            Json all = Json::array();
            std::string failed;
            for (const auto& name : given->files) {
                try {
                    const Source source(name, given->raw);
                    all.push_back(describe(source));
                    if (!given->json) print(all.back());
                } catch (const Failure& failure) {
                    if (failure.exit() != Exit::input || given->files.size() == 1) throw;
                    std::fprintf(stderr, "tarsel: %s\n", failure.what());
                    failed = name;
                }
            }
            if (given->json) std::printf("%s\n", all.dump(2).c_str());
            if (!failed.empty()) throw Failure(Exit::input, "not all files could be opened");
        };
    });
}
