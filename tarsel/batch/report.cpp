#include "tarsel/batch/report.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <filesystem>
#include <string_view>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/childprocess.h"
#include "tarsel/host/clocktext.h"
#include "tarsel/host/files.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace {

// More of them make a page that browsers show slowly.
constexpr int kMostPictures = 500;
// A picture that is larger is none that the tool made.
constexpr size_t kMostBytes = 1 << 20;
constexpr double kPatience = 30;  // seconds for a picture

struct EndRow {
    TaskEnd end;
    const char *word, *style;
};
constexpr EndRow kEnds[] = {
    {TaskEnd::done, "done", "good"},     {TaskEnd::already, "done before", "good"},
    {TaskEnd::failed, "failed", "bad"},  {TaskEnd::stopped, "stopped", "bad"},
    {TaskEnd::notRun, "not run", "off"}, {TaskEnd::disabled, "disabled", "off"},
};

const EndRow& rowOf(TaskEnd end) {
    return *std::find_if(std::begin(kEnds), std::end(kEnds) - 1,
                         [&](const EndRow& row) { return row.end == end; });
}

// A text of anyone's as text of the page: nothing in it is markup, and no character acts on the line.
std::string shown(const std::string& text) {
    const std::string quoted = inQuotes(text);
    std::string page;
    for (const char c : quoted.substr(1, quoted.size() - 2)) switch (c) {
            case '&': page += "&amp;"; break;
            case '<': page += "&lt;"; break;
            case '>': page += "&gt;"; break;
            case '"': page += "&quot;"; break;
            case '\'': page += "&#39;"; break;
            default: page += c;
        }
    return page;
}

std::string base64(const std::string& bytes) {
    constexpr char digits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    for (size_t at = 0; at < bytes.size(); at += 3) {
        unsigned group = 0;
        for (size_t i = 0; i < 3; ++i)
            group = group << 8 | (at + i < bytes.size() ? static_cast<unsigned char>(bytes[at + i]) : 0u);
        for (size_t i = 0; i < 4; ++i)
            text += at + i > bytes.size() ? '=' : digits[group >> (18 - 6 * i) & 63];
    }
    return text;
}

std::string dataUri(const std::string& png) {
    return png.empty() ? "" : "data:image/png;base64," + base64(png);
}

// "0.42 s", "12.3 s", "4 min 05 s", "2 h 03 min".
std::string durationText(double seconds) {
    char text[64];
    const auto whole = static_cast<long long>(std::llround(std::max(seconds, 0.0)));
    if (seconds < 10)
        std::snprintf(text, sizeof text, "%.2f s", std::max(seconds, 0.0));
    else if (whole < 60)
        std::snprintf(text, sizeof text, "%.1f s", seconds);
    else if (whole < 3600)
        std::snprintf(text, sizeof text, "%lld min %02lld s", whole / 60, whole % 60);
    else
        std::snprintf(text, sizeof text, "%lld h %02lld min", whole / 3600, whole / 60 % 60);
    return text;
}

std::string fixed(double value, const char* form) {
    char text[64];
    std::snprintf(text, sizeof text, form, value);
    return text;
}

std::string nameOf(const std::string& path) {
    const std::string name = std::filesystem::path(path).filename().string();
    return name.empty() ? path : name;
}

int count(const BatchResult& result, std::initializer_list<TaskEnd> ends) {
    return static_cast<int>(std::count_if(result.tasks.begin(), result.tasks.end(), [&](const auto& task) {
        return std::find(ends.begin(), ends.end(), task.end) != ends.end();
    }));
}

constexpr const char* kHead = R"(<!DOCTYPE html>
<html lang="en">
<head>
<meta charset="utf-8">
<meta http-equiv="Content-Security-Policy" content="default-src 'none'; img-src data:; style-src 'unsafe-inline'">
<meta name="viewport" content="width=device-width, initial-scale=1">
<meta name="referrer" content="no-referrer">
<style>
:root { color-scheme: light dark; --line: #d5d8dd; --soft: #5d6570; --good: #17702f; --bad: #b3261e; --card: #fff; --page: #f4f5f7; --text: #1c1f23; }
@media (prefers-color-scheme: dark) { :root { --line: #3a3f46; --soft: #a3abb6; --good: #6fcf86; --bad: #ff8a80; --card: #23272d; --page: #181a1e; --text: #e8eaed; } }
* { box-sizing: border-box; }
body { margin: 0 auto; padding: 1rem; max-width: 75rem; background: var(--page); color: var(--text); font: 15px/1.45 system-ui, sans-serif; }
h1 { font-size: 1.35rem; margin: 0 0 .25rem; overflow-wrap: anywhere; }
.soft { color: var(--soft); }
.good { color: var(--good); } .bad { color: var(--bad); } .off { color: var(--soft); }
.counts { display: flex; flex-wrap: wrap; gap: .25rem 1.25rem; margin: .75rem 0 1rem; padding: 0; list-style: none; }
.counts b { font-size: 1.2rem; }
ol { margin: 0; padding: 0; list-style: none; }
.task { display: grid; grid-template-columns: 12.5rem minmax(0, 1fr) 15rem; gap: .5rem 1rem; margin: 0 0 .6rem; padding: .75rem; background: var(--card); border: 1px solid var(--line); border-left: 4px solid currentColor; border-radius: 4px; }
.task > * { color: var(--text); }
.picture { min-height: 1rem; } .picture img { display: block; max-width: 100%; height: auto; background: #000; }
.files { overflow-wrap: anywhere; } .files p { margin: 0 0 .3rem; } .files .path { font-size: .85rem; color: var(--soft); }
.end { font-weight: 600; } .end.good { color: var(--good); } .end.bad { color: var(--bad); } .end.off { color: var(--soft); }
dl { display: grid; grid-template-columns: auto 1fr; gap: .1rem .75rem; margin: 0; align-content: start; } dt { color: var(--soft); } dd { margin: 0; text-align: right; font-variant-numeric: tabular-nums; }
ul.said { grid-column: 1 / -1; margin: 0; padding: .5rem 0 0 1.1rem; border-top: 1px solid var(--line); overflow-wrap: anywhere; }
@media (max-width: 760px) { body { padding: .6rem; } .task { grid-template-columns: minmax(0, 1fr); } dd { text-align: left; } }
</style>
)";

std::string row(const char* name, const std::string& value) {
    return value.empty() ? "" : "<dt>" + std::string(name) + "</dt><dd>" + value + "</dd>";
}

std::string fileLines(const char* name, const std::vector<std::string>& paths) {
    std::string page;
    for (const std::string& path : paths)
        page += "<p><span class=\"soft\">" + std::string(name) + "</span> <bdi>" + shown(nameOf(path)) +
                "</bdi><br><span class=\"path\"><bdi>" + shown(path) + "</bdi></span></p>\n";
    return page;
}

std::string saidLines(const BatchTaskResult& task) {
    std::string page;
    if (!task.failure.empty()) page += "<li class=\"bad\">" + shown(task.failure) + "</li>\n";
    for (const std::string& warning : task.warnings) page += "<li>warning: " + shown(warning) + "</li>\n";
    return page.empty() ? "" : "<ul class=\"said\">\n" + page + "</ul>\n";
}

std::string taskCard(const BatchTaskResult& task, const std::string& png) {
    const EndRow& end = rowOf(task.end);
    const bool ran = task.attempts > 0 || task.start != 0;
    std::string page = "<li class=\"task " + std::string(end.style) + "\">\n<div class=\"picture\">";
    if (!png.empty()) page += "<img alt=\"first picture\" src=\"" + dataUri(png) + "\">";
    page += "</div>\n<div class=\"files\">\n<p>" + std::to_string(task.number) + ". <span class=\"end " +
            end.style + "\">" + end.word + "</span></p>\n";
    page += fileLines("from", task.inputs);
    const bool whole = !task.written.empty() || task.output.empty();
    page += fileLines("to", whole ? task.written : std::vector{task.output}) + "</div>\n<dl>";
    page += row("started", shown(localTimeText(task.start)));
    page += row("took", ran ? durationText(task.seconds) : "");
    page += row("speed", ran && task.speed >= 0 ? fixed(task.speed, "%.2f&times;") : "");
    page += row("attempts", task.attempts > 1 ? std::to_string(task.attempts) : "");
    page += row("status", task.status > 0 ? std::to_string(task.status) : "");
    page += row("warnings", task.warnings.empty() ? "" : std::to_string(task.warnings.size()));
    return page + "</dl>\n" + saidLines(task) + "</li>\n";
}

Json orNull(const std::string& text) { return text.empty() ? Json(nullptr) : Json(validUtf8(text)); }

Json texts(const std::vector<std::string>& all) {
    Json list = Json::array();
    for (const std::string& text : all) list.push_back(validUtf8(text));
    return list;
}

Json jsonOf(const BatchTaskResult& task, const std::string& png) {
    Json json = Json::object();
    json["number"] = task.number;
    json["id"] = validUtf8(task.id);
    json["end"] = rowOf(task.end).word;
    json["inputs"] = texts(task.inputs);
    json["output"] = orNull(task.output);
    json["written"] = texts(task.written);
    json["start"] = orNull(utcTimeText(task.start));
    json["seconds"] = task.seconds;
    json["speed"] = task.speed < 0 ? Json(nullptr) : Json(task.speed);
    json["attempts"] = task.attempts;
    json["warnings"] = texts(task.warnings);
    json["status"] = task.status < 0 ? Json(nullptr) : Json(task.status);
    json["failure"] = orNull(task.failure);
    json["picture"] = orNull(dataUri(png));
    return json;
}

bool isPng(const std::string& bytes) {
    return bytes.size() <= kMostBytes && bytes.starts_with("\x89PNG\r\n\x1a\n") &&
           bytes.find("IEND") != std::string::npos;
}

// The options of a task may draw over a picture; this is the one that the file itself has.
std::string pictureIn(const std::string& file) {
    ChildProcess process({"frame", file, "--at", "0", "--size", "200x-1", "-o", "-"},
                         ChildProcess::Stream::output);
    const double end = QvTimer::absoluteTime() + kPatience;
    std::string png;
    while (png.size() <= kMostBytes && process.read(png)) {
        const double left = end - QvTimer::absoluteTime();
        if (left <= 0) return "";  // the process is ended with its object
        waitForAny({{process.descriptor()}}, static_cast<int>(left * 1000) + 1);
    }
    return png.size() <= kMostBytes && process.wait() == 0 && isPng(png) ? png : "";
}

}  // namespace

ReportKind reportKindOf(const std::string& name) {
    const std::string extension = std::filesystem::path(name).extension().string();
    if (extension == ".html" || extension == ".htm") return ReportKind::html;
    if (extension == ".json") return ReportKind::json;
    throw failure(Msg::reportKindUnknown, {name});
}

std::string firstPicture(const BatchTaskResult& task) {
    std::vector<std::string> files;
    if (!task.written.empty()) files.push_back(task.written.front());
    if (!task.inputs.empty()) files.push_back(task.inputs.front());
    for (const std::string& file : files)
        if (std::string png = pictureIn(file); !png.empty()) return png;
    return "";
}

std::string reportPage(const BatchResult& result, const TaskPicture& picture) {
    const std::string title = shown(nameOf(result.list));
    std::string page = kHead;
    page += "<title>" + title + "</title>\n</head>\n<body>\n<h1><bdi>" + title + "</bdi></h1>\n";
    page += "<div class=\"soft\"><bdi>" + shown(result.list) + "</bdi></div>\n<div class=\"soft\">" +
            shown(localTimeText(result.start)) + ", " + durationText(result.seconds) +
            "</div>\n<ul class=\"counts\">\n";
    const int good = count(result, {TaskEnd::done, TaskEnd::already});
    const int bad = count(result, {TaskEnd::failed, TaskEnd::stopped});
    page += "<li class=\"good\"><b>" + std::to_string(good) + "</b> done</li>\n";
    page += "<li class=\"" + std::string(bad > 0 ? "bad" : "off") + "\"><b>" + std::to_string(bad) +
            "</b> failed or stopped</li>\n";
    page += "<li class=\"off\"><b>" + std::to_string(static_cast<int>(result.tasks.size()) - good - bad) +
            "</b> not run</li>\n</ul>\n<ol>\n";
    int left = kMostPictures;
    for (const BatchTaskResult& task : result.tasks) page += taskCard(task, left-- > 0 ? picture(task) : "");
    return page + "</ol>\n</body>\n</html>\n";
}

std::string reportJson(const BatchResult& result, const TaskPicture& picture) {
    Json json = Json::object();
    json["list"] = validUtf8(result.list);
    json["start"] = orNull(utcTimeText(result.start));
    json["seconds"] = result.seconds;
    json["status"] = result.status;
    Json& tasks = json["tasks"] = Json::array();
    int left = kMostPictures;
    for (const BatchTaskResult& task : result.tasks)
        tasks.push_back(jsonOf(task, left-- > 0 ? picture(task) : ""));
    return json.dump(2) + "\n";
}

ReportFile::ReportFile(const std::string& name, const std::vector<std::string>& inputs,
                       const OutputPolicy& policy)
    : name_(name),
      kind_(reportKindOf(name)),
      outputs_(std::make_unique<Outputs>(name, "--report", inputs, policy)) {}

void ReportFile::write(const BatchResult& result, const TaskPicture& picture) {
    const bool page = kind_ == ReportKind::html;
    const std::string text = page ? reportPage(result, picture) : reportJson(result, picture);
    const std::string file = outputs_->begin(page ? "html" : "json");
    if (const int error = writeFile(file, text); error != 0)
        throw systemFailure(Msg::outputSystem, name_, error);
    outputs_->commit();
}
