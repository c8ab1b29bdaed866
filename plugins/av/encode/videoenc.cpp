#include "plugins/av/encode/videoenc.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <iterator>

#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/fourcc.h"
#include "core/media/qvframe.h"
#include "plugins/av/encode/libraryoptions.h"

namespace av {

namespace {

constexpr int hdLines = 720;  // from here on a picture of unknown matrix counts as BT.709
constexpr int longestPixel = 255;

std::span<const std::uint8_t> bytesOf(const AVPacket& packet) {
    return {packet.data, static_cast<std::size_t>(packet.size)};
}

bool is(const VideoCodec& codec, const char* module) { return std::strcmp(codec.module, module) == 0; }

struct ProresKind {
    unsigned fourcc;  // of the units
    unsigned tag;     // the library's
};
// In the order of the profile numbers.
constexpr ProresKind proresKinds[] = {
    {qvFourcc("APCO"), qvFourcc("apco")}, {qvFourcc("APCS"), qvFourcc("apcs")},
    {qvFourcc("APCN"), qvFourcc("apcn")}, {qvFourcc("APCH"), qvFourcc("apch")},
    {qvFourcc("AP4H"), qvFourcc("ap4h")}, {qvFourcc("AP4X"), qvFourcc("ap4x")}};

// The library states the kind of ProRes by its tag alone.
int profileOf(const AVCodecContext& context, const VideoCodec& codec) {
    if (!is(codec, "proresvenc")) return context.profile;
    const auto* const kind =
        std::find_if(std::begin(proresKinds), std::end(proresKinds),
                     [&](const ProresKind& row) { return row.tag == context.codec_tag; });
    return kind != std::end(proresKinds) ? static_cast<int>(kind - std::begin(proresKinds)) : -1;
}

unsigned fourccOf(const AVCodecContext& context, const VideoCodec& codec) {
    const int profile = profileOf(context, codec);
    return is(codec, "proresvenc") && profile >= 0 ? proresKinds[profile].fourcc : codec.fourcc;
}

}  // namespace

VideoEnc::~VideoEnc() { release(); }

int VideoEnc::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "settings") == 0) {
        _traceParam(name, value);
        return value.isDict() ? setParamDict(value.asDict()) : QvStatus::invalidParam;
    }
    const auto rows = VideoSettings::rows(*settings_.codec);
    if (std::strcmp(name, "avOptions") == 0 && value.isText()) {
        const AVCodec* const library = settings_.codec->library();
        const std::string why = library ? checkOptions(*library, value.toString().asString("")) : "";
        if (!why.empty()) return setError(QvStatus::invalidParam, "avOptions: %s", why.c_str());
    }
    if (auto result = _setRow<VideoSettings>(rows, settings_, name, value)) return *result;
    return QvVideoEncoder::setParam(name, value);
}

void VideoEnc::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow<VideoSettings>(VideoSettings::rows(*settings_.codec), settings_, name, value))
        QvVideoEncoder::getParam(name, value);
}

void VideoEnc::store(AnyDict& state) const {
    AnyDict settings;
    qvStoreParamRows<VideoSettings>(VideoSettings::rows(*settings_.codec), settings_, settings);
    if (settings_.maxBitrate > 0) settings.set("maxVBitrate", settings_.maxBitrate);
    state = AnyDict("name", name(), "settingsDict", settings);
}

int VideoEnc::restore(const AnyDict& state) {
    if (state.get("name") != name()) return setError(QvStatus::failed, "restore - invalid name");
    const Any& settings = state.get("settingsDict");
    if (!settings.isDict()) return QvStatus::ok;
    const int result =
        _restoreRows<VideoSettings>(VideoSettings::rows(*settings_.codec), settings_, settings.asDict());
    const Any& most = settings.asDict().get("maxVBitrate");
    if (most.isValid() && settings_.codec->has(VideoTrait::rated)) setParam("maxVBitrate", most);
    return result;
}

int VideoEnc::fail(const std::string& why) {
    release();
    return setError(QvStatus::failed, "%s", why.c_str());
}

void VideoEnc::release() {
    context_.reset();
    packet_.reset();
    input_.close();
    captions_.reset();
    files_.remove();
    statistics_.clear();
    sets_.clear();
}

int VideoEnc::open() {
    if (getState() == qvStateOpen) return setError(QvStatus::failed, "Already open");
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Not initialized");
    if (!outStream()) return setError(QvStatus::failed, "Output stream not attached");
    const std::string why = prepare();
    if (!why.empty()) return fail(why);
    output_ = UnitWriter(*outStream());
    if (!settings_.firstPass && !sendHead()) return fail(output_.problem());
    frames_ = units_ = 0;
    setState(qvStateOpen);
    return QvStatus::ok;
}

// In DV of 25 Mbit/s the sampling of the chroma follows from the height and the profile.
AVPixelFormat VideoEnc::layout() const {
    const VideoForm& form = *settings_.codec->form(settings_.type);
    if (!is(*settings_.codec, "dvvenc") || settings_.codecProfile == "50" || settings_.codecProfile == "100")
        return form.layout;
    if (settings_.height == 480 || settings_.codecProfile == "dvcpro25") return AV_PIX_FMT_YUV411P;
    return AV_PIX_FMT_YUV420P;
}

// What is wrong with them; "" if nothing is.
std::string VideoEnc::checkSettings() const {
    const VideoSettings& s = settings_;
    const VideoCodec& codec = *s.codec;
    if (s.width < 1 || s.height < 1) return "No size of the picture is set";
    if (!s.hasRate) return "No frame rate is set";
    const int least = std::min(codec.minSide, 16);
    if (std::max(s.width, s.height) > codec.maxSide || std::min(s.width, s.height) < least ||
        s.width % codec.sideStep != 0 || s.height % codec.sideStep != 0)
        return "Sides of pictures are " + std::to_string(least) + " to " + std::to_string(codec.maxSide) +
               " pixels" + (codec.sideStep > 1 ? ", multiples of " + std::to_string(codec.sideStep) : "") +
               ", not " + std::to_string(s.width) + "x" + std::to_string(s.height);
    if (!s.supportsSize())
        return "H.263 has pictures of 128x96, 176x144, 352x288, 704x576 and 1408x1152, not of " +
               std::to_string(s.width) + "x" + std::to_string(s.height);
    if (s.isInterlaced() && !s.supportsFields())
        return "The codec takes two fields a picture in 4:2:2 of 1920x1080 only";
    if (s.twoPass && !s.passRecord) return "There are no statistics of a first pass";
    return "";
}

std::string VideoEnc::prepare() {
    const VideoSettings& s = settings_;
    const VideoCodec& codec = *s.codec;
    const AVCodec* const library = codec.library();
    if (!library) return std::string("The installed library has no encoder ") + codec.encoder;
    if (std::string fault = checkSettings(); !fault.empty()) return fault;
    context_.reset(avcodec_alloc_context3(library));
    packet_.reset(av_packet_alloc());
    if (!context_ || !packet_) return "Out of memory";
    std::string problem = configure(layout());
    if (problem.empty()) problem = describeCodec();
    configureGroups();
    if (problem.empty()) problem = configureRate();
    if (problem.empty()) problem = setOptions(*context_, s.profileOptions);
    if (problem.empty()) problem = setOptions(*context_, s.options);
    if (problem.empty()) problem = configurePass();
    if (!problem.empty()) return problem;
    const int opened = avcodec_open2(context_.get(), library, nullptr);
    if (opened < 0) return refusal(opened);
    if (!input_.open(s.type, context_->pix_fmt, s.width, s.height, context_->colorspace,
                     codec.has(VideoTrait::borrows)))
        return "Frames of this form can not be converted";
    if (codec.has(VideoTrait::setsFirst) && context_->extradata_size > 0)
        sets_.assign(context_->extradata, context_->extradata + context_->extradata_size);
    return "";
}

// The library's own reason is in the log.
std::string VideoEnc::refusal(int code) const {
    if (code == AVERROR(ENOMEM)) return "Out of memory";
    const VideoSettings& s = settings_;
    const auto part = [](const char* name, const std::string& value) {
        return value.empty() ? "" : std::string(", ") + name + " '" + value + "'";
    };
    return "The encoder does not take these settings: " + std::to_string(s.width) + "x" +
           std::to_string(s.height) + " " + qvFourccText(s.type).data() + ", " +
           s.rate.desc(false, false).asString("") + part("profile", s.codecProfile) +
           part("preset", s.preset) + part("tune", s.tune) + part("options", s.options);
}

std::string VideoEnc::configure(AVPixelFormat layout) {
    const VideoSettings& s = settings_;
    AVCodecContext& c = *context_;
    c.width = s.width;
    c.height = s.height;
    c.pix_fmt = layout;
    c.time_base = {static_cast<int>(s.rate.rate().den), static_cast<int>(s.rate.rate().num)};
    c.framerate = {c.time_base.den, c.time_base.num};
    c.sample_aspect_ratio = {1, 1};
    if (s.frameAspect > 0) c.sample_aspect_ratio = av_d2q(s.frameAspect * s.height / s.width, longestPixel);
    // DNxHR in 4:4:4 is always labelled BT.709, so RGB is converted with that matrix.
    const bool dnxRgb = is(*s.codec, "vc3venc") && s.type == QvFourcc::b64a;
    const bool hd = s.matrix == 2 || (s.matrix == 0 && (s.height >= hdLines || dnxRgb));
    const bool film = s.height == 480 || s.height == 512;
    c.color_range = AVCOL_RANGE_MPEG;
    c.color_primaries = hd ? AVCOL_PRI_BT709 : film ? AVCOL_PRI_SMPTE170M : AVCOL_PRI_BT470BG;
    c.color_trc = hd ? AVCOL_TRC_BT709 : AVCOL_TRC_SMPTE170M;
    c.colorspace = hd ? AVCOL_SPC_BT709 : film ? AVCOL_SPC_SMPTE170M : AVCOL_SPC_BT470BG;
    if (s.primaries > 0) c.color_primaries = static_cast<AVColorPrimaries>(s.primaries);
    if (s.transfer > 0) c.color_trc = static_cast<AVColorTransferCharacteristic>(s.transfer);
    if (s.space > 0) c.colorspace = static_cast<AVColorSpace>(s.space);
    if ((av_pix_fmt_desc_get(layout)->flags & AV_PIX_FMT_FLAG_RGB) != 0) {
        c.colorspace = AVCOL_SPC_RGB;
        c.color_range = AVCOL_RANGE_JPEG;
    }
    c.field_order = AV_FIELD_PROGRESSIVE;
    if (s.rate.interlaced() != 0) {
        c.field_order = s.rate.isTopFirst() ? AV_FIELD_TT : AV_FIELD_BB;
        c.flags |= AV_CODEC_FLAG_INTERLACED_DCT | AV_CODEC_FLAG_INTERLACED_ME;
    }
    if (s.codec->has(VideoTrait::setsFirst) || is(*s.codec, "ffv1venc") || is(*s.codec, "av1venc"))
        c.flags |= AV_CODEC_FLAG_GLOBAL_HEADER;
    // The H.265 library takes this number as pictures at a time, up to 16. Its threads are a pool of their
    // own, see configurePass.
    c.thread_count = is(*s.codec, "h265venc") ? 0 : s.threads;
    c.strict_std_compliance = FF_COMPLIANCE_UNOFFICIAL;
    return setOptions(c, s.codec->options);
}

// Profile, preset and tune.
std::string VideoEnc::describeCodec() {
    const VideoSettings& s = settings_;
    AVCodecContext& c = *context_;
    const auto set = [&c](const char* name, const std::string& value) {
        return value.empty() || !*name || setOption(c, name, value);
    };
    if (!set(s.codec->preset, s.preset)) return "There is no preset '" + s.preset + "'";
    if (!set(s.codec->tune, s.tune)) return "There is no tune '" + s.tune + "'";
    if (is(*s.codec, "dvvenc") || is(*s.codec, "dv100venc")) return "";
    const VideoForm& form = *s.codec->form(s.type);
    std::string profile = s.isInterlaced() && is(*s.codec, "vc3venc") ? "dnxhd"
                          : form.profile                              ? form.profile
                                                                      : s.codecProfile;
    // Checked here because the library reports an unfit profile on the standard error only.
    if (is(*s.codec, "h264venc")) {
        const bool lossless =
            s.byQuality() && s.quality < 1 && s.type != QvFourcc::W016 && s.type != QvFourcc::Y216;
        if (lossless && form.profile) profile = "high444";
        if (lossless && !profile.empty() && profile != "high444")
            return "The profile '" + profile + "' has no lossless pictures, which crf " +
                   std::to_string(s.quality) + " asks for";
        if (profile == "baseline" && s.isInterlaced())
            return "The profile 'baseline' has no interlaced pictures";
    }
    if (!set("profile", profile)) return "There is no profile '" + profile + "'";
    return "";
}

// Groups of pictures, and the timecode in their headers.
void VideoEnc::configureGroups() {
    const VideoSettings& s = settings_;
    AVCodecContext& c = *context_;
    if (s.codec->has(VideoTrait::groups)) {
        c.gop_size = s.n;
        c.max_b_frames = s.codec->has(VideoTrait::reorders) ? std::min(s.m, s.n) - 1 : 0;
        if (c.gop_size == 1)
            c.gop_size = s.codec->has(VideoTrait::setsFirst) && s.codec->has(VideoTrait::statsFile) ? 1 : 0;
        if (s.n > 1 && s.codec->has(VideoTrait::statsText)) c.flags |= AV_CODEC_FLAG_CLOSED_GOP;
        if (s.m > 1 && is(*s.codec, "h264venc")) setOption(c, "forced-idr", "1");
    }
    if (!s.timecode.empty() && is(*s.codec, "mpegvenc")) {
        std::string timecode = s.timecode;
        // The library takes drop-frame timecodes at 30000/1001 only.
        if (c.framerate.num != 30000) std::replace(timecode.begin(), timecode.end(), ';', ':');
        setOption(c, "gop_timecode", timecode);
    }
}

std::string VideoEnc::configureRate() {
    const VideoSettings& s = settings_;
    AVCodecContext& c = *context_;
    // The bit rate selects the DNxHD profile: here the one of the highest quality.
    if (s.isInterlaced() && is(*s.codec, "vc3venc")) c.bit_rate = s.rate.rate().ratio() > 26 ? 220e6 : 185e6;
    if (!s.codec->has(VideoTrait::rated)) return "";
    if (s.byQuality()) {
        setOption(c, s.codec->quality, std::to_string(s.quality));
        return "";
    }
    const double target = s.bitrate > 0 ? s.bitrate : s.codec->defaultBitrate;
    if (!(target > 0)) return "Neither a quality nor a bit rate is set";
    c.bit_rate = static_cast<std::int64_t>(target);
    limitRate(target);
    return "";
}

// The highest and lowest bit rate, and the buffer in which they hold.
void VideoEnc::limitRate(double target) {
    const VideoSettings& s = settings_;
    AVCodecContext& c = *context_;
    const bool constant = s.vbr == QvBitrate::cbr;
    const double most = constant ? target : s.maxBitrate > target ? s.maxBitrate : 0;
    const bool av1 = is(*s.codec, "av1venc");
    if (av1 && !constant && most > 0)
        qv_log()->warning("%s has no highest bit rate; only the average of %lld kbit/s is kept", name(),
                          static_cast<long long>(c.bit_rate / 1000));
    if (most > 0 && (constant || !av1)) {
        c.rc_max_rate = static_cast<std::int64_t>(most);
        // VBV sizes of MPEG-2 at main and high level; for the others the bits of one second.
        const bool mpeg = is(*s.codec, "mpegvenc");
        const double buffer = !mpeg ? most : most <= 15e6 ? 1835008 : 9781248;
        c.rc_buffer_size = static_cast<int>(std::min(buffer, 2e9));
    }
    if (constant && (av1 || is(*s.codec, "mpegvenc"))) c.rc_min_rate = c.rc_max_rate;
    // The others never pad to a lowest bit rate.
    const bool fills = is(*s.codec, "mpegvenc") || is(*s.codec, "mpeg4venc");
    if (!constant && fills && most > 0)
        c.rc_min_rate = static_cast<std::int64_t>(std::min(s.minBitrate, target));
}

std::string VideoEnc::configurePass() {
    const VideoSettings& s = settings_;
    AVCodecContext& c = *context_;
    const bool x265 = is(*s.codec, "h265venc");
    std::string own = x265 ? "log-level=none:open-gop=0" : "";
    // Without these its pool has one thread per core, and more pictures at a time with more cores.
    if (x265 && s.threads > 0) {
        const int pictures = s.threads >= 16 ? 4 : s.threads >= 8 ? 3 : s.threads >= 4 ? 2 : 1;
        own += ":pools=" + std::to_string(s.threads) + ":frame-threads=" + std::to_string(pictures);
    }
    if (s.passRecord && s.codec->has(VideoTrait::statsText | VideoTrait::statsFile)) {
        c.flags |= s.firstPass ? AV_CODEC_FLAG_PASS1 : AV_CODEC_FLAG_PASS2;
        if (s.codec->has(VideoTrait::statsFile)) {
            const std::string& name = files_.choose();
            if (!s.firstPass && !files_.restore(*s.passRecord))
                return "There are no statistics of a first pass";
            if (x265)
                own += ":pass=" + std::to_string(s.firstPass ? 1 : 2) + ":stats=" + name;
            else if (!setOption(c, "stats", name))
                return "Out of memory";
        } else if (!s.firstPass) {
            if (!loadPass(*s.passRecord, 0, statistics_)) return "There are no statistics of a first pass";
            c.stats_in = statistics_.data();
        }
    } else if (s.firstPass) {
        return "There is no record for the statistics of a first pass";
    }
    if (x265 && !addParameters(c, "x265-params", own)) return "The parameters of the codec can't be set";
    return "";
}

bool VideoEnc::sendHead() {
    const AVCodecContext& c = *context_;
    QvWire::VideoHead head{};
    head.size = sizeof head;
    head.version = QvWire::version;
    head.codec = fourccOf(c, *settings_.codec);
    const int fields = settings_.rate.interlaced();
    head.fieldOrder = static_cast<QvWire::FieldOrder>(fields);
    head.rateNum = c.time_base.den;
    head.rateDen = c.time_base.num;
    head.width = c.width;
    head.height = c.height;
    head.aspectNum = c.sample_aspect_ratio.num;
    head.aspectDen = c.sample_aspect_ratio.den;
    head.primaries = static_cast<std::uint16_t>(c.color_primaries);
    head.transfer = static_cast<std::uint16_t>(c.color_trc);
    head.matrix = static_cast<std::uint16_t>(c.colorspace);
    head.fullRange = c.color_range == AVCOL_RANGE_JPEG ? 1 : 0;
    head.delay = c.has_b_frames > 0 ? c.has_b_frames : c.max_b_frames > 0 ? 1 : 0;
    head.profile = profileOf(c, *settings_.codec);
    head.level = c.level;
    head.extradata = c.extradata;
    head.extradataBytes = static_cast<std::uint64_t>(std::max(c.extradata_size, 0));
    return output_.head(head);
}

bool VideoEnc::carryCaptions(const QvFrame& frame, AVFrame& picture) {
    if (!frame.subpic() && !captions_.used()) return true;
    const bool before = captions_.used(), kept = settings_.codec->has(VideoTrait::captions);
    const bool done = captions_.attach(frame, picture);
    if (captions_.used() && !before && !kept && !settings_.firstPass)
        qv_log()->warning("The captions of the pictures are lost: %s does not keep them", displayName());
    return done;
}

int VideoEnc::writeFrame(QvFrame* frame) {
    if (getState() != qvStateOpen) return setError(QvStatus::illegalState, "Not opened");
    if (!frame) return setError(QvStatus::invalidArgument, "No frame given");
    const bool empty = frame->planes() < 1;
    if (empty || frame->width() != settings_.width || frame->height() != settings_.height ||
        !qvEqualFourcc(frame->four_cc(), settings_.type))
        return setError(QvStatus::invalidArgument, "A frame of %dx%d %s does not fit the output of %dx%d",
                        empty ? 0 : frame->width(), empty ? 0 : frame->height(),
                        empty ? "no format" : frame->str_four_cc(), settings_.width, settings_.height);
    AVFrame* const picture = input_.take(*frame);
    if (!picture || !carryCaptions(*frame, *picture)) return setError(QvStatus::outOfMemory, "Out of memory");
    picture->pts = frames_;
    picture->sample_aspect_ratio = context_->sample_aspect_ratio;
    picture->color_range = context_->color_range;
    picture->color_primaries = context_->color_primaries;
    picture->color_trc = context_->color_trc;
    picture->colorspace = context_->colorspace;
    picture->interlaced_frame = settings_.rate.interlaced() != 0;
    picture->top_field_first = settings_.rate.isTopFirst();
    const int sent = avcodec_send_frame(context_.get(), picture);
    // The library reports no better code when the padding of a constant rate is larger than its buffer for a
    // picture.
    if (sent == AVERROR(EPERM) && context_->rc_min_rate > 0)
        return setError(
            QvStatus::failed, "Pictures of %dx%d can't be filled up to %lld kbit/s; set a lower bit rate",
            settings_.width, settings_.height, static_cast<long long>(context_->rc_min_rate / 1000));
    if (sent < 0)
        return setError(QvStatus::failed, "The encoder refused a picture (%s)", errorText(sent).c_str());
    ++frames_;
    return drain();
}

int VideoEnc::drain() {
    for (;;) {
        const int got = avcodec_receive_packet(context_.get(), packet_.get());
        if (got == AVERROR(EAGAIN) || got == AVERROR_EOF) return QvStatus::ok;
        if (got < 0) return setError(QvStatus::failed, "The encoder failed (%s)", errorText(got).c_str());
        const int put = putPacket();
        av_packet_unref(packet_.get());
        if (put != QvStatus::ok) return put;
    }
}

int VideoEnc::putPacket() {
    ++units_;
    if (settings_.firstPass) {
        if (context_->stats_out) statistics_ += context_->stats_out;
        return QvStatus::ok;
    }
    const bool key = (packet_->flags & AV_PKT_FLAG_KEY) != 0;
    QvWire::VideoUnit unit{};
    unit.flags = QvWire::unitTimed | (key ? QvWire::unitKey : 0);
    unit.pts = packet_->pts;
    unit.dts = packet_->dts != AV_NOPTS_VALUE ? packet_->dts : packet_->pts;
    unit.duration = 1;
    const auto sets = key ? std::span<const std::uint8_t>(sets_) : std::span<const std::uint8_t>();
    if (!output_.unit(sets, bytesOf(*packet_), unit))
        return setError(QvStatus::failed, "%s", output_.problem().c_str());
    return QvStatus::ok;
}

// Statistics in files are complete only after the encoder is destroyed.
int VideoEnc::finishPass() {
    if (units_ == 0 && context_->stats_out) statistics_ = context_->stats_out;
    context_.reset();
    const bool kept = settings_.codec->has(VideoTrait::statsFile)
                          ? files_.save(*settings_.passRecord)
                          : !statistics_.empty() && storePass(*settings_.passRecord, 0, statistics_);
    return kept ? QvStatus::ok
                : setError(QvStatus::failed, "The statistics of the first pass can not be kept");
}

int VideoEnc::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    setState(stateInitialised);
    int result = QvStatus::ok;
    // An encoder that never had a picture has nothing to drain.
    if (frames_ > 0) {
        const int ended = avcodec_send_frame(context_.get(), nullptr);
        result = ended < 0 ? setError(QvStatus::failed, "The encoder failed (%s)", errorText(ended).c_str())
                           : drain();
        if (result == QvStatus::ok && !settings_.firstPass && units_ != frames_)
            result = setError(QvStatus::failed, "The encoder wrote %lld of %lld pictures", units_, frames_);
        if (result == QvStatus::ok && settings_.firstPass) result = finishPass();
    }
    if (result == QvStatus::ok && !settings_.firstPass && !output_.end())
        result = setError(QvStatus::failed, "%s", output_.problem().c_str());
    release();
    return result;
}

int VideoEnc::abort() {
    if (getState() == qvStateOpen) setState(stateInitialised);
    release();
    return QvStatus::ok;
}

}  // namespace av
