#include "core/preset/qvformatmatcher.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <optional>
#include <utility>
#include <vector>

#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/status.h"
#include "core/measure/exactmath_p.h"
#include "core/measure/qvnum.h"
#include "core/measure/streamtype.h"
#include "core/preset/qvpreset.h"

namespace {

// Distances that no size, rate or aspect has.
constexpr int farSize = 100000;
constexpr double farRate = 999.0;
constexpr double farAspect = 999.0;
constexpr double sameAspect = 9.999999747378752e-05;  // 1e-4 in single precision
// Maximum of a variable rate to its target, and to the constant rate of the same quality.
constexpr double variableHeadroom = 1.4;
constexpr int shortestGop = 2;
constexpr int defaultBits = 16;

// A stream of the input, the encoder that is fitted to it, and the limits of a preset.
struct Fit {
    const QvDecodePipe& decoder;
    int type;
    int stream;
    QvEncoder& encoder;
    const AnyDict* preset;

    Any source(const char* name) const { return decoder.getStreamParam(type, stream, name); }
    Any offered(const char* name) const { return encoder.getParam(name); }
    Any range(const char* name) const {
        return preset && preset->isSet(name) ? preset->get(name) : encoder.getParam(name);
    }
};

// Every encoder has to have this parameter; without it the property is unchanged.
void logMissing(const Fit& fit, const char* name) {
    qv_dbg()->warning("[Format match] %s does not say its '%s'", fit.encoder.name(), name);
}

double clampTo(double value, double lowest, double highest) {
    return std::max(lowest, std::min(value, highest));
}

int clampTo(int value, int lowest, int highest) { return std::max(lowest, std::min(value, highest)); }

int clampByKeys(int value, const AnyDict& dict, const char* lowest, const char* highest) {
    if (dict.get(highest).isInt()) value = std::min(value, dict.get(highest).toInt32());
    if (dict.get(lowest).isInt()) value = std::max(value, dict.get(lowest).toInt32());
    return value;
}

// --- Size.

// The nearest width, then the nearest height of the sizes whose width is as near. If widths above and below
// the input are equally near, the result may be a pair that is not in the list.
Pair nearestSize(const AnyVector& sizes, const Pair& wanted) {
    std::vector<Pair> near;
    Pair best(farSize, farSize);
    for (const Any& entry : sizes) {
        if (!entry.isDict()) continue;
        const Pair size(entry.asDict().getInt32("w"), entry.asDict().getInt32("h"));
        if (size == wanted) return size;
    }
    const auto away = [](int a, int b) { return std::abs(static_cast<long long>(a) - b); };
    for (const Any& entry : sizes) {
        if (!entry.isDict()) continue;
        const Pair size(entry.asDict().getInt32("w"), entry.asDict().getInt32("h"));
        const long long distance = away(size.first, wanted.first);
        const long long least = away(best.first, wanted.first);
        if (distance > least) continue;
        if (distance < least) {
            near.clear();
            best.first = size.first;
        }
        near.push_back(size);
    }
    for (const Pair& size : near)
        if (away(size.second, wanted.second) < away(best.second, wanted.second)) best.second = size.second;
    return best;
}

std::optional<Pair> matchDimensions(const Fit& fit) {
    const Pair size(fit.source("width").toInt32(), fit.source("height").toInt32());
    const Any range = fit.range("sizeRange");
    if (range.isVector()) return nearestSize(range.asVector(), size);
    if (!range.isDict()) {
        logMissing(fit, "sizeRange");
        return std::nullopt;
    }
    return Pair(clampByKeys(size.first, range.asDict(), "wmin", "wmax"),
                clampByKeys(size.second, range.asDict(), "hmin", "hmax"));
}

// --- Frame rate.

AnyVector nearestRates(const AnyVector& rates, const QvFramerate& wanted) {
    AnyVector near;
    double best = farRate;
    const double rate = wanted.rate().ratio();
    for (const Any& entry : rates) {
        if (!entry.isFramerate()) continue;
        const double offered = entry.asFramerate().rate().ratio();
        const double distance = std::fabs(offered - rate);
        const double least = std::fabs(best - rate);
        if (distance > least) continue;
        if (distance < least) {
            near.clear();
            best = offered;
        }
        near.append(entry);
    }
    return near;
}

AnyVector ofSameScan(const AnyVector& rates, const QvFramerate& wanted) {
    AnyVector same;
    for (const Any& entry : rates)
        if (entry.isFramerate() && (entry.asFramerate().interlaced() != 0) == (wanted.interlaced() != 0))
            same.append(entry);
    return same;
}

QvFramerate doubled(QvFramerate rate) {
    const QvRatio once = rate.rate();
    if (once.num <= std::numeric_limits<int>::max() / 2)
        rate.setRate(QvRatio(once.num * 2, once.den));
    else
        rate.setRate(once.ratio() * 2.0);
    return rate;
}

QvFramerate nearestRate(const AnyVector& rates, const QvFramerate& wanted) {
    const AnyVector near = nearestRates(rates, wanted);
    const AnyVector same = ofSameScan(near, wanted);
    constexpr std::pair<bool, bool> searches[] = {{true, true}, {true, false}, {false, true}};
    for (const auto& [exact, compareDf] : searches)
        if (const int i = wanted.findInVector(same, exact, compareDf); i >= 0)
            return same.at(i).asFramerate();
    // Next best is the double rate, which shows each frame twice.
    const AnyVector scan = ofSameScan(rates, wanted);
    if (const int i = doubled(wanted).findInVector(scan, false, false); i >= 0)
        return scan.at(i).asFramerate();
    if (!same.empty()) return same.at(0).asFramerate();
    return near.empty() ? QvFramerate() : near.at(0).asFramerate();
}

std::optional<QvFramerate> matchFramerate(const Fit& fit) {
    const Any in = fit.source("framerate");
    Any range = fit.range("framerateRange");
    if (!range.isVector() || range.asVector().empty()) range = fit.offered("framerateRange");
    if (!in.isFramerate() || !range.isVector()) {
        logMissing(fit, "framerateRange");
        return std::nullopt;
    }
    const QvFramerate& wanted = in.asFramerate();
    QvFramerate result = nearestRate(range.asVector(), wanted);
    const bool otherOrder =
        result.interlaced() != 0 && wanted.interlaced() != 0 && wanted.interlaced() != result.interlaced();
    if (otherOrder && fit.offered("canChangeDominance").isTrue()) result.setInterlaced(wanted.interlaced());
    return result;
}

// --- Bit rates.

// The "range" of the first entry of a type: 0 constant, 1 variable.
const Any* rangeOfType(const Any& ranges, int type) {
    if (!ranges.isVector()) return nullptr;
    for (const Any& entry : ranges.asVector())
        if (entry.isDict() && entry.asDict().get("type") == Any(type)) return &entry.asDict().get("range");
    return nullptr;
}

std::optional<Pair> boundsOfType(const Any& ranges, int type) {
    const Any* range = rangeOfType(ranges, type);
    if (!range) return std::nullopt;
    if (range->isPair()) return range->asPair();
    const bool two = range->isVector() && range->asVector().size() == 2 && range->asVector().at(0).isInt() &&
                     range->asVector().at(1).isInt();
    if (!two) return std::nullopt;
    return Pair(range->asVector().at(0).toInt32(), range->asVector().at(1).toInt32());
}

QvBitrate variableRate(double target, double most) {
    return QvBitrate(QvBitrate::vbr, qvmath::truncTo<int>(target), 0, qvmath::truncTo<int>(most));
}

QvBitrate matchVideoBitrate(const Fit& fit) {
    const Any source = fit.source("vBitrate");
    if (!source.isFloat() || source.asDouble() == 0.0 || std::isnan(source.asDouble())) return QvBitrate();
    const double rate = source.asDouble();
    const Any ranges = fit.range("bitrateRange");
    const auto constant = boundsOfType(ranges, 0);
    const auto variable = boundsOfType(ranges, 1);
    const auto into = [](double value, const Pair& bounds) {
        return clampTo(value, static_cast<double>(bounds.first), static_cast<double>(bounds.second));
    };
    if (fit.source("vbr").isTrue()) {
        if (variable) {
            const double most = into(rate, *variable);
            return variableRate(into(most / variableHeadroom, *variable), most);
        }
        if (!constant) return QvBitrate();
        return QvBitrate(QvBitrate::cbr, qvmath::truncTo<int>(into(rate / variableHeadroom, *constant)));
    }
    if (constant) return QvBitrate(QvBitrate::cbr, qvmath::truncTo<int>(into(rate, *constant)));
    if (!variable) return QvBitrate();
    const double target = into(rate, *variable);
    return variableRate(target, into(target * variableHeadroom, *variable));
}

// --- The shape of the picture.

double ratioOf(const Any& width, const Any& height) {
    return height.toInt32() == 0 ? 0.0 : static_cast<double>(width.toInt32()) / height.toInt32();
}

std::optional<double> matchFrameAspect(const Fit& fit) {
    const double aspect = fit.source("frameAspect").toDouble();
    const double own = ratioOf(fit.offered("width"), fit.offered("height"));
    const Any range = fit.range("aspectRange");
    if (range.isDict()) {
        const AnyDict& bounds = range.asDict();
        const double clamped =
            clampTo(aspect, bounds.getDouble("min", aspect), bounds.getDouble("max", aspect));
        const double square = ratioOf(fit.source("width"), fit.source("height"));
        const bool squarePixels =
            QvNum::equ(clamped, square, sameAspect) && QvNum::equ(own, square, sameAspect);
        return squarePixels ? 0.0 : clamped;
    }
    if (!range.isVector() || range.asVector().empty()) {
        logMissing(fit, "aspectRange");
        return std::nullopt;
    }
    double best = farAspect, result = farAspect;
    for (const Any& entry : range.asVector()) {
        if (!entry.isFloat() && !entry.isInt()) continue;
        const double listed = entry.toDouble();
        const double compared = listed == 0.0 ? own : listed;
        if (std::fabs(compared - aspect) > std::fabs(best - aspect)) continue;
        best = compared;
        result = listed;
    }
    return result;
}

// --- Groups of pictures.

// (N, M): pictures in a group, and from one anchor picture to the next.
std::optional<Pair> matchGop(const Fit& fit) {
    const Any n = fit.source("N");
    const Any m = fit.source("M");
    if (!n.isInt() || !m.isInt() || m.toInt32() < 1) return std::nullopt;
    const int length = n.toInt32();
    const int anchor = m.toInt32();
    const Any codec = fit.source("codec");
    const Any range = fit.offered("gopRange");
    if (length < shortestGop || anchor > length || !range.isDict()) return std::nullopt;
    if (!qvModuleTraits(fit.encoder).matchesGop || (codec != "MPEG-2" && codec != "MPEG-1"))
        return std::nullopt;
    const AnyDict& bounds = range.asDict();
    const int distance = std::max(1, clampByKeys(anchor, bounds, "minM", "maxM"));
    int predicted = length / anchor - 1;
    if (bounds.get("minP").isInt() && bounds.get("maxP").isInt())
        predicted = clampTo(predicted, bounds.get("minP").toInt32(), bounds.get("maxP").toInt32());
    else if (bounds.get("minN").isInt() && bounds.get("maxN").isInt())
        predicted = clampTo(predicted, bounds.get("minN").toInt32() / distance - 1,
                            bounds.get("maxN").toInt32() / distance - 1);
    return Pair(qvmath::wrapMul(qvmath::wrapAdd(predicted, 1), distance), distance);
}

// --- Sound.

std::optional<int> nearestInt(const AnyVector& list, int wanted) {
    std::optional<int> best;
    const auto away = [wanted](int value) { return std::abs(static_cast<long long>(value) - wanted); };
    for (const Any& entry : list) {
        if (!entry.isInt()) continue;
        const int value = entry.toInt32();
        if (!best || away(value) < away(*best)) best = value;
    }
    return best;
}

std::optional<int> matchInt(const Fit& fit, const char* name, const char* rangeName) {
    const Any range = fit.offered(rangeName);
    const auto nearest =
        range.isVector() ? nearestInt(range.asVector(), fit.source(name).toInt32()) : std::nullopt;
    if (!nearest) logMissing(fit, rangeName);
    return nearest;
}

int matchQuantization(const Fit& fit) {
    const Any range = fit.offered("bitsPerSampleRange");
    if (!range.isVector()) return defaultBits;
    return nearestInt(range.asVector(), fit.source("bitsPerSample").toInt32()).value_or(defaultBits);
}

QvBitrate matchAudioBitrate(const Fit& fit) {
    const Any source = fit.source("aBitrate");
    if (!source.isInt() && !source.isFloat()) return QvBitrate();
    const int wanted = qvmath::truncTo<int>(source.toDouble() * 1000.0);
    const Any ranges = fit.offered("bitrateRange");
    const Any* range = rangeOfType(ranges, 0);
    const auto nearest = range && range->isVector() ? nearestInt(range->asVector(), wanted) : std::nullopt;
    return nearest ? QvBitrate(QvBitrate::cbr, *nearest) : QvBitrate();
}

// --- What is set.

void setFramerate(const Fit& fit, bool again) {
    const auto rate = matchFramerate(fit);
    if (!rate) return;
    const Any text = rate->desc(true, true);
    qv_dbg()->info(again ? "(re)setting framerate to %s" : "setting framerate to %s", text.asString());
    fit.encoder.setParam("framerate", *rate);
}

void fitVideo(int properties, const Fit& fit) {
    using Matcher = QvFormatMatcher;
    QvEncoder& encoder = fit.encoder;
    if (properties & Matcher::framerate) setFramerate(fit, false);
    if (properties & Matcher::dimensions) {
        if (const auto size = matchDimensions(fit)) {
            qv_dbg()->info("setting dimensions to %dx%d", size->first, size->second);
            encoder.setParam("width", size->first);
            encoder.setParam("height", size->second);
        }
    }
    // The rates of an encoder may depend on the size.
    if (properties & Matcher::framerate) setFramerate(fit, true);
    if (properties & Matcher::frameAspect) {
        if (const auto aspect = matchFrameAspect(fit)) {
            qv_dbg()->info("setting aspect to %f", *aspect);
            encoder.setParam("frameAspect", *aspect);
        }
    }
    if (properties & Matcher::videoBitrate) {
        const QvBitrate rate = matchVideoBitrate(fit);
        if (rate.target != 0) {
            qv_dbg()->info("setting bitrate to %s", rate.desc().asString());
            encoder.setParam("bitrate", rate);
        }
    }
    if (properties & Matcher::gop) {
        const auto gop = matchGop(fit);
        if (gop && gop->first >= shortestGop) {
            qv_dbg()->info("matching GOP size to N:%d, M:%d", gop->first, gop->second);
            encoder.setParam("N", gop->first);
            encoder.setParam("M", gop->second);
        }
    }
}

// "pal" of the stream; a source that does not say has the rate to go by.
int palOf(const QvDecodePipe& decoder, int stream) {
    const Any pal = decoder.getVideoParam(stream, "pal");
    if (pal.isValid()) return pal.isTrue() ? 1 : 0;
    const Any rate = decoder.getVideoParam(stream, "framerate");
    return rate.isFramerate() && rate.asFramerate().isPAL() ? 1 : 0;
}

void setType(const QvDecodePipe& decoder, int stream, QvCodec& target) {
    const int pal = palOf(decoder, stream);
    qv_dbg()->info("setting type to %s", pal ? "PAL" : "NTSC");
    target.setParam("pal", pal);
}

}  // namespace

QvFormatMatcher::QvFormatMatcher(int properties, int second, const QvPreset* preset)
    : properties_(properties), second_(second), presetMeta_(nullptr) {
    if (preset && preset->get("PresetMeta").isDict()) presetMeta_ = &preset->get("PresetMeta").asDict();
}

int QvFormatMatcher::matchFile(const QvDecodePipe* decoder, QvEncodePipe* encoder) const {
    const int videos = decoder->nrVideoStreams();
    const int audios = decoder->nrAudioStreams();
    if ((properties_ & type) && videos > 0) setType(*decoder, 0, *encoder);
    for (int k = 0; videos > 0 && k < encoder->nrVideoStreams(); ++k) {
        const int from = k < videos ? k : 0;
        qv_dbg()->info("[Video format match %d to %d]", from, k);
        if (auto* target = encoder->videoEncoder(k))
            fitVideo(properties_, {*decoder, qvVideoStream, from, *target, presetMeta_});
    }
    for (int k = 0; audios > 0 && k < encoder->nrAudioStreams(); ++k) {
        const int from = k < audios ? k : 0;
        qv_dbg()->info("[Audio format match %d to %d]", from, k);
        if (auto* target = encoder->audioEncoder(k)) matchAudio(decoder, from, target);
    }
    return QvStatus::ok;
}

int QvFormatMatcher::matchVideo(const QvDecodePipe* decoder, int stream, QvVideoEncoder* encoder) const {
    qv_dbg()->info("[Video format match]");
    if (properties_ & type) setType(*decoder, stream, *encoder);
    fitVideo(properties_, {*decoder, qvVideoStream, stream, *encoder, presetMeta_});
    return QvStatus::ok;
}

int QvFormatMatcher::matchAudio(const QvDecodePipe* decoder, int stream, QvAudioEncoder* encoder) const {
    qv_dbg()->info("[Audio format match]");
    const Fit fit{*decoder, qvAudioStream, stream, *encoder, presetMeta_};
    if (properties_ & channels) {
        if (const auto count = matchInt(fit, "channels", "channelsRange")) {
            qv_dbg()->info("setting nr channels to %d", *count);
            encoder->setParam("channels", *count);
        }
    }
    if (properties_ & samplerate) {
        if (const auto rate = matchInt(fit, "samplerate", "samplerateRange")) {
            qv_dbg()->info("setting samplerate to %dHz", *rate);
            encoder->setParam("samplerate", *rate);
        }
    }
    if (properties_ & audioBitrate) {
        const QvBitrate rate = matchAudioBitrate(fit);
        if (rate.target != 0) {
            qv_dbg()->info("setting audio bitrate to %s", rate.desc().asString());
            encoder->setParam("bitrate", rate);
        }
    }
    if (properties_ & bitsPerSample) {
        const int bits = matchQuantization(fit);
        qv_dbg()->info("setting audio bits per sample to %d", bits);
        try {
            encoder->setParam("bitsPerSample", bits);
        } catch (const QvParamException&) {
            // An encoder of one width does not know the parameter.
        }
    }
    return QvStatus::ok;
}
