#include "tarsel/batch/batchfile.h"

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <new>

#include "tarsel/host/childprocess.h"
#include "tarsel/host/files.h"
#include "tarsel/host/memory.h"
#include "tarsel/host/outputs/sharedfile.h"
#include "tarsel/words/messages.h"

namespace {

constexpr size_t kShortestId = 8;  // so that no number of a task is taken for one

void save(QvBatchList& list, const std::string& name) {
    errno = 0;
    if (list.save(Any(name.c_str())) == QvStatus::ok) return;
    throw systemFailure(Msg::batchNotWritten, name, errno != 0 ? errno : EIO);
}

}  // namespace

BatchFile::BatchFile(const std::string& name) : shown_(name), name_(resolvedName(name)) {}

std::string BatchFile::folder() const { return std::filesystem::path(name_).parent_path().string(); }

QvBatchList BatchFile::load() const {
    requireFile(name_);
    const MemoryWatch memory;
    QvBatchList list;
    const int result = list.load(Any(name_.c_str()));
    if (result == QvStatus::ok) return list;
    if (memory.ranOut()) throw std::bad_alloc();
    throw failure(Msg::batchUnreadable, {shown_, result == QvStatus::cannotParse
                                                     ? "it can't be opened, is no XML document, or is cut"
                                                     : "it holds no list of tasks"});
}

Descriptor BatchFile::handOver(const QvBatchList& list, const std::vector<size_t>& indexes) {
    Descriptor file = fileInMemory();
    const std::string name = nameOfDescriptor(file.get());
    AnyVector some;
    for (const size_t index : indexes)
        some.append(static_cast<const AnyVector&>(list).at(static_cast<int>(index)));
    errno = 0;
    try {
        if (XmlParser::storeDict(Any(name.c_str()), AnyDict("taskList", some), "BatchList", "2.0") ==
            QvStatus::ok)
            return file;
    } catch (const QvFileException&) {
    }
    throw systemFailure(Msg::batchNotWritten, "memory", errno != 0 ? errno : EIO);
}

std::vector<BatchTask> BatchFile::handedTasks(int descriptor, const std::vector<int>& numbers) const {
    QvBatchList list;
    if (list.load(Any(nameOfDescriptor(descriptor).c_str())) != QvStatus::ok ||
        static_cast<size_t>(list.size()) != numbers.size())
        throw failure(Msg::batchUnreadable, {shown_, "no task was handed over"});
    std::vector<BatchTask> tasks;
    for (const Any& stored : list)
        tasks.push_back(batchTask(stored.asDict(), numbers[tasks.size()], folder()));
    return tasks;
}

std::vector<BatchTask> BatchFile::tasksOf(const QvBatchList& list) const {
    std::vector<BatchTask> tasks;
    tasks.reserve(static_cast<size_t>(list.size()));
    for (const Any& stored : list) {
        tasks.push_back(batchTask(stored.asDict(), static_cast<int>(tasks.size()) + 1, folder()));
        tasks.back().state.clear();
    }
    return tasks;
}

void BatchFile::make(bool overwrite) const {
    SharedFile shared(name_, Msg::batchNotWritten);
    if (exists(name_) && !overwrite) throw failure(Msg::batchExists, {shown_});
    shared.replace([](const std::string& name) {
        QvBatchList none;
        save(none, name);
    });
}

void BatchFile::change(const std::function<void(QvBatchList& list)>& change) const {
    requireFile(name_);
    SharedFile shared(name_, Msg::batchNotWritten);
    QvBatchList list = load();
    change(list);
    shared.replace([&](const std::string& name) { save(list, name); });
}

bool isTaskNumber(const std::string& word) {
    return !word.empty() && word.size() < kShortestId &&
           word.find_first_not_of("0123456789") == std::string::npos;
}

size_t findTask(const std::vector<BatchTask>& tasks, const std::string& word, const BatchFile& file) {
    const std::string count = std::to_string(tasks.size()) + (tasks.size() == 1 ? " task" : " tasks");
    if (isTaskNumber(word)) {
        const size_t number = std::stoul(word);
        if (number < 1 || number > tasks.size()) throw failure(Msg::batchNoTask, {file.shown(), word, count});
        return number - 1;
    }
    if (word.size() < kShortestId) throw failure(Msg::batchIdShort, {file.shown(), word});
    size_t found = tasks.size();
    for (size_t i = 0; i < tasks.size(); ++i) {
        if (tasks[i].id.rfind(word, 0) != 0) continue;
        if (found < tasks.size() && tasks[i].id != tasks[found].id)
            throw failure(Msg::batchIdOpen, {word, file.shown()});
        if (found == tasks.size()) found = i;
    }
    if (found == tasks.size()) throw failure(Msg::batchNoTask, {file.shown(), word, count});
    return found;
}
