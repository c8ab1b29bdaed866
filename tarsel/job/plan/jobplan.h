// What a transcode does, as a plain value: which part of which stream is read, which filters it passes, and
// what is written, in which format and how much of it. Nothing in it is open, so that a plan can be made and
// printed without a file; JobRun carries it out.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "tarsel/job/plan/jobinput.h"
#include "tarsel/job/plan/outputform.h"
#include "tarsel/job/plan/planoptions.h"
#include "tarsel/picture/picture.h"

// The part of a stream that is taken.
struct StreamPart {
    int input = 0;      // of JobPlan::inputs
    int stream = 0;     // among those of its type there
    bool whole = true;  // no points were asked for
    MediaTime in, out;  // the first instant that is taken, and the first one that is not
};

// One stream of the output.
struct PlannedStream {
    int type = qvVideoStream;  // or qvAudioStream
    int number = 0;            // among those of its type in the output
    StreamPart part;
    std::string module;  // encoder of a stored task or a preset; empty for the one that writes raw streams
    AnyDict codec;       // what a preset sets it to
    std::string set;     // what the options set of it, to be shown
    std::string language, title;
    // The format that is written.
    PictureFormat picture;           // of video
    SoundFormat sound;               // of audio
    FiltersState filters;            // that the user asks for
    AnyVector channelMap;            // of audio; empty for the default
    AudioConversion conversion;      // of audio
    std::vector<std::string> chain;  // a line for each filter, to be shown

    long long expected = 0;  // frames or samples of the output
    bool hold = false;       // video: the last frame is repeated to the end of the part
    MediaTime skipped;       // audio: left out at the start, for a filter that makes the sound earlier
    MediaTime delayed;       // audio: silence in front, which makes start and end later
    long long own = 0;       // audio: samples of the output that come from the part

    bool isVideo() const { return type == qvVideoStream; }
    std::string encoder() const { return module.empty() ? isVideo() ? "rawvenc" : "rawaenc" : module; }
    // Whether it is written uncompressed, so that its size is known beforehand.
    bool isRaw() const { return encoder() == (isVideo() ? "rawvenc" : "rawaenc"); }
    const char* unit() const { return isVideo() ? "frames" : "samples"; }
    long long bytes(long long units) const;  // without headers; 0 for what an encoder compresses
    ProcessParams params() const;
};

struct JobPlan {
    OutputForm output;
    std::shared_ptr<const OutputPreset> preset;  // by which the output is made; null for none
    std::vector<JobInput> inputs;
    std::vector<PlannedStream> streams;
    FilterFiles filterFiles;
    // Metadata of the output, see filmtags.h; not set if the multiplexer already has it.
    std::optional<AnyDict> tags;
    std::vector<std::string> warnings;
    std::vector<std::string> notes;  // lines for the user that are no warnings

    int count(int type) const;  // of streams
    bool hasVideo() const;
    // Video streams of the output; null if there are none.
    const PlannedStream* firstVideo() const;
    const PlannedStream* lastVideo() const;
    const JobInput& input(const PlannedStream& stream) const;
    // The stream of the input that `stream` is a part of.
    const InputStream& source(const PlannedStream& stream) const;
    long long bytes() const;  // that are written, without headers
};

// The formats that the streams of an output already have; the index is the number of the stream.
struct KnownFormats {
    std::vector<PictureFormat> pictures;
    std::vector<SoundFormat> sounds;
};

// Throws Failure for what can't be done. The engine has to be started, for its filters. `known`: for one of
// several segments, the formats that the streams of the earlier ones have; its streams get them too, and
// further streams keep their own. As a segment may lack picture or sound, the caller then calls checkOutput
// for all segments together.
JobPlan planJob(const PlanOptions& options, const OutputForm& output, std::vector<JobInput> inputs,
                const KnownFormats* known = nullptr);
// Whether the output can hold the streams of the plan; sets its kind where they decide it. Throws Failure.
void checkOutput(JobPlan& plan, const PlanOptions& options);

// Throws Failure for a damaged input; with `acceptPartial` that is a warning.
void checkDamage(JobPlan& plan, bool acceptPartial);

// What --dry-run prints: a line for each input, stream, filter, encoder and length, and one for the output.
std::string planText(const JobPlan& plan);
