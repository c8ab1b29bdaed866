#include "core/batch/taskstatecheck_p.h"

#include "core/measure/streamtype.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

namespace {

struct Fault {
    std::string text;
};

[[noreturn]] void damaged(const std::string& path, const std::string& reason) {
    throw Fault{path.empty() ? reason : path + ": " + reason};
}

std::string step(const std::string& path, const std::string& next) {
    return path.empty() ? next : path + "/" + next;
}

std::string step(const std::string& path, int index) { return step(path, std::to_string(index + 1)); }

// The vector of dictionaries under a key.
const AnyVector& list(const AnyDict& parent, const char* key, const std::string& path) {
    const Any& found = parent.get(key);
    if (!found.isVector() || found.asVector().empty()) damaged(path, "it is missing or empty");
    for (int i = 0; i < found.asVector().size(); ++i)
        if (!found.asVector().at(i).isDict()) damaged(step(path, i), "it holds no settings");
    return found.asVector();
}

int streamType(const AnyDict& stream, const std::string& path) {
    const int type = stream.getInt32("type");
    if (type != qvVideoStream && type != qvAudioStream && type != qvSubpicStream)
        damaged(step(path, "type"), "it is no type of stream");
    return type;
}

// In and out points alternate.
void checkPoints(const AnyDict& source, const std::string& path) {
    const Any& points = source.getDict("process").get("inOutPoints");
    if (!points.isValid()) return;
    bool valid = points.isVector() && points.asVector().size() % 2 == 0;
    if (valid)
        for (const Any& point : points.asVector()) valid = valid && point.isMediaTime();
    if (!valid) damaged(step(path, "process/inOutPoints"), "it holds no pairs of times");
}

void checkSource(const Any& source, int type, const std::string& path) {
    if (!source.isDict()) damaged(path, "it is no source");
    const AnyDict& dict = source.asDict();
    if (dict.empty()) return;  // nothing feeds this segment of the stream
    if (!dict.get("file").isText() || !dict.get("file").isTrue())
        damaged(step(path, "file"), "it is no file name");
    const Any& stream = dict.get("stream");
    if (!stream.isPair() || stream.asPair().first != type || stream.asPair().second < 0)
        damaged(step(path, "stream"), "it is no stream of the output's type");
    checkPoints(dict, path);
}

// All streams with sources have the same number of segments.
void checkStreams(const AnyVector& streams, const AnyVector& outputs) {
    if (streams.size() != outputs.size()) damaged("streams", "they are not as many as those of the encoder");
    int segments = 0;
    for (int i = 0; i < streams.size(); ++i) {
        const std::string path = step("streams", i);
        const AnyDict& stream = streams.at(i).asDict();
        const int type = streamType(stream, path);
        if (outputs.at(i).asDict().getInt32("type") != type)
            damaged(step(path, "type"), "it is not that of the encoder's stream");
        const AnyVector& sources = stream.getVector("sources");
        if (sources.empty()) continue;
        if (segments != 0 && sources.size() != segments)
            damaged(step(path, "sources"), "the streams differ in their number of segments");
        segments = sources.size();
        for (int k = 0; k < segments; ++k) checkSource(sources.at(k), type, step(path + "/sources", k));
    }
    if (segments == 0) damaged("streams", "none has a source");
}

void checkFiles(const AnyDict& task) {
    const Any& files = task.get("files");
    if (files.isValid() && !files.isVector()) damaged("files", "it is no list");
    const AnyVector& all = task.getVector("files");
    for (int i = 0; i < all.size(); ++i)
        if (!all.at(i).isDict() || !all.at(i).asDict().get("filename").isText())
            damaged(step(step("files", i), "filename"), "it is no file name");
}

void checkTask(const Any& stored) {
    if (!stored.isDict()) damaged("", "This element of the list is no task");
    const AnyDict& task = stored.asDict();
    if (task.isSet("__class__") && task.get("__class__") != "TranscodeTask")
        damaged("", "This element of the list is no task");
    const Any& encoder = task.get("encoder");
    if (!encoder.isDict() || encoder.asDict().empty()) damaged("encoder", "it holds no settings");
    checkStreams(list(task, "streams", "streams"), list(encoder.asDict(), "streams", "encoder/streams"));
    checkFiles(task);
    if (const Any& flags = task.get("segments"); flags.isValid() && !flags.isVector())
        damaged("segments", "it is no list");
}

}  // namespace

std::string qvTaskStateFault(const Any& stored) {
    try {
        checkTask(stored);
    } catch (const Fault& fault) {
        return fault.text;
    }
    return {};
}
