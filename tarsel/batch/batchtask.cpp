#include "tarsel/batch/batchtask.h"

#include <algorithm>
#include <filesystem>

#include "tarsel/host/files.h"
#include "tarsel/host/filestamp.h"
#include "tarsel/job/task/taskfiles.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/numberedname.h"

namespace fs = std::filesystem;

namespace {

constexpr size_t kIdDigits = 12;
constexpr const char *kWords = "commandLine", *kFolder = "commandFolder";

// Elements of XML as bytes that can't be taken for others.
void append(const XmlNode& node, std::string& bytes) {
    const auto field = [&](const char* text) {
        const std::string_view all = text ? text : "";
        bytes += std::to_string(all.size()) + ":";
        bytes += all;
    };
    field(node.name());
    for (const auto& [key, value] : node.attrs()) {
        field(key);
        const Any text = value->toString();
        field(text.asString(""));
    }
    bytes += "/";
    field(node.data());
    bytes += std::to_string(node.nrChildren()) + "(";
    for (int i = 0; i < node.nrChildren(); ++i) append(*node.child(i), bytes);
}

std::string digestOf(const AnyDict& stored) {
    AnyDict plain = stored;
    plain.remove("enabled");
    XmlNode node("task");
    XmlTrans().DictToXml(plain, &node);
    std::string bytes;
    append(node, bytes);
    return digestOfText(bytes);
}

std::string textOf(const Any& value) {
    const Any text = value.toString();
    return text.asString("");
}

std::vector<std::string> textsOf(const Any& value) {
    std::vector<std::string> texts;
    if (!value.isVector()) return texts;
    for (const Any& one : value.asVector()) texts.push_back(textOf(one));
    return texts;
}

std::string fromFolder(const std::string& name, const std::string& folder) {
    return name.empty() || fs::path(name).is_absolute()
               ? name
               : (fs::path(folder) / name).lexically_normal().string();
}

void readNames(BatchTask& task, const std::string& folder) {
    changeTaskFiles(task.state, [&](const std::string& name, TaskFileUse use) {
        const std::string whole = fromFolder(name, folder);
        if (use == TaskFileUse::input) task.inputs.push_back(whole);
        if (use == TaskFileUse::output) task.output = whole;
        return whole;
    });
    std::sort(task.inputs.begin(), task.inputs.end());
    task.inputs.erase(std::unique(task.inputs.begin(), task.inputs.end()), task.inputs.end());
}

// What writes elementary streams gives each its file.
bool hasSoundApart(const AnyDict& stored) {
    const QvEncodePipeState encoder(stored.getDict("encoder"));
    const Any& muxer = stored.getDict("encoder").getDict("muxer").get("name");
    return muxer == "rawmux" && encoder.nrStreams(qvVideoStream) > 0 && encoder.nrStreams(qvAudioStream) > 0;
}

}  // namespace

BatchTask batchTask(const AnyDict& stored, int number, const std::string& folder) {
    BatchTask task;
    task.number = number;
    task.state = stored;
    task.id = digestOf(stored).substr(0, kIdDigits);
    task.enabled = QvTaskState(AnyDict("enabled", stored.get("enabled"))).isEnabled();
    task.words = textsOf(stored.get(kWords));
    task.folder = textOf(stored.get(kFolder));
    if (!task.isPlanned()) {
        for (const Any& file : stored.getVector("files"))
            if (file.isDict()) task.inputs.push_back(textOf(file.asDict().get("filename")));
        task.output = textOf(stored.get("filename"));
        return task;
    }
    try {
        readNames(task, folder);
        task.soundApart = hasSoundApart(stored);
    } catch (const QvException&) {
        task.fault = "its files can't be read";
    }
    return task;
}

BatchTask outputOf(const AnyDict& stored, int number, const std::string& folder) {
    BatchTask task;
    task.number = number;
    task.enabled = QvTaskState(AnyDict("enabled", stored.get("enabled"))).isEnabled();
    task.output = fromFolder(textOf(stored.get("filename")), folder);
    task.soundApart = hasSoundApart(stored);
    return task;
}

AnyDict plannedLater(const std::vector<std::string>& words, const std::string& folder,
                     const std::vector<std::string>& inputs, const std::string& output) {
    AnyVector files, texts;
    for (const std::string& input : inputs) files.append(AnyDict("filename", input.c_str()));
    for (const std::string& word : words) texts.append(Any(word.c_str()));
    return AnyDict("__class__", "TranscodeTask", "__version__", "2.0", kWords, texts, kFolder, folder.c_str(),
                   "files", files, "filename", output.c_str());
}

std::string keyOf(const BatchTask& task) {
    std::string bytes = task.id;
    for (const std::string& input : task.inputs) {
        const auto stamp = stampOf(input);
        bytes += "\n" + input + "\n";
        bytes += stamp ? std::to_string(stamp->bytes) + " " + std::to_string(stamp->changed) : "absent";
    }
    return digestOfText(bytes);
}

bool mayWrite(const std::string& name, const std::string& file) {
    if (name.empty()) return false;
    if (name == file) return true;
    const fs::path own(name), other(file);
    if (own.parent_path() != other.parent_path()) return false;
    try {
        if (const auto numbered = NumberedName::parse(own.filename().string()))
            return numbered->matches(other.filename().string(), other.extension().string());
    } catch (const Failure&) {
        return false;  // no output can have that name
    }
    const std::string stem = own.stem().string(), rest = other.filename().string();
    if (rest.rfind(stem + "#", 0) == 0) return true;
    return other.stem() == own.stem() && other.extension() == ".wav" && own.extension() != ".wav";
}
