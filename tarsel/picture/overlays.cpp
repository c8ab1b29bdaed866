#include "tarsel/picture/overlays.h"

#include <algorithm>
#include <charconv>
#include <cmath>

#include "tarsel/host/files.h"
#include "tarsel/source/captionfile.h"
#include "tarsel/source/picturefile.h"
#include "tarsel/words/keyvalues.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr int kVideoFilter = 12;
constexpr int kLinesOfText = 18;  // of subtitles that would fill a picture
constexpr int kLeastText = 14;    // pixels
constexpr int kShadow = 2;        // fontEffect
constexpr int kBottom = 2;        // align
constexpr const char* kTitleSafe = "5%";

constexpr struct {
    const char* name;
    int rgb;
} kColours[] = {
    {"white", 0xFFFFFF}, {"black", 0},         {"red", 0xFF0000},     {"green", 0x00FF00},
    {"blue", 0x0000FF},  {"yellow", 0xFFFF00}, {"magenta", 0xFF00FF}, {"cyan", 0x00FFFF},
};

int parseColour(const std::string& text, const std::string& option) {
    for (const auto& colour : kColours)
        if (text == colour.name) return colour.rgb;
    const std::string digits = text.substr(text.rfind('#', 0) == 0 ? 1 : 0);
    int rgb = 0;
    const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), rgb, 16);
    if (digits.size() != 6 || digits[0] == '-' || error != std::errc() || end != digits.data() + 6)
        throw failure(Msg::colourWrong, {option, text});
    return rgb;
}

// The identifier of an encoding that is given by its name or its number.
int parseEncoding(const std::string& text, const QvCodec& filter, const std::string& option) {
    const auto lower = [](std::string name) {
        std::transform(name.begin(), name.end(), name.begin(),
                       [](unsigned char c) { return std::tolower(c); });
        return name;
    };
    const Any range = filter.getParam("encodingRange");
    std::vector<std::string> known;
    for (int i = 0; range.isVector() && i < range.asVector().size(); ++i) {
        const AnyDict& row = range.asVector().at(i).asDict();
        const int identifier = row.getInt32("identifier", 0);
        known.push_back(lower(row.getString("name", "")));
        if (lower(text) == known.back() || text == std::to_string(identifier)) return identifier;
    }
    throw failure(Msg::encodingUnknown, {option, text, suggestion(lower(text), known)});
}

int parseEffect(const std::string& text, const std::string& option) {
    const std::vector<std::string> names = {"none", "outline", "shadow", "hard"};
    const auto found = std::find(names.begin(), names.end(), text);
    if (found == names.end())
        throw failure(Msg::nameUnknown,
                      {option, "effect", text, suggestion(text, names), "none, outline, shadow or hard"});
    return static_cast<int>(found - names.begin());
}

// A name and the numbers after its last "@", if these are numbers.
struct Placed {
    std::string file;
    int x = 0, y = 0;
    std::optional<double> opacity;
};

template <class Number>
bool takeNumber(std::string_view& text, Number& value) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc()) return false;
    text.remove_prefix(static_cast<size_t>(end - text.data()));
    if (text.empty()) return true;
    if (text[0] != ',' || text.size() == 1) return false;
    text.remove_prefix(1);
    return true;
}

Placed parsePlaced(const std::string& spec) {
    const size_t at = spec.rfind('@');
    if (at == std::string::npos) return {spec, 0, 0, {}};
    std::string_view place = std::string_view(spec).substr(at + 1);
    Placed placed{spec.substr(0, at), 0, 0, {}};
    double opacity = 1;
    bool good = takeNumber(place, placed.x) && !place.empty() && takeNumber(place, placed.y);
    if (good && !place.empty()) {
        good = takeNumber(place, opacity) && place.empty() && opacity >= 0 && opacity <= 1;
        placed.opacity = opacity;
    }
    if (good) return placed;
    // A name may hold an "@" as well.
    if (exists(spec)) return {spec, 0, 0, {}};
    throw failure(Msg::placeWrong, {spec, std::string_view(spec).substr(at)});
}

// Any other file is one with moving pictures.
bool isStill(const std::string& name) { return QvFile::getExt(Any(name.c_str()), true) == "png"; }

void requireMovie(const std::string& name) {
    const std::unique_ptr<QvDecodePipe> decoder(QvDecFactory::decodePipe(Any(name.c_str())));
    if (!decoder || decoder->nrStreams(1) == 0) throw failure(Msg::logoNoPicture, {name});
}

void setColour(QvCodec& filter, int rgb, const std::string& option) {
    setChecked(filter, "colorR", rgb >> 16, option);
    setChecked(filter, "colorG", rgb >> 8 & 255, option);
    setChecked(filter, "colorB", rgb & 255, option);
}

// The frame number that a run begins with, and whether it counts in drop frame.
void setStart(QvCodec& filter, const std::string& text, const PictureFormat& picture, bool alone) {
    const std::string option = "--timecode: start";
    const MediaTime start = parseTime(text, picture.rate, option);
    const bool drop = text.find(';') != std::string::npos;
    const bool ntsc = picture.rate.is29p() || picture.rate.is59i() || picture.rate.is59p();
    if (drop && !ntsc) throw failure(Msg::dropFrameNone, {option, text, formatRate(picture.rate)});
    if (drop) setChecked(filter, "dropFrame", 1, option);
    setChecked(filter, "start", alone ? "InPoint" : "FirstInputFrame", option);
    setChecked(filter, "startOffset", static_cast<int>(-start.position(picture.rate)), option);
}

}  // namespace

bool logoIsMoving(const std::string& spec) { return !isStill(parsePlaced(spec).file); }

AnyDict logoState(const std::string& spec, const PictureFormat& picture) {
    const std::string option = "--logo";
    const Placed placed = parsePlaced(spec);
    if (placed.file.empty()) throw failure(Msg::logoNoFile, {spec});
    requireInput(placed.file);
    if (isStill(placed.file)) requirePicture(placed.file);
    const auto filter = makeAnyCodec(isStill(placed.file) ? "logo" : "animatedlogo", kVideoFilter);
    if (std::abs(static_cast<long long>(placed.x)) >= picture.width ||
        std::abs(static_cast<long long>(placed.y)) >= picture.height)
        throw failure(Msg::logoBeyond,
                      {spec, std::to_string(picture.width) + "x" + std::to_string(picture.height)});
    setChecked(*filter, "filename", placed.file.c_str(), option);
    if (!isStill(placed.file)) requireMovie(placed.file);
    setChecked(*filter, "xpos", placed.x, option);
    setChecked(*filter, "ypos", placed.y, option);
    if (placed.opacity) setChecked(*filter, "alpha", *placed.opacity, option);
    return stateOf(*filter);
}

namespace {

bool isFamily(const std::string& name) { return qv_registry()->hasFontFamily(name.c_str()); }

// A name with a folder or an extension is that of a file, any other that of a font family.
void checkFont(const std::string& name, const std::string& what) {
    if (exists(name) || name.find_first_of("/.") != std::string::npos) {
        requireInput(name);
        if (!QvText::isFont(Any(name.c_str()))) throw failure(Msg::fontWrong, {what, name});
        return;
    }
    if (isFamily(name)) return;
    std::vector<std::string> families;
    for (const Any& family : qv_registry()->fontFamilies()) families.emplace_back(family.asString(""));
    throw failure(Msg::noSuchFont, {what, name, suggestion(name, families)});
}

void setFont(QvCodec& filter, const std::string& name, const std::string& what) {
    checkFont(name, what);
    setChecked(filter, exists(name) ? "font_filename" : "font_family", name.c_str(), what);
}

// Where text can be placed, in the order of a numeric keypad, from 1.
const std::vector<std::string> kPlaces = {"bottom-left", "bottom",   "bottom-right", "left",     "middle",
                                          "right",       "top-left", "top",          "top-right"};

int parseAlign(const std::string& text, const std::string& what) {
    const auto found = std::find(kPlaces.begin(), kPlaces.end(), text);
    if (found != kPlaces.end()) return static_cast<int>(found - kPlaces.begin()) + 1;
    std::string all;
    for (const auto& place : kPlaces) all += (all.empty() ? "" : ", ") + place;
    throw failure(Msg::noSuchAlign, {what, text, all});
}

// Pixels; `text` may be a percentage of the picture's width or height, which is `length`.
int parseMargin(const std::string& text, int length, const std::string& what) {
    double value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    const std::string_view unit = std::string_view(text).substr(static_cast<size_t>(end - text.data()));
    const double pixels = unit == "%" ? value * length / 100 : value;
    if (error != std::errc() || !(unit.empty() || unit == "%") || !(pixels >= 0 && pixels * 2 < length))
        throw failure(Msg::noMargin, {what, text});
    return static_cast<int>(pixels);
}

void setMargin(QvCodec& filter, const std::string& text, const PictureFormat& picture,
               const std::string& what) {
    setChecked(filter, "marginX", parseMargin(text, picture.width, what), what);
    setChecked(filter, "marginY", parseMargin(text, picture.height, what), what);
}

int parseSwitch(const std::string& text, const std::string& what) {
    if (text != "on" && text != "off") throw failure(Msg::noSwitch, {what, text});
    return text == "on";
}

int parseTextSize(const std::string& text, const std::string& what) {
    return static_cast<int>(parseNumber(text, 1, 4096, what));
}

// One key of --subtitle-style.
void setStyle(QvCodec& filter, const std::string& key, const std::string& value,
              const PictureFormat& picture) {
    const std::string what = "--subtitle-style: " + key;
    if (key == "size") setChecked(filter, "font_size", parseTextSize(value, what), what);
    if (key == "color") setChecked(filter, "color", parseColour(value, what), what);
    if (key == "font") setFont(filter, value, what);
    if (key == "effect") setChecked(filter, "fontEffect", parseEffect(value, what), what);
    if (key == "encoding") setChecked(filter, "encoding", parseEncoding(value, filter, what), what);
    if (key == "delay") setChecked(filter, "delay", 1000 * parseDecimal(value, -86400, 86400, what), what);
    if (key == "speed") setChecked(filter, "speed", parseDecimal(value, 0.001, 1000, what), what);
    if (key == "rate") setChecked(filter, "framerate", Any(parseRate(value, what)), what);
    if (key == "align") setChecked(filter, "align", parseAlign(value, what), what);
    if (key == "margin") setMargin(filter, value, picture, what);
    if (key == "wrap") setChecked(filter, "wrap", parseSwitch(value, what), what);
}

struct SubtitleFacts {
    QvSubtitleFindings findings;
    int readable = 0;  // subtitles
};

// Reads the file as the filter will.
SubtitleFacts readSubtitles(const std::string& file, const QvCodec& filter) {
    SubtitleFacts facts;
    QvSubtitles subtitles;
    subtitles.readFile(Any(file.c_str()), QvFramerate(QvRatio(25, 1)), filter.getParam("encoding").toInt32(),
                       facts.findings, filter.getParam("subtitle_stream").toInt32());
    facts.readable = subtitles.nrSubtitles();
    return facts;
}

void checkSubtitles(const std::string& file, const QvCodec& filter, bool acceptPartial) {
    using Findings = QvSubtitleFindings;
    const auto [found, readable] = readSubtitles(file, filter);
    const std::string line = std::to_string(found.line);
    if (found.problem == Findings::unreadable) throw failure(Msg::subtitlesOtherFile, {file});
    if (found.problem == Findings::noText) throw failure(Msg::subtitlesNoText, {file});
    if (found.problem == Findings::unknownEncoding) throw failure(Msg::subtitlesEncodingUnknown, {file});
    if (acceptPartial) return;
    if (found.problem == Findings::noSubtitles) throw failure(Msg::subtitlesNone, {file});
    if (found.problem == Findings::otherEncoding && found.encoding.empty())
        throw failure(Msg::subtitlesNotInEncoding, {file, line});
    if (found.problem == Findings::otherEncoding)
        throw failure(Msg::subtitlesInOtherEncoding, {file, line, found.encoding});
    if (found.lost > 0)
        throw failure(Msg::subtitlesLost,
                      {file, std::to_string(found.lost), std::to_string(found.lost + readable)});
}

// Why the filter can't use the subtitles, where no option of the command line gave them; "" if it can.
std::string subtitleFault(const std::string& file, const QvCodec& filter, bool acceptPartial) {
    using Findings = QvSubtitleFindings;
    const auto [found, readable] = readSubtitles(file, filter);
    if (found.problem == Findings::unreadable) return "it is no subtitle file";
    if (found.problem == Findings::noText) return "it is no text";
    if (found.problem == Findings::unknownEncoding) return "its encoding can't be found out";
    if (acceptPartial) return "";
    if (found.problem == Findings::noSubtitles) return "it has no subtitles";
    if (found.problem == Findings::otherEncoding)
        return "line " + std::to_string(found.line) + " is not valid in its encoding";
    if (found.lost == 0) return "";
    return "the times of " + std::to_string(found.lost) + " of " + std::to_string(found.lost + readable) +
           " subtitles can't be read";
}

std::string fileFault(const QvCodec& filter, const std::string& file, bool acceptPartial) {
    const auto isParam = [&](const char* name) { return filter.getParam(name) == file.c_str(); };
    if (isParam("font_filename")) return QvText::isFont(Any(file.c_str())) ? "" : "it is no font";
    if (isParam("subtitle_filename")) return subtitleFault(file, filter, acceptPartial);
    return "";
}

// Letters get a shadow, so that they can be read on any picture. A size of 0 is the default.
void setTextSize(QvCodec& filter, int size, const PictureFormat& picture, const std::string& what) {
    const Any before = filter.getParam("renderingOptions");
    AnyDict rendering = before.isDict() ? before.asDict() : AnyDict();
    rendering.set("charSizePt", size);
    rendering.set("fontEffect", kShadow);
    if (const double aspect = picture.pixelAspect(); aspect != 1) rendering.set("pixelAspect", aspect);
    setChecked(filter, "renderingOptions", rendering, what);
}

void setTimecodeFont(QvCodec& filter, const std::string& name, const std::string& what) {
    checkFont(name, what);
    if (exists(name)) return setChecked(filter, "font_filename", name.c_str(), what);
    AnyDict rendering = filter.getParam("renderingOptions").asDict();
    rendering.set("fontFamily", name.c_str());
    setChecked(filter, "renderingOptions", rendering, what);
}

void setMode(QvCodec& filter, const std::string& mode, const std::string& what) {
    if (mode != "timecode" && mode != "frames")
        throw failure(Msg::nameUnknown, {what, "mode", mode, "", "timecode or frames"});
    setChecked(filter, "mode", mode == "frames" ? "Frame number" : "Timecode", what);
}

// One key of --timecode.
void setTimecode(QvCodec& filter, const std::string& key, const std::string& value,
                 const PictureFormat& picture, bool alone) {
    const std::string what = "--timecode: " + key;
    const auto place = [&](int most) { return static_cast<int>(parseNumber(value, 0, most, what)); };
    if (key == "start") setStart(filter, value, picture, alone);
    if (key == "mode") setMode(filter, value, what);
    if (key == "x") setChecked(filter, "positionX", place(picture.width), what);
    if (key == "y") setChecked(filter, "positionY", place(picture.height), what);
    if (key == "size") setTextSize(filter, parseTextSize(value, what), picture, what);
    if (key == "color") setColour(filter, parseColour(value, what), what);
    if (key == "font") setTimecodeFont(filter, value, what);
}

}  // namespace

void requireFilterFile(const QvCodec& filter, const std::string& file, bool acceptPartial) {
    requireInput(file);
    if (isStill(file)) requirePicture(file);
    if (const std::string fault = fileFault(filter, file, acceptPartial); !fault.empty())
        throw failure(Msg::filterFileRefused, {filter.name(), file, fault});
}

AnyDict subtitleState(const std::string& file, const std::string& style, const PictureFormat& picture,
                      bool acceptPartial) {
    const std::string option = "--subtitles";
    requireInput(file);
    const auto filter = makeAnyCodec("subtitle", kVideoFilter);
    setChecked(*filter, "subtitle_filename", file.c_str(), option);
    setChecked(*filter, "font_size", std::max(picture.height / kLinesOfText, kLeastText), option);
    setChecked(*filter, "fontEffect", kShadow, option);
    setChecked(*filter, "pixelAspect", picture.pixelAspect(), option);
    setChecked(*filter, "normalize", 1, option);
    setChecked(*filter, "wrap", 1, option);
    setChecked(*filter, "align", kBottom, option);
    setMargin(*filter, kTitleSafe, picture, option);
    const KeyValues keys(style,
                         {"size", "color", "font", "effect", "encoding", "delay", "speed", "rate", "align",
                          "margin", "wrap", "stream"},
                         "--subtitle-style");
    for (const auto& [key, value] : keys.all()) setStyle(*filter, key, value, picture);
    const std::string* const stream = keys.find("stream");
    if (stream || isFilm(file))
        setChecked(*filter, "subtitle_stream", subtitleStream(file, stream ? *stream : ""), option);
    checkSubtitles(file, *filter, acceptPartial);
    return stateOf(*filter);
}

AnyDict timecodeState(const std::string& spec, const PictureFormat& picture, bool alone, bool atTop) {
    const std::string option = "--timecode";
    const auto filter = makeAnyCodec("timecode", kVideoFilter);
    setChecked(*filter, "start", "InPoint", option);
    setTextSize(*filter, 0, picture, option);
    if (atTop) {
        setChecked(*filter, "positionX", picture.width * 35 / 100, option);
        setChecked(*filter, "positionY", picture.height / kLinesOfText / 2, option);
    }
    const bool plain = spec == "true", isStart = !plain && spec.find('=') == std::string::npos;
    const KeyValues keys(plain     ? ""
                         : isStart ? "start=" + spec
                                   : spec,
                         {"start", "mode", "x", "y", "size", "color", "font"}, option);
    for (const auto& [key, value] : keys.all()) setTimecode(*filter, key, value, picture, alone);
    if (!keys.find("x") != !keys.find("y")) throw failure(Msg::pairIncomplete, {option, "x", "y"});
    return stateOf(*filter);
}

AnyDict fadeState(const std::string& spec, const PictureFormat& picture, long long frames) {
    const std::string option = "--fade";
    const size_t comma = std::min(spec.find(','), spec.size());
    const std::string in = spec.substr(0, comma), out = comma < spec.size() ? spec.substr(comma + 1) : in;
    const auto filter = makeAnyCodec("videofade", kVideoFilter);
    const auto framesOf = [&](const std::string& text) {
        return static_cast<int>(parseTime(text, picture.rate, option).position(picture.rate));
    };
    setChecked(*filter, "fade_in", framesOf(in), option);
    setChecked(*filter, "fade_out", framesOf(out), option);
    setChecked(*filter, "frames_count", static_cast<int>(std::min<long long>(frames, INT32_MAX)), option);
    return stateOf(*filter);
}
