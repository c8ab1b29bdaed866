// A transcode of the tool: resolved from options to a plan, then run, checked and put in place.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/progress.h"
#include "tarsel/picture/picture.h"
#include "tarsel/source/source.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/numberedname.h"
#include "tarsel/words/timespec.h"

struct JobOptions {
    std::vector<std::string> inputs;
    std::string output, format, raw, from, to, duration, muxer, post, saveTask;
    EffectOptions effects;
    std::optional<int> samplerate, channels, bits;
    ProgressMode progress;
    OutputPolicy policy{false};
    bool splitChannels = false, dryRun = false, acceptPartial = false, quiet = false;
    bool noVideo = false, noAudio = false;
    bool strict = false;                // warnings are failures
    std::vector<std::string> warnings;  // of earlier attempts
};

// An input became shorter while it was read, so that what was written has too little of it or holds silence
// in its place. The job can be run again with what is left.
class InputShrank : public Failure {
  public:
    InputShrank(const Failure& failure, std::string line) : Failure(failure), warning(std::move(line)) {}
    std::string warning;  // for the attempt that takes what is left
};

// What an output name stands for. `byInput`: a stream whose name does not say it, which takes raw pictures,
// or WAV where there is no picture.
enum class OutputKind { raw, wav, pictures, avi, nothing, byInput };

// One stream from an input to the output, with what it will be.
struct JobStream {
    int type;  // 1 video, 2 audio
    Source* source;
    int decStream, encStream;
    // The format of the output.
    std::shared_ptr<const PictureEffects> picture;  // of video
    int width = 0, height = 0;
    unsigned fourcc = 0;
    QvFramerate rate;
    int samplerate = 0, channels = 0, bits = 0;
    MediaTime in, out;       // in the source
    long long inUnits = 0;   // frames or samples between the points
    long long expected = 0;  // frames or samples of the output
    long long own = 0;       // audio: samples of the output that the source itself has
    long long frame = 0;     // audio: most samples that belong to one frame of the picture; 0 without one
    long long written = -1;  // after the run
    ProcessParams params;
    std::vector<std::string> chain;          // a line for each filter
    long long bytes(long long units) const;  // without headers
};

class Job {
  public:
    Job(const JobOptions& options, Signals& signals);
    ~Job();

    // Throws Failure if a warning is one.
    void checkWarnings() const;
    // Writes the task file if there is to be one, and prints the plan to the standard output.
    void plan();
    // Runs, checks and commits. Throws Failure.
    void run();
    // Whether the task file is a stream, which takes it once.
    bool taskIsStream() const { return taskStream_ != nullptr; }

  private:
    class Runner;

    void openInputs();
    void chooseOutput();
    OutputKind chosenKind() const;
    std::string formatName() const;
    void choosePixel();
    void chooseNumbers();
    void checkStream() const;
    void planStreams();
    void planStream(Source& source, int type, int number);
    bool unwanted(int type) const;
    static MediaTime endOf(const JobStream& stream);
    bool takesPart() const;
    void planPoints();
    void planPoint(JobStream& stream, const JobStream& leading);
    void planLengths();
    void planFilters();
    void planPicture(JobStream& stream);
    void planSound(JobStream& stream) const;
    void checkEffects() const;
    void takeWarnings();
    void checkPicture() const;
    void checkCounts() const;
    void buildPipe();
    void addStream(JobStream& stream);
    void carryChunks(const JobStream& stream);
    void checkNames();
    void checkOutputNames();
    void claim(const std::string& place, const std::string& name);
    void claimFilterFiles();
    void claimTask();
    void printPlan() const;
    void storeTask();
    void commit();
    void checkDamage();
    void checkLengths() const;
    void checkSpace() const;
    void redirectFilters();
    std::string withFinalNames(std::string text) const;
    void link(Runner& runner) const;
    int runLinked(Runner& runner, Progress& progress);
    [[noreturn]] void stopped(Exit signalled) const;
    [[noreturn]] void fail(Runner& runner, int result) const;
    [[noreturn]] void tellBetter(bool ranOut) const;
    bool failedForMemory(const Runner& runner) const;
    void stopIfSignalled() const;
    void checkResult();
    void checkFiles() const;
    void checkTaken() const;
    long long taken() const;  // bytes, by a stream
    void report(const std::vector<std::string>& names) const;
    void runPost(const std::vector<std::string>& names) const;
    void showWarnings() const;
    std::string primaryExtension() const;
    const std::string& outputName() const;  // for messages
    bool hasVideo() const;
    bool writesNothing() const;
    bool takesOneStream() const;
    JobOptions options_;
    Signals& signals_;
    OutputKind kind_ = OutputKind::raw;
    std::vector<std::unique_ptr<Source>> sources_;
    std::vector<JobStream> streams_;
    std::optional<NumberedName> numbered_;
    // Of all files that the job writes: they get their names together.
    std::shared_ptr<Transaction> files_ = std::make_shared<Transaction>();
    std::unique_ptr<Outputs> outputs_, taskFile_;  // no `outputs_` where there is a `stream_`
    std::unique_ptr<StreamOutput> stream_, taskStream_;
    FilterFiles filterFiles_;
    std::map<std::string, std::unique_ptr<Outputs>> dumps_;  // what filters write, by the name that they have
    std::set<std::string> places_;                           // of all that the job writes
    std::unique_ptr<QvEncodePipe> pipe_;
    std::vector<std::string> warnings_;
    std::vector<long long> lengths_;  // bytes of the inputs at the start; negative for what is no file
};
