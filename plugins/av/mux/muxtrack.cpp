#include "plugins/av/mux/muxtrack.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <utility>

#include "core/engine/modules/qvcodec.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvframe.h"
#include "plugins/av/mux/pixelprobe.h"
#include "plugins/av/source/limits.h"
#include "plugins/av/source/soundlayout.h"

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wconversion"
#pragma GCC diagnostic ignored "-Wsign-conversion"
extern "C" {
#include <libavcodec/bsf.h>
}
#pragma GCC diagnostic pop

namespace av {

namespace {

// Forms of uncompressed pictures for which containers have a code.
struct RawForm {
    unsigned fourcc;
    AVCodecID codec;
    AVPixelFormat pixels;
    unsigned tag;  // the container's code; 0: the library chooses
    unsigned quickTimeTag = 0;
};
constexpr RawForm rawForms[] = {
    {QvFourcc::I420, AV_CODEC_ID_RAWVIDEO, AV_PIX_FMT_YUV420P, MKTAG('I', '4', '2', '0')},
    {QvFourcc::YUYV, AV_CODEC_ID_RAWVIDEO, AV_PIX_FMT_YUYV422, MKTAG('Y', 'U', 'Y', '2'),
     MKTAG('y', 'u', 'v', 's')},
    {QvFourcc::YUY2, AV_CODEC_ID_RAWVIDEO, AV_PIX_FMT_YUYV422, MKTAG('Y', 'U', 'Y', '2'),
     MKTAG('y', 'u', 'v', 's')},
    {QvFourcc::UYVY, AV_CODEC_ID_RAWVIDEO, AV_PIX_FMT_UYVY422, MKTAG('U', 'Y', 'V', 'Y'),
     MKTAG('2', 'v', 'u', 'y')},
    {QvFourcc::W016, AV_CODEC_ID_RAWVIDEO, AV_PIX_FMT_YUV420P16LE, 0},
    {QvFourcc::v210, AV_CODEC_ID_V210, AV_PIX_FMT_YUV422P10LE, 0},
};

bool holdsForm(const Container& container, const RawForm& form) {
    if (!container.takes(MuxCodec::raw)) return false;
    const std::string_view format = container.format;
    const bool planar = form.pixels == AV_PIX_FMT_YUV420P || form.pixels == AV_PIX_FMT_YUV420P16LE;
    if (format == "yuv4mpegpipe") return planar;
    if (form.pixels == AV_PIX_FMT_YUV420P16LE) return false;
    if (format == "mov") return !planar;
    return format == "avi" || form.codec == AV_CODEC_ID_RAWVIDEO;
}

// For messages.
std::string heldForms(const Container& container) {
    std::string names;
    for (const RawForm& row : rawForms)
        if (holdsForm(container, row))
            names += (names.empty() ? "" : ", ") + std::string(qvFourccText(row.fourcc).data());
    return names;
}

// In the order of the profile numbers.
constexpr unsigned proresTags[] = {MKTAG('a', 'p', 'c', 'o'), MKTAG('a', 'p', 'c', 's'),
                                   MKTAG('a', 'p', 'c', 'n'), MKTAG('a', 'p', 'c', 'h'),
                                   MKTAG('a', 'p', '4', 'h'), MKTAG('a', 'p', '4', 'x')};

int intParam(const QvCodec& codec, const char* name, int fallback) {
    const Any value = codec.getParam(name);
    return value.isInt() ? value.toInt32() : fallback;
}

}  // namespace

void MuxTrack::Free::operator()(AVCodecParameters* parameters) const { avcodec_parameters_free(&parameters); }
void MuxTrack::Free::operator()(AVBSFContext* filter) const { av_bsf_free(&filter); }

MuxTrack::MuxTrack(const Container& container, bool video, std::string place)
    : container_(&container),
      video_(video),
      place_(std::move(place)),
      parameters_(avcodec_parameters_alloc()) {
    if (parameters_) parameters_->codec_type = video ? AVMEDIA_TYPE_VIDEO : AVMEDIA_TYPE_AUDIO;
}
MuxTrack::MuxTrack(MuxTrack&&) noexcept = default;
MuxTrack::~MuxTrack() = default;

bool MuxTrack::fail(const std::string& why) {
    problem_ = place_ + ": " + why;
    return false;
}

bool MuxTrack::chooseCodec(const MuxCodecRow* row, std::uint32_t fourcc) {
    if (!parameters_) return fail("there is no memory for it");
    if (row && isSound(row->codec) == video_)
        return fail(std::string(row->name) + " is no codec of " + (video_ ? "pictures" : "sound"));
    const bool fits = row && container_->takes(row->codec);
    if (!fits) {
        const std::string name = row ? row->name : std::string("'") + qvFourccText(fourcc).data() + "'";
        const std::string taken = container_->takenNames(video_);
        return fail(
            std::string(container_->module().displayName) + " does not hold " + name +
            (taken.empty() ? std::string(", nor any ") + (video_ ? "pictures" : "sound") : ", but " + taken));
    }
    codec_ = row;
    parameters_->codec_id = row->id;
    return true;
}

bool MuxTrack::setExtradata(const void* data, std::uint64_t bytes) {
    if (!data || bytes == 0) return true;
    if (bytes > limits::allocation / 16) return fail("the extradata of its codec are too long");
    auto* const copy = static_cast<std::uint8_t*>(av_mallocz(bytes + AV_INPUT_BUFFER_PADDING_SIZE));
    if (!copy) return fail("there is no memory for it");
    std::memcpy(copy, data, bytes);
    av_freep(&parameters_->extradata);
    parameters_->extradata = copy;
    parameters_->extradata_size = static_cast<int>(bytes);
    return true;
}

// --- Heads.

bool MuxTrack::describe(const QvWire::VideoHead& head) {
    if (described()) return setExtradata(head.extradata, head.extradataBytes);
    if (head.rateNum < 1 || head.rateDen < 1) return fail("it has no frame rate");
    if (head.width < 1 || head.height < 1 || head.width > limits::side || head.height > limits::side)
        return fail("there are no pictures of " + std::to_string(head.width) + "x" +
                    std::to_string(head.height));
    if (!chooseCodec(muxCodec(head.codec), head.codec)) return false;
    if (head.delay > 0 && (container_->inOrder & codecBit(codec_->codec)) != 0)
        return fail(std::string(container_->module().displayName) +
                    " does not hold the order of B-frames of " + codec_->name + "; encode without them");
    AVCodecParameters& to = *parameters_;
    to.width = head.width;
    to.height = head.height;
    rate_ = {head.rateNum, head.rateDen};
    timeBase_ = {head.rateDen, head.rateNum};
    if (head.aspectNum > 0 && head.aspectDen > 0)
        av_reduce(&aspect_.num, &aspect_.den, head.aspectNum, head.aspectDen, 65535);
    to.sample_aspect_ratio = aspect_;
    to.field_order = head.fieldOrder == QvWire::FieldOrder::topFirst      ? AV_FIELD_TT
                     : head.fieldOrder == QvWire::FieldOrder::bottomFirst ? AV_FIELD_BB
                                                                          : AV_FIELD_PROGRESSIVE;
    to.color_primaries =
        head.primaries ? static_cast<AVColorPrimaries>(head.primaries) : AVCOL_PRI_UNSPECIFIED;
    to.color_trc =
        head.transfer ? static_cast<AVColorTransferCharacteristic>(head.transfer) : AVCOL_TRC_UNSPECIFIED;
    to.color_space = static_cast<AVColorSpace>(head.matrix);
    to.color_range = head.fullRange ? AVCOL_RANGE_JPEG : AVCOL_RANGE_MPEG;
    to.video_delay = std::max(head.delay, 0);
    to.profile = head.profile >= 0 ? head.profile : FF_PROFILE_UNKNOWN;
    to.level = head.level >= 0 ? head.level : FF_LEVEL_UNKNOWN;
    chooseTag(head.profile);
    // Extradata that begin with a 1 are the record of a container (avcC, hvcC), which does not fit units in
    // elementary form.
    const bool isRecord = (codec_->codec == MuxCodec::h264 || codec_->codec == MuxCodec::hevc) &&
                          head.extradataBytes > 0 && head.extradata &&
                          *static_cast<const std::uint8_t*>(head.extradata) == 1;
    if (!isRecord && !setExtradata(head.extradata, head.extradataBytes)) return false;
    awaitsUnit_ = (codec_->setsInBand && container_->is(MuxTrait::lengths) && to.extradata_size == 0) ||
                  container_->is(MuxTrait::pixels);
    return makeUnitFilter();
}

void MuxTrack::chooseTag(int profile) {
    const bool quickTime = container_->is(MuxTrait::indexInFront);  // or MP4, which is based on it
    if (codec_->codec == MuxCodec::hevc && quickTime)
        parameters_->codec_tag = MKTAG('h', 'v', 'c', '1');
    else if (codec_->codec == MuxCodec::prores && profile >= 0 &&
             profile < static_cast<int>(std::size(proresTags)))
        parameters_->codec_tag = proresTags[profile];
}

bool MuxTrack::describe(const QvWire::AudioHead& head) {
    if (described()) {
        trailingPadding_ = std::max(head.trailingPadding, 0);
        const auto* const data = static_cast<const std::uint8_t*>(head.extradata);
        if (data && codec_->codec == MuxCodec::flac) newExtradata_.assign(data, data + head.extradataBytes);
        return true;
    }
    if (head.rate < 1 || head.rate > limits::samplerate || head.channels < 1 ||
        head.channels > limits::channels)
        return fail("there is no sound of " + std::to_string(head.rate) + " Hz and " +
                    std::to_string(head.channels) + " channels");
    if (!chooseCodec(muxCodec(head.codec), head.codec)) return false;
    const MuxerModule& module = container_->module();
    if (module.samplerate > 0 && head.rate != module.samplerate)
        return fail(std::string(module.displayName) + " holds sound of " + std::to_string(module.samplerate) +
                    " Hz, not of " + std::to_string(head.rate) + " Hz");
    AVCodecParameters& to = *parameters_;
    to.sample_rate = head.rate;
    timeBase_ = {1, head.rate};
    rate_ = {head.rate, 1};
    if (head.mask != 0) av_channel_layout_from_mask(&to.ch_layout, head.mask);
    if (to.ch_layout.nb_channels != head.channels && !setUsualLayout(to.ch_layout, head.channels))
        return fail("there is no memory for it");
    to.bits_per_raw_sample = head.bits;
    to.frame_size = std::max(head.frameSize, 0);
    to.initial_padding = std::max(head.initialPadding, 0);
    to.trailing_padding = trailingPadding_ = std::max(head.trailingPadding, 0);
    to.bit_rate = std::max(head.bitrate, 0);
    to.profile = head.profile >= 0 ? head.profile : FF_PROFILE_UNKNOWN;
    if (codec_->codec == MuxCodec::pcm) choosePcm(head.bits);
    if (!setExtradata(head.extradata, head.extradataBytes)) return false;
    awaitsUnit_ = codec_->setsInBand && container_->is(MuxTrait::lengths) && to.extradata_size == 0;
    return makeUnitFilter();
}

void MuxTrack::choosePcm(int bits) {
    AVCodecParameters& to = *parameters_;
    const int bytes = std::clamp((bits + 7) / 8, 1, 4);
    constexpr std::array little = {AV_CODEC_ID_PCM_U8, AV_CODEC_ID_PCM_S16LE, AV_CODEC_ID_PCM_S24LE,
                                   AV_CODEC_ID_PCM_S32LE};
    constexpr std::array big = {AV_CODEC_ID_PCM_U8, AV_CODEC_ID_PCM_S16BE, AV_CODEC_ID_PCM_S24BE,
                                AV_CODEC_ID_PCM_S32BE};
    to.codec_id = (container_->is(MuxTrait::bigPcm) ? big : little)[static_cast<std::size_t>(bytes - 1)];
    to.bits_per_coded_sample = bytes * 8;
    to.block_align = sampleBytes_ = bytes * to.ch_layout.nb_channels;
    to.bit_rate = std::int64_t{8} * to.block_align * to.sample_rate;
    to.frame_size = 0;
}

bool MuxTrack::describeRaw(const QvCodec& encoder) {
    raw_ = true;
    return video_ ? describeRawPictures(encoder) : describeRawSound(encoder);
}

bool MuxTrack::describeRawSound(const QvCodec& encoder) {
    QvWire::AudioHead head{};
    head.codec = qvFourcc("PCM ");
    head.rate = intParam(encoder, "samplerate", 0);
    head.channels = intParam(encoder, "channels", 0);
    head.bits = intParam(encoder, "bitsPerSample", 0);
    head.profile = -1;
    return describe(head);
}

bool MuxTrack::describeRawPictures(const QvCodec& encoder) {
    const auto type = static_cast<unsigned>(intParam(encoder, "type", 0));
    const auto* const form = std::find_if(std::begin(rawForms), std::end(rawForms),
                                          [type](const RawForm& row) { return row.fourcc == type; });
    if (form == std::end(rawForms) || !holdsForm(*container_, *form)) {
        const std::string held = heldForms(*container_);
        return fail(std::string(container_->module().displayName) + " does not hold raw pictures " +
                    qvFourccText(type).data() + (held.empty() ? "" : ", but " + held));
    }
    const Any rate = encoder.getParam("framerate");
    const QvRatio ratio = rate.isFramerate() ? rate.asFramerate().rate() : QvRatio(0, 1);
    if (ratio.num < 1 || ratio.den < 1) return fail("it has no frame rate");
    if (!parameters_) return fail("there is no memory for it");
    AVCodecParameters& to = *parameters_;
    to.width = intParam(encoder, "width", 0);
    to.height = intParam(encoder, "height", 0);
    QvFrame frame;
    if (to.width < 1 || to.height < 1 || std::max(to.width, to.height) > limits::side ||
        frame.init(type, to.width, to.height) != 0)
        return fail("there are no pictures of " + std::to_string(to.width) + "x" + std::to_string(to.height));
    pictureBytes_ = frame.total_bytes();
    codec_ = &muxCodecRow(MuxCodec::raw);
    to.codec_id = container_->is(MuxTrait::wrapsPictures) ? AV_CODEC_ID_WRAPPED_AVFRAME : form->codec;
    const bool quickTime = container_->is(MuxTrait::indexInFront);
    to.codec_tag = container_->is(MuxTrait::wrapsPictures) ? 0 : quickTime ? form->quickTimeTag : form->tag;
    to.format = form->pixels;
    rate_ = {static_cast<int>(ratio.num), static_cast<int>(ratio.den)};
    timeBase_ = {rate_.den, rate_.num};
    const int fields = rate.asFramerate().interlaced();
    to.field_order = fields == 1 ? AV_FIELD_TT : fields == 2 ? AV_FIELD_BB : AV_FIELD_PROGRESSIVE;
    return true;
}

// --- Units.

// The filter removes parameter sets or ADTS headers from the units where they belong into the container's
// header, or reports the parameter sets of the first unit for it.
bool MuxTrack::makeUnitFilter() {
    const char* name = nullptr;
    const char* options = nullptr;
    const MuxCodec codec = codec_->codec;
    if (container_->is(MuxTrait::lengths) && (codec == MuxCodec::h264 || codec == MuxCodec::hevc))
        name = "extract_extradata", options = "1";
    else if (codec == MuxCodec::aac && !container_->is(MuxTrait::adts))
        name = "aac_adtstoasc";
    else if (codec_->setsInBand && awaitsUnit_ && codec != MuxCodec::aac)
        name = "extract_extradata";
    if (!name) return true;
    AVBSFContext* made = nullptr;
    const AVBitStreamFilter* const kind = av_bsf_get_by_name(name);
    int result = kind ? av_bsf_alloc(kind, &made) : AVERROR_BSF_NOT_FOUND;
    filter_.reset(made);
    if (result >= 0) result = avcodec_parameters_copy(made->par_in, parameters_.get());
    if (result >= 0) made->time_base_in = timeBase_;
    if (result >= 0 && options) result = av_opt_set(made->priv_data, "remove", options, 0);
    if (result >= 0) result = av_bsf_init(made);
    return result >= 0 ||
           fail("units of " + std::string(codec_->name) + " can't be converted: " + errorText(result));
}

// Takes what the container's header needs from a unit: extradata that the filter has found, and the pixel
// format.
bool MuxTrack::completeFrom(AVPacket& unit) {
    std::size_t bytes = 0;
    const std::uint8_t* const data = av_packet_get_side_data(&unit, AV_PKT_DATA_NEW_EXTRADATA, &bytes);
    if (data) {
        if (parameters_->extradata_size == 0 && !setExtradata(data, bytes)) return false;
        av_packet_free_side_data(&unit);
    }
    if (!awaitsUnit_) return true;
    if (container_->is(MuxTrait::pixels) && video_ && parameters_->format < 0)
        probePixels(*parameters_, unit);
    const bool needs =
        codec_->codec == MuxCodec::h264 || codec_->codec == MuxCodec::hevc || codec_->codec == MuxCodec::aac;
    if (needs && container_->is(MuxTrait::lengths) && parameters_->extradata_size == 0)
        return fail(std::string("the first unit of ") + codec_->name + " has no parameters of its own");
    awaitsUnit_ = false;
    return true;
}

bool MuxTrack::hasValidTimes(const AVPacket& unit) {
    constexpr std::int64_t farthest = 1LL << 48;  // sums of times can't overflow
    const std::int64_t first = video_ ? -farthest : -std::int64_t{parameters_->initial_padding};
    if (unit.pts < first || unit.pts > farthest || unit.dts < -farthest || unit.duration < 0)
        return fail("a unit has the time " + std::to_string(unit.pts));
    if (video_ && (unit.pts < unit.dts || (lastDts_ != AV_NOPTS_VALUE && unit.dts <= lastDts_)))
        return fail("a unit is to be decoded at " + std::to_string(unit.dts) + ", out of order");
    return true;
}

bool MuxTrack::take(PacketPtr unit, std::vector<PacketPtr>& out) {
    if (unit->pts == AV_NOPTS_VALUE) unit->pts = unit->dts = nextTime_;
    if (!hasValidTimes(*unit)) return false;
    lastDts_ = unit->dts;
    nextTime_ = std::max(nextTime_, unit->pts + unit->duration);
    if (parameters_->codec_id == AV_CODEC_ID_WRAPPED_AVFRAME && !wrap(*unit)) return false;
    if (!video_ && codec_->codec == MuxCodec::pcm && container_->is(MuxTrait::bigPcm))
        return takeBigEndianPcm(*unit, out);
    if (!filter_) return completeFrom(*unit) && deliver(std::move(unit), out);
    int result = av_bsf_send_packet(filter_.get(), unit.get());
    while (result >= 0) {
        PacketPtr made(av_packet_alloc());
        if (!made) return fail("there is no memory for a unit");
        result = av_bsf_receive_packet(filter_.get(), made.get());
        if (result == AVERROR(EAGAIN) || result == AVERROR_EOF) return true;
        if (result >= 0 && !(completeFrom(*made) && deliver(std::move(made), out))) return false;
    }
    return fail(std::string("a unit is no ") + codec_->name + ": " + errorText(result));
}

// Puts an uncompressed picture into the form of AV_CODEC_ID_WRAPPED_AVFRAME: the packet's data is an AVFrame.
bool MuxTrack::wrap(AVPacket& unit) {
    FramePtr frame(av_frame_alloc());
    if (!frame) return fail("there is no memory for a picture");
    frame->format = parameters_->format;
    frame->width = parameters_->width;
    frame->height = parameters_->height;
    av_image_fill_arrays(frame->data, frame->linesize, unit.data, static_cast<AVPixelFormat>(frame->format),
                         frame->width, frame->height, 1);
    std::swap(frame->buf[0], unit.buf);
    auto* const data = reinterpret_cast<std::uint8_t*>(frame.get());
    const auto release = [](void*, std::uint8_t* wrapped) {
        const FramePtr owner(reinterpret_cast<AVFrame*>(wrapped));
    };
    unit.data = nullptr;
    unit.size = 0;
    unit.buf = av_buffer_create(data, sizeof(AVFrame), release, nullptr, 0);
    if (!unit.buf) return fail("there is no memory for a picture");
    frame.release();
    unit.data = data;
    unit.size = sizeof(AVFrame);
    return true;
}

// Big-endian samples, in packets that are short enough for the audio buffer of a program stream's player.
bool MuxTrack::takeBigEndianPcm(AVPacket& unit, std::vector<PacketPtr>& out) {
    constexpr int mostBytes = 1920;
    const int width = sampleBytes_ / std::max(parameters_->ch_layout.nb_channels, 1);
    const int step = std::max(mostBytes / sampleBytes_, 1) * sampleBytes_;
    if (av_packet_make_writable(&unit) < 0) return fail("there is no memory for a unit");
    for (int at = 0; at + width <= unit.size; at += width)
        std::reverse(unit.data + at, unit.data + at + width);
    for (int at = 0; at < unit.size; at += step) {
        PacketPtr part(av_packet_clone(&unit));
        if (!part) return fail("there is no memory for a unit");
        part->data += at;
        part->size = std::min(step, unit.size - at);
        part->pts = part->dts = unit.pts + at / sampleBytes_;
        part->duration = part->size / sampleBytes_;
        if (!deliver(std::move(part), out)) return false;
    }
    return true;
}

bool MuxTrack::deliver(PacketPtr unit, std::vector<PacketPtr>& out) {
    if (!video_) return holdBack(std::move(unit), out);
    out.push_back(std::move(unit));
    return true;
}

// Keeps the last units of sound until finish(): only then is it known how many samples at the end are
// padding.
bool MuxTrack::holdBack(PacketPtr unit, std::vector<PacketPtr>& out) {
    if (container_->is(MuxTrait::counted) && unit->pts + unit->duration <= 0) return true;
    constexpr std::size_t most = 3;  // units that padding can reach
    held_.push_back(std::move(unit));
    if (held_.size() > most) {
        out.push_back(std::move(held_.front()));
        held_.erase(held_.begin());
    }
    return true;
}

bool MuxTrack::finish(std::vector<PacketPtr>& out) {
    if (held_.empty()) return true;
    std::int64_t padding = trailingPadding_;
    for (; held_.size() > 1 && padding > 0 && padding >= held_.back()->duration; held_.pop_back())
        padding -= held_.back()->duration;
    AVPacket& last = *held_.back();
    if (padding > 0 && padding < last.duration) {
        last.duration -= padding;
        // Samples to skip at the start and at the end, 32 bits each, then a reason for either.
        std::uint8_t* const skip = av_packet_new_side_data(&last, AV_PKT_DATA_SKIP_SAMPLES, 10);
        if (!skip) return fail("there is no memory for a unit");
        std::memset(skip, 0, 10);
        AV_WL32(skip + 4, static_cast<std::uint32_t>(padding));
    }
    for (PacketPtr& unit : held_) out.push_back(std::move(unit));
    held_.clear();
    return newExtradata_.empty() || addExtradataUpdate(out);
}

// An empty unit that hands the new extradata to the multiplexer.
bool MuxTrack::addExtradataUpdate(std::vector<PacketPtr>& out) {
    PacketPtr unit(av_packet_alloc());
    std::uint8_t* const data =
        unit ? av_packet_new_side_data(unit.get(), AV_PKT_DATA_NEW_EXTRADATA, newExtradata_.size()) : nullptr;
    if (!data) return fail("there is no memory for a unit");
    std::memcpy(data, newExtradata_.data(), newExtradata_.size());
    unit->pts = unit->dts = nextTime_;
    out.push_back(std::move(unit));
    return true;
}

}  // namespace av
