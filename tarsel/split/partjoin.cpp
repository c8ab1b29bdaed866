#include "tarsel/split/partjoin.h"

#include <algorithm>
#include <filesystem>
#include <span>

#include "tarsel/host/files.h"
#include "tarsel/split/splitplan.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

// The byte at which the samples of a WAV file begin.
size_t samplesAt(const std::string& file) {
    constexpr size_t kForm = 12;       // bytes of "RIFF....WAVE"
    constexpr size_t kHead = 8;        // bytes of a chunk's id and size
    constexpr size_t kMost = 1 << 16;  // bytes that are searched
    const std::string bytes = firstBytes(file, kMost);
    for (size_t at = kForm; at + kHead <= bytes.size();) {
        if (bytes.compare(at, 4, "data") == 0) return at + kHead;
        size_t size = 0;
        for (size_t i = 0; i < 4; ++i)
            size |= static_cast<size_t>(static_cast<unsigned char>(bytes[at + 4 + i])) << 8 * i;
        at += kHead + size + size % 2;
    }
    throw failure(Msg::outputUnreadable, {file});
}

void copyFormat(QvFileMuxStream& to, const QvEncoder& encoder) {
    const auto ask = [&](const char* name) { return static_cast<const QvCodec&>(encoder).getParam(name); };
    if (to.type == qvVideoStream) {
        if (const Any rate = ask("framerate"); rate.isFramerate()) to.framerate = rate.asFramerate();
        for (const char* name : {"type", "width", "height"}) to.params.set(name, ask(name));
    } else {
        to.samplerate = ask("samplerate").asInt32(0);
        to.channels = ask("channels").asInt32(0);
        to.bitsPerSample = ask("bitsPerSample").asInt32(0);
    }
}

// Moves the files into the folder of the output. They keep their names.
void moveNextTo(std::span<const std::string> files, const std::string& output) {
    const fs::path folder = fs::path(output).parent_path();
    for (const std::string& file : files) moveFile(file, (folder / fs::path(file).filename()).string());
}

// Multiplexes the parts as the job's own multiplexer does.
class PartMultiplexer {
  public:
    PartMultiplexer(const JobParts& parts, const PartFiles& files) : parts_(parts), files_(files) {}

    bool write(const std::string& output, bool withSound, const std::function<bool(double)>& watch) {
        size_t sound = 0;
        for (const PlannedStream& stream : parts_.plan.streams) {
            if (isFilm(parts_.plan)) {
                addRecorded(stream);
                continue;
            }
            if (!stream.isVideo() && !withSound) continue;
            std::vector<QvFilePart> data;
            if (stream.isVideo())
                for (const PartPictures& part : files_.pictures)
                    data.push_back({Any(part.files.at(0).c_str()), stream.bytes(part.lead)});
            else
                data.push_back(samplesOf(stream, files_.sounds.at(sound++)));
            add(stream, std::move(data));
        }
        mux_.config().watch = watch;
        setOutput();
        const int result = mux_.run(parts_.plan.output.muxer(), Any(output.c_str()));
        if (result == QvFileMux::cancelled) return false;
        if (result != 0)
            throw writeFailure(parts_.plan.output.name, parts_.outputs.withFinalNames(mux_.errorDesc()));
        return true;
    }

  private:
    void add(const PlannedStream& stream, std::vector<QvFilePart> data) {
        const std::string encoder = stream.encoder();
        QvFileMuxStream& to = mux_.config().addStream(stream.type, data.front().file, Any(encoder.c_str()));
        copyFormat(to, *parts_.encoder(stream));
        to.parts = std::move(data);
        const long long wanted = stream.bytes(stream.expected), found = to.length();
        if (found != wanted)
            throw failure(Msg::outputDiffers, {parts_.plan.output.name, std::to_string(found),
                                               "bytes of its parts", std::to_string(wanted)});
    }

    // Adds a stream whose parts are recorded units. The units of all sounds are in one file.
    void addRecorded(const PlannedStream& stream) {
        std::vector<QvFilePart> data;
        if (stream.isVideo())
            for (const PartPictures& part : files_.pictures)
                data.push_back({Any(part.files.at(0).c_str()), part.lead});
        else
            data.push_back({Any(files_.sounds.at(0).c_str())});
        const std::string encoder = stream.encoder();
        QvFileMuxStream& to = mux_.config().addStream(stream.type, data.front().file, Any(encoder.c_str()));
        parts_.pipe->getMuxer()->getStreamParams(stream.type, stream.number, to.params);
        copyFormat(to, *parts_.encoder(stream));
        to.parts = std::move(data);
        to.recorded = true;
    }

    QvFilePart samplesOf(const PlannedStream& stream, const std::string& file) const {
        return {Any(file.c_str()), static_cast<long long>(samplesAt(file)), stream.bytes(stream.expected)};
    }

    // The multiplexer's settings are those of the job in one piece.
    void setOutput() {
        AnyDict state;
        parts_.pipe->getMuxer()->store(state);
        for (const char* key : {"name", "displayName", "filename"}) state.remove(key);
        if (isFilm(parts_.plan)) {
            state.set("_totalFrames", static_cast<int>(pictureOf(parts_.plan).expected));
            if (const Any meta = metaOfInput(); !state.isSet("tags") && meta.isDict())
                state.set("meta", meta);
        }
        mux_.config().output = state;
    }

    // The metadata that a job in one piece hands to its multiplexer.
    Any metaOfInput() const {
        const Source& source = parts_.source(pictureOf(parts_.plan));
        return static_cast<const QvCodec&>(source.decoder()).getParam("meta");
    }

    const JobParts& parts_;
    const PartFiles& files_;
    QvFileMux mux_;
};

}  // namespace

bool joinParts(const JobParts& parts, const PartFiles& files, const std::string& output,
               const std::function<bool(double)>& watch) {
    switch (parts.plan.output.kind) {
        case OutputKind::pictures:
            for (const PartPictures& part : files.pictures)
                moveNextTo(std::span(part.files)
                               .subspan(std::min<size_t>(static_cast<size_t>(part.lead), part.files.size())),
                           output);
            moveNextTo(files.sounds, output);
            return true;
        case OutputKind::raw:
            moveNextTo(files.sounds, output);
            return PartMultiplexer(parts, files).write(output, false, watch);
        default: return PartMultiplexer(parts, files).write(output, true, watch);
    }
}
