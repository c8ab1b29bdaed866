#include "tarsel/job/job.h"

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <new>
#include <set>

#include "tarsel/host/files.h"
#include "tarsel/source/wavcarry.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/rawnames.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr long long kTicks = 35280000;
constexpr int kVideo = 1, kAudio = 2;
constexpr int kMostChannels = 32;  // of an output
constexpr int kVideoFilter = 12, kAudioFilter = 13;

struct KindRow {
    std::string_view extension;
    OutputKind kind;
};

// Beside the names of raw files.
constexpr KindRow kKinds[] = {
    {"wav", OutputKind::wav},
    {"png", OutputKind::pictures},
    {"avi", OutputKind::avi},
};

int intParam(const QvDecodePipe& decoder, int type, int stream, const char* name) {
    const Any value = decoder.getStreamParam(type, stream, name);
    return value.isInt32() ? value.asInt32() : 0;
}

// Filters of so many channels leave others silent, which no one means.
void requireChannels(const AnyDict& filter, int channels) {
    const std::string name = filter.getString("name", "");
    const int most = makeAnyCodec(name, kAudioFilter)->getParam("_maxChannels").asInt32(channels);
    if (channels > most)
        throw failure(Msg::filterChannels, {name, std::to_string(channels), std::to_string(most)});
}

}  // namespace

long long JobStream::bytes(long long units) const {
    if (type == kAudio) return units * channels * ((bits + 7) / 8);
    QvFrame frame;
    if (frame.init(fourcc, width, height) != QvStatus::ok) throw std::bad_alloc();
    return units * frame.total_bytes();
}

Job::Job(const JobOptions& options, Signals& signals)
    : options_(options), signals_(signals), warnings_(options.warnings) {
    chooseOutput();
    openInputs();
    planStreams();
    planPoints();
    planLengths();
    planFilters();
    buildPipe();
    checkNames();
}

Job::~Job() = default;

const std::string& Job::outputName() const {
    return options_.output.empty() ? options_.inputs.front() : options_.output;
}

bool Job::hasVideo() const {
    return std::any_of(streams_.begin(), streams_.end(), [](const auto& s) { return s.type == kVideo; });
}

bool Job::writesNothing() const { return kind_ == OutputKind::nothing || (stream_ && stream_->discards()); }

bool Job::takesOneStream() const { return stream_ && !stream_->discards(); }

// "ext" of --format, or of the output's name.
std::string Job::formatName() const {
    return extensionOf(options_.format.empty() ? options_.output : "x." + options_.format);
}

OutputKind Job::chosenKind() const {
    const bool named = !options_.format.empty();
    const std::string extension = formatName();
    for (const KindRow& row : kKinds)
        if (extension == row.extension) return row.kind;
    if (rawName(extension)) return OutputKind::raw;
    std::vector<std::string> known;
    for (const auto& row : kKinds) known.emplace_back(row.extension);
    for (const auto& row : rawNames()) known.emplace_back(row.extension);
    const std::string near = suggestion(extension, known), hint = near.empty() ? near : "." + near;
    if (const OpenName* open = openName(extension))
        throw failure(Msg::outputNameOpen, {outputName(), extension, open->instead});
    if (named) throw failure(Msg::formatUnknown, {options_.format, hint});
    if (options_.output == "-") throw failure(Msg::streamNeedsFormat);
    if (stream_) return OutputKind::byInput;
    requireNoFolder(options_.output, "avi");
    if (extension.empty()) throw failure(Msg::outputFormatMissing, {options_.output});
    throw failure(Msg::outputFormatUnknown, {options_.output, extension, hint});
}

// A name such as "x.uyvy" says the pixel format.
void Job::choosePixel() {
    const RawName* name = kind_ == OutputKind::raw ? rawName(formatName()) : nullptr;
    if (!name || name->fourcc == 0) return;
    std::string& pixel = options_.effects.pixel;
    if (pixel.empty()) pixel = fourccText(name->fourcc);
    const unsigned fourcc = parsePixel(pixel, "--pixel");
    if (nameAllows(*name, fourcc, false)) return;
    const std::string shown = options_.format.empty() ? options_.output : "--format " + options_.format;
    throw failure(Msg::outputNameSays, {pixel, shown, fourccText(name->fourcc), extensionFor(fourcc)});
}

// Numbered names are those of pictures, of channels, and of several streams.
void Job::chooseNumbers() {
    if (kind_ == OutputKind::avi) return;
    const std::filesystem::path output(options_.output);
    const std::string name = output.filename().string();
    const bool pictures = kind_ == OutputKind::pictures;
    numbered_ = pictures ? NumberedName::parseStrictly(name) : NumberedName::parse(name);
    if (numbered_ && !options_.saveTask.empty()) throw failure(Msg::numberNotStored, {options_.output});
    if (pictures && !numbered_)
        options_.output = std::filesystem::path(output).replace_filename(withoutEscapes(name)).string();
}

void Job::chooseOutput() {
    if (options_.muxer == "nullmux") {
        kind_ = OutputKind::nothing;
        return;
    }
    if (options_.output.empty()) throw failure(Msg::outputMissing);
    stream_ = StreamOutput::find(options_.output, options_.inputs);
    kind_ = chosenKind();
    if (const char* writer = kind_ == OutputKind::avi ? "rawavimux" : "rawmux";
        !options_.muxer.empty() && options_.muxer != writer)
        throw failure(Msg::muxerOther, {options_.muxer, options_.output, writer});
    choosePixel();
    if (takesOneStream()) checkStream();
    if (stream_) return;
    chooseNumbers();
    outputs_ = std::make_unique<Outputs>(options_.output, "-o", options_.inputs, options_.policy, files_);
    if (numbered_) outputs_->number(*numbered_);
}

void Job::checkStream() const {
    const char* files = kind_ == OutputKind::avi        ? "an AVI file"
                        : kind_ == OutputKind::pictures ? "a sequence of PNG files"
                                                        : nullptr;
    if (files) throw failure(Msg::streamOfFiles, {stream_->name(), files});
    if (options_.splitChannels) throw failure(Msg::streamOfChannels, {stream_->name()});
}

void Job::openInputs() {
    if (options_.inputs.empty()) throw failure(Msg::inputMissing);
    // Beside a raw file there may be others, such as its sound.
    const bool onlyOne = options_.inputs.size() == 1;
    const auto isRaw = [&](const auto& name) { return onlyOne || !Source::describesItself(name); };
    if (!options_.raw.empty() && std::none_of(options_.inputs.begin(), options_.inputs.end(), isRaw))
        throw failure(Msg::rawNoInput);
    for (const auto& name : options_.inputs) {
        sources_.push_back(std::make_unique<Source>(name, isRaw(name) ? options_.raw : ""));
        sources_.back()->selectAll();
    }
    checkDamage();
    for (const auto& source : sources_) lengths_.push_back(source->isFile() ? fileBytes(source->name()) : -1);
}

// A sound that has become shorter ends as silence, so this looks at the files themselves.
void Job::checkLengths() const {
    for (size_t i = 0; i < sources_.size(); ++i) {
        const std::string& name = sources_[i]->name();
        const long long now = sources_[i]->isFile() ? fileBytes(name) : -1;
        if (now < 0 || now >= lengths_[i]) continue;
        const std::string left = std::to_string(now), all = std::to_string(lengths_[i]);
        const Failure shrank = failure(Msg::inputShrank, {name, left, all});
        // What a device or a pipe has got can't be taken back.
        if (takesOneStream()) throw Failure(shrank);
        throw InputShrank(shrank, lineOf(Msg::inputShrankTaken, {name, left, all}));
    }
}

// A cut input is refused unless the user takes what is there.
void Job::checkDamage() {
    for (const auto& source : sources_) {
        const std::string damage = source->damage();
        if (damage.empty()) continue;
        if (!options_.acceptPartial) throw failure(Msg::inputDamaged, {source->name(), damage});
        warnings_.push_back(lineOf(Msg::inputDamagedTaken, {source->name(), damage}));
    }
}

// By --no-video and --no-audio.
bool Job::unwanted(int type) const { return type == kVideo ? options_.noVideo : options_.noAudio; }

void Job::planStreams() {
    for (const auto& source : sources_)
        for (int type : {kVideo, kAudio}) {
            if (unwanted(type) || (type == kVideo && kind_ == OutputKind::wav)) continue;
            if (takesOneStream() && !streams_.empty()) continue;
            for (int i = 0; i < source->decoder().nrStreams(type); ++i) planStream(*source, type, i);
        }
    if (streams_.empty() && (options_.noVideo || options_.noAudio))
        throw failure(Msg::inputUnwanted, {options_.noAudio ? "--no-audio" : "--no-video", outputName()});
    if (streams_.empty())
        throw failure(kind_ == OutputKind::wav ? Msg::inputNoSound : Msg::inputNoStreams, {outputName()});
    if (kind_ == OutputKind::byInput) kind_ = hasVideo() ? OutputKind::raw : OutputKind::wav;
    checkPicture();
    if (outputs_) checkCounts();
    // As captions, of which raw pictures hold none.
    const auto isLeft = [&](const Source& source, int type) {
        return unwanted(type) && source.decoder().nrStreams(type) > 0;
    };
    for (const auto& source : sources_)
        if (!isLeft(*source, kVideo) && !isLeft(*source, kAudio) &&
            std::none_of(streams_.begin(), streams_.end(),
                         [&](const auto& s) { return s.source == source.get(); }))
            warnings_.push_back(lineOf(Msg::inputUnused, {source->name()}));
}

// What has a file of its own is one, or is numbered as the user says.
void Job::checkCounts() const {
    if (kind_ == OutputKind::avi) return;
    for (const int type : {kVideo, kAudio}) {
        const auto count =
            std::count_if(streams_.begin(), streams_.end(), [&](const auto& s) { return s.type == type; });
        const char* what = type == kVideo ? "picture" : "sound";
        if (count < 2) continue;
        if (kind_ == OutputKind::pictures || options_.splitChannels)
            throw failure(Msg::outputTakesOne, {options_.output, what, std::to_string(count)});
        if (!numbered_)
            throw failure(Msg::outputHoldsOne,
                          {options_.output, what, std::to_string(count), numberedLike(options_.output)});
    }
}

void Job::checkPicture() const {
    const bool sound = kind_ == OutputKind::wav || kind_ == OutputKind::nothing;
    if (sound || hasVideo()) return;
    if (options_.noVideo) throw failure(Msg::inputUnwanted, {"--no-video", options_.output});
    throw failure(Msg::inputNoPicture, {options_.output});
}

void Job::planStream(Source& source, int type, int number) {
    const QvDecodePipe& decoder = source.decoder();
    JobStream stream{};
    stream.type = type;
    stream.source = &source;
    stream.decStream = number;
    stream.encStream = static_cast<int>(
        std::count_if(streams_.begin(), streams_.end(), [&](const auto& s) { return s.type == type; }));
    if (type == kVideo) {
        stream.picture =
            std::make_shared<PictureEffects>(options_.effects, source, number, kind_ == OutputKind::pictures);
        const PictureFormat& out = stream.picture->out();
        stream.width = out.width;
        stream.height = out.height;
        stream.fourcc = out.fourcc;
        stream.rate = out.rate;
    } else {
        stream.samplerate = options_.samplerate.value_or(intParam(decoder, type, number, "samplerate"));
        stream.channels = options_.channels.value_or(intParam(decoder, type, number, "channels"));
        stream.bits = options_.bits.value_or(intParam(decoder, type, number, "bitsPerSample"));
    }
    streams_.push_back(stream);
}

// The end of a stream: an instant whose position is the count of its frames or samples. Not every rate
// divides the timescale, so the exact one may lie between two ticks.
MediaTime Job::endOf(const JobStream& stream) {
    QvDecodePipe& decoder = stream.source->decoder();
    const MediaTime end = decoder.duration(stream.type, stream.decStream);
    const Any rate = decoder.getStreamParam(stream.type, stream.decStream,
                                            stream.type == kVideo ? "framerate" : "samplerate");
    const bool before = stream.type == kVideo
                            ? end.position(rate.asFramerate()) < decoder.nrFrames(stream.decStream)
                            : end.position(rate.toInt32()) < decoder.nrSamples(stream.decStream);
    return before ? end + MediaTime(1) : end;
}

bool Job::takesPart() const {
    return !options_.from.empty() || !options_.to.empty() || !options_.duration.empty();
}

// Times from the end count from that of the picture, so that all streams keep together.
void Job::planPoints() {
    const auto picture = std::find_if(streams_.begin(), streams_.end(),
                                      [](const JobStream& stream) { return stream.type == kVideo; });
    const JobStream& leading = picture != streams_.end() ? *picture : streams_.front();
    for (JobStream& stream : streams_) planPoint(stream, leading);
}

void Job::planPoint(JobStream& stream, const JobStream& leading) {
    // Frames beside a sound of its own file are those of the picture.
    auto rate = stream.source->frameRate();
    if (!rate && leading.type == kVideo) rate = leading.source->frameRate();
    const MediaTime length = endOf(stream), whole = endOf(leading);
    const std::string end = formatTime(length.seconds());
    const std::string start = options_.from.empty() ? "the start" : "--from " + options_.from;
    stream.in = MediaTime(0LL, kTicks);
    stream.out = length;
    if (!options_.from.empty()) stream.in = parseInstant(options_.from, rate, "--from", whole);
    if (!options_.to.empty()) stream.out = parseInstant(options_.to, rate, "--to", whole);
    if (!options_.duration.empty()) stream.out = parseSpan(options_.duration, rate, "--duration", stream.in);
    if (stream.out <= stream.in && !options_.to.empty()) throw failure(Msg::toNotAfter, {options_.to, start});
    if (stream.out <= stream.in && !options_.duration.empty())
        throw failure(Msg::durationNone, {options_.duration});
    if (stream.in >= length && !options_.from.empty())
        throw failure(Msg::fromAfterEnd, {options_.from, stream.source->name(), end});
    if (stream.out <= length) return;
    if (stream.type == kVideo || !hasVideo())
        warnings_.push_back(
            options_.to.empty()
                ? lineOf(Msg::durationAfterEnd, {options_.duration, start, stream.source->name(), end})
                : lineOf(Msg::toAfterEnd, {options_.to, stream.source->name(), end}));
    stream.out = length;
}

void Job::planLengths() {
    const JobStream* video = nullptr;
    for (JobStream& stream : streams_) {
        const Any inRate = stream.source->decoder().getStreamParam(
            stream.type, stream.decStream, stream.type == kVideo ? "framerate" : "samplerate");
        if (stream.type == kVideo) {
            const QvRatio from = inRate.asFramerate().rate();
            stream.inUnits = stream.out.position(from) - stream.in.position(from);
            stream.expected = QvRatio::multyplyByRatio(stream.inUnits, stream.rate.rate(), from);
            // A whole number of pairs goes into a halving.
            if (std::abs(2.0 * stream.rate.rate() - static_cast<double>(from)) < 1e-4 && stream.inUnits % 2)
                stream.expected = (stream.inUnits + 1) / 2;
            if (stream.expected < 1 || stream.inUnits < 1)
                throw failure(Msg::noFrameBetween, {stream.source->name(), formatTime(stream.in.seconds()),
                                                    formatTime(stream.out.seconds())});
            video = &stream;
        }
    }
    for (JobStream& stream : streams_) {
        if (stream.type != kAudio) continue;
        stream.own = stream.out.position(stream.samplerate) - stream.in.position(stream.samplerate);
        stream.expected = stream.own;
        if (video) {
            stream.expected =
                QvUtil::samplesForFrames(static_cast<int>(video->expected), video->rate, stream.samplerate);
            stream.frame = QvUtil::samplesForFrames(1, video->rate, stream.samplerate) + 1;
        }
        stream.inUnits = stream.expected;
    }
}

std::string Job::primaryExtension() const {
    switch (kind_) {
        case OutputKind::wav: return "wav";
        case OutputKind::avi: return "avi";
        case OutputKind::pictures: return "png";
        default: return hasVideo() ? "raw" : "wav";
    }
}

void Job::buildPipe() {
    pipe_.reset(QvEncodePipe::create());
    if (!pipe_) throw failure(Msg::outputNoModule, {outputName()});
    if (kind_ == OutputKind::avi && !writesNothing()) {
        if (!qvPresetMgr()->profileAvailable(QvProfile::aviRaw))
            throw failure(Msg::aviNoModule, {options_.output});
        pipe_->applyPreset(QvProfile::aviRaw, 0);
    }
    pipe_->clearStreams();
    const char* muxer = writesNothing() ? "nullmux" : kind_ == OutputKind::avi ? "rawavimux" : "rawmux";
    if (std::string_view(pipe_->getMuxer() ? pipe_->getMuxer()->name() : "") != muxer &&
        pipe_->setMuxer(muxer) != QvStatus::ok)
        throw failure(Msg::muxerUnusable, {muxer, pipe_->errorDesc()});
    QvMuxer& m = *pipe_->getMuxer();
    if (kind_ == OutputKind::pictures && !writesNothing()) {
        m.setParam("splitVideo", 1);
        m.setParam("rawAsPng", 1);
    }
    if (options_.splitChannels && !stream_) setChecked(m, "splitAudio", 1, "--split-channels");
    if (takesOneStream()) m.setParam("exactName", 1);
    for (JobStream& stream : streams_) addStream(stream);
}

void Job::addStream(JobStream& stream) {
    const char* module = stream.type == kVideo ? "rawvenc" : "rawaenc";
    if (pipe_->addStream(stream.type, Any(module)) < 0)
        throw failure(Msg::outputNoStream, {outputName(), stream.type == kVideo ? "picture" : "sound"});
    QvEncoder& encoder = *pipe_->encoder(stream.type, stream.encStream);
    if (stream.type == kVideo) {
        setChecked(encoder, "type", static_cast<int>(stream.fourcc), "--pixel");
        for (const auto& [name, value] :
             {std::pair{"width", stream.width}, std::pair{"height", stream.height}})
            if (static_cast<QvCodec&>(encoder).setParam(name, value) != QvStatus::ok)
                throw failure(Msg::frameTooLarge,
                              {"--size", std::to_string(stream.width) + "x" + std::to_string(stream.height)});
        setChecked(encoder, "framerate", Any(stream.rate), "--rate");
    } else {
        setChecked(encoder, "samplerate", stream.samplerate, "--samplerate");
        if (!options_.channels && stream.channels > kMostChannels)
            throw failure(Msg::outputChannels,
                          {outputName(), std::to_string(kMostChannels), std::to_string(stream.channels)});
        setChecked(encoder, "channels", stream.channels, "--channels");
        setChecked(encoder, "bitsPerSample", stream.bits, "--bits");
        // The header of a stream goes ahead of the sound; what may end early promises no length.
        if (takesOneStream() && !options_.acceptPartial)
            pipe_->getMuxer()
                ->stream(kAudio, stream.encStream)
                ->setParam("expectedSamples", Any(stream.expected));
        carryChunks(stream);
    }
}

// Only a WAV file has room for them. A stream ends with its samples, and not every reader of a pipe knows
// RF64.
void Job::carryChunks(const JobStream& stream) {
    if (writesNothing()) return;
    const bool isFile = kind_ != OutputKind::avi && !takesOneStream();
    QvBufStream* output = isFile ? pipe_->getMuxer()->stream(kAudio, stream.encStream) : nullptr;
    if (output) output->setParam("rf64", 1);
    WavPart part = {.samplerate = stream.samplerate,
                    .channels = stream.channels,
                    .bits = stream.bits,
                    .changed = stream.params.filters().has_value()};
    if (takesPart()) {
        const int rate = intParam(stream.source->decoder(), kAudio, stream.decStream, "samplerate");
        part.first = stream.in.position(rate);
        part.samples = stream.out.position(rate) - part.first;
    }
    const std::string lost = carryWavChunks(*stream.source, stream.decStream, part, output);
    if (!lost.empty()) warnings_.push_back(lineOf(Msg::inputChunksLost, {stream.source->name(), lost}));
}

// Nothing is written over what the job reads, or twice, and names that exist are refused before any work;
// what is written beside the output counts as well.
void Job::checkNames() {
    for (const auto& source : sources_)
        filterFiles_.read.insert(filterFiles_.read.end(), source->files().begin(), source->files().end());
    if (outputs_) checkOutputNames();
    if (takesOneStream()) claim(stream_->place(), stream_->name());
    claimFilterFiles();
    claimTask();
}

void Job::checkOutputNames() {
    outputs_->addInputs(filterFiles_.read);
    long long pictures = 0, channels = 0;
    for (const JobStream& s : streams_)
        (s.type == kVideo ? pictures : channels) += s.type == kVideo ? s.expected : s.channels;
    if (kind_ == OutputKind::pictures) outputs_->checkNumbered("png", pictures);
    if (options_.splitChannels) outputs_->checkNumbered("wav", channels);
    if (kind_ == OutputKind::pictures || options_.splitChannels ||
        (kind_ != OutputKind::avi && streams_.size() > 1) || numbered_)
        outputs_->expectSet();
    pipe_->setFilename(Any(outputs_->hiddenName(primaryExtension()).c_str()));
    const Any names = pipe_->getMuxer()->QvCodec::getParam("filenames");
    for (int i = 0; names.isVector() && i < names.asVector().size(); ++i) {
        const std::string written = names.asVector().at(i).asString();
        // Pictures get numbers in place of this name, and those have been looked at.
        if (kind_ == OutputKind::pictures && !written.ends_with(".wav")) continue;
        const auto name = outputs_->finalName(written, primaryExtension());
        outputs_->checkFinal(name);
        if (!places_.insert(outputs_->placeOf(name)).second)
            throw failure(Msg::outputTwice, {name, "give -o the extension of its format"});
    }
    places_.insert(outputs_->placeOf(outputs_->output()));
}

// That nothing else of the job goes there.
void Job::claim(const std::string& place, const std::string& name) {
    if (outputs_ && place == outputs_->placeOf(outputs_->output()))
        throw failure(Msg::outputIsOutput, {name});
    const bool numbered = outputs_ && ((kind_ == OutputKind::pictures && outputs_->numbers(place, "png")) ||
                                       (options_.splitChannels && outputs_->numbers(place, "wav")));
    if (numbered || !places_.insert(place).second)
        throw failure(Msg::outputTwice, {name, "give one of them another name"});
}

void Job::claimFilterFiles() {
    for (const auto& [file, filter] : filterFiles_.written) {
        // Of the null device there is always one more.
        if (const auto stream = file == "-" ? nullptr : StreamOutput::find(file, filterFiles_.read)) {
            if (!stream->discards()) claim(stream->place(), file);
            continue;
        }
        auto output =
            std::make_unique<Outputs>(file, "--filter " + filter, filterFiles_.read, options_.policy, files_);
        claim(output->placeOf(file), file);
        dumps_[file] = std::move(output);
    }
}

void Job::claimTask() {
    const std::string& name = options_.saveTask;
    if (name.empty()) return;
    taskStream_ = StreamOutput::find(name, filterFiles_.read);
    if (!taskStream_) {
        taskFile_ =
            std::make_unique<Outputs>(name, "--save-task", filterFiles_.read, options_.policy, files_);
        return claim(taskFile_->placeOf(name), name);
    }
    if (taskStream_->isStandardOutput() && options_.dryRun) throw failure(Msg::planAndTask, {name});
    if (!taskStream_->discards()) claim(taskStream_->place(), name);
}

// What was asked for has to have something that it works on.
void Job::checkEffects() const {
    if (const std::string option = options_.effects.given(); !option.empty() && !hasVideo())
        throw failure(Msg::effectNoPicture, {option});
    for (const auto& spec : options_.effects.filters) {
        const int type = filterType(spec);
        if (std::any_of(streams_.begin(), streams_.end(), [&](const auto& s) { return s.type == type; }))
            continue;
        throw failure(Msg::filterNoStream,
                      {spec.substr(0, spec.find(':')), type == kVideo ? "picture" : "sound"});
    }
}

void Job::planFilters() {
    checkEffects();
    for (JobStream& stream : streams_) {
        if (takesPart()) stream.params.setInOutPoints(InOutPoints(stream.in, stream.out));
        stream.type == kVideo ? planPicture(stream) : planSound(stream);
    }
    takeWarnings();
}

void Job::planPicture(JobStream& stream) {
    if (kind_ == OutputKind::pictures) makeAnyCodec("scaler", kVideoFilter);
    const FiltersState state = stream.picture->filters(stream.expected, false);
    if (!state.empty()) stream.params.setFilters(state);
    const auto pipe = tryPipe(stream.picture->job(state));
    if (pipe) {
        const FilterFiles files = filterFiles(*pipe);
        filterFiles_.read.insert(filterFiles_.read.end(), files.read.begin(), files.read.end());
        filterFiles_.written.insert(filterFiles_.written.end(), files.written.begin(), files.written.end());
    }
    stream.chain = describe(pipe.get());
}

void Job::planSound(JobStream& stream) const {
    const QvDecodePipe& decoder = stream.source->decoder();
    const auto differs = [&](const char* name, int wanted) {
        return intParam(decoder, stream.type, stream.decStream, name) != wanted;
    };
    FiltersState state;
    for (const auto& spec : options_.effects.filters) {
        if (filterType(spec) != kAudio) continue;
        const AnyDict filter = filterState(spec);
        const int channels = intParam(decoder, stream.type, stream.decStream, "channels");
        requireChannels(filter, filter.get("_front").isTrue() ? channels : stream.channels);
        state.appendFilter(spec.c_str(), filter);
        stream.chain.push_back(spec);
    }
    if (!state.empty()) stream.params.setFilters(state);
    if (differs("samplerate", stream.samplerate)) makeAnyCodec("srconvert", kAudioFilter);
    if (differs("channels", stream.channels)) makeAnyCodec("chconvert", kAudioFilter);
    // Filters work on 32 bits.
    if (differs("bitsPerSample", stream.bits) || stream.params.filters())
        makeAnyCodec("aquant", kAudioFilter);
}

// What the engine told its user, each line once.
void Job::takeWarnings() {
    for (const std::string& text : engineWarnings()) {
        const std::string line = lineOf(Msg::engineWarns, {withFinalNames(text)});
        if (std::find(warnings_.begin(), warnings_.end(), line) == warnings_.end()) warnings_.push_back(line);
    }
}
