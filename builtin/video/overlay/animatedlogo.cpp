#include "builtin/video/overlay/animatedlogo.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <string_view>

#include "builtin/creators.h"
#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = AnimatedLogoSettings;

constexpr int mostOffset = 1 << 20;
constexpr int videoFilterInterface = 12;
constexpr int leastSide = 4;

// A whole number as such, anything else as text.
Any valueOf(std::string_view text) {
    int number = 0;
    const auto [rest, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error == std::errc() && rest == text.data() + text.size()) return number;
    return std::string(text).c_str();
}

// "FOURCC=BGRA;width=64" as a dictionary. False: it is not of that form.
bool parse(std::string_view text, AnyDict& dict) {
    while (!text.empty()) {
        const std::string_view pair = text.substr(0, text.find(';'));
        text.remove_prefix(std::min(pair.size() + 1, text.size()));
        const size_t equals = pair.find('=');
        if (equals == 0 || equals == std::string_view::npos || equals > AnyDict::maxKeyLength) return false;
        dict.set(std::string(pair.substr(0, equals)).c_str(), valueOf(pair.substr(equals + 1)));
    }
    return true;
}

int setDecoderParams(Settings& settings, const Any& value) {
    AnyDict params;
    std::string text;
    if (value.isDict())
        params = value.asDict();
    else if (!value.isText() || !qvparam::convert(value, text) || !parse(text, params))
        return QvStatus::invalidParam;
    settings.decoderParams = params;
    return QvStatus::ok;
}

void getDecoderParams(const Settings& settings, Any& value) { value = settings.decoderParams; }

constexpr QvParamRow<Settings> rows[] = {
    {.name = "filename",
     .member = &Settings::filename,
     .flags = qvParamStored,
     .description = "Movie with logo"},
    {.name = "decoder",
     .member = &Settings::decoder,
     .flags = qvParamStored,
     .help = "module that opens the movie; empty: by its extension"},
    {.name = "decoderParams",
     .member = QvParamAccess<Settings>{setDecoderParams, getDecoderParams},
     .flags = qvParamStored,
     .help = "parameters of that module, key=value;key=value"},
    {"xpos", &Settings::x, qvParamStored, -mostOffset, mostOffset, "x offset (negative for right alignment)",
     "pixels"},
    {"ypos", &Settings::y, qvParamStored, -mostOffset, mostOffset, "y offset (negative for bottom alignment)",
     "pixels"},
    {"alpha", &Settings::alpha, qvParamStored, 0, 1, "Logo opacity"},
    {"scale", &Settings::scale, qvParamStored, 1, 1000, "Logo scale in %", "%"},
    {.name = "loop", .member = &Settings::loop, .flags = qvParamStored, .description = "Loop logo on finish"},
};
static_assert(qvParamTableOk<Settings>(rows));

QvVideoFilter* filterOf(QvCodec* codec) {
    return codec ? static_cast<QvVideoFilter*>(codec->getInterface(videoFilterInterface)) : nullptr;
}

bool hasAlpha(unsigned fourcc) {
    return fourcc == QvFourcc::BGRA || fourcc == QvFourcc::ARGB || fourcc == QvFourcc::b64a;
}

// So that scaling takes nothing from the colours of transparent pixels.
void multiplyByAlpha(QvFrame& frame) {
    for (int y = 0; y < frame.height(); ++y) {
        unsigned char* pixel = frame.pixelPtr(0, y);
        for (int x = 0; x < frame.width(); ++x, pixel += 4)
            for (int k = 0; k < 3; ++k)
                pixel[k] = static_cast<unsigned char>((pixel[k] * pixel[3] + 127) / 255);
    }
}

void makeOpaque(QvFrame& frame) {
    for (int y = 0; y < frame.height(); ++y) {
        unsigned char* pixel = frame.pixelPtr(0, y);
        for (int x = 0; x < frame.width(); ++x, pixel += 4) pixel[3] = 255;
    }
}

}  // namespace

QvCodec* newAnimatedlogo() { return new AnimatedLogo; }

AnimatedLogo::AnimatedLogo() : InPlaceEffectOf("animated logo", rows) {}

AnimatedLogo::~AnimatedLogo() = default;

int AnimatedLogo::open() {
    picture_ = nullptr;
    ended_ = false;
    if (const int result = openMovie()) return result;
    if (const int result = openScaler()) return result;
    return InPlaceEffectOf::open();
}

int AnimatedLogo::openMovie() {
    const char* name = settings_.filename.c_str();
    if (settings_.filename.empty()) return setError(QvStatus::failed, "'filename' names no movie");
    const std::string& decoder = settings_.decoder;
    if (!settings_.decoderParams.empty()) {
        Any error;
        movie_.reset(QvDecFactory::decodePipeWith(Any(name), settings_.decoderParams, &error,
                                                  decoder.empty() ? nullptr : decoder.c_str()));
        if (!movie_)
            return setError(QvStatus::failed, "The logo movie %s can't be opened: %s", name,
                            error.asString(""));
    } else if (decoder.empty())
        movie_.reset(QvDecFactory::decodePipe(Any(name)));
    else if (qv_registry()->module(decoder.c_str()))
        movie_.reset(QvDecFactory::decodePipeUsing(Any(name), AnyVector(Any(decoder.c_str()))));
    if (!movie_)
        return setError(QvStatus::failed, "No decoder%s%s opens the logo movie %s",
                        decoder.empty() ? "" : " ", decoder.c_str(), name);
    if (movie_->nrStreams(qvVideoStream) == 0) {
        qv_dbg()->error("[animated logo] no video streams in file %s", name);
        return setError(QvStatus::failed, "The logo movie %s has no picture", name);
    }
    movie_->select(qvVideoStream, 0);
    return QvStatus::ok;
}

int AnimatedLogo::openScaler() {
    const auto scaled = [&](const char* side) {
        const double size = movie_->QvCodec::getParam(side).asInt32(0) * settings_.scale / 100;
        return static_cast<int>(std::lround(std::clamp<double>(size, leastSide, mostOffset)));
    };
    width_ = scaled("video0/width");
    height_ = scaled("video0/height");
    alpha_ = hasAlpha(static_cast<unsigned>(movie_->QvCodec::getParam("video0/FOURCC").asInt32(0)));
    scaler_.reset(qv_registry()->newCodec("scaler"));
    if (!filterOf(scaler_.get())) return setError(QvStatus::failed, "there is no scaler");
    scaler_->setParam("outWidth", width_);
    scaler_->setParam("outHeight", height_);
    scaler_->setParam("FOURCC", "BGRA");
    scaler_->setParam("disableLog", 1);
    if (scaler_->open() == QvStatus::ok) return QvStatus::ok;
    return setError(QvStatus::failed, "The logo can't be scaled to %dx%d: %s", width_, height_,
                    scaler_->errorDesc());
}

int AnimatedLogo::close() {
    if (movie_) movie_->close();
    movie_.reset();
    scaler_.reset();
    toBgra_.reset();
    multiplied_.destroy();
    picture_ = nullptr;
    overlay_.clear();
    return InPlaceEffectOf::close();
}

// False: the movie has no further frame.
bool AnimatedLogo::readNext() {
    int result = movie_->readFrame(0);
    if (result == QvStatus::endOfStream && settings_.loop && picture_) {
        result = movie_->seekToFrame(0, 0);
        if (result == QvStatus::ok) result = movie_->readFrame(0);
    }
    if (result != QvStatus::ok && result != QvStatus::endOfStream)
        qv_log()->warning("The logo movie %s can't be read on: %s", settings_.filename.c_str(),
                          movie_->errorDesc());
    return result == QvStatus::ok && movie_->getFramePtr(0);
}

// Of a movie with alpha the colours are multiplied by it before they are scaled.
int AnimatedLogo::takePicture() {
    QvFrame* in = movie_->getFramePtr(0);
    if (alpha_) {
        if (!toBgra_) toBgra_ = std::make_unique<QvColorConverter>(QvFourcc::BGRA, false, false);
        if (in->four_cc() == QvFourcc::BGRA)
            multiplied_ = *in;
        else if (const int result = toBgra_->convert(*in, multiplied_))
            return setError(result, "The logo can't be converted from %s", in->str_four_cc());
        multiplyByAlpha(multiplied_);
        in = &multiplied_;
    }
    if (alpha_ && in->width() == width_ && in->height() == height_) {
        picture_ = in;
        return QvStatus::ok;
    }
    QvVideoFilter& scaler = *filterOf(scaler_.get());
    if (scaler.write(*in) != QvStatus::ok || scaler.ready() == 0)
        return setError(QvStatus::failed, "The logo can't be scaled: %s", scaler.errorDesc());
    if (!alpha_) makeOpaque(*scaler.frame());
    picture_ = scaler.frame();
    return QvStatus::ok;
}

int AnimatedLogo::change(const QvFrame& from, QvFrame& to) {
    copySamples(to, from);
    const bool fresh = !ended_ && readNext();
    if (!fresh) ended_ = true;
    if (fresh)
        if (const int result = takePicture()) return result;
    if (!picture_) return QvStatus::ok;
    if (fresh || !overlay_.suits(to)) {
        const QvPoint corner = qvOverlayCorner(settings_.x, settings_.y, width_, height_, to);
        if (const int result = overlay_.prepare(*picture_, PictureOverlay::Alpha::premultiplied, corner,
                                                settings_.alpha, to))
            return setError(result, "%s", overlay_.error());
    }
    overlay_.draw(to);
    return QvStatus::ok;
}
