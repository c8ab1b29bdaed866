#include "tarsel/job/task/joinplanner.h"

#include <algorithm>
#include <cstdio>
#include <optional>

#include "tarsel/job/plan/filmtags.h"
#include "tarsel/job/plan/filters.h"
#include "tarsel/job/plan/inputfit.h"
#include "tarsel/job/task/divide.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

void refuse(bool given, const char* option) {
    if (given) throw failure(Msg::joinRefuses, {option});
}

// Several segments differ by the names that were typed; a task of one finds its decoder by the name
// that the decoder gives itself, which is another one for the test generator.
AnyDict storedInput(const Source& source, const std::string& name, bool alone) {
    AnyDict decoder;
    source.decoder().store(decoder);
    const Any own = alone ? source.decoder().QvCodec::getParam("filename") : Any();
    return AnyDict("filename", own.isText() ? own : Any(name.c_str()), "decoder", Any(decoder));
}

std::string inSeconds(const std::string& time, const QvFramerate& rate) {
    char text[32];
    std::snprintf(text, sizeof text, "%.9f", parseTime(time, rate, "--fade").seconds());
    return text;
}

// "IN,OUT" of --fade, of which the first segment has the beginning and the last one the end. `rate`: of the
// frames that it counts, for a segment that has no picture of its own.
std::string fadeOf(const std::string& given, bool first, bool last, const std::optional<QvFramerate>& rate) {
    if (given.empty() || (!first && !last)) return "";
    const size_t comma = std::min(given.find(','), given.size());
    std::string in = given.substr(0, comma), out = comma < given.size() ? given.substr(comma + 1) : in;
    if (rate) in = inSeconds(in, *rate), out = inSeconds(out, *rate);
    return (first ? in : "0") + "," + (last ? out : "0");
}

}  // namespace

JoinPlanner::JoinPlanner(const PlanOptions& options, const OutputForm& form, Opener open)
    : options_(options), form_(form), open_(std::move(open)) {
    const bool points = !options.from.empty() || !options.to.empty() || !options.duration.empty();
    const char* const how = options.join ? "--join" : "--cut";
    if (options.join && !options.cuts.empty()) throw failure(Msg::optionsExclude, {"--join", "--cut"});
    if (points) throw failure(Msg::optionsExclude, {how, "--from, --to and --duration"});
    refuse(!options.sound.delay.empty(), "--delay");
    for (const std::string& spec : options.effects.filters) requireDivisible(spec.substr(0, spec.find(':')));
    join_.ofCuts = !options.join;
}

std::vector<SegmentWords> JoinPlanner::words() const {
    std::vector<SegmentWords> all;
    for (const std::string& cut : options_.cuts)
        all.push_back({options_.inputs, parseRange(cut, "--cut"), "--cut " + cut});
    if (options_.join)
        for (const std::string& word : options_.inputs) all.push_back(parseSegment(word));
    return all;
}

void JoinPlanner::plan() {
    const std::vector<SegmentWords> all = words();
    for (size_t i = 0; i < all.size(); ++i) add(all[i], i == 0, i + 1 == all.size());
    whole_.output = form_;
    whole_.preset = options_.preset;
    whole_.streams = join_.streams();
    checkOutput(whole_, options_);
    checkEffects(whole_, options_.effects);
    planTags();
    if (const std::string given = options_.sound.given(); !given.empty() && known_.sounds.empty())
        throw failure(Msg::effectNoSound, {given});
}

void JoinPlanner::planTags() {
    std::vector<const JobPlan*> parts;
    for (const JoinedSegment& segment : join_.segments) parts.push_back(&segment.plan);
    checkTags(form_, options_.tags);
    planLanguages(whole_.streams, options_.tags);
    whole_.tags = filmTags(parts, options_.tags);
}

size_t JoinPlanner::segmentCount() const {
    return options_.join ? options_.inputs.size() : options_.cuts.size();
}

bool JoinPlanner::levelIsCommon() const { return !options_.sound.normalize.empty() && segmentCount() > 1; }

std::unique_ptr<JoinLevel> JoinPlanner::level() const {
    if (!levelIsCommon() || !options_.sound.gains.empty()) return nullptr;
    return std::make_unique<JoinLevel>(join_, parseTarget(options_.sound.normalize), name());
}

std::string JoinPlanner::name() const {
    const size_t more = join_.segments.size() - 1;
    return names_.front() + (more == 0 ? "" : " and " + std::to_string(more) + " more");
}

int JoinPlanner::inputNumber(const std::string& name) {
    if (const auto known = numbers_.find(name); known != numbers_.end()) return known->second;
    const std::unique_ptr<Source> source = open_(name);
    const int number = static_cast<int>(names_.size());
    names_.push_back(name);
    numbers_.emplace(name, number);
    inputs_.push_back(readInput(*source));
    join_.inputs.push_back(storedInput(*source, source->name(), segmentCount() == 1));
    files_.insert(files_.end(), source->files().begin(), source->files().end());
    return number;
}

PlanOptions JoinPlanner::optionsOf(const SegmentWords& words, const std::vector<JobInput>& inputs, bool first,
                                   bool last) const {
    PlanOptions options = options_;
    options.inputs = words.inputs;
    options.from = words.range.from;
    options.to = words.range.to;
    options.segment = words.typed;
    const bool hasPicture =
        std::any_of(inputs.begin(), inputs.end(), [](const JobInput& input) { return !input.video.empty(); });
    if (std::all_of(inputs.begin(), inputs.end(), [](const JobInput& input) { return input.audio.empty(); }))
        options.sound = SoundOptions();
    std::optional<QvFramerate> rate;
    if (!hasPicture && !known_.pictures.empty()) rate = known_.pictures.front().rate;
    // A gain of its own for each would not keep how loud they are to each other.
    if (levelIsCommon()) options.sound.normalize.clear();
    options.effects.fade = fadeOf(options_.effects.fade, first, last, rate);
    return options;
}

void JoinPlanner::add(const SegmentWords& words, bool first, bool last) {
    JoinedSegment segment;
    std::vector<JobInput> inputs;
    for (const std::string& name : words.inputs) {
        segment.inputs.push_back(inputNumber(name));
        inputs.push_back(inputs_[static_cast<size_t>(segment.inputs.back())]);
    }
    PlanOptions options = optionsOf(words, inputs, first, last);
    if (fitsInputs(options))
        options.fit = [&](int type, int input, int stream, QvEncoder& encoder) {
            const auto source = open_(words.inputs[static_cast<size_t>(input)]);
            fitEncoder(encoder, type, source->decoder(), stream, options_);
        };
    segment.plan = planJob(options, form_, std::move(inputs), &known_);
    remember(segment.plan);
    join_.segments.push_back(std::move(segment));
}

// The first segment that has a stream gives its format.
void JoinPlanner::remember(const JobPlan& plan) {
    for (const PlannedStream& stream : plan.streams) {
        const auto number = static_cast<size_t>(stream.number);
        if (stream.isVideo() && number >= known_.pictures.size()) known_.pictures.push_back(stream.picture);
        if (!stream.isVideo() && number >= known_.sounds.size()) known_.sounds.push_back(stream.sound);
    }
    whole_.warnings.insert(whole_.warnings.end(), plan.warnings.begin(), plan.warnings.end());
    const auto& read = plan.filterFiles.read;
    files_.insert(files_.end(), read.begin(), read.end());
}
