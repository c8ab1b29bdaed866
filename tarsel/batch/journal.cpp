#include "tarsel/batch/journal.h"

#include <algorithm>
#include <utility>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/clock.h"
#include "tarsel/host/outputs/owner.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace {

using Step = TaskRecord::Step;

constexpr std::pair<Step, const char*> kSteps[] = {
    {Step::started, "started"},
    {Step::placing, "placing"},
    {Step::done, "done"},
    {Step::failed, "failed"},
};

Json rowsOf(const std::vector<RecordedFile>& files) {
    Json rows = Json::array();
    for (const RecordedFile& file : files)
        rows.push_back({{"name", escapedBytes(file.name)},
                        {"bytes", file.stamp.bytes},
                        {"changed", file.stamp.changed},
                        {"digest", file.digest}});
    return rows;
}

// What an entry does not have, or has in another type, is as if it were not there.
template <class Value>
Value valueOf(const Json& object, const char* key, Value otherwise) {
    const auto found = object.find(key);
    if (found == object.end()) return otherwise;
    try {
        return found->get<Value>();
    } catch (const Json::exception&) {
        return otherwise;
    }
}

std::vector<RecordedFile> filesOf(const Json& object) {
    std::vector<RecordedFile> files;
    const auto rows = object.find("files");
    if (rows == object.end() || !rows->is_array()) return files;
    for (const Json& row : *rows)
        if (row.is_object())
            files.push_back({unescapedBytes(valueOf<std::string>(row, "name", "")),
                             {valueOf<long long>(row, "bytes", -1), valueOf<long long>(row, "changed", -1)},
                             valueOf<std::string>(row, "digest", "")});
    return files;
}

void take(TaskRecord& record, const Json& object) {
    const std::string event = valueOf<std::string>(object, "event", "");
    const auto step = std::find_if(std::begin(kSteps), std::end(kSteps),
                                   [&](const auto& row) { return event == row.second; });
    if (step == std::end(kSteps)) return;
    if (step->first == Step::started) {
        record = {};
        record.start = valueOf<long long>(object, "time", 0);
        record.host = valueOf<std::string>(object, "host", "");
        record.pid = valueOf<long long>(object, "pid", 0);
    }
    record.last = step->first;
    record.key = valueOf<std::string>(object, "key", "");
    record.files = filesOf(object);
    record.seconds = valueOf<double>(object, "seconds", 0);
    record.status = valueOf<int>(object, "status", 0);
    record.failure = valueOf<std::string>(object, "error", "");
}

std::string lineOf(const Json& object) { return object.dump(-1, ' ', false, Json::error_handler_t::replace); }

}  // namespace

TaskRecord TaskRecord::read(const std::string& file) {
    TaskRecord record;
    for (const std::string& line : RecordFile::read(file))
        if (const Json object = Json::parse(line, nullptr, false); object.is_object()) take(record, object);
    return record;
}

bool TaskRecord::stands(bool digests) const {
    return std::all_of(files.begin(), files.end(), [&](const RecordedFile& file) {
        if (stampOf(file.name) != file.stamp) return false;
        try {
            return !digests || digestOfFile(file.name) == file.digest;
        } catch (const Failure&) {
            return false;  // it went meanwhile
        }
    });
}

TaskJournal::TaskJournal(const std::string& file, std::string key) : file_(file), key_(std::move(key)) {}

void TaskJournal::started() {
    const Owner self = Owner::self();
    start_ = QvTimer::absoluteTime();
    file_.append(lineOf({{"event", "started"},
                         {"key", key_},
                         {"time", secondsSince1970()},
                         {"host", self.host},
                         {"pid", self.pid}}),
                 false);
}

void TaskJournal::placing(const std::vector<PlacedFile>& files) {
    placed_.clear();
    for (const PlacedFile& file : files) {
        const auto stamp = stampOf(file.written);
        if (!stamp) throw failure(Msg::outputFolderGone, {file.name});
        placed_.push_back({file.name, *stamp, digestOfFile(file.written)});
    }
    file_.append(lineOf({{"event", "placing"}, {"key", key_}, {"files", rowsOf(placed_)}}), true);
}

void TaskJournal::done() {
    file_.append(lineOf({{"event", "done"},
                         {"key", key_},
                         {"seconds", QvTimer::absoluteTime() - start_},
                         {"files", rowsOf(placed_)}}),
                 false);
}

void TaskJournal::failed(int status, const std::string& error) {
    file_.append(lineOf({{"event", "failed"}, {"key", key_}, {"status", status}, {"error", error}}), false);
}

void TaskJournal::settled(const std::vector<RecordedFile>& files) {
    file_.append(lineOf({{"event", "done"}, {"key", key_}, {"seconds", 0.0}, {"files", rowsOf(files)}}),
                 false);
}
