#include "tarsel/watch/memory.h"

#include <array>
#include <string_view>

#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace {

// In the order of State.
constexpr std::array<std::string_view, 4> kStates = {"begun", "done", "closed", "failed"};

Json jsonOf(const MadeFile& made) {
    return Json::array({escapedBytes(made.name), made.bytes, made.modified});
}

MadeFile madeFileOf(const Json& json) {
    return {unescapedBytes(json.at(0).get<std::string>()), json.at(1).get<long long>(),
            json.at(2).get<long long>()};
}

WatchedFile fileOf(const Json& json) {
    WatchedFile file;
    file.digest = json.at("digest").get<std::string>();
    file.facts.kind = FileFacts::Kind::file;
    file.facts.bytes = json.at("bytes").get<long long>();
    file.facts.modified = json.at("modified").get<long long>();
    file.facts.inode = json.at("inode").get<unsigned long long>();
    const auto state = json.at("state").get<std::string>();
    for (size_t i = 0; i < kStates.size(); ++i)
        if (kStates[i] == state) file.state = static_cast<WatchedFile::State>(i);
    for (const auto& [label, all] : json.at("made").items())
        for (const Json& made : all) file.made[unescapedBytes(label)].push_back(madeFileOf(made));
    for (const Json& output : json.at("outputs"))
        file.outputs.push_back(unescapedBytes(output.get<std::string>()));
    file.name = unescapedBytes(json.at("name").get<std::string>());
    return file;
}

}  // namespace

bool MadeFile::stands() const {
    const FileFacts facts = factsOf(name);
    return facts.kind == FileFacts::Kind::file && facts.bytes == bytes && facts.modified == modified;
}

bool WatchedFile::isCertainly(const FileFacts& now) const {
    return now.kind == facts.kind && now.bytes == facts.bytes && now.modified == facts.modified &&
           now.inode == facts.inode;
}

std::string lineOf(const WatchedFile& file) {
    Json json = Json::object();
    json["name"] = escapedBytes(file.name);
    json["state"] = kStates[static_cast<size_t>(file.state)];
    json["digest"] = file.digest;
    json["bytes"] = file.facts.bytes;
    json["modified"] = file.facts.modified;
    json["inode"] = file.facts.inode;
    Json& targets = json["made"] = Json::object();
    for (const auto& [label, all] : file.made) {
        Json& target = targets[escapedBytes(label)] = Json::array();
        for (const MadeFile& made : all) target.push_back(jsonOf(made));
    }
    Json& outputs = json["outputs"] = Json::array();
    for (const std::string& output : file.outputs) outputs.push_back(escapedBytes(output));
    return json.dump();
}

WatchedFile watchedFileOf(const std::string& line) {
    try {
        return fileOf(Json::parse(line));
    } catch (const Json::exception&) {
        return {};
    }
}

WatchMemory::WatchMemory(const std::string& file) : lines_(file) {
    if (!lines_.tryLock()) throw failure(Msg::watchTwice, {file});
    const std::vector<std::string> lines = lines_.lines();
    for (const std::string& line : lines)
        if (const WatchedFile known = watchedFileOf(line); !known.name.empty()) take(known);
    // Most lines are of files that later lines say more about.
    constexpr size_t few = 1000;
    if (lines.size() < few || lines.size() < 2 * files_.size()) return;
    std::vector<std::string> latest;
    for (const auto& [name, known] : files_) latest.push_back(lineOf(known));
    lines_.replace(latest);
}

void WatchMemory::take(const WatchedFile& file) {
    files_[file.name] = file;
    for (const std::string& output : file.outputs) makers_[output] = file.name;
}

const WatchedFile* WatchMemory::find(const std::string& name) const {
    const auto place = files_.find(name);
    return place == files_.end() ? nullptr : &place->second;
}

void WatchMemory::remember(const WatchedFile& file) {
    lines_.append(lineOf(file), true);
    take(file);
}

const std::string* WatchMemory::makerOf(const std::string& output) const {
    const auto place = makers_.find(output);
    return place == makers_.end() ? nullptr : &place->second;
}
