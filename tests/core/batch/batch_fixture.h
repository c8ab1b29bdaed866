// Stored tasks over real files, and a callback that writes down what a batch reports.
#pragma once

#include <atomic>
#include <functional>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "core/batch/qvbatchprocessor.h"
#include "tests/core/transcode/batch/joinedtask.h"
#include "tests/support/events.h"

// What is reported, except for progress. `hook` is called with each of these, and with "progress", on the
// thread that reports.
class BatchNotes : public QvBatchProcessCb, public Events {
  public:
    int count(const std::string& text) const {
        const std::string notes = all();
        int found = 0;
        for (std::size_t at = notes.find(text); at != std::string::npos; at = notes.find(text, at + 1))
            ++found;
        return found;
    }

    // Calls the action on each report of this text, in place of any former hook.
    void when(const std::string& report, const std::function<void()>& action) {
        hook = [=](const std::string& text) {
            if (text == report) action();
        };
    }

    std::function<void(const std::string&)> hook;
    std::vector<std::string> messages;  // the "msg" of tasks that have ended
    std::vector<double> progressed;

    int batchStarted() override { return note("begin"); }
    int batchFinished() override { return note("end"); }
    int taskStarted(int task) override { return note("task" + std::to_string(task)); }
    int taskFinished(int task, int code, const AnyDict& info) override {
        messages.push_back(info.getString("msg", ""));
        return note("done" + std::to_string(task) + ":" + std::to_string(code));
    }
    int taskSkipped(int task) override { return note("skipped" + std::to_string(task)); }
    int segmentInitStatus(int task, int segment, int status) override {
        return note("init" + place(task, segment) + ":" + std::to_string(status));
    }
    int segmentStarted(int task, int segment) override { return note("seg" + place(task, segment)); }
    int segmentFinished(int task, int segment, int code, const AnyDict&) override {
        return note("segdone" + place(task, segment) + ":" + std::to_string(code));
    }
    int progress(int, int, const AnyDict& info) override {
        progressed.push_back(info.getDouble("percent", -1));
        if (hook) hook("progress");
        return 0;
    }
    int batchPaused(bool paused) override { return note(paused ? "paused" : "resumed"); }

  private:
    static std::string place(int task, int segment) {
        return std::to_string(task) + "." + std::to_string(segment);
    }
    int note(const std::string& text) {
        add(text);
        if (hook) hook(text);
        return 0;
    }
};

class BatchTest : public JoinedTask {
  protected:
    // Only sound, or only pictures; each file is a segment.
    QvTaskState task(const std::string& out, const std::vector<AnyDict>& files, int type = qvAudioStream,
                     const std::optional<InOutPoints>& points = {}) const {
        QvTaskState made;
        made.set("__class__", "TranscodeTask");
        made.set("encoder", type == qvAudioStream ? output(1, QvFramerate(0.0)) : output(0));
        made.setOutputFilename(folder_.file(out).c_str());
        made.set("streams", AnyVector(AnyDict("type", type)));
        made.set("segments", AnyVector());
        for (const AnyDict& file : files)
            made.addSegment(AnyVector(source(type, file, points)), AnyVector(file));
        return made;
    }
    QvTaskState good(int number) const { return task("out" + std::to_string(number) + ".x", {wav_}); }
    AnyDict missing() const { return entry(folder_.file("missing.wav"), AnyDict()); }
    // The files that begin with the output's name.
    Texts outputs(int number) const {
        Texts names;
        for (const auto& file : std::filesystem::directory_iterator(folder_.path()))
            if (file.path().filename().string().rfind("out" + std::to_string(number), 0) == 0)
                names.push_back(file.path().string());
        return names;
    }
    bool isWritten(int number) const { return !outputs(number).empty(); }

    AnyDict wav_ = sound("in.wav", 4800, 7, 48000);
};
