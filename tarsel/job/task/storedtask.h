// A task file: read, checked, and made ready to run.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/source/source.h"

// The key of a task that is made in so many parts.
inline constexpr char kSplitKey[] = "split";

class StoredTask {
  public:
    // Reads and checks the file. Relative names in it count from its folder. Throws Failure.
    explicit StoredTask(const std::string& file);
    // A state that was just made, as it is when it has been stored and read again: numbers with a point have
    // six decimal places. `name`: for messages.
    StoredTask(const AnyDict& state, const std::string& name);
    StoredTask(const StoredTask&) = delete;
    StoredTask& operator=(const StoredTask&) = delete;
    ~StoredTask();

    // Of the file, for the first of these.
    const std::string& name() const { return name_; }
    // As the file has it, but with absolute names and without logs of encoding quality.
    const QvTaskState& state() const { return state_; }
    // As it is, without another folder's names in it.
    const AnyDict& raw() const { return raw_; }

    // The same without the segments that are switched off, and without input files that no other uses: these
    // need not be there.
    QvTaskState enabled() const;

    // The files that a run reads its sources from, without generated ones, and the output; "" for none.
    std::vector<std::string> inputs() const;
    std::string output() const;
    // Also those that a run does not need.
    std::vector<std::string> allInputs() const;
    // The logs of encoding quality that the file asks for.
    const std::vector<std::string>& qualityLogs() const { return qualityLogs_; }
    // The command that runs afterwards, with its placeholders; "" for none.
    std::string postProcess() const;

    // Whether it has several segments, or one that is switched off.
    bool isJoin() const;

    // Before open: the task does its work and writes nothing.
    void discardOutput();
    // Opens the inputs and makes the output, which opens nothing yet. The command for afterwards is taken out
    // of the task: postProcess() runs it. Throws Failure.
    void open();
    // After open. The sources are the decoders of the task's links, each once.
    QvTask& task() const { return *task_; }
    std::vector<std::unique_ptr<Source>> sources() const;
    // To be called once. The task still uses it, so it has to outlive the task's runs.
    std::unique_ptr<QvEncodePipe> takePipe() { return std::move(pipe_); }

  private:
    std::string missingStream() const;

    std::string name_;
    std::vector<std::string> qualityLogs_;
    AnyDict raw_;
    QvTaskState state_;
    QvDPipeList decoders_;
    std::unique_ptr<QvEncodePipe> pipe_;
    std::unique_ptr<QvTask> task_;
};

// Throws Failure if a file is not a valid task.
void requireTask(const std::string& file);

// Writes a state as a task file. Returns why it could not, as the end of a sentence; "" when it is written.
std::string writeTask(const AnyDict& state, const std::string& file);

// Names as a task file is to have them: absolute, or from `folder` on.
void makeAbsolute(AnyDict& state);
void makeRelative(AnyDict& state, const std::string& folder);
