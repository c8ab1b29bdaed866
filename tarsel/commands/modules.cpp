// The modules of this installation and their parameters.
#include <set>
#include "tarsel/commands/commands.h"

#include "tarsel/host/console.h"
#include "tarsel/presets/codecnames.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/valuetext.h"

namespace {

const char* kindName(int kind) {
    switch (kind) {
        case 2: return "decoder";
        case 3: return "encode pipe";
        case 5: return "sink";
        case 6: return "audio encoder";
        case 7: return "video encoder";
        case 10: return "multiplexer";
        case 12: return "video filter";
        case 13: return "audio filter";
        case 14: return "video pipe";
        case 16: return "audio pipe";
    }
    return "other";
}

std::string rangeText(const AnyDict& row) {
    const std::string min = valueText(row.get("min")), max = valueText(row.get("max"));
    if (!min.empty() && !max.empty()) return min + " to " + max;
    if (!min.empty()) return "from " + min;
    return max.empty() ? "" : "to " + max;
}

// What the framework and codecs tell each other is nobody's to set.
bool isInternal(const AnyDict& row) { return row.getString("name", "_")[0] == '_'; }

Json parameters(const QvCodec& codec) {
    Json list = Json::array();
    for (const Any& described : qvParameters(codec)) {
        const AnyDict& row = described.asDict();
        if (isInternal(row)) continue;
        const std::string type = row.getString("type", ""), help = row.getString("help", "");
        Json parameter = Json::object();
        parameter["name"] = row.getString("name", "");
        parameter["type"] = type == "Invalid" ? "" : type;
        parameter["unit"] = row.getString("unit", "");
        parameter["range"] = rangeText(row);
        parameter["default"] = row.isSet("readOnly") ? "" : valueText(row.get("default"));
        parameter["meaning"] = help.empty() ? row.getString("description", "") : help;
        parameter["read_only"] = row.isSet("readOnly");
        parameter["needed"] = row.isSet("needed");
        list.push_back(std::move(parameter));
    }
    return list;
}

Json describe(QvModule& module) {
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module.name()));
    Json row = Json::object();
    row["name"] = module.name();
    row["kind"] = kindName(moduleKind(module));
    row["description"] = module.desc();
    row["plugin"] = module.plugin() ? module.plugin()->name() : "";
    row["usable"] = codec != nullptr;
    row["parameters"] = codec ? parameters(*codec) : Json::array();
    return row;
}

std::string text(const Json& row, const char* key) { return row[key].get<std::string>(); }

void printModule(const Json& m) {
    print("%-13s %-14s %s%s\n", text(m, "name").c_str(), text(m, "kind").c_str(),
          text(m, "description").c_str(), m["usable"].get<bool>() ? "" : "  (not usable)");
}

void printParameters(const Json& module) {
    std::string toRead;
    for (const auto& p : module["parameters"]) {
        if (p["read_only"].get<bool>()) {
            toRead += (toRead.empty() ? "" : ", ") + text(p, "name");
            continue;
        }
        std::string values = text(p, "range");
        const auto add = [&](const std::string& part) {
            if (!part.empty()) values += (values.empty() ? "" : ", ") + part;
        };
        add(text(p, "unit"));
        if (const std::string value = text(p, "default"); !value.empty()) add("default " + value);
        if (p["needed"].get<bool>()) add("needed");
        print("  %-17s %-9s %-34s %s\n", text(p, "name").c_str(), text(p, "type").c_str(), values.c_str(),
              text(p, "meaning").c_str());
    }
    if (!toRead.empty()) print("  to read: %s\n", toRead.c_str());
    if (module["parameters"].empty() && module["usable"].get<bool>()) print("  it has no parameters\n");
}

struct Given {
    std::string name;
    bool json = false, missing = false;
};

// The modules that presets and options know by name, and that are not there or can't do their work, each with
// the reason.
class MissingModules {
  public:
    MissingModules() {
        for (int i = 0; i < qv_registry()->nrModules(0); ++i) {
            QvModule& module = *qv_registry()->module(i);
            installed_.insert(module.name());
            const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module.name()));
            if (!codec)
                add(module.name(), moduleKind(module),
                    "the libraries that are installed lack what does its work",
                    module.plugin() ? module.plugin()->name().asString("") : "");
        }
        for (int i = 0; i < qv_registry()->nrPlugins(); ++i) takeFrom(*qv_registry()->plugin(i));
        const AnyVector presets = qvPresetMgr()->missingPresets();
        for (const Any& preset : presets)
            for (const Any& name : preset.asDict().getVector("waitsFor", AnyVector()))
                noPlugin(name.asString(""), QvModuleType::videoEncoder);
        for (const CodecName& codec : codecNames())
            for (const char* const name : codec.encoders())
                noPlugin(name, codec.type == qvVideoStream ? QvModuleType::videoEncoder
                                                           : QvModuleType::audioEncoder);
    }
    const Json& rows() const { return rows_; }

  private:
    Json rows_ = Json::array();
    std::set<std::string> installed_, listed_;

    void add(const std::string& name, int kind, const std::string& reason, const std::string& plugin) {
        if (name.empty() || !listed_.insert(name).second) return;
        rows_.push_back({{"name", name}, {"kind", kindName(kind)}, {"reason", reason}, {"plugin", plugin}});
    }
    void noPlugin(const std::string& name, int kind) {
        const bool mux = name.size() > 3 && name.compare(name.size() - 3, 3, "mux") == 0;
        if (mux) kind = QvModuleType::muxer;
        if (installed_.count(name) == 0) add(name, kind, "no plug-in that is loaded has it", "");
    }
    // What a plug-in says of modules that it leaves out.
    void takeFrom(const QvPlugin& plugin) {
        const Any all = plugin.getAttr("missing");
        if (!all.isVector()) return;
        for (const Any& entry : all.asVector()) {
            if (!entry.isDict()) continue;
            const AnyDict& row = entry.asDict();
            const std::string name = row.getString("name", ""), reason = row.getString("reason", "");
            if (installed_.count(name) == 0)
                add(name, row.getInt32("type", 0), reason, plugin.name().asString(""));
        }
    }
};

void listMissing(const Given& given) {
    Json rows = Json::array();
    const Json all = MissingModules().rows();
    std::vector<std::string> names;
    for (const auto& row : all) {
        names.push_back(text(row, "name"));
        if (given.name.empty() || given.name == names.back()) rows.push_back(row);
    }
    if (rows.empty() && !given.name.empty())
        throw failure(Msg::moduleNotMissing, {given.name, suggestion(given.name, names)});
    if (given.json) return print("%s\n", rows.dump(2).c_str());
    for (const auto& row : rows)
        print("%-15s %-14s %s\n", text(row, "name").c_str(), text(row, "kind").c_str(),
              text(row, "reason").c_str());
}

void list(const Given& given) {
    Json all = Json::array();
    std::vector<std::string> names;
    for (int i = 0; i < qv_registry()->nrModules(0); ++i) {
        QvModule& module = *qv_registry()->module(i);
        names.emplace_back(module.name());
        if (given.name.empty() || given.name == module.name()) all.push_back(describe(module));
    }
    if (all.empty()) throw failure(Msg::moduleUnknown, {given.name, suggestion(given.name, names)});
    if (given.json) return print("%s\n", all.dump(2).c_str());
    for (const auto& module : all) {
        printModule(module);
        if (!given.name.empty()) printParameters(module);
    }
}

}  // namespace

void addModules(CommandLine& line) {
    Command command = line.command("modules", "List the modules, or the parameters of one");
    auto given = std::make_shared<Given>();
    command.argument("NAME", given->name, "A module", Need::optional);
    command.flag("--json", given->json, "Print JSON, with the parameters of each");
    command.flag("--missing", given->missing, "List those that are known and not there, and why");
    command.action([given] { given->missing ? listMissing(*given) : list(*given); });
}
