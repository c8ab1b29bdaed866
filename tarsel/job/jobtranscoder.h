// The transcoder of a job. Its callbacks run on the engine's worker; the tool waits on its own thread.
#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "tarsel/job/jobparts.h"
#include "tarsel/job/progress.h"
#include "tarsel/words/failure.h"

class JobTranscoder : public QvTranscoder {
  public:
    // Both have to outlive it.
    JobTranscoder(JobParts& parts, Progress& progress);
    ~JobTranscoder() override { QvTranscoder::stop(); }

    // The sound was measured before: the run is the second pass.
    void countMeasuring() { measured_ = 1; }
    // Joins the streams of the plan; `params` are those of each. Throws Failure.
    void join(const std::vector<ProcessParams>& params);
    // What is shown when it starts: how many passes there are, and which is the first.
    ProgressState begin() const;
    // The result of the run. `slow` is called when a requested stop takes a while.
    int wait(const std::function<void()>& slow);

    // From any thread, at any time of the run: a stop, a key, a line about the progress.
    void requestStop();
    void pressed(char key);
    void report();

    // After the run: what was shown last, the frames or samples of each stream of the plan, and why a filter
    // could not do its work, without which the job continued.
    const ProgressState& last() const { return last_; }
    const std::vector<long long>& written() const { return written_; }
    // Values that went beyond full scale in each stream of the plan.
    const std::vector<long long>& clipped() const { return clipped_; }
    // The first stream whose sound ended before its source said; null for none.
    const PlannedStream* endedEarly() const { return endedEarly_; }
    const std::optional<Failure>& filterFailure() const { return filterFailure_; }
    // Null for a stream that was not joined.
    const TransLink* linkOf(const PlannedStream& stream) const { return linkFor(stream); }
    // Why the run failed: a link knows it better than the log, and that better than the run.
    std::string reason() const;

    int cbProcess() override;
    // The sound is read once before the run, which makes a pass more of it.
    void cbMeasure(double part) override;
    int cbProgress(double part) override;
    int cbMuxClose(QvMuxer*) override;
    void cbPaused(bool paused) override;
    void cbDone(int result) override;

  private:
    TransLink* linkFor(const PlannedStream& stream) const {
        return getLinkForOutput(stream.type, stream.number);
    }
    ProgressState state(const char* name) const;
    ProgressState stateAt(long long units, const char* name) const;
    ProgressState measuringState() const;
    // Of the pass in which an encoder looks at the pictures.
    ProgressState analyzingState() const;
    // `fromLast`: how many passes follow. What is done of the pass becomes that of the whole.
    void countPasses(ProgressState& state, int fromLast) const;
    void takeFilterFailure();
    Failure failureOf(const QvCodec& filter) const;

    JobParts& parts_;
    Progress& progress_;
    const TransLink* first_ = nullptr;  // of the first stream
    std::atomic<long long> units_{0};   // of the first stream; for a report that comes on another thread
    std::atomic<const char*> phase_{"running"};
    std::atomic<double> measured_{-1};  // part of the sound; negative where none is measured
    std::atomic<bool> began_{false};    // the run itself
    bool twoPass_ = false;
    std::atomic<double> analyzed_{-1};  // part of the pictures, while the first of two passes goes over them
    ProgressState last_;
    std::vector<long long> written_, clipped_;
    std::optional<Failure> filterFailure_;
    const PlannedStream* endedEarly_ = nullptr;
    std::atomic<bool> stop_{false};
    std::mutex lock_;
    std::condition_variable changed_;
    bool done_ = false;
    int result_ = 0;
};
