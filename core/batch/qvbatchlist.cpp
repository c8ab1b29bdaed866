#include "core/batch/qvbatchlist.h"

#include <string>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/batch/batchfile_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/status.h"

namespace {

constexpr const char* listKey = "taskList";

// Tasks are large dictionaries: frequent queries and changes work without a copy.
const AnyDict& taskAt(const QvBatchList& list, int index) {
    QV_ASSERT_MSG(index >= 0 && index < list.size(), "Invalid list index");
    const Any& task = static_cast<const AnyVector&>(list).at(index);
    QV_ASSERT_MSG(task.isDict(), "The list holds something that is no task");
    return task.asDict();
}

AnyDict& taskAt(QvBatchList& list, int index) {
    return const_cast<AnyDict&>(taskAt(std::as_const(list), index));
}

// The dictionary of a task as a QvTaskState, for as long as this lives.
class ChangedTask {
  public:
    explicit ChangedTask(AnyDict& dict) : dict_(dict) {
        task.swap(dict_);
        task.remove("#nsegs");
    }
    ChangedTask(const ChangedTask&) = delete;
    ChangedTask& operator=(const ChangedTask&) = delete;
    ~ChangedTask() { task.swap(dict_); }

    QvTaskState task;

  private:
    AnyDict& dict_;
};

// The dictionary of a document that holds the list, which gets its tasks back at the end.
class StoredList {
  public:
    explicit StoredList(AnyVector& list) : list_(list), inside_(dict.set(listKey, AnyVector()).asVector()) {
        inside_.swap(list_);
    }
    StoredList(const StoredList&) = delete;
    StoredList& operator=(const StoredList&) = delete;
    ~StoredList() { inside_.swap(list_); }

    AnyDict dict;

  private:
    AnyVector& list_;
    AnyVector& inside_;
};

}  // namespace

// --- The tasks.

QvTaskState QvBatchList::at(int index) const { return QvTaskState(taskAt(*this, index)); }

void QvBatchList::replace(int index, const QvTaskState& task) {
    taskAt(*this, index) = static_cast<const AnyDict&>(task);
}

void QvBatchList::append(const QvTaskState& task) { AnyVector::append(static_cast<const AnyDict&>(task)); }

void QvBatchList::remove(int index) {
    QV_ASSERT_MSG(index >= 0 && index < size(), "Invalid list index");
    AnyVector::remove(index);
}

void QvBatchList::swap(QvBatchList& other) { AnyVector::swap(other); }

bool QvBatchList::moveTask(int index, int delta) {
    const long long target = static_cast<long long>(index) + delta;
    if (index < 0 || index >= size() || target < 0 || target >= size()) return false;
    if (delta != 0) taskAt(*this, index).swap(taskAt(*this, static_cast<int>(target)));
    return true;
}

// --- Output files. Narrow and wide names compare equal.

bool QvBatchList::hasOutputFile(const Any& name, int except) const {
    if (!name.isText()) return false;
    const std::string wanted = qv_os_name(name);
    for (int i = 0; i < size(); ++i)
        if (i != except && taskAt(*this, i).get("filename").isText() &&
            qv_os_name(taskAt(*this, i).get("filename")) == wanted)
            return true;
    return false;
}

int QvBatchList::findByOutputFile(const Any& name) const {
    if (!name.isText()) return -1;
    const std::string wanted = qv_os_name(name);
    for (int i = size() - 1; i >= 0; --i)
        if (const Any& own = taskAt(*this, i).get("filename"); own.isText() && qv_os_name(own) == wanted)
            return i;
    return -1;
}

// --- The tasks' own operations.

void QvBatchList::setTaskEnabled(int index, bool on) {
    ChangedTask(taskAt(*this, index)).task.setEnabled(on);
}

bool QvBatchList::isTaskEnabled(int index) const {
    return QvTaskState(AnyDict("enabled", taskAt(*this, index).get("enabled"))).isEnabled();
}

void QvBatchList::setSegmentEnabled(int index, int segment, bool on) {
    ChangedTask(taskAt(*this, index)).task.setSegmentEnabled(segment, on);
}

bool QvBatchList::isSegmentEnabled(int index, int segment) const {
    const QvTaskState task = at(index);
    QV_ASSERT_MSG(segment >= 0 && segment < task.nrSegments(), "Invalid segment index");
    return task.isSegmentEnabled(segment);
}

int QvBatchList::removeSegment(int index, int segment) {
    return ChangedTask(taskAt(*this, index)).task.removeSegment(segment);
}

// --- Storing.

void QvBatchList::store(AnyDict& dict) const { dict.set(listKey, static_cast<const AnyVector&>(*this)); }

int QvBatchList::restore(const AnyDict& dict) {
    if (!dict.get(listKey).isVector()) return QvStatus::failed;
    AnyVector tasks = dict.get(listKey).asVector();
    AnyVector::swap(tasks);
    return QvStatus::ok;
}

int QvBatchList::save(const Any& file) {
    const StoredList stored(*this);
    return qvWriteBatchFile(file, stored.dict);
}

int QvBatchList::load(const Any& file) {
    AnyVector tasks;
    const int result = qvReadBatchFile(file, tasks);
    if (result == QvStatus::ok) AnyVector::swap(tasks);
    return result;
}
