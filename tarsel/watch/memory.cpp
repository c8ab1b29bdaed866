#include "tarsel/watch/memory.h"

#include <array>
#include <cstdio>
#include <cstdlib>
#include <string_view>

#include "tarsel/words/json.h"

namespace {

// In the order of State.
constexpr std::array<std::string_view, 4> kStates = {"begun", "done", "closed", "failed"};

// Names are bytes, and JSON is UTF-8: other bytes than those of plain ASCII become "%XX".
std::string coded(const std::string& name) {
    std::string text;
    for (const char c : name) {
        if (c > ' ' && c < '\x7f' && c != '%') {
            text += c;
            continue;
        }
        char digits[4];
        std::snprintf(digits, sizeof digits, "%%%02x", static_cast<unsigned>(static_cast<unsigned char>(c)));
        text += digits;
    }
    return text;
}

std::string decoded(const std::string& text) {
    std::string name;
    for (size_t at = 0; at < text.size(); ++at) {
        if (text[at] != '%' || at + 2 >= text.size()) {
            name += text[at];
            continue;
        }
        name += static_cast<char>(std::strtoul(text.substr(at + 1, 2).c_str(), nullptr, 16));
        at += 2;
    }
    return name;
}

Json jsonOf(const MadeFile& made) { return Json::array({coded(made.name), made.bytes, made.modified}); }

MadeFile madeFileOf(const Json& json) {
    return {decoded(json.at(0).get<std::string>()), json.at(1).get<long long>(), json.at(2).get<long long>()};
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
        for (const Json& made : all) file.made[decoded(label)].push_back(madeFileOf(made));
    for (const Json& output : json.at("outputs")) file.outputs.push_back(decoded(output.get<std::string>()));
    file.name = decoded(json.at("name").get<std::string>());
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
    json["name"] = coded(file.name);
    json["state"] = kStates[static_cast<size_t>(file.state)];
    json["digest"] = file.digest;
    json["bytes"] = file.facts.bytes;
    json["modified"] = file.facts.modified;
    json["inode"] = file.facts.inode;
    Json& targets = json["made"] = Json::object();
    for (const auto& [label, all] : file.made) {
        Json& target = targets[coded(label)] = Json::array();
        for (const MadeFile& made : all) target.push_back(jsonOf(made));
    }
    Json& outputs = json["outputs"] = Json::array();
    for (const std::string& output : file.outputs) outputs.push_back(coded(output));
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
    lines_.add(lineOf(file));
    take(file);
}

const std::string* WatchMemory::makerOf(const std::string& output) const {
    const auto place = makers_.find(output);
    return place == makers_.end() ? nullptr : &place->second;
}
