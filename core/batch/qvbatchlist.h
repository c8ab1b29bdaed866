// A list of tasks, with a file form. Each element is the dictionary of one QvTaskState.
//
//     QvBatchList list;
//     if (list.load("night.xml") == 0) { list.moveTaskUp(3); list.save("night.xml"); }
//
// Indexes out of range are assertions unless a function says otherwise.
#pragma once

#include "core/arch/api.h"
#include "core/transcode/task/qvtaskstate.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QV_API QvBatchList : public AnyVector {
  public:
    QvBatchList() = default;

    // Copies; replace() puts a changed one back.
    QvTaskState at(int index) const;
    QvTaskState operator[](int index) const { return at(index); }
    QvTaskState front() const { return at(0); }
    QvTaskState back() const { return at(size() - 1); }
    void replace(int index, const QvTaskState& task);
    void append(const QvTaskState& task);
    void remove(int index);
    void swap(QvBatchList& other);

    // Exchanges a task with the one that is `delta` further on. False, and nothing changes, where there is
    // none.
    bool moveTask(int index, int delta);
    bool moveTaskUp(int index) { return moveTask(index, -1); }
    bool moveTaskDown(int index) { return moveTask(index, 1); }

    // Whether a task writes to that name (of either width), leaving out task `except` (-1: none).
    bool hasOutputFile(const Any& name, int except = -1) const;
    int findByOutputFile(const Any& name) const;  // the last one that writes to that name, or -1

    // The task's own operations.
    void setTaskEnabled(int index, bool on);
    bool isTaskEnabled(int index) const;
    void setSegmentEnabled(int index, int segment, bool on);
    bool isSegmentEnabled(int index, int segment) const;
    int removeSegment(int index, int segment);

    void store(AnyDict& dict) const;   // under "taskList"
    int restore(const AnyDict& dict);  // -1, and nothing changes, without a Vector "taskList"

    // Writes an XML document of type "BatchList", version 2.0: 0, or -1 with a line in the log. A file that
    // exists is replaced in one step, and is unchanged when this fails. The list itself goes through the
    // document's dictionary and back, so that it is not copied; it is as before also when this fails or
    // throws.
    int save(const Any& file);
    // 0; -9 if the file can't be read; -1 if it holds no list, a list with an element that is no dictionary,
    // or one of the form before this one. The list changes only on success. What a task holds is not looked
    // at: QvBatchProcessor reports a damaged one as failed. Encoders that are not installed give way to those
    // that can stand in for them.
    int load(const Any& file);
};
