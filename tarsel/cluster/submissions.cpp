#include "tarsel/cluster/submissions.h"

#include <algorithm>
#include <set>

#include "tarsel/words/json.h"

namespace {

std::string lineOf(const SubmittedArray& array) {
    return Json({{"event", "array"}, {"name", array.name}, {"time", array.time}, {"tasks", array.tasks}})
        .dump();
}

// Adds the array of a line of the file. Other lines are ignored.
void take(std::vector<SubmittedArray>& arrays, const std::string& line) {
    const Json object = Json::parse(line, nullptr, false);
    if (!object.is_object()) return;
    try {
        if (object.at("event") == "array")
            arrays.push_back({object.at("name").get<std::string>(), object.at("time").get<std::time_t>(),
                              object.at("tasks").get<std::vector<std::string>>()});
    } catch (const Json::exception&) {
    }
}

}  // namespace

Submissions::Submissions(const std::string& file) : file_(file) {
    for (const std::string& line : RecordFile::read(file)) take(arrays_, line);
}

std::vector<std::string> Submissions::names() const {
    std::vector<std::string> names;
    for (const SubmittedArray& array : arrays_) names.push_back(array.name);
    return names;
}

void Submissions::add(SubmittedArray array) {
    RecordFile(file_).append(lineOf(array), true);
    arrays_.push_back(std::move(array));
}

void Submissions::keep(const std::vector<std::string>& names) {
    const std::set<std::string> kept(names.begin(), names.end());
    const auto removed = std::remove_if(arrays_.begin(), arrays_.end(),
                                        [&](const SubmittedArray& array) { return !kept.count(array.name); });
    if (removed == arrays_.end()) return;
    arrays_.erase(removed, arrays_.end());
    std::vector<std::string> lines;
    for (const SubmittedArray& array : arrays_) lines.push_back(lineOf(array));
    RecordFile(file_).replace(lines);
}

ClusterQueue::ClusterQueue(const Submissions& submissions, const std::vector<ClusterElement>& elements) {
    std::map<std::pair<std::string, size_t>, const ClusterElement*> active;
    for (const ClusterElement& element : elements) active[{element.array, element.index}] = &element;
    for (const SubmittedArray& array : submissions.arrays())
        for (size_t i = 0; i < array.tasks.size(); ++i) {
            const auto found = active.find({array.name, i});
            Place place{array.name, "", i, false, false, array.time};
            if (found != active.end()) {
                place.job = found->second->job;
                place.pending = found->second->pending;
                place.active = true;
            }
            // An active place is kept even if a later one has ended.
            Place& known = tasks[array.tasks[i]];
            if (place.active || !known.active) known = place;
        }
}

bool ClusterQueue::isActive(const std::string& task) const {
    const auto found = tasks.find(task);
    return found != tasks.end() && found->second.active;
}

std::vector<std::string> ClusterQueue::jobs() const {
    std::set<std::string> jobs;
    for (const auto& [task, place] : tasks)
        if (place.active) jobs.insert(place.job);
    return {jobs.begin(), jobs.end()};
}

std::vector<std::string> ClusterQueue::activeArrays() const {
    std::set<std::string> names;
    for (const auto& [task, place] : tasks)
        if (place.active) names.insert(place.array);
    return {names.begin(), names.end()};
}
