#include <algorithm>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/commands/progressoption.h"
#include "tarsel/commands/transcode.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/job.h"
#include "tarsel/job/plan/outputform.h"
#include "tarsel/job/post.h"
#include "tarsel/presets/codecnames.h"
#include "tarsel/presets/presetchoice.h"
#include "tarsel/split/split.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/keyvalues.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/rawnames.h"
#include "tarsel/words/timespec.h"

namespace {

struct Given : GivenJob {
    OutputOptions outputs;
    ProgressOption progress;
    std::string threads, inputFormat;
    SplitPlace place;
};

constexpr int kMostSchedulerOptions = 100;

int parseBits(const std::string& text) {
    for (const int bits : {8, 16, 24})
        if (text == std::to_string(bits)) return bits;
    throw failure(Msg::bitsWrong, {"--bits", text});
}

// The null device has no name that says a format, and needs none.
bool discards(const JobOptions& job) {
    const auto stream = job.output.empty() ? nullptr : StreamOutput::find(job.output, {});
    return stream && stream->discards();
}

OutputWish wishOf(const GivenJob& given) {
    const JobOptions& job = given.job;
    OutputWish wish;
    wish.preset = job.presetName;
    wish.output = job.output;
    wish.video = parseCodec(given.vcodec, qvVideoStream);
    wish.audio = parseCodec(given.acodec, qvAudioStream);
    if (job.muxer == "nullmux" || job.output.empty()) return wish;
    wish.extension = formatName(job);
    wish.own = writesItself(wish.extension);
    wish.muxer = job.muxer;
    if (wish.extension.empty() && wish.namesCodecs() && job.presetName.empty() && !discards(job))
        throw job.output == "-" ? failure(Msg::streamNeedsFormat)
                                : failure(Msg::outputFormatMissing, {job.output});
    return wish;
}

// What is set has to have an encoder.
void checkEncoders(const JobOptions& job, const OutputWish& wish) {
    job.encoders.check();
    if (job.preset || !(wish.own || wish.extension.empty())) return;
    for (const int type : {qvVideoStream, qvAudioStream})
        if (const std::string option = job.encoders.given(type); !option.empty())
            throw failure(Msg::encoderRaw, {option, job.output});
}

// The encoders that --vcodec and --acodec name, or the extension of a name to which the tool itself gives no
// meaning, may say the preset.
void choosePreset(GivenJob& given) {
    JobOptions& job = given.job;
    const OutputWish wish = wishOf(given);
    job.noVideo |= wish.video.none;
    job.noAudio |= wish.audio.none;
    job.encoders.video = wish.video.settings;
    job.encoders.audio = wish.audio.settings;
    job.preset = outputPreset(wish);
    checkEncoders(job, wish);
    if (!job.preset && job.match) throw failure(Msg::matchNoPreset);
    if (!job.preset) return;
    const QvPreset& preset = job.preset->preset();
    const std::string command = preset.isCustom() ? preset.postprocessCmd().toString().asString("") : "";
    if (!command.empty() && job.post.empty())
        job.warnings.push_back(lineOf(Msg::presetCommandLeft, {preset.name(), command}));
}

// "NAME:key=value,...".
void parseMuxer(JobOptions& job) {
    const size_t colon = job.muxer.find(':');
    if (colon == std::string::npos) return;
    const std::string text = job.muxer.substr(colon + 1);
    job.muxer.resize(colon);
    job.muxerSettings = KeyValues(text, {}, "--muxer " + job.muxer).all();
}

void checkMuxer(const JobOptions& job) {
    if (job.preset || job.muxer.empty()) return;
    const std::vector<std::string> own = {"rawmux", "rawavimux", "nullmux"};
    if (std::find(own.begin(), own.end(), job.muxer) == own.end())
        throw failure(Msg::muxerUnknown, {job.muxer, suggestion(job.muxer, own)});
}

void takeStandardInput(Given& given) {
    JobOptions& job = given.job;
    job.standardInput = standardInputOf(job.inputs, given.inputFormat);
    if (!job.standardInput) return;
    if (!job.saveTask.empty()) throw failure(Msg::stdinRefuses, {"--save-task"});
    if (job.encoders.twoPass) throw failure(Msg::streamReadTwice, {"--two-pass"});
    if (postNames(job.post, job.inputs, StandardInput::kName))
        throw failure(Msg::stdinRefuses, {"--post with %i"});
}

// After "--", among the inputs. None of these begins like an option then, but as "./-name".
void takeSchedulerOptions(Given& given) {
    if (!given.place.slurm) return;
    const auto isOption = [](const std::string& word) { return word.size() > 1 && word[0] == '-'; };
    std::ranges::copy_if(given.job.inputs, std::back_inserter(given.place.options), isOption);
    std::erase_if(given.job.inputs, isOption);
}

}  // namespace

void resolveJob(GivenJob& given) {
    JobOptions& job = given.job;
    job.effects.check();
    job.sound.check();
    if (job.shortest && job.longest) throw failure(Msg::optionsExclude, {"--shortest", "--longest"});
    if (!job.to.empty() && !job.duration.empty()) throw failure(Msg::optionsExclude, {"--to", "--duration"});
    job.effects.acceptPartial = job.acceptPartial;
    if (!given.samplerate.empty())
        job.samplerate = static_cast<int>(parseNumber(given.samplerate, 1000, 768000, "--samplerate"));
    if (!given.channels.empty())
        job.channels = static_cast<int>(parseNumber(given.channels, 1, 8, "--channels"));
    if (!given.bits.empty()) job.bits = parseBits(given.bits);
    if (!given.split.empty()) {
        if (job.standardInput) throw failure(Msg::stdinRefuses, {"--split"});
        job.division = makeSplit(given.split);
    }
    parseMuxer(job);
    choosePreset(given);
    checkMuxer(job);
}

namespace {

void openEvents(Given& given, const std::string& version) {
    JobOptions& job = given.job;
    if (job.dryRun && parseProgress(given.progress.text).target == "1")
        throw failure(Msg::optionsExclude, {"--progress " + given.progress.text, "--dry-run"});
    std::vector<std::string> others = job.inputs;
    others.insert(others.end(), {job.saveTask, job.effects.subtitles});
    given.progress.open(job.output, others, given.outputs.overwrite, version);
    job.progress = given.progress.mode;
}

void transcode(Given& given, Signals& signals) {
    JobOptions& job = given.job;
    job.threads = limitThreads(given.threads);
    job.policy = given.outputs.policy();
    job.policy.recover = !job.dryRun;
    job.policy.quiet = job.quiet;
    takeSchedulerOptions(given);
    takeStandardInput(given);
    resolveJob(given);
    job.division = makeSplit(given.split, given.place);
    runJob(given.job, [&] { return std::make_unique<Job>(given.job, signals); });
}

std::vector<std::string> outputFormats() {
    std::vector<std::string> names = {"wav", "png", "avi"};
    for (const RawName& name : rawNames()) names.emplace_back(name.extension);
    return names;
}

std::vector<std::string> offeredCodecs(int type) {
    std::vector<std::string> names = {"none"};
    for (const CodecName& row : codecNames())
        if (row.type == type) names.emplace_back(row.name);
    return names;
}

}  // namespace

void addJobOptions(Command& command, GivenJob& given, Need inputs) {
    JobOptions& job = given.job;
    command.arguments("INPUT", job.inputs,
                      "Files, testgen:size=1280x720,rate=25,duration=10, or - for the standard input", 0,
                      inputs);
    command.option("-o,--output", job.output,
                   "What to write; the extension says how. - is the standard output", "FILE");
    command.option("--format", job.format, "What to write, in the place of an extension: wav, raw, ...",
                   "EXT", outputFormats());
    command.option("--preset", job.presetName, "What the output is to be, see 'tarsel presets list'", "NAME");
    command.option("--vcodec", given.vcodec,
                   "Encoder of the picture: h264, prores, ..., a module, or none; settings as h264:tune=film",
                   "NAME[:K=V,...]", offeredCodecs(qvVideoStream));
    command.option("--acodec", given.acodec,
                   "Encoder of the sound: aac, flac, pcm, ..., a module, or none; settings as aac:profile=1",
                   "NAME[:K=V,...]", offeredCodecs(qvAudioStream));
    command.option("--crf", job.encoders.crf, "Quality that the picture's encoder keeps, in its own scale",
                   "N");
    command.option("--bitrate", job.encoders.bitrate, "Bit rate of the picture: 800k, 5M, ...", "RATE");
    command.option("--audio-bitrate", job.encoders.audioBitrate, "Bit rate of the sound: 128k, ...", "RATE");
    command.flag("--two-pass", job.encoders.twoPass, "Read the picture twice, to spend its bits better");
    command.list(
        "--meta", job.tags.given,
        "What the output says of itself: title=..., artist=..., timecode=HH:MM:SS:FF; empty for none",
        "KEY=VALUE");
    command.option("--language", job.tags.languages, "Languages of the sounds, three letters each: eng,fra",
                   "CODE,...");
    command.flag("--no-meta", job.tags.none,
                 "Leave out titles, chapters, timecode and languages of the INPUTs");
    command.flag("--match", job.match, "Choose the values nearest to the INPUT that the preset allows");
    command.flag("--join", job.join,
                 "The INPUTs are segments NAME[@FROM-TO], one after the other; A+B is read side by side");
    command.list("--cut", job.cuts, "A part of the INPUTs; several are joined in this order", "FROM-TO");
    command.option("--raw", job.raw, "Format of a raw input: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.flag("--no-rotate", job.noRotate, "Keep films as they are coded, not turned upright");
    command.option("--from", job.from,
                   "First instant taken: SS.mmm, HH:MM:SS, 120f, HH:MM:SS:FF; -10 counts from the end",
                   "TIME");
    command.option("--to", job.to, "First instant not taken", "TIME");
    command.option("--duration", job.duration, "How much is taken, in the place of --to", "TIME");
    command.flag("--no-video", job.noVideo, "Leave out the pictures");
    command.flag("--no-audio", job.noAudio, "Leave out the sound");
    command.option("--samplerate", given.samplerate, "Samples a second", "N");
    command.option("--channels", given.channels, "Channels of the sound, 1 to 8", "N");
    command.option("--bits", given.bits, "Bits of a sample: 8, 16 or 24", "N");
    command.flag("--shortest", job.shortest, "End the picture with its sound");
    command.flag("--longest", job.longest, "Hold the last picture until the sound has ended");
    command.option("--muxer", job.muxer,
                   "nullmux: do everything but write; or one that the preset allows; settings as mp4mux:K=V",
                   "NAME[:K=V,...]", {"nullmux", "rawmux", "rawavimux"});
    command.option("--post", job.post,
                   "A command run afterwards; %i and %o stand for the inputs and outputs, %o1 for the first",
                   "CMD");
    command.flag("--split-channels", job.splitChannels, "One WAV file a channel");
    command.option("--split", given.split, "Make the picture in N parts, side by side", "N");
    command.flag("--accept-partial", job.acceptPartial, "Accept a damaged input and take what can be read");
    addSoundOptions(command, job.sound);
    addEffectOptions(command, job.effects);
}

void addTranscode(CommandLine& line, Signals& signals, const std::string& version) {
    Command command = line.command("transcode", "Read INPUTs, convert, and write OUTPUT");
    auto given = std::make_shared<Given>();
    JobOptions& job = given->job;
    addJobOptions(command, *given, Need::required);
    // The parser ends at "--" where no argument is left, and gives these words to the inputs before them.
    command.arguments("OPTION", given->place.options, "After --: options for sbatch, as --partition=NAME",
                      kMostSchedulerOptions, Need::optional);
    command.group("");
    command.option("--input-format", given->inputFormat,
                   "What the standard input holds, as an extension: wav, ...", "EXT");
    command.option("--save-task", job.saveTask, "Write the job as a task file", "FILE");
    command.flag("--relative", job.relative, "The task file names files as seen from its folder");
    given->progress.add(command);
    command.flag("--strict", job.strict, "Let the job fail if there is a warning");
    command.flag("--unchanged", job.unchanged, "Let the job fail if an INPUT changes while it is read");
    command.flag("--slurm", given->place.slurm,
                 "Make the parts of --split on a cluster, by Slurm; after --: options for sbatch");
    addThreads(command, given->threads);
    command.flag("--dry-run", job.dryRun, "Print the plan and do nothing");
    given->outputs.add(command);
    command.flag("-q,--quiet", job.quiet, "Print nothing but errors");
    command.action([&signals, given] { transcode(*given, signals); },
                   [given, version] { openEvents(*given, version); });
}
