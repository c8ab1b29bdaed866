#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/signals.h"
#include "tarsel/source/mixfile.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"
#include "tarsel/words/xmlnames.h"

namespace {

namespace fs = std::filesystem;

constexpr double kMostWeight = 32767;
constexpr int kMostNumber = 255;  // of a stream or a channel
// Half of what a weight is a multiple of when sounds are mixed.
constexpr double kWeightTolerance = 0.5 / 65536;

struct Given {
    std::string file, output;
    std::vector<std::string> channels;
    OutputOptions outputOptions;
    bool json = false;
    Signals* signals = nullptr;
};

struct Fed {
    std::string file;
    int stream = 0, channel = 0;
    double weight = 1.0;
};

bool consistsOf(std::string_view text, const char* characters) {
    return !text.empty() && text.find_first_not_of(characters) == std::string_view::npos;
}

// FILE[:STREAM.CHANNEL or :CHANNEL][*WEIGHT]. A file that has all of it as its name is meant.
Fed parseSource(const std::string& text, const std::string& option) {
    Fed source{.file = text};
    if (isRegularFile(source.file)) return source;
    if (const size_t star = text.rfind('*');
        star != std::string::npos && consistsOf(std::string_view(text).substr(star + 1), "0123456789.-")) {
        source.weight = parseDecimal(text.substr(star + 1), -kMostWeight, kMostWeight, option);
        source.file = text.substr(0, star);
    }
    if (isRegularFile(source.file)) return source;
    const size_t colon = source.file.rfind(':');
    if (colon == std::string::npos) return source;
    const std::string place = source.file.substr(colon + 1);
    if (!consistsOf(place, "0123456789.")) return source;
    const size_t point = place.find('.');
    if (point != std::string::npos)
        source.stream = static_cast<int>(parseNumber(place.substr(0, point), 0, kMostNumber, option));
    const std::string channel = point == std::string::npos ? place : place.substr(point + 1);
    source.channel = static_cast<int>(parseNumber(channel, 0, kMostNumber, option));
    source.file.resize(colon);
    return source;
}

// What "+" joins. File names may have one as well, so more than one piece is taken where only that is a file.
std::vector<Fed> parseSources(const std::string& text, const std::string& option) {
    std::vector<std::string> pieces(1);
    for (const char c : text) {
        if (c == '+')
            pieces.emplace_back();
        else
            pieces.back() += c;
    }
    std::vector<Fed> sources;
    for (size_t i = 0; i < pieces.size();) {
        size_t end = i + 1;
        std::string name = pieces[i];
        while (end < pieces.size() && !isRegularFile(parseSource(name, option).file))
            name += "+" + pieces[end++];
        if (!isRegularFile(parseSource(name, option).file)) {
            name = pieces[i];
            end = i + 1;
        }
        sources.push_back(parseSource(name, option));
        i = end;
    }
    return sources;
}

// POSITION=SOURCE+SOURCE...
AnyDict parseChannel(const std::string& text) {
    const std::string option = "--ch " + text;
    const size_t equals = text.find('=');
    if (equals == std::string::npos || equals == 0 || equals + 1 == text.size())
        throw failure(Msg::mixWrong, {"--ch", text});
    AnyVector list;
    for (const Fed& source : parseSources(text.substr(equals + 1), option)) {
        if (source.file.empty()) throw failure(Msg::mixWrong, {"--ch", text});
        requireInput(source.file);
        AnyDict entry("src", source.file.c_str(), "stream", source.stream, "channel", source.channel);
        // The same source twice has the sum of both weights.
        double weight = source.weight;
        for (int i = list.size(); i-- > 0;) {
            AnyDict same = list.at(i).asDict();
            const double former = same.getDouble("weight");
            same.remove("weight");
            if (!(same == entry)) continue;
            weight += former;
            list.remove(i);
        }
        entry.set("weight", weight);
        list.append(entry);
    }
    return AnyDict("pos", text.substr(0, equals).c_str(), "source", list);
}

AnyDict mixGiven(const Given& given) {
    if (given.channels.empty() && given.file.empty()) throw failure(Msg::mixNothing, {"--ch"});
    if (!given.channels.empty() && !given.file.empty())
        throw failure(Msg::optionsExclude, {"--ch", given.file});
    if (given.channels.empty()) return readMix(given.file);
    AnyVector channels;
    for (const std::string& text : given.channels) channels.append(parseChannel(text));
    return AnyDict("name", "AudioMixSetup", "outChannels", channels);
}

// Names in a metafile count from its folder on: what lies in it moves with it.
Any nameFor(const Any& file, const fs::path& folder) {
    const fs::path whole = absoluteName(file.toString().asString(""));
    const fs::path below = whole.lexically_relative(folder);
    return Any((below.empty() || *below.begin() == ".." ? whole : below).c_str());
}

void renameFiles(AnyDict& setup, const fs::path& folder) {
    for (const char* list : {"decoders", "filters"})
        if (setup.get(list).isVector())
            for (Any& entry : setup.get(list).asVector())
                entry.asDict().set("file", nameFor(entry.asDict().get("file"), folder));
    for (Any& channel : setup.get("outChannels").asVector())
        for (Any& source : channel.asDict().get("source").asVector())
            source.asDict().set("src", nameFor(source.asDict().get("src"), folder));
}

std::string written(const char* format, double weight) { return Any::sprintf(format, weight).asString(""); }

// What the file would not keep is refused, or said of weights, which have three decimals there.
void requireKept(const AnyDict& setup, const std::string& output) {
    const auto keep = [&](const Any& value) {
        const std::string text = value.toString().asString("");
        if (!xmlAttributeKeeps(text)) throw failure(Msg::xmlNameLost, {output, text});
    };
    for (const char* list : {"decoders", "filters"})
        for (const Any& entry : setup.getVector(list)) keep(entry.asDict().get("file"));
    for (const Any& channel : setup.getVector("outChannels")) {
        if (channel.asDict().get("pos").isText()) keep(channel.asDict().get("pos"));
        for (const Any& source : channel.asDict().getVector("source")) {
            keep(source.asDict().get("src"));
            const double weight = source.asDict().getDouble("weight");
            const std::string kept = written("%.3f", weight);
            if (std::fabs(std::strtod(kept.c_str(), nullptr) - weight) > kWeightTolerance)
                tell(Level::warning, lineOf(Msg::mixWeightRounded, {output, written("%g", weight), kept}));
        }
    }
}

void write(const Given& given, const AnyDict& mix, const std::vector<std::string>& files) {
    requireNoFolder(given.output, "mmf");
    if (!isMixName(given.output)) throw failure(Msg::mixName, {given.output});
    std::vector<std::string> inputs = files;
    if (!given.file.empty()) inputs.push_back(given.file);
    Outputs outputs(given.output, "-o", inputs, given.outputOptions.policy());
    const Signals::Watch watch(*given.signals, {.first = {}, .second = [&] { return outputs.leave(); }});
    AnyDict renamed = mix;
    renameFiles(renamed, fs::path(absoluteName(given.output)).parent_path());
    QvAudioMixDecSetup setup;
    setup.restore(renamed);
    requireKept(renamed, given.output);
    try {
        setup.save(Any(outputs.begin("mmf").c_str()));
    } catch (const QvFileException& failure) {
        throw writeFailure(given.output, outputs.withFinalNames(failure.what()));
    }
    outputs.commit();
    given.signals->complete();
    tell(Level::note, "wrote " + inQuotes(given.output));
}

Json describe(const AnyDict& mix, const QvDecodePipe& decoder) {
    Json channels = Json::array();
    for (const Any& channel : mix.getVector("outChannels")) {
        const Any& position = channel.asDict().get("pos");
        Json sources = Json::array();
        for (const Any& source : channel.asDict().getVector("source")) {
            const AnyDict& entry = source.asDict();
            sources.push_back({{"file", validUtf8(entry.get("src").toString().asString(""))},
                               {"stream", entry.getInt32("stream")},
                               {"channel", entry.getInt32("channel")},
                               {"weight", entry.getDouble("weight")}});
        }
        channels.push_back({{"position", position.isText() ? Json(validUtf8(position.toString().asString("")))
                                                           : Json(nullptr)},
                            {"sources", sources}});
    }
    return {{"samplerate", decoder.getAudioParam(0, "samplerate").asInt32(0)},
            {"samples", decoder.nrSamples(0)},
            {"channels", channels}};
}

void printText(const Json& mix) {
    print("%lld samples at %d Hz\n", mix["samples"].get<long long>(), mix["samplerate"].get<int>());
    for (const Json& channel : mix["channels"]) {
        print("  %s\n", channel["position"].is_null()
                            ? "channel"
                            : inQuotes(channel["position"].get<std::string>()).c_str());
        for (const Json& source : channel["sources"])
            print("    %s stream %d channel %d, weight %.3f\n",
                  inQuotes(source["file"].get<std::string>()).c_str(), source["stream"].get<int>(),
                  source["channel"].get<int>(), source["weight"].get<double>());
    }
}

void mix(const Given& given) {
    const AnyDict setup = mixGiven(given);
    const std::unique_ptr<QvDecodePipe> decoder = openMix(given.file, setup);
    if (!given.output.empty()) write(given, setup, mixedFiles(*decoder));
    if (!given.json && !given.output.empty()) return;
    const Json described = describe(setup, *decoder);
    if (given.json)
        print("%s\n", described.dump(2).c_str());
    else
        printText(described);
    flushOutput();
}

}  // namespace

void addMix(CommandLine& line, Signals& signals) {
    Command command = line.command("mix", "Describe a mix of sounds in a file, or show one");
    auto given = std::make_shared<Given>();
    given->signals = &signals;
    command.argument("FILE", given->file, "A mix to show or to write anew", Need::optional);
    command.list("--ch", given->channels,
                 "A channel: POSITION=FILE[:STREAM.CHANNEL or :CHANNEL][*WEIGHT], several joined by +",
                 "POSITION=SOURCE");
    command.option("-o,--output", given->output, "The mix", "FILE.mmf");
    command.flag("--json", given->json, "Print JSON");
    given->outputOptions.add(command);
    command.action([given] { mix(*given); });
}
