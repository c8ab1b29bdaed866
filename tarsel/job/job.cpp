#include "tarsel/job/job.h"

#include <algorithm>

#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/job/jobrun.h"
#include "tarsel/job/keptchunks.h"
#include "tarsel/job/outputpipe.h"
#include "tarsel/job/savedtask.h"
#include "tarsel/sound/channelmap.h"
#include "tarsel/source/joinedsound.h"
#include "tarsel/words/messages.h"

Job::Job(const JobOptions& options, Signals& signals)
    : options_(options),
      signals_(signals),
      parts_{{}, {}, JobOutputs(options_), nullptr},
      warnings_(options.warnings) {
    openInputs();
    lengths_ = InputLengths(parts_.sources);
    joinSounds();
    parts_.plan = planJob(options_, parts_.outputs.form(), readInputs());
    warnings_.add(parts_.plan.warnings);
    warnings_.addEngine([this](const std::string& text) { return parts_.outputs.withFinalNames(text); });
    parts_.pipe = makeOutputPipe(parts_.plan, options_.acceptPartial);
    carryChunks(parts_, warnings_);
    parts_.outputs.claim(parts_.plan, filesRead(), *parts_.pipe);
}

void Job::openInputs() {
    if (options_.inputs.empty()) throw failure(Msg::inputMissing);
    // Next to a raw file there may be others, such as its sound.
    const bool onlyOne = options_.inputs.size() == 1;
    const auto isRaw = [&](const auto& name) { return onlyOne || !Source::describesItself(name); };
    if (!options_.raw.empty() && std::none_of(options_.inputs.begin(), options_.inputs.end(), isRaw))
        throw failure(Msg::rawNoInput);
    for (const auto& name : options_.inputs) {
        parts_.sources.push_back(std::make_unique<Source>(name, isRaw(name) ? options_.raw : ""));
        parts_.sources.back()->selectAll();
    }
}

std::vector<JobInput> Job::readInputs() const {
    std::vector<JobInput> inputs;
    for (const auto& source : parts_.sources) inputs.push_back(readInput(*source));
    if (joined_) inputs.back().joined = true;
    return inputs;
}

// Where --map takes channels of several sounds, they become one sound of a further input.
void Job::joinSounds() {
    if (options_.sound.map.empty()) return;
    const std::vector<int> sounds = parseChannelMap(options_.sound.map).sounds();
    std::vector<JoinedSound::Part> all, parts;
    std::vector<std::string> names;
    for (const auto& source : parts_.sources)
        for (int i = 0; i < source->decoder().nrStreams(qvAudioStream); ++i) {
            if (std::binary_search(sounds.begin(), sounds.end(), static_cast<int>(all.size()))) {
                parts.push_back({&source->decoder(), i});
                names.push_back(source->name());
            }
            all.push_back({&source->decoder(), i});
        }
    // The plan refuses what is not there.
    if (sounds.size() < 2 || parts.size() < sounds.size()) return;
    const auto rateOf = [&](size_t part) {
        return parts[part].decoder->getAudioParam(parts[part].stream, "samplerate").asInt32(0);
    };
    for (size_t i = 1; i < parts.size(); ++i)
        if (rateOf(i) != rateOf(0))
            throw failure(Msg::mapSounds, {std::to_string(sounds[i]), std::to_string(rateOf(i)),
                                           std::to_string(sounds[0]), std::to_string(rateOf(0))});
    parts_.sources.push_back(
        std::make_unique<Source>(joined(names, " + "), std::make_unique<JoinedSound>(parts)));
    joined_ = true;
}

// What filters read is an input as well.
std::vector<std::string> Job::filesRead() const {
    std::vector<std::string> files = parts_.plan.filterFiles.read;
    for (const auto& source : parts_.sources)
        files.insert(files.end(), source->files().begin(), source->files().end());
    return files;
}

void Job::checkWarnings() const {
    if (options_.strict) warnings_.refuse(options_.quiet, parts_.plan.output.name);
}

void Job::printPlan() {
    {
        const Signals::Watch storing(signals_,
                                     {.first = {}, .second = [this] { return parts_.outputs.leave(); }});
        saveTask(parts_, options_, warnings_, signals_);
        parts_.outputs.commitTask();
    }
    printText(planText(parts_.plan));
    if (!options_.quiet) warnings_.show();
    if (!options_.quiet)
        for (const auto& line : parts_.plan.notes) tell(Level::note, line);
}

void Job::run() { JobRun(options_, parts_, lengths_, warnings_, signals_).run(); }
