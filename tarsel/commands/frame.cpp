// One picture of a video, or a sheet of many, as a PNG.
#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <filesystem>
#include <new>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/commands/progressoption.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/host/plugins.h"
#include "tarsel/host/signals.h"
#include "tarsel/host/terminal.h"
#include "tarsel/picture/pictureconverter.h"
#include "tarsel/picture/picturereader.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/numberedname.h"
#include "tarsel/words/timespec.h"

namespace fs = std::filesystem;

namespace {

constexpr int kVideoFilter = 12;
constexpr int kSheetWidth = 1920;  // pixels a contact sheet is at most wide
constexpr int kMostCells = 32;     // in each direction
constexpr int kGap = 8;            // pixels between its pictures

struct Given {
    std::string input, raw, at, output, sheet, threads;
    bool strict = false, noRotate = false;
    ProgressOption progress;
    EffectOptions effects;
    OutputOptions outputOptions;
    std::shared_ptr<Outputs> outputs;  // null where there is a `stream`
    std::shared_ptr<StreamOutput> stream;
    Signals* signals = nullptr;
    int warnings = 0;  // of the input
};

// What is shown while the input is read up to picture `last`.
class Reading {
  public:
    Reading(const Given& given, const Source& source, PictureReader& reader, long long last)
        : reader_(reader),
          progress_(given.progress.mode, false, "", false),
          last_(static_cast<double>(last) * static_cast<double>(source.decoder().nrFrames(0)) /
                static_cast<double>(std::max(1LL, reader.frames()))),
          rate_(source.frameRate().value_or(QvFramerate()).rate()),
          watch_(*given.signals, {.first = {},
                                  .second = [this] { return clearLine(), false; },
                                  .report = [this] { progress_.report(state()); },
                                  .suspend = [this] { progress_.time().stopping(); },
                                  .resume = [this] { progress_.time().continued(); },
                                  .last = Msg::stopped}) {
        progress_.start();
        reader_.onRead([this](long long number) {
            number_.store(number, std::memory_order_relaxed);
            if (progress_.due() && !ending_) progress_.update(state());
        });
    }
    ~Reading() { reader_.onRead({}); }
    Reading(const Reading&) = delete;
    Reading& operator=(const Reading&) = delete;

    void done() {
        ProgressState end = state();
        end.part = 1;
        progress_.finish(end);
    }

  private:
    // For an end in the middle of it, even while another thread holds the line.
    void clearLine() {
        ending_ = true;
        if (progress_.onTerminal() && stderrHasRoom()) writeToStderr("\r\x1b[K");
    }
    ProgressState state() const {
        const long long number = number_.load(std::memory_order_relaxed);
        const double part = static_cast<double>(number) / std::max(last_, 1.0);
        return {.part = std::min(part, 1.0),
                .frame = number + 1,
                .outSeconds = static_cast<double>(number + 1) / rate_};
    }

    PictureReader& reader_;
    Progress progress_;
    const double last_, rate_;  // the last frame of the input; frames a second
    std::atomic<long long> number_{-1};
    std::atomic<bool> ending_{false};
    const Signals::Watch watch_;
};

void save(const QvFrame& picture, const Source& source, const Given& given) {
    Outputs* const outputs = given.outputs.get();
    Signals::Handlers handlers;
    if (outputs) handlers.second = [outputs] { return outputs->leave(); };
    const Signals::Watch watch(*given.signals, std::move(handlers));
    const std::string name = outputs ? outputs->begin("png") : given.stream->engineName();
    if (picture.four_cc() != QvFourcc::BGR3) makeAnyCodec("scaler", kVideoFilter);  // says that it is missing
    errno = 0;
    if (QvImage::saveFrame(picture, Any(name.c_str()), 0) != 0) {
        if (errno == ENOMEM) throw std::bad_alloc();
        if (errno != 0) throw systemFailure(Msg::outputSystem, given.output, errno);
        throw failure(Msg::outputRefused, {given.output, "the picture can't be converted to a PNG"});
    }
    const int warnings = given.warnings + printWarnings() + printConcealed(source) + pluginWarnings();
    if (given.strict && warnings > 0)
        throw failure(Msg::warningsCount, {given.output, std::to_string(warnings)});
    if (outputs) outputs->commit();
    given.signals->complete();
    Events::get().wrote({given.output});
    tell(Level::note, "wrote " + inQuotes(given.output));
}

Size parseSheet(const std::string& text) { return parseSize(text, "--sheet", kMostCells, Msg::sheetWrong); }

void saveSheet(const Source& source, PictureReader& reader, const Given& given) {
    const Size grid = parseSheet(given.sheet);
    const int width = ((kSheetWidth - kGap) / grid.width - kGap) & ~1;
    const int height = std::max(2, static_cast<int>(std::lround(width / reader.format().aspect)) & ~1);
    QvFrame sheet;
    if (sheet.init(QvFourcc::BGR3, grid.width * (width + kGap) + kGap,
                   grid.height * (height + kGap) + kGap) != QvStatus::ok)
        throw std::bad_alloc();
    sheet.setRGB(24, 24, 24);
    PictureConverter shrinker(width, height, QvFourcc::BGR3, "--sheet");
    const int count = grid.width * grid.height;
    // The middle of each of `count` equal parts of the video.
    const auto middle = [&](int i) { return (2LL * i + 1) * reader.frames() / (2LL * count); };
    Reading reading(given, source, reader, middle(count - 1));
    for (int i = 0; i < count; ++i)
        if (sheet.clip(shrinker.convert(reader.at(middle(i))), 0, 0, kGap + i % grid.width * (width + kGap),
                       kGap + i / grid.width * (height + kGap), width, height) != QvStatus::ok)
            throw std::bad_alloc();
    reading.done();
    save(sheet, source, given);
}

// A cut input is refused unless the user takes what is there, as a run would do it. How many warnings it
// made.
int checkDamage(const Source& source, bool acceptPartial) {
    const std::string damage = source.damage();
    if (damage.empty()) return 0;
    if (!acceptPartial) throw failure(Msg::inputDamaged, {source.name(), damage});
    tell(Level::warning, lineOf(Msg::inputDamagedTaken, {source.name(), damage}));
    return 1;
}

MediaTime lengthOf(const Source& source) {
    QvDecodePipe& decoder = source.decoder();
    const auto rate = source.frameRate();
    return rate ? qvInstantOf(decoder.nrFrames(0), rate->rate()) : decoder.duration(1, 0);
}

void frame(Given& given) {
    given.effects.check();
    limitThreads(given.threads);
    if (!given.sheet.empty()) parseSheet(given.sheet);
    if (!given.sheet.empty() && !given.at.empty()) throw failure(Msg::optionsExclude, {"--at", "--sheet"});
    const OutputPolicy policy = given.outputOptions.policy();
    given.stream = StreamOutput::find(given.output, {given.input});
    const Any extension = QvFile::getExt(Any(given.output.c_str()), true);
    if (!given.stream) requireNoFolder(given.output, "png");
    if (!given.stream && !(extension == "png")) throw failure(Msg::pictureName, {"-o", given.output});
    if (!given.stream && NumberedName::parse(fs::path(given.output).filename().string()))
        throw failure(Msg::pictureNumbered, {given.output});
    Source source(given.input, given.raw, nullptr, {.upright = !given.noRotate});
    if (!given.stream) given.outputs = std::make_shared<Outputs>(given.output, "-o", source.files(), policy);
    if (source.decoder().nrStreams(1) == 0) throw failure(Msg::fileNoPicture, {given.input});
    source.selectAll();
    given.warnings = checkDamage(source, given.effects.acceptPartial);
    PictureReader reader(source, given.effects);
    if (reader.pipe() && given.outputs) given.outputs->addInputs(filterFiles(*reader.pipe()).read);
    if (!given.sheet.empty()) return saveSheet(source, reader, given);
    const auto rate = source.frameRate();
    const MediaTime at =
        given.at.empty() ? MediaTime() : parseInstant(given.at, rate, "--at", lengthOf(source));
    if (rate && at.position(*rate) >= source.decoder().nrFrames(0))
        throw failure(Msg::atAfterEnd, {given.at, given.input, formatTime(source.duration())});
    const long long number = std::min(rate ? at.position(reader.format().rate) : 0, reader.frames() - 1);
    Reading reading(given, source, reader, number);
    const QvFrame& picture = reader.at(number);
    reading.done();
    save(picture, source, given);
}

}  // namespace

void addFrame(CommandLine& line, Signals& signals, const std::string& version) {
    Command command = line.command("frame", "Save one picture of a video, or a contact sheet");
    auto given = std::make_shared<Given>();
    given->signals = &signals;
    command.argument("FILE", given->input, "A file, or testgen:...");
    command.option("--at", given->at,
                   "The instant: SS.mmm, HH:MM:SS, 120f, HH:MM:SS:FF; -10 counts from the end", "TIME");
    command.option("--sheet", given->sheet, "A sheet of COLUMNSxROWS pictures", "NxM");
    command.option("--raw", given->raw, "Format of a raw file: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.flag("--no-rotate", given->noRotate, "Keep a film as it is coded, not turned upright");
    command.option("-o,--output", given->output, "The picture; - is the standard output", "FILE.png",
                   Need::required);
    addEffectOptions(command, given->effects);
    command.flag("--strict", given->strict, "Write nothing if there is a warning");
    addThreads(command, given->threads);
    command.flag("--accept-partial", given->effects.acceptPartial,
                 "Accept a damaged input or subtitles and take what can be read");
    given->outputOptions.add(command);
    given->progress.add(command);
    command.action([given] { frame(*given); },
                   [given, version] {
                       given->progress.open(given->output, {given->input, given->effects.subtitles},
                                            given->outputOptions.overwrite, version);
                   });
}
