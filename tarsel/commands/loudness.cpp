#include <algorithm>
#include <climits>
#include <cmath>
#include <cstdio>

#include "tarsel/commands/commands.h"
#include "tarsel/host/console.h"
#include "tarsel/job/progress.h"
#include "tarsel/source/mixfile.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace {

constexpr int kBlock = 65536;  // samples that are read at a time

[[noreturn]] void refuse(const Source& source, int stream, const std::string& why) {
    throw failure(Msg::loudnessFailed, {source.name(), std::to_string(stream), why});
}

// On a terminal, of one stream.
class Shown {
  public:
    Shown(const Source& source, int stream)
        : progress_({}, false, inQuotes(source.name()) + " ", false),
          samples_(static_cast<double>(source.decoder().nrSamples(stream))),
          rate_(source.decoder().getAudioParam(stream, "samplerate").asInt32(1)) {
        if (!progress_.onTerminal()) return;
        progress_.start();
        progress_.show(at(0));
    }
    ~Shown() {
        if (progress_.onTerminal()) progress_.finish({});
    }
    Shown(const Shown&) = delete;
    Shown& operator=(const Shown&) = delete;
    void update(long long measured) {
        if (progress_.onTerminal() && progress_.due()) progress_.update(at(measured));
    }

  private:
    ProgressState at(long long measured) const {
        ProgressState state;
        const auto done = static_cast<double>(measured);
        if (samples_ > 0) state.part = std::min(done / samples_, 1.0);
        state.outSeconds = done / rate_;
        state.frame = -1;
        return state;
    }

    Progress progress_;
    double samples_;
    int rate_;
};

// The places of the channels as the bits of a mask; 0 where the source does not name them.
long long placesOf(const QvDecodePipe& decoder, int stream) {
    const Any mask = decoder.getAudioParam(stream, "channelMask");
    return mask.isInt() ? mask.toInt64() : 0;
}

QvLoudness& measure(const Source& source, int stream, QvLoudness& meter) {
    QvDecodePipe& decoder = source.decoder();
    const auto ask = [&](const char* name) { return decoder.getAudioParam(stream, name).asInt32(0); };
    const int channels = ask("channels"), rate = ask("samplerate");
    const int begun = meter.init(channels, rate, placesOf(decoder, stream));
    if (begun == QvStatus::outOfMemory) throw std::bad_alloc();
    if (begun != QvStatus::ok)
        refuse(source, stream,
               std::to_string(channels) + " channels at " + std::to_string(rate) + " Hz can't be measured");
    Shown shown(source, stream);
    // A mix gives some silence after its end.
    long long left = isMixName(source.name()) ? decoder.nrSamples(stream) : LLONG_MAX;
    for (;;) {
        if (left < 1) return meter;
        const int read = decoder.readSamples(static_cast<int>(std::min<long long>(kBlock, left)), stream);
        if (read < 0 && read != QvStatus::endOfStream) throw failure(Msg::readFailed, {source.name()});
        const QvPcm* pcm = decoder.getAudioPtr(stream);
        if (read < 1 || !pcm || pcm->samples() < 1) return meter;
        const int added = meter.add(*pcm);
        if (added == QvStatus::outOfMemory) throw std::bad_alloc();
        if (added != QvStatus::ok) refuse(source, stream, "its format changes");
        shown.update(meter.samples());
        left -= read;
    }
}

// Silence has no level.
Json level(double value) { return std::isfinite(value) ? Json(value) : Json(nullptr); }

Json describe(const QvLoudness& meter, int stream) {
    return {{"number", stream},
            {"samples", meter.samples()},
            {"integrated_lufs", level(meter.integrated())},
            {"range_lu", level(meter.range())},
            {"true_peak_dbtp", level(meter.truePeak())},
            {"sample_peak_dbfs", level(meter.samplePeak())},
            {"rms_dbfs", level(meter.rms())}};
}

std::string shown(double value, const char* unit) {
    char text[48];
    if (std::isfinite(value))
        std::snprintf(text, sizeof text, "%.1f %s", value, unit);
    else
        std::snprintf(text, sizeof text, "-inf %s", unit);
    return text;
}

void printLine(const QvLoudness& meter, int stream) {
    print("  audio %d   %s, range %s, true peak %s, peak %s, RMS %s\n", stream,
          shown(meter.integrated(), "LUFS").c_str(), shown(meter.range(), "LU").c_str(),
          shown(meter.truePeak(), "dBTP").c_str(), shown(meter.samplePeak(), "dBFS").c_str(),
          shown(meter.rms(), "dBFS").c_str());
}

struct Given {
    std::vector<std::string> files;
    bool json = false;
};

// Throws Failure for a file of which not all can be measured, after what can be.
void measureFile(const std::string& name, bool json, Json& all) {
    Source source(name, "");
    const int streams = source.decoder().nrStreams(qvAudioStream);
    if (streams < 1) throw failure(Msg::loudnessNoSound, {name});
    source.selectAll();
    Json file = {{"file", validUtf8(name)}, {"streams", Json::array()}};
    if (!json) print("%s\n", inQuotes(name).c_str());
    for (int stream = 0; stream < streams; ++stream) {
        QvLoudness meter;
        measure(source, stream, meter);
        if (!json) printLine(meter, stream);
        if (!json) flushOutput();  // measuring takes its time
        file["streams"].push_back(describe(meter, stream));
    }
    const std::string damage = source.damage();
    if (!damage.empty()) file["damage"] = damage;
    all.push_back(std::move(file));
    printConcealed(source);
    if (!damage.empty()) throw failure(Msg::fileDamaged, {name, damage});
    printWarnings();
}

// Measures every file, also after one that can't be used.
void loudness(const Given& given) {
    Json all = Json::array();
    std::vector<std::string> failures;
    for (const auto& name : given.files) {
        try {
            measureFile(name, given.json, all);
        } catch (const Failure& failure) {
            if (failure.exit() != Exit::input) throw;
            failures.push_back(failure.what());
        }
    }
    if (given.json) print("%s\n", all.dump(2).c_str());
    flushOutput();
    if (failures.empty()) return;
    for (size_t i = 0; i + 1 < failures.size(); ++i)
        std::fprintf(stderr, "tarsel: %s\n", failures[i].c_str());
    throw Failure(Exit::input, failures.back());
}

}  // namespace

void addLoudness(CommandLine& line) {
    Command command =
        line.command("loudness", "Measure the loudness, its range and the peaks of the sound of files");
    auto given = std::make_shared<Given>();
    command.arguments("FILE", given->files, "Files, or testgen:...");
    command.flag("--json", given->json, "Print JSON, one array of files");
    command.action([given] { loudness(*given); });
}
