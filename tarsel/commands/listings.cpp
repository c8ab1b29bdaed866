// What this installation can read and write.
#include "tarsel/commands/commands.h"
#include "tarsel/host/console.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/rawnames.h"
#include "tarsel/words/timespec.h"

namespace {

struct Output {
    const char* extensions;
    const char* what;
    const char* module;  // what it needs
};

constexpr Output kOutputs[] = {
    {"wav", "PCM sound, 8 to 24 bits, 1 to 8 channels", "rawmux"},
    {"png", "one picture a frame, NAME#0.png, or as NAME_%04d.png says; sound in NAME.wav", "scaler"},
    {"avi", "uncompressed pictures and sound in one file", "rawavimux"},
};

Json formats() {
    Json result = Json::object();
    Json inputs = Json::array();
    for (int i = 0; i < qv_registry()->nrModules(0); ++i) {
        QvModule& module = *qv_registry()->module(i);
        if (module.getAttr("type").toInt32() != 2) continue;
        const Any exts = module.getAttr("exts");
        if (!exts.isVector() || exts.asVector().empty()) continue;
        std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module.name()));
        if (!codec) continue;
        Json names = Json::array();
        for (int k = 0; k < exts.asVector().size(); ++k) names.push_back(exts.asVector().at(k).asString());
        inputs.push_back({{"extensions", names}, {"decoder", module.name()}, {"description", module.desc()}});
    }
    result["inputs"] = inputs;
    result["outputs"] = Json::array();
    for (const Output& output : kOutputs)
        if (std::unique_ptr<QvCodec>(qv_registry()->newCodec(output.module)))
            result["outputs"].push_back({{"extensions", output.extensions}, {"description", output.what}});
    std::string raw;
    result["raw_names"] = Json::array();
    for (const RawName& name : rawNames()) {
        raw += (raw.empty() ? "" : " ") + std::string(name.extension);
        result["raw_names"].push_back({{"extension", name.extension},
                                       {"fourcc", name.fourcc ? Json(fourccText(name.fourcc)) : Json()},
                                       {"description", name.bytes}});
    }
    result["outputs"].push_back(
        {{"extensions", raw}, {"description", "raw frames one after the other; sound in NAME.wav"}});
    result["open_names"] = Json::array();
    for (const OpenName& name : openNames())
        result["open_names"].push_back({{"extension", name.extension}, {"instead", name.instead}});
    result["pixels"] = Json::array();
    for (const QvPixelFormat& format : qvPixelFormats())
        result["pixels"].push_back({{"fourcc", fourccText(format.fourcc)}});
    return result;
}

std::string joined(const Json& list) {
    std::string text;
    for (const auto& item : list) text += (text.empty() ? "" : " ") + item.get<std::string>();
    return text;
}

void add(CommandLine& line, const char* name, const char* help, Json (*make)(), void (*show)(const Json&)) {
    Command command = line.command(name, help);
    auto json = std::make_shared<bool>(false);
    command.flag("--json", *json, "Print JSON");
    command.action([json, make, show] {
        const Json data = make();
        if (*json)
            print("%s\n", data.dump(2).c_str());
        else
            show(data);
    });
}

}  // namespace

void addFormats(CommandLine& line) {
    add(line, "formats", "List what can be read and written", formats, [](const Json& data) {
        print("Inputs\n");
        for (const auto& i : data["inputs"])
            print("  %-10s %s: %s\n", i["decoder"].get<std::string>().c_str(),
                  i["description"].get<std::string>().c_str(), joined(i["extensions"]).c_str());
        print("Outputs\n");
        for (const auto& o : data["outputs"])
            print("  %s\n      %s\n", o["extensions"].get<std::string>().c_str(),
                  o["description"].get<std::string>().c_str());
        print("Names of raw files and what is in them\n");
        for (const auto& n : data["raw_names"])
            print("  .%-5s %-5s %s\n", n["extension"].get<std::string>().c_str(),
                  n["fourcc"].is_null() ? "" : n["fourcc"].get<std::string>().c_str(),
                  n["description"].get<std::string>().c_str());
        for (const auto& n : data["open_names"])
            print("  .%-5s -     does not say the order of its bytes; use %s\n",
                  n["extension"].get<std::string>().c_str(), n["instead"].get<std::string>().c_str());
        print("Pixel formats\n ");
        for (const auto& p : data["pixels"]) print(" %s", p["fourcc"].get<std::string>().c_str());
        print("\n");
    });
}
