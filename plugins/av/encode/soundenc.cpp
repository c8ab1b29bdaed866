#include "plugins/av/encode/soundenc.h"

#include <algorithm>
#include <array>
#include <climits>
#include <cstdint>
#include <cstring>
#include <span>

#include "core/engine/log/qvlog.h"
#include "core/media/qvpcm.h"
#include "plugins/av/encode/libraryoptions.h"
#include "plugins/av/source/soundlayout.h"

namespace av {

namespace {

constexpr int freeFrameSamples = 1024;  // for encoders that accept frames of any length
constexpr int adtsBytes = 7;
using AdtsHeader = std::array<std::uint8_t, adtsBytes>;

bool is(const SoundSettings& s, const char* module) { return std::strcmp(s.codec->module, module) == 0; }

// A little-endian sample of 2 or 3 bytes, as a signed number of 24 bits.
std::int32_t sampleAt(const unsigned char* at, int bytes) {
    if (bytes == 2) {
        const auto value = static_cast<std::int16_t>(at[0] | at[1] << 8);
        return std::int32_t{value} * 256;
    }
    const std::uint32_t value =
        at[0] | static_cast<std::uint32_t>(at[1]) << 8 | static_cast<std::uint32_t>(at[2]) << 16;
    return static_cast<std::int32_t>(value << 8) >> 8;
}

// `value`: 24 bits. 16-bit formats get it rounded.
void putSample(AVFrame& frame, int index, int channel, int channels, std::int32_t value) {
    const auto format = static_cast<AVSampleFormat>(frame.format);
    const bool planar = av_sample_fmt_is_planar(format) != 0;
    std::uint8_t* const data = frame.extended_data[planar ? channel : 0];
    const int place = planar ? index : index * channels + channel;
    switch (av_get_packed_sample_fmt(format)) {
        case AV_SAMPLE_FMT_FLT:
            reinterpret_cast<float*>(data)[place] = static_cast<float>(value) / 8388608.0F;
            break;
        case AV_SAMPLE_FMT_S32: reinterpret_cast<std::int32_t*>(data)[place] = value * 256; break;
        default:
            reinterpret_cast<std::int16_t*>(data)[place] =
                static_cast<std::int16_t>(std::min((value + 128) >> 8, 32767));
            break;
    }
}

// Of the sample formats that the library has: 16-bit integers for 16-bit input, otherwise float or 32 bits.
AVSampleFormat formatOf(const AVCodec& library, int bits) {
    AVSampleFormat finest = AV_SAMPLE_FMT_NONE;
    for (const AVSampleFormat* format = library.sample_fmts; format && *format != AV_SAMPLE_FMT_NONE;
         ++format) {
        const AVSampleFormat packed = av_get_packed_sample_fmt(*format);
        if (packed == AV_SAMPLE_FMT_S16 && bits == 16) return *format;
        if (packed == AV_SAMPLE_FMT_FLT || packed == AV_SAMPLE_FMT_S32 || finest == AV_SAMPLE_FMT_NONE)
            finest = *format;
    }
    return finest;
}

// ADTS has one layout for each number of channels: four are three in front and one at the back. Opus keeps
// the order of more than two channels only with the channel mapping of Vorbis (family 1).
bool setLayout(AVCodecContext& context, const SoundSettings& s) {
    if (is(s, "aacaenc") && s.channels == 4)
        return av_channel_layout_from_mask(&context.ch_layout, AV_CH_LAYOUT_4POINT0) >= 0;
    if (is(s, "opusaenc") && s.channels > 2 && av_opt_set_int(context.priv_data, "mapping_family", 1, 0) < 0)
        return false;
    return setUsualLayout(context.ch_layout, s.channels);
}

// In the order of the sampling frequency index.
constexpr int adtsRates[] = {96000, 88200, 64000, 48000, 44100, 32000,
                             24000, 22050, 16000, 12000, 11025, 8000};

// MPEG-4, no CRC, AAC LC, one raw data block.
AdtsHeader adtsHeader(int samplerate, int channels, int payload) {
    const auto index = static_cast<unsigned>(
        std::find(std::begin(adtsRates), std::end(adtsRates), samplerate) - std::begin(adtsRates));
    const unsigned layout = channels == 8 ? 7 : static_cast<unsigned>(channels);
    const auto length = static_cast<unsigned>(payload + adtsBytes);
    const unsigned bytes[] = {0xFF,
                              0xF1,
                              1u << 6 | index << 2 | layout >> 2,
                              (layout & 3) << 6 | length >> 11,
                              length >> 3 & 0xFF,
                              (length & 7) << 5 | 0x1F,
                              0xFC};
    AdtsHeader header;
    for (std::size_t i = 0; i < header.size(); ++i) header[i] = static_cast<std::uint8_t>(bytes[i] & 0xFF);
    return header;
}

}  // namespace

int SoundEnc::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "settings") == 0) {
        _traceParam(name, value);
        return value.isDict() ? setParamDict(value.asDict()) : QvStatus::invalidParam;
    }
    if (std::strcmp(name, "avOptions") == 0 && value.isText()) {
        const AVCodec* const library = settings_.codec->library();
        const std::string why = library ? checkOptions(*library, value.toString().asString(""))
                                        : "this encoder has no options of a library";
        if (!why.empty()) return setError(QvStatus::invalidParam, "avOptions: %s", why.c_str());
    }
    if (auto result = _setRow<SoundSettings>(SoundSettings::rows(), settings_, name, value)) return *result;
    return QvAudioEncoder::setParam(name, value);
}

void SoundEnc::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow<SoundSettings>(SoundSettings::rows(), settings_, name, value))
        QvAudioEncoder::getParam(name, value);
}

void SoundEnc::store(AnyDict& state) const {
    AnyDict settings;
    qvStoreParamRows<SoundSettings>(SoundSettings::rows(), settings_, settings);
    if (settings_.codec->kilobits.empty()) settings.remove("bitrate");
    state = AnyDict("name", name(), "settingsDict", settings);
}

int SoundEnc::restore(const AnyDict& state) {
    if (state.get("name") != name()) return setError(QvStatus::failed, "restore - invalid name");
    const Any& settings = state.get("settingsDict");
    return settings.isDict()
               ? _restoreRows<SoundSettings>(SoundSettings::rows(), settings_, settings.asDict())
               : QvStatus::ok;
}

std::string SoundEnc::prepare() {
    const SoundSettings& s = settings_;
    if (!*s.codec->encoder) return "";
    const AVCodec* const library = s.codec->library();
    if (!library) return std::string("The installed library has no encoder ") + s.codec->encoder;
    context_.reset(avcodec_alloc_context3(library));
    frame_.reset(av_frame_alloc());
    packet_.reset(av_packet_alloc());
    if (!context_ || !frame_ || !packet_) return "Out of memory";
    AVCodecContext& c = *context_;
    c.sample_rate = s.samplerate;
    c.sample_fmt = formatOf(*library, s.bits);
    if (!setLayout(c, s)) return "Out of memory";
    c.time_base = {1, s.samplerate};
    c.bit_rate = s.codec->kilobits.empty() ? 0 : static_cast<std::int64_t>(s.bitsPerSecond());
    c.bits_per_raw_sample = s.bits;
    c.thread_count = s.threads;
    if (const std::string why = setOptions(c, s.options); !why.empty()) return why;
    const int opened = avcodec_open2(&c, library, nullptr);
    if (opened < 0)
        return "The encoder does not take these settings (" + std::string(s.codec->encoder) + ": " +
               errorText(opened) + ")";
    frame_->format = c.sample_fmt;
    frame_->nb_samples = c.frame_size > 0 ? c.frame_size : freeFrameSamples;
    frame_->sample_rate = s.samplerate;
    if (av_channel_layout_copy(&frame_->ch_layout, &c.ch_layout) < 0 ||
        av_frame_get_buffer(frame_.get(), 0) < 0)
        return "Out of memory";
    return "";
}

bool SoundEnc::sendHead(bool last) {
    QvWire::AudioHead head{};
    head.size = sizeof head;
    head.version = QvWire::version;
    head.codec = settings_.codec->fourcc;
    head.rate = settings_.samplerate;
    head.channels = settings_.channels;
    head.bits = settings_.bits;
    head.bitrate = static_cast<int>(settings_.bitsPerSecond());
    head.profile = -1;
    if (context_) {
        const AVCodecContext& c = *context_;
        if (c.bit_rate > 0 && c.bit_rate <= INT_MAX) head.bitrate = static_cast<int>(c.bit_rate);
        if (c.ch_layout.order == AV_CHANNEL_ORDER_NATIVE) head.mask = c.ch_layout.u.mask;
        head.frameSize = c.frame_size;
        head.initialPadding = c.initial_padding;
        head.profile = c.profile;
        head.extradata = c.extradata;
        head.extradataBytes = static_cast<std::uint64_t>(std::max(c.extradata_size, 0));
        const long long padding = sent_ - c.initial_padding - taken_;
        if (last) head.trailingPadding = static_cast<int>(std::max(padding, 0LL));
    }
    return output_.head(head);
}

int SoundEnc::open() {
    if (getState() == qvStateOpen) return setError(QvStatus::failed, "Already open");
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Not initialized");
    if (!outStream()) return setError(QvStatus::failed, "Output stream not attached");
    filled_ = 0;
    taken_ = sent_ = 0;
    output_ = UnitWriter(*outStream());
    const std::string why = prepare();
    if (!why.empty() || !sendHead(false)) {
        release();
        return setError(QvStatus::failed, "%s", why.empty() ? output_.problem().c_str() : why.c_str());
    }
    if (settings_.hasOwnBitrate() && settings_.bitsPerSecond() != 1000.0 * settings_.kilobits)
        qv_log()->warning("%s: %d kbit/s are used, as %d kbit/s are none of those for %d Hz and %d channels",
                          name(), static_cast<int>(settings_.bitsPerSecond() / 1000), settings_.kilobits,
                          settings_.samplerate, settings_.channels);
    setState(qvStateOpen);
    return QvStatus::ok;
}

int SoundEnc::writePcm(QvPcm* pcm, int samples) {
    if (getState() != qvStateOpen) return setError(QvStatus::illegalState, "Not opened");
    if (!pcm) return setError(QvStatus::invalidArgument, "No samples given");
    if (samples < 0) samples = pcm->samples();
    if (samples > pcm->samples())
        return setError(QvStatus::invalidArgument, "%d samples asked for, %d given", samples, pcm->samples());
    if (pcm->channels() != settings_.channels || pcm->bytesPerSample() != settings_.bits / 8)
        return setError(
            QvStatus::invalidArgument,
            "Samples of %d channels and %d bytes do not fit the output of %d channels and %d bits",
            pcm->channels(), pcm->bytesPerSample(), settings_.channels, settings_.bits);
    if (!context_) return putPlain(*pcm, samples);
    const int whole = context_->frame_size > 0 ? context_->frame_size : freeFrameSamples;
    for (int first = 0; first < samples;) {
        const int count = std::min(samples - first, whole - filled_);
        if (filled_ == 0 && av_frame_make_writable(frame_.get()) < 0)
            return setError(QvStatus::outOfMemory, "Out of memory");
        fill(*pcm, first, count);
        first += count;
        filled_ += count;
        if (filled_ < whole) break;
        if (const int result = sendFrame()) return result;
    }
    return QvStatus::ok;
}

int SoundEnc::putPlain(const QvPcm& pcm, int samples) {
    if (samples == 0) return QvStatus::ok;
    QvWire::AudioUnit unit{};
    unit.samples = static_cast<std::uint32_t>(samples) | QvWire::unitTimed;
    unit.pts = taken_;
    taken_ += samples;
    const std::span<const std::uint8_t> bytes(pcm.ptr(0),
                                              static_cast<std::size_t>(pcm.samples2bytes(samples)));
    if (!output_.unit({}, bytes, unit)) return setError(QvStatus::failed, "%s", output_.problem().c_str());
    return QvStatus::ok;
}

void SoundEnc::fill(const QvPcm& pcm, int first, int count) {
    const int channels = settings_.channels, bytes = pcm.bytesPerSample();
    const unsigned char* from = pcm.ptr(first);
    for (int i = 0; i < count; ++i)
        for (int channel = 0; channel < channels; ++channel, from += bytes)
            putSample(*frame_, filled_ + i, channel, channels, sampleAt(from, bytes));
}

int SoundEnc::sendFrame() {
    const int room = frame_->nb_samples;
    frame_->nb_samples = filled_;
    frame_->pts = taken_;
    taken_ += filled_;
    filled_ = 0;
    const int sent = avcodec_send_frame(context_.get(), frame_.get());
    frame_->nb_samples = room;
    if (sent < 0)
        return setError(QvStatus::failed, "The encoder refused samples (%s)", errorText(sent).c_str());
    return drain();
}

int SoundEnc::drain() {
    for (;;) {
        const int got = avcodec_receive_packet(context_.get(), packet_.get());
        if (got == AVERROR(EAGAIN) || got == AVERROR_EOF) return QvStatus::ok;
        if (got < 0) return setError(QvStatus::failed, "The encoder failed (%s)", errorText(got).c_str());
        const int put = putPacket();
        av_packet_unref(packet_.get());
        if (put != QvStatus::ok) return put;
    }
}

int SoundEnc::putPacket() {
    AVCodecContext& c = *context_;
    std::size_t bytes = 0;
    const auto* const changed = av_packet_get_side_data(packet_.get(), AV_PKT_DATA_NEW_EXTRADATA, &bytes);
    if (changed && static_cast<int>(bytes) == c.extradata_size) std::memcpy(c.extradata, changed, bytes);
    if (packet_->size == 0) return QvStatus::ok;
    const int count =
        c.frame_size > 0 && !is(settings_, "flacaenc") ? c.frame_size : static_cast<int>(packet_->duration);
    QvWire::AudioUnit unit{};
    unit.samples = static_cast<std::uint32_t>(count) | QvWire::unitTimed;
    unit.pts = sent_ - c.initial_padding;
    sent_ += count;
    AdtsHeader adts;
    std::span<const std::uint8_t> prefix;
    if (is(settings_, "aacaenc")) {
        adts = adtsHeader(settings_.samplerate, settings_.channels, packet_->size);
        prefix = adts;
    }
    if (!output_.unit(prefix, {packet_->data, static_cast<std::size_t>(packet_->size)}, unit))
        return setError(QvStatus::failed, "%s", output_.problem().c_str());
    return QvStatus::ok;
}

int SoundEnc::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    setState(stateInitialised);
    int result = QvStatus::ok;
    if (context_ && (filled_ > 0 || taken_ > 0)) {
        if (filled_ > 0) result = sendFrame();
        if (result == QvStatus::ok) {
            const int ended = avcodec_send_frame(context_.get(), nullptr);
            result = ended < 0
                         ? setError(QvStatus::failed, "The encoder failed (%s)", errorText(ended).c_str())
                         : drain();
        }
        if (result == QvStatus::ok && !sendHead(true))
            result = setError(QvStatus::failed, "%s", output_.problem().c_str());
    }
    if (result == QvStatus::ok && !output_.end())
        result = setError(QvStatus::failed, "%s", output_.problem().c_str());
    release();
    return result;
}

int SoundEnc::abort() {
    if (getState() == qvStateOpen) setState(stateInitialised);
    release();
    return QvStatus::ok;
}

void SoundEnc::release() {
    context_.reset();
    frame_.reset();
    packet_.reset();
}

}  // namespace av
