#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/host/events.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/job.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

// Of a job whose input becomes shorter each time that it is read.
constexpr int kMostAttempts = 3;

// Options as they were given; they are parsed once the command runs.
struct Given {
    JobOptions job;
    OutputOptions outputs;
    std::string samplerate, channels, bits, threads, progress = "auto";
};

void resolve(Given& given) {
    JobOptions& job = given.job;
    job.effects.check();
    limitThreads(given.threads);
    if (!job.to.empty() && !job.duration.empty()) throw failure(Msg::optionsExclude, {"--to", "--duration"});
    job.policy = given.outputs.policy();
    job.policy.recover = !job.dryRun;
    job.policy.quiet = job.quiet;
    job.effects.acceptPartial = job.acceptPartial;
    if (!given.samplerate.empty())
        job.samplerate = static_cast<int>(parseNumber(given.samplerate, 1000, 768000, "--samplerate"));
    if (!given.channels.empty())
        job.channels = static_cast<int>(parseNumber(given.channels, 1, 8, "--channels"));
    if (!given.bits.empty()) job.bits = static_cast<int>(parseNumber(given.bits, 8, 24, "--bits"));
    if (job.bits && *job.bits % 8 != 0) throw failure(Msg::bitsWrong, {"--bits", given.bits});
    if (!job.muxer.empty() && job.muxer != "nullmux" && job.muxer != "rawmux" && job.muxer != "rawavimux")
        throw failure(Msg::muxerUnknown,
                      {job.muxer, suggestion(job.muxer, {"rawmux", "rawavimux", "nullmux"})});
}

// Before the engine starts, so that what is said of plug-ins is an object as well.
void openEvents(Given& given, const std::string& version) {
    JobOptions& job = given.job;
    job.progress = parseProgress(given.progress);
    if (job.progress.how != ProgressMode::How::json) return;
    const std::string option = "--progress " + given.progress;
    if (job.progress.target == "1" && job.dryRun) throw failure(Msg::optionsExclude, {option, "--dry-run"});
    if (job.progress.target == "1" && (job.output == "-" || job.output == "/dev/stdout"))
        throw failure(Msg::optionsExclude, {option, "-o " + job.output});
    std::vector<std::string> others = job.inputs;
    for (const auto& name : {job.output, job.saveTask, job.effects.subtitles})
        if (!name.empty()) others.push_back(name);
    Events::get().open(job.progress.target, others, given.outputs.overwrite, version);
}

void transcode(Given& given, Signals& signals) {
    resolve(given);
    for (int attempt = 1;; ++attempt) {
        Job job(given.job, signals);
        job.checkWarnings();
        if (given.job.dryRun) return job.printPlan();
        try {
            return job.run();
        } catch (const InputShrank& shrank) {
            if (!given.job.acceptPartial || attempt == kMostAttempts) throw;
            given.job.warnings.push_back(shrank.warning);
            if (job.taskIsStream()) given.job.saveTask.clear();
        }
    }
}

}  // namespace

void openEventsFor(std::span<char*> words, const std::string& version) {
    for (size_t i = 1; i < words.size() && std::string_view(words[i]) != "--"; ++i) {
        const std::string word = words[i], name = "--progress";
        if (word.rfind(name, 0) != 0) continue;
        const bool whole = word == name && i + 1 < words.size();
        if (!whole && word.rfind(name + "=", 0) != 0) continue;
        try {
            const ProgressMode mode = parseProgress(whole ? words[i + 1] : word.substr(name.size() + 1));
            // Nothing that exists is emptied for it.
            if (mode.how == ProgressMode::How::json) Events::get().open(mode.target, {}, false, version);
        } catch (const Failure&) {
            // What is wrong with the line as a whole is said.
        }
        return;
    }
}

void addTranscode(CommandLine& line, Signals& signals, const std::string& version) {
    Command command = line.command("transcode", "Read INPUTs, convert, and write OUTPUT");
    auto given = std::make_shared<Given>();
    JobOptions& job = given->job;
    command.arguments("INPUT", job.inputs, "Files, or testgen:size=1280x720,rate=25,duration=10");
    command.option("-o,--output", job.output,
                   "What to write; the extension says how. - is the standard output", "FILE");
    command.option("--format", job.format, "What to write, in the place of an extension: wav, raw, ...",
                   "EXT");
    command.option("--raw", job.raw, "Format of a raw input: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.option("--from", job.from,
                   "First instant taken: SS.mmm, HH:MM:SS, 120f, HH:MM:SS:FF; -10 counts from the end",
                   "TIME");
    command.option("--to", job.to, "First instant not taken", "TIME");
    command.option("--duration", job.duration, "How much is taken, in the place of --to", "TIME");
    command.flag("--no-video", job.noVideo, "Leave out the pictures");
    command.flag("--no-audio", job.noAudio, "Leave out the sound");
    command.option("--samplerate", given->samplerate, "Samples a second", "N");
    command.option("--channels", given->channels, "Channels of the sound, 1 to 8", "N");
    command.option("--bits", given->bits, "Bits of a sample: 8, 16 or 24", "N");
    command.option("--muxer", job.muxer, "nullmux: do everything but write", "NAME");
    command.option("--post", job.post,
                   "A command run afterwards; %i and %o stand for the inputs and outputs, %o1 for the first",
                   "CMD");
    command.option("--save-task", job.saveTask, "Write the job as a task file", "FILE");
    command.option("--progress", given->progress,
                   "What is shown meanwhile: objects to FD or FILE, or stderr; or a line each SECONDS",
                   "auto|json[:FD|:FILE]|log[:SECONDS]|none", {"auto", "json", "log", "none"});
    command.flag("--split-channels", job.splitChannels, "One WAV file a channel");
    command.flag("--accept-partial", job.acceptPartial, "Take what is there of a damaged input");
    command.flag("--strict", job.strict, "Let the job fail if there is a warning");
    addThreads(command, given->threads);
    command.flag("--dry-run", job.dryRun, "Print the plan and do nothing");
    given->outputs.add(command);
    command.flag("-q,--quiet", job.quiet, "Say nothing but errors");
    addEffectOptions(command, job.effects);
    command.action([&signals, given] { transcode(*given, signals); },
                   [given, version] { openEvents(*given, version); });
}
