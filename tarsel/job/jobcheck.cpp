// What was written, compared with what the job asked for.
#include <algorithm>
#include <filesystem>

#include "tarsel/host/files.h"
#include "tarsel/job/job.h"
#include "tarsel/source/wavcarry.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

std::vector<fs::path> ofExtension(const std::vector<fs::path>& files, const char* extension) {
    std::vector<fs::path> found;
    std::copy_if(files.begin(), files.end(), std::back_inserter(found),
                 [&](const fs::path& file) { return file.extension() == extension; });
    return found;
}

// Samples that the header of a file speaks of and its data holds; -1 when it can't be read.
long long samplesOf(const fs::path& file) {
    const Any extended = AnyDict("extended", 1);
    const std::unique_ptr<QvDecodePipe> decoder(
        QvDecFactory::decodePipe(Any(file.c_str()), Any(), nullptr, &extended));
    if (!decoder || decoder->nrStreams(2) != 1) return -1;
    AnyDict params;
    decoder->getStreamParams(2, 0, params);
    return params.get("truncated").isTrue() ? -1 : decoder->nrSamples(0);
}

[[noreturn]] void differs(const std::string& name, long long found, long long wanted, const char* unit) {
    if (found < 0) throw failure(Msg::outputUnreadable, {name});
    throw failure(Msg::outputDiffers, {name, std::to_string(found), unit, std::to_string(wanted)});
}

}  // namespace

// An input that ended early is told apart from a result that is wrong.
void Job::checkResult() {
    for (const JobStream& s : streams_) {
        if (const long long clipped = s.type == 2 ? clippedSamples(*s.source, s.decStream) : 0; clipped > 0)
            warnings_.push_back(lineOf(
                Msg::inputClipped, {s.source->name(), std::to_string(clipped), std::to_string(s.decStream)}));
        const char* unit = s.type == 1 ? "frames" : "samples";
        if (s.written > s.expected) differs(options_.output, s.written, s.expected, unit);
        if (s.written == s.expected) continue;
        // Sound that has all been written may end within the last frame of the picture.
        if (s.written == s.own && s.expected - s.written <= s.frame) continue;
        const std::string read = std::to_string(s.written), wanted = std::to_string(s.expected);
        const std::string& name = s.source->name();
        if (!options_.acceptPartial) throw failure(Msg::inputEndedEarly, {name, read, wanted, unit});
        warnings_.push_back(lineOf(Msg::inputPartlyRead, {name, read, wanted, unit}));
    }
    if (outputs_) checkFiles();
    if (takesOneStream()) checkTaken();
}

long long Job::taken() const {
    const JobStream& s = streams_.front();
    return static_cast<long long>(pipe_->getMuxer()->stream(s.type, s.encStream)->ioTaken());
}

// A stream can't be read back; the count of what the system took can be checked.
void Job::checkTaken() const {
    constexpr long long wavHeader = 80;
    const JobStream& s = streams_.front();
    const long long wanted = s.bytes(s.written) + (s.type == 2 ? wavHeader : 0);
    if (taken() != wanted)
        throw failure(Msg::streamShort, {stream_->name(), std::to_string(taken()), std::to_string(wanted)});
}

void Job::checkFiles() const {
    const std::vector<fs::path> files = outputs_->written();
    size_t sound = 0, raw = 0;
    const auto sounds = ofExtension(files, ".wav"), raws = ofExtension(files, ".raw");
    long long pictures = 0;
    for (const JobStream& s : streams_) {
        if (s.type == 1 && kind_ == OutputKind::pictures) pictures += s.written;
        if (s.type == 1 && kind_ == OutputKind::raw) {
            const long long bytes = raw < raws.size() ? fileBytes(raws[raw++]) : 0;
            if (bytes != s.bytes(s.written)) differs(options_.output, bytes, s.bytes(s.written), "bytes");
        }
        if (s.type != 2 || kind_ == OutputKind::avi) continue;
        for (int part = 0; part < (options_.splitChannels ? s.channels : 1); ++part) {
            const fs::path file = sound < sounds.size() ? sounds[sound++] : fs::path();
            const long long samples = samplesOf(file);
            if (samples != s.written)
                differs(file.empty() ? options_.output : outputs_->finalName(file, primaryExtension()),
                        samples, s.written, "samples");
        }
    }
    const auto found = static_cast<long long>(ofExtension(files, ".png").size());
    if (kind_ == OutputKind::pictures && found != pictures)
        differs(options_.output, found, pictures, "pictures");
}
