#include "plugins/av/encode/videosettings.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <string_view>
#include <utility>
#include <vector>

#include "core/measure/fourcc.h"
#include "plugins/av/encode/libraryoptions.h"
#include "plugins/av/encode/presetvalues.h"

namespace av {

namespace {

using S = VideoSettings;
using Row = QvParamRow<S>;
using Access = QvParamAccess<S>;

struct Rate {
    double rate;
    int interlaced;
};
constexpr Rate rates[] = {{5, 0},      {6, 0},     {7.5, 0}, {8, 0},      {9, 0},  {10, 0},
                          {12, 0},     {12.5, 0},  {15, 0},  {16, 0},     {18, 0}, {20, 0},
                          {23.976, 0}, {24, 0},    {25, 0},  {25, 1},     {25, 2}, {29.97, 0},
                          {29.97, 1},  {29.97, 2}, {30, 0},  {30, 1},     {48, 0}, {50, 0},
                          {59.94, 0},  {60, 0},    {100, 0}, {119.88, 0}, {120, 0}};
constexpr Rate mpegRates[] = {{23.976, 0}, {24, 0}, {25, 0}, {25, 1}, {25, 2},    {29.97, 0}, {29.97, 1},
                              {29.97, 2},  {30, 0}, {30, 1}, {50, 0}, {59.94, 0}, {60, 0}};
constexpr Rate h263Rates[] = {{5, 0},  {6, 0},  {7.5, 0},    {8, 0},  {10, 0}, {12, 0},   {12.5, 0},
                              {15, 0}, {20, 0}, {23.976, 0}, {24, 0}, {25, 0}, {29.97, 0}};
constexpr Rate dvRates[] = {{25, 2}, {25, 0}, {29.97, 2}, {29.97, 0}};
constexpr Rate dv100Rates[] = {{25, 1}, {25, 0}, {29.97, 1}, {29.97, 0}, {50, 0}, {59.94, 0}};

// DV of 100 Mbit/s: a module of its own, and also a profile of the DV encoder.
bool isDv100(const S& s) {
    const std::string_view module = s.codec->module;
    return module == "dv100venc" || (module == "dvvenc" && s.codecProfile == "100");
}

std::span<const Rate> ratesOf(const S& s) {
    if (isDv100(s)) return dv100Rates;
    if (std::strcmp(s.codec->module, "mpegvenc") == 0) return mpegRates;
    if (std::strcmp(s.codec->module, "dvvenc") == 0) return dvRates;
    if (std::strcmp(s.codec->encoder, "h263") == 0) return h263Rates;
    return rates;
}

void framerateRange(const S& s, Any& value) {
    AnyVector all;
    for (const Rate& row : ratesOf(s))
        if (row.interlaced == 0 || s.supportsFields()) all.append(QvFramerate(row.rate, row.interlaced));
    value = all;
}

constexpr std::pair<int, int> h263Sizes[] = {{128, 96}, {176, 144}, {352, 288}, {704, 576}, {1408, 1152}};

AnyDict sizePair(int w, int h) { return AnyDict("w", w, "h", h); }

void sizeRange(const S& s, Any& value) {
    AnyVector sizes;
    if (!isDv100(s) && std::strcmp(s.codec->module, "dvvenc") == 0)
        for (const int height : {576, 480}) sizes.append(sizePair(720, height));
    if (isDv100(s)) {
        sizes.append(sizePair(1440, 1080));
        sizes.append(sizePair(1280, 1080));
        sizes.append(sizePair(960, 720));
    }
    if (std::strcmp(s.codec->encoder, "h263") == 0)
        for (const auto& [w, h] : h263Sizes) sizes.append(sizePair(w, h));
    if (!sizes.empty())
        value = sizes;
    else
        value = AnyDict("wmin", s.codec->minSide, "wmax", s.codec->maxSide, "hmin",
                        std::min(s.codec->minSide, 120), "hmax", s.codec->maxSide);
}

// Cut to what a parameter of 32 bits holds.
int bitrateNumber(double bitrate) { return static_cast<int>(std::min(bitrate, 2e9)); }

void bitrateRange(const S& s, Any& value) {
    AnyVector both;
    for (const int type : {QvBitrate::cbr, QvBitrate::vbr}) {
        AnyDict row("type", type);
        row.set("range", AnyVector(bitrateNumber(s.codec->minBitrate), bitrateNumber(s.codec->maxBitrate)));
        both.append(row);
    }
    value = both;
}

int setBitrate(S& s, const Any& value, double S::*member) {
    double wanted = 0;
    if (!qvparam::convert(value, wanted) || !(wanted >= 0) || wanted > 4e9) return QvStatus::invalidParam;
    if (wanted > 0 && (wanted < s.codec->minBitrate || wanted > s.codec->maxBitrate))
        return QvStatus::invalidParam;
    s.*member = wanted;
    if (member == &S::bitrate && wanted > 0) s.quality = -1;
    return QvStatus::ok;
}

int setQuality(S& s, const Any& value) {
    double wanted = 0;
    if (!qvparam::convert(value, wanted) || !(wanted >= -1) || wanted > s.codec->maxQuality)
        return QvStatus::invalidParam;
    s.quality = wanted < 0 ? -1 : wanted;
    return QvStatus::ok;
}

int setType(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
    const VideoForm* const form = s.codec->form(static_cast<unsigned>(wanted));
    if (!form) return QvStatus::invalidParam;
    s.type = form->fourcc;
    return QvStatus::ok;
}

int setRate(S& s, const Any& value) {
    QvFramerate wanted;
    if (!qvparam::convert(value, wanted) || wanted.rate().num < 1 || wanted.rate().den < 1)
        return QvStatus::invalidParam;
    if (wanted.interlaced() != 0 && !s.codec->has(VideoTrait::interlaced)) return QvStatus::invalidParam;
    s.rate = wanted;
    s.hasRate = true;
    return QvStatus::ok;
}

int setInterlaced(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || wanted < 0 || wanted > 2) return QvStatus::invalidParam;
    if (wanted != 0 && !s.codec->has(VideoTrait::interlaced)) return QvStatus::invalidParam;
    s.rate.setInterlaced(wanted);
    return QvStatus::ok;
}

int setProfile(S& s, const Any& value) {
    if (!qvparam::convert(value, s.profile)) return QvStatus::invalidParam;
    s.applyProfile();
    return QvStatus::ok;
}

int setPal(S& s, const Any& value) {
    if (!qvparam::convert(value, s.pal)) return QvStatus::invalidParam;
    s.applyProfile();
    return QvStatus::ok;
}

int setStandard(S& s, const Any& value) {
    std::string wanted;
    if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
    const VideoCodec* const row =
        wanted.empty() ? videoCodec(s.codec->module) : videoCodec(s.codec->module, wanted.c_str());
    if (!row) return QvStatus::invalidParam;
    if (row == s.codec) return QvStatus::ok;
    s.codec = row;
    // Profile and options of the other standard mean nothing for this one.
    s.codecProfile = row->profile;
    s.profileOptions.clear();
    s.m = std::min(s.m, row->maxM);
    if (!row->has(VideoTrait::interlaced)) s.rate.setInterlaced(0);
    if (s.bitrate > 0) s.bitrate = std::clamp(s.bitrate, row->minBitrate, row->maxBitrate);
    if (!row->form(s.type)) s.type = row->forms.front().fourcc;
    return QvStatus::ok;
}

// Sets an option that the library names `option`. `words`: the values it may have, each between spaces; "":
// the library checks the value.
int setNamed(const S& s, const char* option, const char* words, const Any& value, std::string& to) {
    std::string wanted;
    const AVCodec* const library = s.codec->library();
    if (!library || !qvparam::convert(value, wanted) || wanted.find_first_of(":='\\ ") != wanted.npos)
        return QvStatus::invalidParam;
    if (*words && !wanted.empty() && !std::strstr(words, (" " + wanted + " ").c_str()))
        return QvStatus::invalidParam;
    if (!*words && !wanted.empty() && !checkOptions(*library, std::string(option) + "=" + wanted).empty())
        return QvStatus::invalidParam;
    to = wanted;
    return QvStatus::ok;
}

// Profile names, each between spaces, of codecs whose libraries reject a wrong one only when they are opened.
// "": the library can check the name at once.
const char* profilesOf(const VideoCodec& codec) {
    const std::string_view module = codec.module;
    if (module == "h264venc") return " baseline main high high10 high422 high444 ";
    if (module == "h265venc")
        return " main main-intra mainstillpicture main444-8 main444-intra main444-stillpicture main10"
               " main10-intra main422-10 main422-10-intra main444-10 main444-10-intra ";
    if (module == "dvvenc") return " 25 dvcpro25 50 100 ";
    return module == "dv100venc" ? " 100 " : "";
}

int setCodecProfile(S& s, const Any& value) {
    return setNamed(s, "profile", profilesOf(*s.codec), value, s.codecProfile);
}

int setTimecode(S& s, const Any& value) {
    std::string wanted;
    int part[4] = {};
    char last = 0, drops = 0;
    if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
    if (!wanted.empty() && (std::sscanf(wanted.c_str(), "%2d:%2d:%2d%c%2d%c", &part[0], &part[1], &part[2],
                                        &drops, &part[3], &last) != 5 ||
                            (drops != ':' && drops != ';') || part[0] > 23 || part[1] > 59 || part[2] > 59 ||
                            *std::min_element(part, part + 4) < 0))
        return QvStatus::invalidParam;
    s.timecode = wanted;
    return QvStatus::ok;
}

int setPassRecord(S& s, const Any& value) {
    if (value.isValid() && !value.isGeneric()) return QvStatus::invalidParam;
    s.passRecord = value.isValid() ? static_cast<bufstream*>(const_cast<void*>(value.asGeneric())) : nullptr;
    return QvStatus::ok;
}

Any textOf(const std::string& text) { return Any(text.c_str()); }

void allowedTypes(const S& s, Any& value) {
    AnyVector all;
    for (const VideoForm& form : s.codec->forms)
        all.append(AnyDict("type", static_cast<int>(form.fourcc), "name", qvFourccText(form.fourcc).data()));
    value = all;
}

double aspectOf(const S& s) {
    if (s.frameAspect > 0 || s.height == 0) return s.frameAspect;
    return static_cast<double>(s.width) / s.height;
}

double nominalBits(const S& s) { return s.bitrate > 0 ? s.bitrate : s.codec->defaultBitrate; }

template <int number>
void fixed(const S&, Any& value) {
    value = number;
}

using C = const S&;
const Row commonRows[] = {
    {.name = "profile",
     .member = Access{setProfile, [](C s, Any& v) { v = s.profile; }},
     .flags = qvParamStored,
     .help = "number of a preset; to set it sets what the preset has for this encoder",
     .type = Any::Int32},
    {.name = "pal",
     .member = Access{setPal, [](C s, Any& v) { v = s.pal ? 1 : 0; }},
     .flags = qvParamStored,
     .help = "size and frame rate of a television preset: 1 for 50 Hz, 0 for 60 Hz",
     .type = Any::Int32},
    // After "profile": restored later, it replaces the standard that the preset has set.
    {.name = "standard",
     .member = Access{setStandard, [](C s, Any& v) { v = s.codec->standard; }},
     .flags = qvParamStored,
     .help = "for encoders of two standards: MPEG-2 or MPEG-1, MPEG-4 or H.263",
     .type = Any::String},
    {"width", &S::width, qvParamStored, 0, 16384, "", "pixels", "0: not set"},
    {"height", &S::height, qvParamStored, 0, 16384, "", "pixels", "0: not set"},
    {.name = "framerate",
     .member = Access{setRate,
                      [](C s, Any& v) {
                          if (s.hasRate) v = s.rate;
                      }},
     .flags = qvParamStored,
     .help = "a frame rate, or frames/s",
     .type = Any::Framerate},
    {.name = "interlaced",
     .member = Access{setInterlaced, [](C s, Any& v) { v = s.rate.interlaced(); }},
     .min = 0,
     .max = 2,
     .help = "0 progressive, 1 top field first, 2 bottom field first",
     .type = Any::Int32},
    {"frameAspect", &S::frameAspect, qvParamStored, 0, 100, "", "", "width to height; 0: square pixels"},
    {.name = "type",
     .member = Access{setType, [](C s, Any& v) { v = static_cast<int>(s.type); }},
     .flags = qvParamStored,
     .help = "FOURCC of the input frames",
     .type = Any::Int32},
    {"colourMatrix", &S::matrix, qvParamStored, 0, 2, "", "", "1 BT.601, 2 BT.709; 0: by the picture's height"},
    {"colourPrimaries", &S::primaries, qvParamStored, 0, 255, "", "", "code point of ITU-T H.273; 0: follows colourMatrix"},
    {"colourTransfer", &S::transfer, qvParamStored, 0, 255, "", "", "code point of ITU-T H.273; 0: follows colourMatrix"},
    {"colourSpace", &S::space, qvParamStored, 0, 255, "", "", "code point of ITU-T H.273; 0: follows colourMatrix"},
    {"threads", &S::threads, qvParamStored, 0, 64, "", "", "threads of the codec; 0: one per core"},
    {.name = "codecProfile",
     .member = Access{setCodecProfile, [](C s, Any& v) { v = textOf(s.codecProfile); }},
     .flags = qvParamStored,
     .help = "the codec's profile, as the library names it",
     .type = Any::String},
    {.name = "avOptions",
     .member = Access{[](S& s, const Any& value) {
                          std::string wanted;
                          const AVCodec* const library = s.codec->library();
                          if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
                          if (!wanted.empty() && (!library || !checkOptions(*library, wanted).empty()))
                              return QvStatus::invalidParam;
                          s.options = wanted;
                          return QvStatus::ok;
                      },
                      [](C s, Any& v) { v = textOf(s.options); }},
     .flags = qvParamStored,
     .help = "options of the library, name=value:name=value",
     .type = Any::String},
    {.name = "meta",
     .member = Access{setPassRecord, nullptr},
     .flags = qvParamWriteOnly,
     .help = "statistics of the first pass",
     .type = Any::Generic},
    {"chapters", {}, qvParamIgnored},
    {"topFirst", {}, qvParamIgnored},
    {"accelerationType", {}, qvParamIgnored},
    {"selectedFOURCC", Access{nullptr, [](C s, Any& v) { v = static_cast<int>(s.type); }}},
    {"allowedTypes", Access{nullptr, allowedTypes}},
    {"keepsForm", Access{nullptr, [](C s, Any& v) { v = s.codec->has(VideoTrait::keepsForm) ? 1 : 0; }}},
    {"sizeRange", Access{nullptr, sizeRange}},
    {"framerateRange", Access{nullptr, framerateRange}},
    {"aspectRange", Access{nullptr, [](C, Any& v) { v = AnyDict("min", 0.1, "max", 10.0); }}},
    {"pixelAspect",
     Access{nullptr,
            [](C s, Any& v) { v = s.width > 0 && s.height > 0 ? aspectOf(s) * s.height / s.width : 1.0; }}},
    {"extension", Access{nullptr, [](C s, Any& v) { v = s.codec->extension; }}},
    {"twoPassPossible",
     Access{nullptr,
            [](C s, Any& v) {
                const bool keeps = s.codec->has(VideoTrait::statsText | VideoTrait::statsFile);
                v = keeps && !s.byQuality() ? 1 : 0;
            }}},
    {"canChangeDominance", Access{nullptr, fixed<1>}},
    {"previewPossible", Access{nullptr, fixed<0>}},
    {"srPossible", Access{nullptr, fixed<0>}},
    {"_isAVCHD", Access{nullptr, fixed<0>}},
    {"_needTopBlanking", Access{nullptr, [](C s, Any& v) { v = s.topLines; }}},
    {"pulldown", Access{nullptr, fixed<0>}},
};

const Row groupRows[] = {
    {"N", &S::n, qvParamStored, 1, 1000, "", "pictures",
     "GOP length: most pictures from one key frame to the next"},
    {.name = "M",
     .member = Access{[](S& s, const Any& value) {
                          int wanted = 0;
                          if (!qvparam::convert(value, wanted) || wanted < 1 || wanted > s.codec->maxM)
                              return QvStatus::invalidParam;
                          s.m = wanted;
                          return QvStatus::ok;
                      },
                      [](C s, Any& v) { v = s.m; }},
     .flags = qvParamStored,
     .help = "distance from one I or P picture to the next; 1: no B-frames",
     .type = Any::Int32},
    {"gopRange",
     Access{nullptr,
            [](C s, Any& v) { v = AnyDict("minM", 1, "maxM", s.codec->maxM, "minN", 1, "maxN", 1000); }}},
};

const Row rateRows[] = {
    {"vbr", &S::vbr, qvParamStored, 0, 4, "", "", "0 constant, 1 variable"},
    {.name = "vBitrate",
     .member = Access{[](S& s, const Any& value) { return setBitrate(s, value, &S::bitrate); },
                      [](C s, Any& v) { v = nominalBits(s); }},
     .flags = qvParamStored,
     .unit = "bit/s",
     .type = Any::Float},
    {.name = "maxVBitrate",
     .member = Access{[](S& s, const Any& value) { return setBitrate(s, value, &S::maxBitrate); },
                      [](C s, Any& v) { v = s.maxBitrate > 0 ? s.maxBitrate : nominalBits(s); }},
     .unit = "bit/s",
     .help = "AV1 ignores it",
     .type = Any::Float},
    {"minVBitrate", &S::minBitrate, qvParamStored, 0, 4e9, "", "bit/s",
     "MPEG-1, 2 and 4 with a maximum; the others ignore it"},
    {"bitrateRange", Access{nullptr, bitrateRange}},
    {"vBitrateRange", Access{nullptr,
                             [](C s, Any& v) {
                                 v = AnyVector(bitrateNumber(s.codec->minBitrate),
                                               bitrateNumber(s.codec->maxBitrate));
                             }}},
    {"estimateSecKb",
     Access{nullptr, [](C s, Any& v) { v = Any(static_cast<float>(nominalBits(s) / 8000)); }}},
    {.name = "timecode",
     .member = Access{setTimecode, [](C s, Any& v) { v = textOf(s.timecode); }},
     .flags = qvParamStored,
     .help = "of the first picture, HH:MM:SS:FF; MPEG-1 and -2 write it into each GOP",
     .type = Any::String},
    {"twoPass", &S::twoPass, qvParamPlain},
    {.name = "firstPass", .member = &S::firstPass, .help = "1: writes statistics into meta, and no stream"},
};

const Row qualityRow = {.name = "crf",
                        .member = Access{setQuality, [](C s, Any& v) { v = s.quality; }},
                        .flags = qvParamStored,
                        .help = "constant quality, lower is better; -1: by bit rate",
                        .type = Any::Float};
const Row presetRow = {.name = "preset",
                       .member = Access{[](S& s, const Any& value) {
                                            return setNamed(s, s.codec->preset, s.codec->presetWords, value,
                                                            s.preset);
                                        },
                                        [](C s, Any& v) { v = textOf(s.preset); }},
                       .flags = qvParamStored,
                       .help = "speed against size, in the library's word",
                       .type = Any::String};
const Row tuneRow = {
    .name = "tune",
    .member = Access{
        [](S& s, const Any& value) { return setNamed(s, s.codec->tune, s.codec->tuneWords, value, s.tune); },
        [](C s, Any& v) { v = textOf(s.tune); }},
    .flags = qvParamStored,
    .help = "kind of pictures, in the library's word",
    .type = Any::String};

std::vector<Row> tableOf(const VideoCodec& codec) {
    std::vector<Row> table(std::begin(commonRows), std::end(commonRows));
    if (codec.has(VideoTrait::groups)) table.insert(table.end(), std::begin(groupRows), std::end(groupRows));
    if (codec.has(VideoTrait::rated)) table.insert(table.end(), std::begin(rateRows), std::end(rateRows));
    if (*codec.quality) table.push_back(qualityRow);
    if (*codec.preset) table.push_back(presetRow);
    if (*codec.tune) table.push_back(tuneRow);
    return table;
}

}  // namespace

VideoSettings::VideoSettings(const VideoCodec& row)
    : codec(&row),
      type(row.forms.front().fourcc),
      quality(*row.quality ? row.defaultQuality : -1),
      n(row.defaultN),
      m(row.defaultM),
      preset(row.defaultPreset),
      codecProfile(row.profile) {}

// Three tables cover all codecs: those with constant quality, those with a bit rate only, and those with
// neither.
std::span<const QvParamRow<VideoSettings>> VideoSettings::rows(const VideoCodec& codec) {
    static const std::vector<Row> quality = tableOf(*videoCodec("h264venc"));
    static const std::vector<Row> rated = tableOf(*videoCodec("mpegvenc"));
    static const std::vector<Row> plain = tableOf(*videoCodec("ffv1venc"));
    return *codec.quality ? quality : codec.has(VideoTrait::rated) ? rated : plain;
}

// VC-3 has interlaced pictures of 1920x1080 in 4:2:2 only.
bool VideoSettings::supportsFields() const {
    if (std::strcmp(codec->module, "vc3venc") != 0) return codec->has(VideoTrait::interlaced);
    return (width == 0 || (width == 1920 && height == 1080)) && type != QvFourcc::b64a;
}

bool VideoSettings::supportsSize() const {
    return std::strcmp(codec->encoder, "h263") != 0 ||
           std::find(std::begin(h263Sizes), std::end(h263Sizes), std::pair(width, height)) !=
               std::end(h263Sizes);
}

void VideoSettings::applyProfile() {
    const PresetVideo* const row = presetVideo(profile, codec->module);
    if (!row) return;
    if (*row->standard) setStandard(*this, Any(row->standard));
    if (row->width > 0) {
        width = row->width;
        height = row->television && !pal ? row->height60 : row->height;
    }
    if (row->rate > 0)
        setRate(*this, Any(QvFramerate(row->television && !pal ? 29.97 : row->rate, row->interlaced)));
    if (row->target > 0) {
        bitrate = row->target;
        maxBitrate = row->most;
        vbr = row->most > row->target ? QvBitrate::vbr : QvBitrate::cbr;
        quality = -1;
    }
    if (row->n > 0) n = row->n;
    if (row->m > 0) m = row->m;
    frameAspect = row->aspect;
    topLines = row->topLines;
    if (row->type) setType(*this, Any(static_cast<int>(row->type)));
    if (*row->codecProfile) codecProfile = row->codecProfile;
    profileOptions = row->options;
}

}  // namespace av
