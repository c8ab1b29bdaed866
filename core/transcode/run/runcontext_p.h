// What the parts of a run work with: the task, how to run it, and the application's callbacks.
#pragma once

#include <memory>
#include <vector>

class QvMetadataFile;
class QvTask;
class QvTranscoder;
class RunControl;
class RunError;
class StepTimes;
struct TranscoderSettings;

struct RunContext {
    QvTranscoder& transcoder;
    QvTask& task;
    const TranscoderSettings& settings;
    RunControl& control;
    StepTimes& times;
    RunError& error;
    std::vector<std::unique_ptr<QvMetadataFile>>& statistics;  // of a first pass, until the end of the run

    // During these two the application may ask for filters of the running links.
    void callProgress(double part) const;
    void callProcess() const;             // what is not 0 stops the loop
    bool callMeasure(double part) const;  // false once the run is to stop
    void waitWhilePaused() const;
};
