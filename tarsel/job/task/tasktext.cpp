#include "tarsel/job/task/tasktext.h"

#include <algorithm>

#include "tarsel/picture/picture.h"
#include "tarsel/words/timespec.h"

namespace {

std::string narrow(const Any& value) {
    return value.isText() ? std::string(value.toString().asString("")) : "";
}

// File names need not be UTF-8; JSON does.
Json jsonText(const std::string& bytes) {
    return Json::parse(Json(bytes).dump(-1, ' ', false, Json::error_handler_t::replace));
}

const char* typeWord(int type) {
    return type == qvVideoStream ? "video" : type == qvAudioStream ? "audio" : "subpicture";
}

Json sourceJson(const QvTaskState::Source& source) {
    Json object = Json::object();
    object["file"] = jsonText(narrow(source.filename()));
    object["type"] = typeWord(source.type());
    object["stream"] = source.number();
    const ProcessParams params = source.processParams();
    if (const auto points = params.inOutPoints(); points && points->count() > 0) {
        object["from_s"] = points->inPoint().seconds();
        if (points->outPoint() > MediaTime()) object["to_s"] = points->outPoint().seconds();
    }
    const auto filters = params.filters();
    if (filters && filters->activeCount() > 0) {
        object["filters"] = Json::array();
        for (const std::string& line : describe(*filters)) object["filters"].push_back(jsonText(line));
    }
    return object;
}

Json outputStreamJson(const QvEncodePipeStreamState& stream) {
    Json object = Json::object();
    object["type"] = typeWord(stream.type());
    object["encoder"] = jsonText(narrow(stream.codecName()));
    const auto number = [&](const char* key, int value) {
        if (value > 0) object[key] = value;
    };
    number("width", stream.width());
    number("height", stream.height());
    if (const Any rate = stream.framerate(); rate.isFramerate())
        object["rate"] = formatRate(rate.asFramerate());
    number("samplerate", stream.samplerate());
    number("channels", stream.channels());
    return object;
}

Json describeState(const StoredTask& task) {
    const QvTaskState& state = task.state();
    const QvEncodePipeState encoder = state.encoder();
    Json object = Json::object();
    object["task"] = jsonText(task.name());
    object["enabled"] = state.isEnabled();
    object["inputs"] = Json::array();
    for (const Any& entry : state.inputFiles()) {
        const QvTaskState::File file(entry.asDict());
        object["inputs"].push_back(Json::object({{"file", jsonText(narrow(file.filename()))},
                                                 {"decoder", jsonText(narrow(file.decoder().get("name")))}}));
    }
    object["output"] = jsonText(task.output());
    object["muxer"] = jsonText(narrow(encoder.muxerName()));
    object["streams"] = Json::array();
    for (int i = 0; i < encoder.nrStreams(); ++i)
        object["streams"].push_back(outputStreamJson(encoder.stream(i)));
    object["segments"] = Json::array();
    for (int s = 0; s < state.nrSegments(); ++s) {
        Json segment = Json::object();
        segment["enabled"] = state.isSegmentEnabled(s);
        segment["sources"] = Json::array();
        for (int i = 0; i < encoder.nrStreams(); ++i)
            segment["sources"].push_back(state.nrSources(i) > s ? sourceJson(state.source(i, s)) : Json());
        object["segments"].push_back(segment);
    }
    if (const std::string command = task.postProcess(); !command.empty()) object["post"] = jsonText(command);
    return object;
}

std::string textOf(const Json& value) { return value.get<std::string>(); }

std::string streamLine(const Json& stream) {
    const auto number = [&](const char* key) { return std::to_string(stream[key].get<int>()); };
    std::string line = textOf(stream["type"]) + " by " + textOf(stream["encoder"]);
    if (stream.contains("width") && stream.contains("height"))
        line += ", " + number("width") + "x" + number("height");
    if (stream.contains("rate")) line += ", " + textOf(stream["rate"]) + " frames a second";
    if (stream.contains("samplerate")) line += ", " + number("samplerate") + " Hz";
    if (stream.contains("channels")) line += ", " + number("channels") + " ch";
    return line;
}

std::string rangeOf(const Json& source) {
    std::string text;
    if (source.contains("from_s")) text += ", from " + formatTime(source["from_s"].get<double>());
    if (source.contains("to_s")) text += " to " + formatTime(source["to_s"].get<double>());
    return text;
}

std::string sourceLines(const Json& source) {
    if (source.is_null()) return "source   nothing\n";
    std::string text = "source   " + textOf(source["type"]) + " " +
                       std::to_string(source["stream"].get<int>()) + " of " +
                       inQuotes(textOf(source["file"]));
    text += rangeOf(source) + "\n";
    if (source.contains("filters"))
        for (const Json& line : source["filters"]) text += "filter   " + textOf(line) + "\n";
    return text;
}

std::string segmentLines(const Json& segments) {
    std::string text;
    for (size_t s = 0; s < segments.size(); ++s) {
        const Json& segment = segments[s];
        if (segments.size() > 1)
            text += "segment  " + std::to_string(s + 1) + (segment["enabled"] ? "" : ", switched off") + "\n";
        for (const Json& source : segment["sources"]) text += sourceLines(source);
    }
    return text;
}

std::string briefOf(const Json& segment) {
    std::string text;
    for (const Json& source : segment["sources"]) {
        if (source.is_null()) continue;
        text += (text.empty() ? "" : ", ") + textOf(source["type"]) + " " +
                std::to_string(source["stream"].get<int>()) + " of " + inQuotes(textOf(source["file"])) +
                rangeOf(source);
    }
    return (text.empty() ? "nothing" : text) + (segment["enabled"] ? "" : ", switched off");
}

}  // namespace

std::string taskBrief(const StoredTask& task) {
    constexpr size_t most = 20;
    const Json state = describeState(task), &segments = state["segments"];
    std::string text;
    for (size_t s = 0; s < std::min(segments.size(), most); ++s)
        text += "  segment " + std::to_string(s + 1) + "  " + briefOf(segments[s]) + "\n";
    if (segments.size() > most)
        text += "  and " + std::to_string(segments.size() - most) + " segments more\n";
    const std::string output = textOf(state["output"]);
    return text + "  output     " + (output.empty() ? "nothing" : inQuotes(output)) + " by " +
           textOf(state["muxer"]) + "\n";
}

Json taskBriefJson(const StoredTask& task) {
    const Json state = describeState(task);
    return Json::object({{"segments", state["segments"]}, {"output", state["output"]}});
}

std::string segmentsText(const StoredTask& task) {
    return task.isJoin() ? segmentLines(describeState(task)["segments"]) : "";
}

std::string taskJson(const StoredTask& task) { return describeState(task).dump(2) + "\n"; }

std::string taskText(const StoredTask& task) {
    const Json state = describeState(task);
    std::string text;
    for (const Json& input : state["inputs"])
        text += "input    " + inQuotes(textOf(input["file"])) + " by " + textOf(input["decoder"]) + "\n";
    text += segmentLines(state["segments"]);
    for (const Json& stream : state["streams"]) text += "stream   " + streamLine(stream) + "\n";
    const std::string output = textOf(state["output"]);
    text += "output   " + (output.empty() ? "nothing" : inQuotes(output)) + " by " + textOf(state["muxer"]) +
            "\n";
    if (state.contains("post")) text += "post     " + inQuotes(textOf(state["post"])) + "\n";
    if (!state["enabled"]) text += "the task is switched off\n";
    return text;
}
