#include "tarsel/job/resultcheck.h"

#include <algorithm>
#include <filesystem>

#include "tarsel/host/files.h"
#include "tarsel/source/wavcarry.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

// The files of one extension, in their order.
class FilesOf {
  public:
    FilesOf(const std::vector<fs::path>& files, const char* extension) {
        std::copy_if(files.begin(), files.end(), std::back_inserter(files_),
                     [&](const fs::path& file) { return file.extension() == extension; });
    }
    size_t count() const { return files_.size(); }
    // Empty after the last one.
    fs::path next() { return next_ < files_.size() ? files_[next_++] : fs::path(); }

  private:
    std::vector<fs::path> files_;
    size_t next_ = 0;
};

// Samples that the header of a file speaks of and its data holds; -1 when it can't be read.
long long samplesOf(const fs::path& file) {
    const Any extended = AnyDict("extended", 1);
    const std::unique_ptr<QvDecodePipe> decoder(
        QvDecFactory::decodePipe(Any(file.c_str()), Any(), nullptr, &extended));
    if (!decoder || decoder->nrStreams(qvAudioStream) != 1) return -1;
    AnyDict params;
    decoder->getStreamParams(qvAudioStream, 0, params);
    return params.get("truncated").isTrue() ? -1 : decoder->nrSamples(0);
}

void compare(const std::string& name, long long found, long long wanted, const char* unit) {
    if (found == wanted) return;
    if (found < 0) throw failure(Msg::outputUnreadable, {name});
    throw failure(Msg::outputDiffers, {name, std::to_string(found), unit, std::to_string(wanted)});
}

void checkFiles(const JobParts& parts, const std::vector<long long>& written) {
    const OutputForm& output = parts.plan.output;
    const std::vector<fs::path> files = parts.outputs.files()->written();
    FilesOf sounds(files, ".wav"), raws(files, ".raw");
    long long pictures = 0;
    for (size_t i = 0; i < written.size(); ++i) {
        const PlannedStream& s = parts.plan.streams[i];
        if (s.isVideo() && output.kind == OutputKind::pictures) pictures += written[i];
        if (s.isVideo() && output.kind == OutputKind::raw) {
            const fs::path file = raws.next();
            compare(output.name, file.empty() ? 0 : fileBytes(file), s.bytes(written[i]), "bytes");
        }
        if (s.isVideo() || output.kind == OutputKind::avi || output.kind == OutputKind::module) continue;
        for (int part = 0; part < (output.splitChannels ? s.sound.channels : 1); ++part) {
            const fs::path file = sounds.next();
            compare(file.empty() ? output.name : parts.outputs.finalName(file), samplesOf(file), written[i],
                    "samples");
        }
    }
    if (output.kind == OutputKind::pictures)
        compare(output.name, static_cast<long long>(FilesOf(files, ".png").count()), pictures, "pictures");
}

// A stream can't be read back; the count of what the system took can be checked.
void checkTaken(const JobParts& parts, long long written) {
    constexpr long long wavHeader = 80;
    const PlannedStream& s = parts.plan.streams.front();
    if (parts.plan.output.kind == OutputKind::module) return;  // what its multiplexer makes of it is its own
    const long long wanted = s.bytes(written) + (s.isVideo() ? 0 : wavHeader), taken = parts.taken();
    if (taken != wanted)
        throw failure(Msg::streamShort,
                      {parts.plan.output.name, std::to_string(taken), std::to_string(wanted)});
}

// In a join missing sound is filled with silence, so the count does not show that it is missing.
void checkJoined(const JobParts& parts, bool acceptPartial, Warnings& warnings) {
    if (!parts.stored || !parts.stored->isJoin()) return;
    for (const auto& source : parts.sources) {
        const Any ended = static_cast<const QvCodec&>(source->decoder()).getParam("endedEarly");
        if (!ended.isVector() || ended.asVector().empty()) continue;
        const std::string name = ended.asVector().at(0).toString().asString("");
        if (!acceptPartial) throw failure(Msg::soundEndedEarly, {name});
        warnings.add(lineOf(Msg::soundPartlyRead, {name}));
    }
}

}  // namespace

void checkResult(const JobParts& parts, const std::vector<long long>& written, bool acceptPartial,
                 Warnings& warnings) {
    const JobPlan& plan = parts.plan;
    for (size_t i = 0; i < written.size(); ++i) {
        const PlannedStream& s = plan.streams[i];
        if (const long long clipped = s.isVideo() ? 0 : clippedSamples(parts.source(s), s.part.stream);
            clipped > 0)
            warnings.add(lineOf(Msg::inputClipped, {plan.input(s).name, std::to_string(clipped),
                                                    std::to_string(s.part.stream)}));
        if (written[i] > s.expected) compare(plan.output.name, written[i], s.expected, s.unit());
        if (written[i] == s.expected) continue;
        const std::string read = std::to_string(written[i]), wanted = std::to_string(s.expected);
        const std::string& name = plan.input(s).name;
        if (!acceptPartial) throw failure(Msg::inputEndedEarly, {name, read, wanted, s.unit()});
        warnings.add(lineOf(Msg::inputPartlyRead, {name, read, wanted, s.unit()}));
    }
    checkJoined(parts, acceptPartial, warnings);
    if (parts.outputs.files()) checkFiles(parts, written);
    if (plan.output.isStream()) checkTaken(parts, written.front());
}
