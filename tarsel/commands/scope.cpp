// The levels of pictures: how they are spread, and where they leave the range that is meant for them.
#include <memory>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/savedpicture.h"
#include "tarsel/host/console.h"
#include "tarsel/picture/pictureconverter.h"
#include "tarsel/picture/picturereader.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr double kLow = 0.01, kHigh = 0.99;

struct Given {
    std::string input, raw, at, output;
    bool json = false;
    OutputOptions outputOptions;
    Signals* signals = nullptr;
};

// Levels are those of the stream; a format that has none of its own is shown as RGB.
class Levels {
  public:
    const QvFrame& measurable(const QvFrame& frame) {
        QvHistogram probe;
        if (!converter_ && probe.add(frame) != QvStatus::notSupported) return frame;
        if (!converter_)
            converter_ =
                std::make_unique<PictureConverter>(frame.width(), frame.height(), QvFourcc::BGR4, "scope");
        return converter_->convert(frame);
    }
    void add(const QvFrame& frame) { histogram.add(measurable(frame)); }

    QvHistogram histogram;

  private:
    std::unique_ptr<PictureConverter> converter_;
};

Json describe(const QvHistogram::Channel& channel) {
    return {{"channel", std::string(1, channel.name)},
            {"levels", channel.counts.size()},
            {"min", channel.min()},
            {"max", channel.max()},
            {"mean", channel.mean()},
            {"p1", channel.percentile(kLow)},
            {"p99", channel.percentile(kHigh)},
            {"lowest", channel.lowest},
            {"highest", channel.highest},
            {"below", channel.share(channel.below)},
            {"above", channel.share(channel.above)},
            {"at_floor", channel.share(channel.atFloor)},
            {"at_ceiling", channel.share(channel.atCeiling)},
            {"histogram", channel.counts}};
}

void report(const Given& given, const QvHistogram& histogram, long long frames) {
    if (given.json) {
        Json out = {{"file", given.input}, {"frames", frames}, {"channels", Json::array()}};
        for (int i = 0; i < histogram.channels(); ++i)
            out["channels"].push_back(describe(histogram.channel(i)));
        print("%s\n", out.dump(2, ' ', false, Json::error_handler_t::replace).c_str());
        return;
    }
    print("%lld %s\n", frames, frames == 1 ? "picture" : "pictures");
    for (int i = 0; i < histogram.channels(); ++i) {
        const QvHistogram::Channel& channel = histogram.channel(i);
        print("%c  %d to %d, mean %.1f, 98%% from %d to %d; below %d: %.3f%%, above %d: %.3f%%\n",
              channel.name, channel.min(), channel.max(), channel.mean(), channel.percentile(kLow),
              channel.percentile(kHigh), channel.lowest, 100 * channel.share(channel.below), channel.highest,
              100 * channel.share(channel.above));
    }
}

void scope(Given& given) {
    Source source(given.input, given.raw);
    std::unique_ptr<SavedPicture> saved;
    if (!given.output.empty())
        saved = std::make_unique<SavedPicture>(given.output, "-o", source.files(), given.outputOptions,
                                               *given.signals);
    if (source.decoder().nrStreams(1) == 0) throw failure(Msg::fileNoPicture, {given.input});
    source.selectAll();
    if (const std::string damage = source.damage(); !damage.empty())
        throw failure(Msg::fileDamaged, {given.input, damage});
    EffectOptions effects;
    PictureReader reader(source, effects);
    const auto rate = source.frameRate();
    const bool one = !given.at.empty();
    const MediaTime end = rate ? qvInstantOf(reader.frames(), rate->rate()) : MediaTime();
    const MediaTime at = one ? parseInstant(given.at, rate, "--at", end) : MediaTime();
    const long long first = rate ? at.position(*rate) : 0;
    if (first >= reader.frames())
        throw failure(Msg::atAfterEnd, {given.at, given.input, formatTime(source.duration())});
    const long long last = one ? first : reader.frames() - 1;
    Levels levels;
    QvFrame waveform;
    for (long long n = first; n <= last; ++n) {
        const QvFrame& frame = reader.at(n);
        levels.add(frame);
        if (n > first || !saved) continue;
        if (QvHistogram::waveform(levels.measurable(frame), waveform) != QvStatus::ok) throw std::bad_alloc();
    }
    report(given, levels.histogram, last - first + 1);
    if (saved) saved->save(waveform);
    flushOutput();
    printConcealed(source);
}

}  // namespace

void addScope(CommandLine& line, Signals& signals) {
    Command command = line.command("scope", "Show how the levels of pictures are spread");
    auto given = std::make_shared<Given>();
    given->signals = &signals;
    command.argument("FILE", given->input, "A file, or testgen:...");
    command.option("--at", given->at, "Of the picture at this instant; without it of all pictures", "TIME");
    command.option("--raw", given->raw, "Format of a raw file: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.option("-o,--output", given->output, "The waveform of the picture (without --at the first)",
                   "FILE.png");
    command.flag("--json", given->json, "Print JSON, with the count of each level");
    given->outputOptions.add(command);
    command.action([given] { scope(*given); });
}
