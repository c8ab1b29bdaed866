#include "builtin/video/overlay/subtitlewriter.h"

#include <algorithm>
#include <cstdio>

#include "builtin/creators.h"
#include "core/caption/text/qvtext.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvprocessutil.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvdraw.h"

namespace {

using Settings = SubtitleSettings;
using Options = QvTextRenderingOptions;

constexpr int largestFont = 4096;
constexpr int mostMargin = 65535;  // pixels
constexpr double mostSpeed = 1000;
constexpr double mostDelay = 1e9;  // ms, eleven days

AnyVector encodingRange() {
    AnyVector range;
    QvText::availableEncodings(range);
    return range;
}

AnyVector effectRange() {
    AnyVector range;
    for (int effect = 0; effect < Options::nrEffects; ++effect) {
        AnyDict row("name", Options::effectName(effect));
        row.set("identifier", effect);
        range.append(row);
    }
    return range;
}

int setEncoding(Settings& settings, const Any& value) {
    int number = 0;
    if (!qvparam::convert(value, number) || number < 0) return QvStatus::invalidParam;
    if (number >= Options::byCodePage && QvText::encodingName(number) == "N/A") return QvStatus::invalidParam;
    settings.encoding = number;
    return QvStatus::ok;
}

void getEncoding(const Settings& settings, Any& value) { value = settings.encoding; }
void getEncodings(const Settings&, Any& value) { value = encodingRange(); }
void getEffects(const Settings&, Any& value) { value = effectRange(); }

int setFramerate(Settings& settings, const Any& value) {
    QvFramerate rate;
    if (!value.isValid()) {
        settings.framerate.invalidate();
        return QvStatus::ok;
    }
    if (!qvparam::convert(value, rate) || !(rate.rate().ratio() > 0)) return QvStatus::invalidParam;
    settings.framerate = rate;
    return QvStatus::ok;
}

void getFramerate(const Settings& settings, Any& value) { value = settings.framerate; }

template <int Shift>
int setByte(Settings& settings, const Any& value) {
    int byte = 0;
    if (!qvparam::convert(value, byte) || byte < 0 || byte > 255) return QvStatus::invalidParam;
    settings.color = (settings.color & ~(255 << Shift)) | byte << Shift;
    return QvStatus::ok;
}

template <int Shift>
void getByte(const Settings& settings, Any& value) {
    value = settings.color >> Shift & 255;
}

using Access = QvParamAccess<Settings>;

constexpr QvParamRow<Settings> rows[] = {
    {.name = "subtitle_filename",
     .member = &Settings::file,
     .flags = qvParamStored,
     .help = "a .srt or .sub file, with normalize also a film; without one nothing is drawn"},
    {"subtitle_stream", &Settings::stream, qvParamStored, 0, 255, "", "",
     "which stream of subtitles of a film, with normalize"},
    {.name = "font_filename",
     .member = &Settings::font,
     .flags = qvParamStored,
     .help = "of all three faces; empty: the sans fonts of the system"},
    {.name = "font_family",
     .member = &Settings::family,
     .flags = qvParamStored,
     .help = "goes before font_filename if it is installed"},
    {"font_size", &Settings::fontSize, qvParamStored, 1, largestFont, "", "pixels"},
    {"speed", &Settings::speed, qvParamStored, 0, mostSpeed, "", "",
     "of the clock of the subtitles against that of the picture"},
    {"delay", &Settings::delay, qvParamStored, -mostDelay, mostDelay, "", "ms",
     "by which subtitles come later"},
    {.name = "encoding",
     .member = Access{setEncoding, getEncoding},
     .flags = qvParamStored,
     .help = "of a file without a mark: 0 ASCII, 1 UTF-8, 2 UTF-16, 3 UTF-32, else a code page"},
    {"encodingRange", Access{nullptr, getEncodings}},
    {.name = "framerate",
     .member = Access{setFramerate, getFramerate},
     .flags = qvParamStored,
     .help = "of the frame numbers in a .sub file; not set: that of the picture",
     .type = Any::Framerate},
    {"fontEffect", &Settings::fontEffect, qvParamStored, 0, Options::nrEffects - 1, "", "",
     "see fontEffectRange"},
    {"pixelAspect", &Settings::pixelAspect, qvParamStored, 0.1, 10, "", "", "width to height of a pixel"},
    {"fontEffectRange", Access{nullptr, getEffects}},
    {.name = "normalize",
     .member = &Settings::normalize,
     .flags = qvParamStored,
     .help = "reads files of any origin and encoding"},
    {.name = "wrap", .member = &Settings::wrap, .flags = qvParamStored, .help = "wide lines become several"},
    {"align", &Settings::align, qvParamStored, 0, 9, "", "",
     "1 to 9 as on the keys of numbers, 2 at the bottom; 0 by the size of the letters"},
    {"marginX", &Settings::marginX, qvParamStored, 0, mostMargin, "", "pixels", "with align or wrap"},
    {"marginY", &Settings::marginY, qvParamStored, 0, mostMargin, "", "pixels", "with align or wrap"},
    {"color", &Settings::color, qvParamStored, 0, 0xFFFFFF, "", "", "0xRRGGBB"},
    {"colorR", Access{setByte<16>, getByte<16>}, qvParamPlain, 0, 255, "", "", "red of color"},
    {"colorG", Access{setByte<8>, getByte<8>}, qvParamPlain, 0, 255, "", "", "green of color"},
    {"colorB", Access{setByte<0>, getByte<0>}, qvParamPlain, 0, 255, "", "", "blue of color"},
};
static_assert(qvParamTableOk<Settings>(rows));

AnyVector identifiers(const AnyVector& range) {
    AnyVector numbers;
    for (const Any& row : range) numbers.append(row.asDict().get("identifier"));
    return numbers;
}

AnyVector paramSet() {
    const auto desc = [](const char* name, int type, int control, const char* text, const Any& min = Any(),
                         const Any& max = Any()) {
        return QvProcessUtil::createParamDesc(name, type, control, text, min, max);
    };
    AnyVector set;
    set.append(desc("subtitle_filename", Any::String, QV_GUI_FILESELECT_LOAD, "Subtitle file"));
    set.append(desc("font_filename", Any::String, QV_GUI_FILESELECT_LOAD, "Font file"));
    set.append(desc("font_size", Any::Int32, QV_GUI_EDIT, "Font size in pixels", 1, largestFont));
    set.append(desc("speed", Any::Float, QV_GUI_EDIT, "Relative subtitle speed", 0.0, mostSpeed));
    set.append(desc("delay", Any::Float, QV_GUI_EDIT, "Subtitle offset in ms", -mostDelay, mostDelay));
    set.append(desc("framerate", Any::Float, QV_GUI_EDIT, "Framerate"));
    set.append(QvProcessUtil::createParamDesc("encoding", Any::Int32, QV_GUI_COMBOBOX, "",
                                              identifiers(encodingRange())));
    set.append(QvProcessUtil::createParamDesc("fontEffect", Any::Int32, QV_GUI_COMBOBOX, "",
                                              identifiers(effectRange())));
    return set;
}

// `isUtf8`: the text is by now, because the file has a byte order mark or was converted.
Options optionsOf(const Settings& settings, bool isUtf8) {
    Options options;
    if (settings.font.empty()) {
        options.fontRegular = qv_registry()->defaultFontFile(0);
        if (const Any italic = qv_registry()->defaultFontFileItalic(0); italic.isTrue())
            options.fontItalic = italic;
        if (const Any bold = qv_registry()->defaultFontFileBold(0); bold.isTrue()) options.fontBold = bold;
    } else {
        options.fontRegular = settings.font.c_str();
    }
    options.charSize = settings.fontSize;
    options.subEncoding = isUtf8 ? Options::utf8 : std::min<int>(settings.encoding, Options::byCodePage);
    options.codePage = settings.encoding >= Options::byCodePage ? settings.encoding : 0;
    options.fontEffect = settings.fontEffect;
    options.pixelAspect = settings.pixelAspect;
    if (!settings.family.empty()) options.fontFamily = settings.family.c_str();
    options.wrap = settings.wrap;
    options.align = settings.align;
    options.marginX = settings.marginX;
    options.marginY = settings.marginY;
    return options;
}

void warnOfReading(const QvSubtitleFindings& findings, const char* file) {
    if (findings.problem == QvSubtitleFindings::noSubtitles)
        qv_log()->warning("Subtitle file %s has no subtitles", file);
    if (findings.lost > 0)
        qv_log()->warning("Subtitle file %s: %d subtitles are left out, their times can't be read", file,
                          findings.lost);
    if (findings.problem == QvSubtitleFindings::otherEncoding)
        qv_log()->warning("Subtitle file %s: line %lld is not in its encoding", file, findings.line);
    if (findings.guessed)
        qv_log()->warning("Subtitle file %s does not say its encoding, it is read as %s", file,
                          findings.encoding.c_str());
}

// The first few letters by themselves, the others by their number.
void warnOfLetters(const std::u32string& letters, const std::string& file) {
    if (letters.empty()) return;
    constexpr std::size_t most = 5;
    std::string names;
    for (const char32_t letter : std::u32string_view(letters).substr(0, most)) {
        char code[16];
        std::snprintf(code, sizeof code, "U+%04X ", static_cast<unsigned>(letter));
        names += (names.empty() ? "" : ", ") + std::string(code) + QvText::toUtf8({&letter, 1});
    }
    if (letters.size() > most) names += " and " + std::to_string(letters.size() - most) + " more";
    qv_log()->warning("Subtitle file %s: no font of this system has %s; they are drawn as boxes",
                      file.c_str(), names.c_str());
}

}  // namespace

QvCodec* newSubtitle() { return new SubtitleWriter; }

SubtitleWriter::SubtitleWriter() : OverlayOf("subtitle", rows) {}

void SubtitleWriter::getParam(const char* name, Any& value) const {
    const std::string_view asked = name;
    if (asked == "format")
        value = subtitles_ ? static_cast<int>(subtitles_->format()) : 0;
    else if (asked == "paramSet")
        value = paramSet();
    else
        OverlayOf::getParam(name, value);
}

int SubtitleWriter::open() {
    if (opened()) close();
    if (const int result = load()) return result;
    return OverlayOf::open();
}

int SubtitleWriter::load() {
    subtitles_.reset();
    const Options fonts = optionsOf(settings_, false);
    const Any font = fonts.fontRegular.toString();
    qv_dbg()->info("[subwriter] Subtitle file: %s", settings_.file.c_str());
    qv_dbg()->info("[subwriter] Font file: %s", font.asString(""));
    qv_dbg()->info("[subwriter] Font size: %d", settings_.fontSize);
    qv_dbg()->info("[subwriter] Speed, offset: %f, %f", settings_.speed, settings_.delay);
    qv_dbg()->info("[subwriter] Encoding: %d", settings_.encoding);
    if (settings_.file.empty()) return QvStatus::ok;

    rateKnown_ = settings_.framerate.isFramerate();
    QvSubtitles read;
    if (const int result = readFile(read)) return result;
    const bool isUtf8 = settings_.normalize || read.encoding() != QvSubtitles::markNone;
    const Options options = optionsOf(settings_, isUtf8);
    overlay::warnOfFonts(options);
    if (render_.init(options) != QvStatus::ok)
        return setError(QvStatus::failed, "Unable to load font rendering library.");
    warnOfLetters(render_.findFonts(read), settings_.file);
    subtitles_ = std::move(read);
    return QvStatus::ok;
}

int SubtitleWriter::readFile(QvSubtitles& read) {
    const QvFramerate rate = rateKnown_ ? settings_.framerate.asFramerate() : QvFramerate(QvRatio(25, 1));
    const char* const file = settings_.file.c_str();
    if (settings_.normalize) {
        QvSubtitleFindings findings;
        const int result = read.readFile(file, rate, settings_.encoding, findings, settings_.stream);
        if (result != QvStatus::ok && findings.problem != QvSubtitleFindings::noSubtitles)
            return setError(QvStatus::cannotParse, "Failed to read subtitle file %s", file);
        if (findings.hasRate && rateKnown_) read.changeFramerate(rate);
        rateKnown_ |= findings.hasRate;
        warnOfReading(findings, file);
        return QvStatus::ok;
    }
    if (read.parseFile(file, rate) != QvStatus::ok)
        return setError(QvStatus::cannotParse, "Failed to read subtitle file %s", file);
    if (read.unread() > 0)
        qv_log()->warning("Subtitle file %s: the last %lld bytes of its text are not read", file,
                          read.unread());
    else if (read.nrSubtitles() == 0)
        qv_log()->warning("Subtitle file %s has no subtitles", file);
    return QvStatus::ok;
}

int SubtitleWriter::close() {
    subtitles_.reset();
    return OverlayOf::close();
}

int SubtitleWriter::draw(QvFrame& frame) {
    if (!subtitles_ || !(frame.framerate.rate().ratio() > 0)) return QvStatus::ok;
    if (!rateKnown_ && subtitles_->format() == QvSubtitles::SUB) subtitles_->changeFramerate(frame.framerate);
    rateKnown_ = true;
    const MediaTime shown(frame.frameNr, frame.framerate, MediaTime::defaultTimescale);
    const double seconds = shown.seconds() * settings_.speed - settings_.delay / 1000.0;
    QvSubtitle* subtitle = subtitles_->find(MediaTime(seconds));
    if (!subtitle) return QvStatus::ok;
    const QvColor color(static_cast<unsigned>(settings_.color));
    return render_.render(frame, *subtitle, &color);
}
