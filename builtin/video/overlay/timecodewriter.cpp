#include "builtin/video/overlay/timecodewriter.h"

#include <algorithm>
#include <climits>
#include <cstdio>
#include <cstring>
#include <string_view>

#include "builtin/creators.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/engine/modules/qvregistry.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvdraw.h"

namespace {

using Settings = TimecodeSettings;

constexpr int leastSize = 14;
constexpr int upperFieldOnly = 2;

// Index of a text in a pair of them; a number is the index itself. -1: neither.
int chosen(const Any& value, const char* const (&names)[2]) {
    int number = 0;
    if (qvparam::convert(value, number)) return number == 1;
    std::string text;
    if (!value.isText() || !qvparam::convert(value, text)) return -1;
    return text == names[1] ? 1 : text == names[0] ? 0 : -1;
}

constexpr const char* modes[] = {"Frame number", "Timecode"};
constexpr const char* starts[] = {"InPoint", "FirstInputFrame"};

int setMode(Settings& settings, const Any& value) {
    const int mode = chosen(value, modes);
    if (mode < 0) return QvStatus::invalidParam;
    settings.asTimecode = mode == 1;
    return QvStatus::ok;
}

void getMode(const Settings& settings, Any& value) { value = modes[settings.asTimecode]; }

int setStart(Settings& settings, const Any& value) {
    const int start = value.isText() ? chosen(value, starts) : -1;
    if (start < 0) return QvStatus::invalidParam;
    settings.fromFirstFrame = start == 1;
    return QvStatus::ok;
}

void getStart(const Settings& settings, Any& value) { value = starts[settings.fromFirstFrame]; }

constexpr QvParamRow<Settings> rows[] = {
    {.name = "mode",
     .member = QvParamAccess<Settings>{setMode, getMode},
     .flags = qvParamStored,
     .help = "Timecode, or Frame number"},
    {.name = "start",
     .member = QvParamAccess<Settings>{setStart, getStart},
     .flags = qvParamStored,
     .help = "FirstInputFrame: that frame counts as 0; InPoint: frames keep their numbers"},
    {.name = "startOffset",
     .member = &Settings::startOffset,
     .flags = qvParamStored,
     .unit = "frames",
     .help = "subtracted from the number"},
    {"dropFrame", &Settings::dropFrame, qvParamStored, -1, 1, "", "",
     "1 drop frame, 0 not, -1 as the rate says"},
    {.name = "font_filename",
     .member = &Settings::font,
     .flags = qvParamStored,
     .help = "of all three faces; empty: the sans fonts of the system"},
    overlay::byteRow("colorR", &Settings::red),
    overlay::byteRow("colorG", &Settings::green),
    overlay::byteRow("colorB", &Settings::blue),
    {.name = "positionX",
     .member = &Settings::x,
     .flags = qvParamStored,
     .unit = "pixels",
     .help = "from the left; -1: the default place"},
    {.name = "positionY",
     .member = &Settings::y,
     .flags = qvParamStored,
     .unit = "pixels",
     .help = "from the top"},
    {.name = "renderingOptions",
     .member = &Settings::renderingOptions,
     .flags = qvParamStored,
     .help = "a stored QvTextRenderingOptions"},
};
static_assert(qvParamTableOk<Settings>(rows));

QvFramerate countingRate(QvFramerate rate, int dropFrame) {
    if (dropFrame >= 0) rate.setDf(dropFrame == 1 && (rate.is29p() || rate.is59p() || rate.is59i()));
    return rate;
}

// Of a number below 0, counted back from midnight.
int wrapped(int number, const QvFramerate& rate) {
    const int day = QvTimecode(24, 0, 0, 0).frameNr(rate, false);
    return number >= 0 || day <= 0 ? number : (number % day + day) % day;
}

QvTextRenderingOptions optionsOf(const Settings& settings) {
    QvTextRenderingOptions options;
    options.charSize = 0;
    options.fontRegular =
        settings.font.empty() ? qv_registry()->defaultFontFile(0) : Any(settings.font.c_str());
    options.fontItalic = options.fontBold = options.fontRegular;
    options.restore(settings.renderingOptions);
    options.subEncoding = QvTextRenderingOptions::utf8;  // of the text that is made here
    return options;
}

}  // namespace

QvCodec* newTimecode() { return new TimecodeWriter; }

TimecodeWriter::TimecodeWriter() : OverlayOf("timecode", rows) {}

int TimecodeWriter::open() {
    height_ = 0;
    counting_ = false;
    overlay::warnOfFonts(optionsOf(settings_));
    return OverlayOf::open();
}

int TimecodeWriter::prepare(int pictureHeight) {
    if (height_ == pictureHeight) return QvStatus::ok;
    QvTextRenderingOptions options = optionsOf(settings_);
    if (options.charSize <= 0) options.charSize = std::max(pictureHeight / 10 * 7 / 8, leastSize);
    if (render_.init(options) != QvStatus::ok)
        return setError(QvStatus::failed, "Unable to load font rendering library.");
    charSize_ = options.charSize;
    height_ = pictureHeight;
    return QvStatus::ok;
}

int TimecodeWriter::numberOf(const QvFrame& frame) {
    if (!counting_) first_ = frame.frameNr;
    counting_ = true;
    const long long from = settings_.fromFirstFrame ? first_ : 0;
    const long long number = frame.frameNr - from - settings_.startOffset;
    return static_cast<int>(std::clamp<long long>(number, INT_MIN, INT_MAX));
}

void TimecodeWriter::setText(const QvFrame& frame, int number) {
    char text[QvTimecode::textSize + 1];
    if (settings_.asTimecode) {
        const QvFramerate rate = countingRate(frame.framerate, settings_.dropFrame);
        const QvTimecode timecode(wrapped(number, rate), rate, false);
        timecode.pprint(text, timecode.df());
        std::strcat(text, "*");
    } else {
        std::snprintf(text, sizeof text, "%d", number);
    }
    setFieldMasks(settings_.asTimecode && frame.framerate.interlaced(), static_cast<int>(std::strlen(text)));
    if (std::string_view(line_.text.asString("")) != text) line_.text = text;
}

// The last character, the star, stands in the upper field only.
void TimecodeWriter::setFieldMasks(bool interlaced, int characters) {
    AnyVector& masks = line_.fieldMasks;
    if (masks.size() == (interlaced ? characters : 0)) return;
    masks.clear();
    for (int i = 1; interlaced && i <= characters; ++i) masks.append(i < characters ? 0 : upperFieldOnly);
}

int TimecodeWriter::draw(QvFrame& frame) {
    if (const int result = prepare(frame.height())) return result;
    setText(frame, numberOf(frame));
    const int below = static_cast<int>(std::min(charSize_ * 3LL / 2, INT_MAX / 2LL));
    line_.position = settings_.x != -1
                         ? QvPoint(settings_.x, settings_.y)
                         : QvPoint(static_cast<int>(frame.width() * 35LL / 100), frame.height() - below);
    const QvColor color(static_cast<unsigned char>(settings_.red),
                        static_cast<unsigned char>(settings_.green),
                        static_cast<unsigned char>(settings_.blue), false);
    return render_.render(frame, line_, &color);
}
