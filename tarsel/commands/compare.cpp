// How far the pictures of one input are from those of another.
#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdlib>
#include <memory>
#include <new>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/savedpicture.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/picture/pictureconverter.h"
#include "tarsel/picture/picturereader.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr size_t kWorst = 5;
constexpr int kCellWidth = 640;  // pixels a picture of the sheet is at most wide
constexpr int kGap = 8;
constexpr int kAmplified = 8;  // how much stronger differences are shown
constexpr double kMostPsnr = 1000;
constexpr long long kMostOffset = 1000000000;

struct Given {
    std::string first, second, raw, offset, minPsnr, sheet;
    bool json = false, frames = false;
    OutputOptions outputOptions;
    Signals* signals = nullptr;
};

struct Measured {
    long long number;  // of the first input's picture
    QvPictureQuality quality;
};

// What is measured is what the meter knows; everything else is shown to it as RGB.
unsigned measurable(unsigned fourcc) {
    QvFrame probe;
    QvPictureQuality quality;
    int result = probe.init(fourcc, 16, 16);
    if (result == QvStatus::ok) result = QvQualityMeter().measure(probe, probe, quality);
    if (result == QvStatus::outOfMemory) throw std::bad_alloc();
    return result == QvStatus::ok ? fourcc : QvFourcc::BGR4;
}

// The pictures of an input in one format.
class Pictures {
  public:
    Pictures(const std::string& name, const std::string& raw)
        : source_(name, Source::describesItself(name) ? "" : raw) {
        if (source_.decoder().nrStreams(1) == 0) throw failure(Msg::fileNoPicture, {name});
        source_.selectAll();
        if (const std::string damage = source_.damage(); !damage.empty())
            throw failure(Msg::fileDamaged, {name, damage});
        reader_ = std::make_unique<PictureReader>(source_, effects_);
    }
    const Source& source() const { return source_; }
    const std::string& name() const { return source_.name(); }
    const std::vector<std::string>& files() const { return source_.files(); }
    const PictureFormat& format() const { return reader_->format(); }
    std::string size() const {
        return std::to_string(format().width) + "x" + std::to_string(format().height);
    }
    long long count() const { return reader_->frames(); }
    const QvFrame& at(long long number) { return reader_->at(number); }
    const QvFrame& at(long long number, unsigned fourcc) {
        const QvFrame& frame = reader_->at(number);
        if (frame.four_cc() == fourcc) return frame;
        if (!converter_)
            converter_ = std::make_unique<PictureConverter>(frame.width(), frame.height(), fourcc, "compare");
        return converter_->convert(frame);
    }

  private:
    Source source_;
    EffectOptions effects_;
    std::unique_ptr<PictureReader> reader_;
    std::unique_ptr<PictureConverter> converter_;
};

double parsePsnr(const std::string& text) {
    double value = 0;
    const char* const end = text.data() + text.size();
    const auto parsed = std::from_chars(text.data(), end, value);
    if (parsed.ec == std::errc() && parsed.ptr == end && value >= 0 && value <= kMostPsnr) return value;
    throw failure(Msg::decimalWrong, {"--min-psnr", text, "0", "1000"});
}

std::string decibels(double value) {
    char text[32];
    if (std::isinf(value)) return "inf";
    std::snprintf(text, sizeof text, "%.2f", value);
    return text;
}

Json numberOrNull(double value) { return std::isfinite(value) ? Json(value) : Json(nullptr); }

Json describe(const QvPictureQuality& quality) {
    Json psnr = Json::object(), ssim = Json::object();
    for (int i = 0; i < quality.planes; ++i) {
        const QvPlaneQuality& plane = quality.plane[static_cast<size_t>(i)];
        const std::string name(1, static_cast<char>(plane.name - 'A' + 'a'));
        psnr[name] = numberOrNull(plane.psnr());
        ssim[name] = plane.ssim;
    }
    psnr["all"] = numberOrNull(quality.psnr());
    ssim["all"] = quality.ssim();
    return {{"psnr", psnr}, {"ssim", ssim}};
}

Json describe(const Measured& measured) {
    Json frame = {{"frame", measured.number}};
    frame.update(describe(measured.quality));
    return frame;
}

void printQuality(const char* what, const QvPictureQuality& quality) {
    std::string psnr, ssim;
    for (int i = 0; i < quality.planes; ++i) {
        const QvPlaneQuality& plane = quality.plane[static_cast<size_t>(i)];
        char text[48];
        psnr += std::string("  ") + plane.name + " " + decibels(plane.psnr());
        std::snprintf(text, sizeof text, "  %c %.4f", plane.name, plane.ssim);
        ssim += text;
    }
    print("%-12s PSNR %s dB%s   SSIM %.4f%s\n", what, decibels(quality.psnr()).c_str(), psnr.c_str(),
          quality.ssim(), ssim.c_str());
}

// The worst first; equal ones in their order.
std::vector<Measured> worstOf(const std::vector<Measured>& all) {
    std::vector<Measured> worst = all;
    const auto end = worst.begin() + static_cast<std::ptrdiff_t>(std::min(kWorst, worst.size()));
    std::partial_sort(worst.begin(), end, worst.end(), [](const Measured& a, const Measured& b) {
        const double left = a.quality.mse(), right = b.quality.mse();
        return left != right ? left > right : a.number < b.number;
    });
    worst.erase(end, worst.end());
    return worst;
}

void drawDifference(const QvFrame& a, const QvFrame& b, QvFrame& out) {
    if (out.init(QvFourcc::BGR3, a.width(), a.height()) != QvStatus::ok) throw std::bad_alloc();
    for (int y = 0; y < a.height(); ++y) {
        const unsigned char *left = a.pixelPtr(0, y), *right = b.pixelPtr(0, y);
        unsigned char* const to = out.pixelPtr(0, y);
        for (int i = 0; i < 3 * a.width(); ++i)
            to[i] = static_cast<unsigned char>(std::min(255, std::abs(left[i] - right[i]) * kAmplified));
    }
}

// A row for each of the worst pictures: the first input's, the second's, and the difference.
void saveSheet(Pictures& first, Pictures& second, long long offset, const std::vector<Measured>& worst,
               SavedPicture& saved) {
    const PictureFormat& format = first.format();
    const int width = std::max(2, std::min(kCellWidth, format.width) & ~1);
    const int height = std::max(2, static_cast<int>(std::lround(width / std::max(0.01, format.aspect))) & ~1);
    const int rows = static_cast<int>(worst.size());
    QvFrame sheet, difference;
    if (sheet.init(QvFourcc::BGR3, 3 * (width + kGap) + kGap, rows * (height + kGap) + kGap) != QvStatus::ok)
        throw std::bad_alloc();
    sheet.setRGB(24, 24, 24);
    PictureConverter left(width, height, QvFourcc::BGR3, "--sheet"),
        right(width, height, QvFourcc::BGR3, "--sheet");
    for (int i = 0; i < rows; ++i) {
        const long long number = worst[static_cast<size_t>(i)].number;
        const QvFrame& a = left.convert(first.at(number));
        const QvFrame& b = right.convert(second.at(number + offset));
        drawDifference(a, b, difference);
        const int top = kGap + i * (height + kGap);
        int column = kGap;
        for (const QvFrame* const cell : {&a, &b, static_cast<const QvFrame*>(&difference)}) {
            if (sheet.clip(*cell, 0, 0, column, top, width, height) != QvStatus::ok) throw std::bad_alloc();
            column += width + kGap;
        }
    }
    saved.save(sheet);
}

// Pictures of the first input from..to-1 have a counterpart.
struct Common {
    long long from, to;
    long long alone(const Pictures& pictures) const { return pictures.count() - (to - from); }
};

std::vector<Measured> measure(Pictures& first, Pictures& second, const Common& common, long long offset) {
    const unsigned fourcc = measurable(first.format().fourcc);
    QvQualityMeter meter;
    std::vector<Measured> all;
    for (long long n = common.from; n < common.to; ++n) {
        Measured measured{n, {}};
        const QvFrame& a = first.at(n, fourcc);
        if (meter.measure(a, second.at(n + offset, fourcc), measured.quality) != QvStatus::ok)
            throw failure(Msg::compareFailed, {second.name(), "its picture " + std::to_string(n + offset) +
                                                                  " differs in format"});
        all.push_back(measured);
    }
    return all;
}

void report(const Given& given, const Pictures& first, const Pictures& second, const Common& common,
            const std::vector<Measured>& all, const std::vector<Measured>& worst, const QvQualityMean& mean) {
    if (given.json) {
        Json out = {{"first", first.name()},
                    {"second", second.name()},
                    {"frames", mean.count()},
                    {"unmatched", {{"first", common.alone(first)}, {"second", common.alone(second)}}},
                    {"mean", describe(mean.mean())}};
        for (const Measured& measured : worst) out["worst"].push_back(describe(measured));
        for (const Measured& measured : all) out["each"].push_back(describe(measured));
        print("%s\n", out.dump(2, ' ', false, Json::error_handler_t::replace).c_str());
        return;
    }
    if (given.frames)
        for (const Measured& measured : all)
            printQuality(std::to_string(measured.number).c_str(), measured.quality);
    print("%d %s\n", mean.count(), mean.count() == 1 ? "picture" : "pictures");
    printQuality("mean", mean.mean());
    for (const Measured& measured : worst)
        if (measured.quality.mse() > 0)
            printQuality(("worst " + std::to_string(measured.number)).c_str(), measured.quality);
}

void compare(Given& given) {
    const double minPsnr = given.minPsnr.empty() ? -1 : parsePsnr(given.minPsnr);
    const long long offset =
        given.offset.empty() ? 0 : parseNumber(given.offset, -kMostOffset, kMostOffset, "--offset");
    Pictures first(given.first, given.raw), second(given.second, given.raw);
    if (first.format().width != second.format().width || first.format().height != second.format().height)
        throw failure(Msg::compareSizes, {first.name(), second.name(), first.size(), second.size()});
    std::unique_ptr<SavedPicture> saved;
    if (!given.sheet.empty()) {
        std::vector<std::string> inputs = first.files();
        inputs.insert(inputs.end(), second.files().begin(), second.files().end());
        saved = std::make_unique<SavedPicture>(given.sheet, "--sheet", inputs, given.outputOptions,
                                               *given.signals);
    }
    const Common common{std::max(0LL, -offset), std::min(first.count(), second.count() - offset)};
    if (common.from >= common.to) throw failure(Msg::compareNothing, {first.name(), second.name()});

    const std::vector<Measured> all = measure(first, second, common, offset);
    const std::vector<Measured> worst = worstOf(all);
    QvQualityMean mean;
    for (const Measured& measured : all) mean.add(measured.quality);
    report(given, first, second, common, all, worst, mean);
    if (saved) saveSheet(first, second, offset, worst, *saved);
    flushOutput();
    printConcealed(first.source());
    printConcealed(second.source());
    const double psnr = mean.mean().psnr();
    if (minPsnr >= 0 && psnr < minPsnr)
        throw failure(Msg::comparePsnr, {second.name(), decibels(psnr), given.minPsnr});
    for (const Pictures* pictures : {&first, &second}) {
        const long long alone = common.alone(*pictures);
        if (alone == 0) continue;
        if (minPsnr >= 0) throw failure(Msg::compareLength, {pictures->name(), std::to_string(alone)});
        tell(Level::warning, lineOf(Msg::compareLengthNoted, {pictures->name(), std::to_string(alone)}));
    }
}

}  // namespace

void addCompare(CommandLine& line, Signals& signals) {
    Command command = line.command("compare", "Measure how far pictures are from those of another input");
    auto given = std::make_shared<Given>();
    given->signals = &signals;
    command.argument("FIRST", given->first, "A file, or testgen:...");
    command.argument("SECOND", given->second, "What is compared with it");
    command.option("--offset", given->offset, "Picture 0 of FIRST is compared with picture N of SECOND", "N");
    command.option("--raw", given->raw, "Format of raw files: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.option("--min-psnr", given->minPsnr,
                   "Status 6 for a lower mean, or pictures without a counterpart", "DB");
    command.option("--sheet", given->sheet, "The worst pictures side by side, with their difference",
                   "FILE.png");
    command.flag("--frames", given->frames, "A line for each picture");
    command.flag("--json", given->json, "Print JSON, with each picture");
    given->outputOptions.add(command);
    command.action([given] { compare(*given); });
}
