#include "tarsel/job/task/taskfiles.h"

#include <algorithm>

#include "tarsel/picture/picture.h"

namespace {

using Change = std::function<std::string(const std::string&, TaskFileUse)>;

std::string narrow(const Any& name) { return name.isText() ? std::string(name.toString().asString("")) : ""; }

void changeName(AnyDict& in, const char* key, TaskFileUse use, const Change& other) {
    const std::string name = narrow(in.get(key));
    if (name.empty()) return;
    if (const std::string changed = other(name, use); changed != name) in.set(key, changed.c_str());
}

// Applies `change` to each dictionary of the vector at `key`.
void changeEach(AnyDict& in, const char* key, const std::function<void(AnyDict&)>& change) {
    if (!in.get(key).isVector()) return;
    AnyVector all = in.getVector(key);
    for (int i = 0; i < all.size(); ++i) {
        if (!all.at(i).isDict()) continue;
        AnyDict one = all.at(i).asDict();
        change(one);
        all.set(i, Any(one));
    }
    in.set(key, all);
}

void changeInside(AnyDict& in, const char* key, const std::function<void(AnyDict&)>& change) {
    if (!in.get(key).isDict()) return;
    AnyDict inner = in.getDict(key);
    change(inner);
    in.set(key, inner);
}

bool isGenerator(const AnyDict& file) { return file.getDict("decoder").get("name") == "testgen"; }

// A generated source is known by a name that is no file's.
std::vector<std::string> generatedNames(const AnyDict& state) {
    std::vector<std::string> names;
    const AnyVector files = state.getVector("files");
    for (int i = 0; i < files.size(); ++i)
        if (files.at(i).isDict() && isGenerator(files.at(i).asDict()))
            names.push_back(narrow(files.at(i).asDict().get("filename")));
    return names;
}

void changeInput(AnyDict& file, const Change& other) {
    if (!isGenerator(file)) return changeName(file, "filename", TaskFileUse::input, other);
    changeInside(file, "decoder", [&](AnyDict& decoder) {
        changeInside(decoder, "streams", [&](AnyDict& streams) {
            changeEach(streams, "vids",
                       [&](AnyDict& video) { changeName(video, "picture", TaskFileUse::input, other); });
        });
    });
}

void changeFilters(AnyDict& process, const Change& other) {
    if (!process.get("filters").isDict()) return;
    FiltersState filters(process.getDict("filters"));
    changeFilterFiles(filters, [&](const std::string& file, const char*, bool writes) {
        return other(file, writes ? TaskFileUse::filterWrites : TaskFileUse::filterReads);
    });
    process.set("filters", static_cast<const AnyDict&>(filters));
}

}  // namespace

void changeTaskFiles(AnyDict& state, const Change& other) {
    const std::vector<std::string> generated = generatedNames(state);
    changeEach(state, "files", [&](AnyDict& file) { changeInput(file, other); });
    changeEach(state, "streams", [&](AnyDict& stream) {
        changeEach(stream, "sources", [&](AnyDict& source) {
            const std::string file = narrow(source.get("file"));
            if (std::find(generated.begin(), generated.end(), file) == generated.end())
                changeName(source, "file", TaskFileUse::input, other);
            changeInside(source, "process", [&](AnyDict& process) { changeFilters(process, other); });
        });
    });
    changeName(state, "filename", TaskFileUse::output, other);
    changeInside(state, "encoder",
                 [&](AnyDict& encoder) { changeName(encoder, "filename", TaskFileUse::output, other); });
}

std::vector<std::string> takeQualityLogs(AnyDict& state) {
    std::vector<std::string> names;
    const auto take = [&](AnyDict& process) {
        for (const Any& log : process.getVector("qualityStats"))
            if (const std::string name = log.isDict() ? narrow(log.asDict().get("filename")) : "";
                std::find(names.begin(), names.end(), name) == names.end())
                names.push_back(name);
        process.remove("qualityStats");
    };
    changeEach(state, "streams", [&](AnyDict& stream) {
        changeEach(stream, "sources", [&](AnyDict& source) { changeInside(source, "process", take); });
    });
    return names;
}
