#include "tarsel/batch/order.h"

#include <algorithm>
#include <filesystem>

#include "tarsel/host/files.h"

namespace fs = std::filesystem;

namespace {

// The folder and the part of the name that all files of an output have in common, "/a/card" of
// "/a/card#0001.png".
std::string stemOf(const fs::path& place) {
    const std::string stem = place.stem().string();
    return (place.parent_path() / stem.substr(0, stem.find('#'))).string();
}

}  // namespace

std::string Places::of(const std::string& name) {
    const fs::path path(name);
    const std::string folder = path.parent_path().string();
    auto known = folders_.find(folder);
    if (known == folders_.end()) known = folders_.emplace(folder, resolvedName(folder)).first;
    return (fs::path(known->second) / path.filename()).string();
}

std::vector<std::string> Places::writtenBy(const BatchTask& task) {
    if (task.output.empty() || isDevice(task.output)) return {};
    std::vector<std::string> places = {of(task.output)};
    if (task.soundApart) places.push_back(fs::path(places[0]).replace_extension(".wav").string());
    return places;
}

void OutputIndex::add(size_t task, const std::string& place) {
    const fs::path path(place);
    if (path.filename().string().find('%') != std::string::npos)
        numbered_.emplace(path.parent_path().string(), Output{task, place});
    else
        byStem_.emplace(stemOf(path), Output{task, place});
}

std::vector<size_t> OutputIndex::writersOf(const std::string& place) const {
    std::vector<size_t> tasks;
    const auto take = [&](const auto& range) {
        for (auto at = range.first; at != range.second; ++at)
            if (mayWrite(at->second.place, place)) tasks.push_back(at->second.task);
    };
    const fs::path path(place);
    take(byStem_.equal_range(stemOf(path)));
    take(numbered_.equal_range(path.parent_path().string()));
    return tasks;
}

std::vector<std::vector<Before>> orderOf(const std::vector<BatchTask>& tasks) {
    Places places;
    OutputIndex outputs;
    std::unordered_multimap<std::string, size_t> readers;  // by the input's stem
    std::vector<std::vector<Before>> order(tasks.size());
    for (size_t i = 0; i < tasks.size(); ++i) {
        if (!tasks[i].enabled) continue;
        std::vector<std::string> inputs;
        for (const std::string& input : tasks[i].inputs) inputs.push_back(places.of(input));
        for (const std::string& input : inputs)
            for (const size_t writer : outputs.writersOf(input)) order[i].push_back({writer, true});
        const std::vector<std::string> written = places.writtenBy(tasks[i]);
        for (const std::string& place : written) {
            const auto [first, last] = readers.equal_range(stemOf(place));
            for (auto at = first; at != last; ++at) order[i].push_back({at->second, false});
        }
        for (const std::string& input : inputs) readers.emplace(stemOf(input), i);
        if (!written.empty()) outputs.add(i, written[0]);
    }
    return order;
}
