#include "plugins/av/encode/soundenc.h"

#include <algorithm>
#include <array>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "core/engine/log/qvlog.h"
#include "core/engine/qvutil.h"
#include "core/media/qvpcm.h"
#include "core/preset/qvprofile.h"
#include "plugins/av/encode/libraryoptions.h"
#include "plugins/av/source/soundlayout.h"

namespace av {

namespace {

using S = SoundSettings;
using C = const S&;
using Access = QvParamAccess<S>;

constexpr int aacRates[] = {8000,  11025, 12000, 16000, 22050, 24000,
                            32000, 44100, 48000, 64000, 88200, 96000};
constexpr int mpegRates[] = {16000, 22050, 24000, 32000, 44100, 48000};
constexpr int mp3Rates[] = {8000, 11025, 12000, 16000, 22050, 24000, 32000, 44100, 48000};
constexpr int dolbyRates[] = {32000, 44100, 48000};
constexpr int anyRates[] = {8000,  11025, 16000, 22050, 24000,  32000,
                            44100, 48000, 88200, 96000, 176400, 192000};
constexpr int opusRates[] = {8000, 12000, 16000, 24000, 48000};
constexpr int aacBits[] = {32, 48, 64, 96, 112, 128, 160, 192, 224, 256, 320, 384, 448, 512};
constexpr int layer2Bits[] = {32, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320, 384};
constexpr int layer3Bits[] = {32, 40, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320};
constexpr int dolbyBits[] = {32, 64, 96, 128, 160, 192, 224, 256, 320, 384, 448, 512, 576, 640};
constexpr int opusBits[] = {16, 24, 32, 48, 64, 96, 128, 160, 192, 256, 320, 384, 448, 510};
static_assert(opusBits[9] == 256);

// Layer 2 and 3 of MPEG-2, and of MPEG-2.5 in part.
constexpr int slowBits[] = {8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160};
constexpr int upTo2[] = {1, 2};
constexpr int upTo6[] = {1, 2, 3, 4, 5, 6};
constexpr int upTo8[] = {1, 2, 3, 4, 5, 6, 7, 8};
constexpr int aacChannels[] = {1, 2, 3, 4, 5, 6, 8};  // ADTS has no word for seven

// clang-format off
constexpr auto codecs = std::to_array<SoundCodec>({
    {"aacaenc",       "aac",        "AAC ", "aac",  aacRates,   aacBits,    aacChannels, 160},
    {"mpegaenc",      "mp2",        "MP2 ", "mp2",  mpegRates,  layer2Bits, upTo2, 224, slowBits},
    {"mpegpcmenc",    "",           "PCM ", "pcm",  anyRates,   {},         upTo8, 0},
    {"mp3aenc",       "libmp3lame", "MP3 ", "mp3",  mp3Rates,   layer3Bits, upTo2, 192, slowBits},
    {"ddaenc",        "ac3",        "AC-3", "ac3",  dolbyRates, dolbyBits,  upTo6, 192},
    {"ddproaenc",     "ac3",        "AC-3", "ac3",  dolbyRates, dolbyBits,  upTo6, 384},
    {"ddplusproaenc", "eac3",       "EC-3", "eac3", dolbyRates, dolbyBits,  upTo6, 384},
    {"flacaenc",      "flac",       "FLAC", "flac", anyRates,   {},         upTo8, 0},
    {"opusaenc",      "libopus",    "OPUS", "opus", opusRates,  opusBits,   upTo8, 128},
});
// clang-format on

AnyVector vectorOf(std::span<const int> values, int factor = 1) {
    AnyVector all;
    for (const int value : values) all.append(value * factor);
    return all;
}

bool holds(std::span<const int> values, int value) {
    return std::find(values.begin(), values.end(), value) != values.end();
}

bool is(C s, const char* module) { return std::strcmp(s.codec->module, module) == 0; }

constexpr int leastFastRate = 32000;  // of MPEG-1
constexpr int aacMost = 6;            // bits a sample and channel, 6144 a frame

// Those that fit the rate and the channels.
std::span<const int> kilobitsOf(C s) {
    const auto all = s.codec->kilobits;
    if (s.samplerate < leastFastRate && !s.codec->lowKilobits.empty()) return s.codec->lowKilobits;
    if (is(s, "opusaenc") && s.channels == 1) return all.first(10);  // 256 a channel
    if (is(s, "aacaenc")) {
        const auto most =
            std::upper_bound(all.begin(), all.end(), aacMost * s.samplerate * s.channels / 1000);
        return all.first(static_cast<std::size_t>(most - all.begin()));
    }
    if (s.codec->kilobits.data() == dolbyBits && s.channels > 2) return all.subspan(1);  // 32 are too few
    return all;
}

double bitsPerSecond(C s) {
    const auto all = kilobitsOf(s);
    if (!all.empty())
        return 1000.0 * *std::min_element(all.begin(), all.end(), [&s](int a, int b) {
                   return std::abs(a - s.kilobits) < std::abs(b - s.kilobits);
               });
    return 1.0 * s.samplerate * s.channels * s.bits;
}

int setKilobits(S& s, double wanted) {
    const int nearest = wanted > 0 && wanted < 1e6 ? static_cast<int>(wanted) : 0;
    if (!holds(kilobitsOf(s), nearest) || nearest != wanted) return QvStatus::invalidParam;
    s.kilobits = nearest;
    return QvStatus::ok;
}

int setBitrate(S& s, const Any& value) {
    if (!value.isBitrate()) return QvStatus::invalidParam;
    return setKilobits(s, value.asBitrate().target / 1000.0);
}

int setABitrate(S& s, const Any& value) {
    double wanted = 0;
    return qvparam::convert(value, wanted) ? setKilobits(s, wanted) : QvStatus::invalidParam;
}

int setRate(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || !holds(s.codec->rates, wanted)) return QvStatus::invalidParam;
    s.samplerate = wanted;
    return QvStatus::ok;
}

int setChannels(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || !holds(s.codec->channels, wanted)) return QvStatus::invalidParam;
    s.channels = wanted;
    return QvStatus::ok;
}

int setBits(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || (wanted != 16 && wanted != 24)) return QvStatus::invalidParam;
    s.bits = wanted;
    return QvStatus::ok;
}

int setOptionText(S& s, const Any& value) {
    std::string wanted;
    const AVCodec* const library = s.codec->library();
    if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
    // Uncompressed sound has no library, and none is needed for no options.
    if (!wanted.empty() && (!library || !checkOptions(*library, wanted).empty()))
        return QvStatus::invalidParam;
    s.options = wanted;
    return QvStatus::ok;
}

// The video discs have the rate of audio discs.
int setProfile(S& s, const Any& value) {
    if (!qvparam::convert(value, s.profile)) return QvStatus::invalidParam;
    const std::string_view symbol = qvProfileToSym(s.profile);
    if ((symbol == "VCD" || symbol == "SVCD") && holds(s.codec->rates, 44100)) s.samplerate = 44100;
    return QvStatus::ok;
}

void bitrateRange(C s, Any& value) {
    AnyDict row("type", static_cast<int>(QvBitrate::cbr));
    row.set("range", s.codec->kilobits.empty() ? AnyVector(static_cast<int>(bitsPerSecond(s)))
                                               : vectorOf(kilobitsOf(s), 1000));
    AnyVector all;
    all.append(row);
    value = all;
}

const QvParamRow<S> table[] = {
    {.name = "profile",
     .member = Access{setProfile, [](C s, Any& v) { v = s.profile; }},
     .help = "number of a preset",
     .type = Any::Int32},
    {.name = "samplerate",
     .member = Access{setRate, [](C s, Any& v) { v = s.samplerate; }},
     .flags = qvParamStored,
     .unit = "Hz",
     .type = Any::Int32},
    {.name = "channels",
     .member = Access{setChannels, [](C s, Any& v) { v = s.channels; }},
     .flags = qvParamStored,
     .type = Any::Int32},
    {.name = "bitsPerSample",
     .member = Access{setBits, [](C s, Any& v) { v = s.bits; }},
     .flags = qvParamStored,
     .help = "of the samples that are taken: 16 or 24",
     .type = Any::Int32},
    {.name = "aBitrate",
     .member = Access{setABitrate, [](C s, Any& v) { v = static_cast<int>(bitsPerSecond(s) / 1000); }},
     .unit = "kbit/s",
     .type = Any::Int32},
    {.name = "bitrate",
     .member = Access{setBitrate,
                      [](C s, Any& v) { v = QvBitrate(QvBitrate::cbr, static_cast<int>(bitsPerSecond(s))); }},
     .flags = qvParamStored,
     .type = Any::Bitrate},
    {"threads", &S::threads, qvParamStored, 0, 64, "", "", "of the codec; 0: one a core"},
    {.name = "avOptions",
     .member = Access{setOptionText, [](C s, Any& v) { v = Any(s.options.c_str()); }},
     .flags = qvParamStored,
     .help = "options of the library, name=value:name=value",
     .type = Any::String},
    {"framerate", {}, qvParamIgnored},
    {"type", {}, qvParamIgnored},
    {"pal", {}, qvParamIgnored},
    {"samplerateRange", Access{nullptr, [](C s, Any& v) { v = vectorOf(s.codec->rates); }}},
    {"channelsRange", Access{nullptr, [](C s, Any& v) { v = vectorOf(s.codec->channels); }}},
    {"bitsPerSampleRange", Access{nullptr, [](C, Any& v) { v = AnyVector(16, 24); }}},
    {"bitrateRange", Access{nullptr, bitrateRange}},
    {"aBitrateRange", Access{nullptr, [](C s, Any& v) { v = vectorOf(kilobitsOf(s)); }}},
    {"estimateSecKb",
     Access{nullptr, [](C s, Any& v) { v = Any(static_cast<float>(bitsPerSecond(s) / 8000)); }}},
    {"extension", Access{nullptr, [](C s, Any& v) { v = s.codec->extension; }}},
};

unsigned fourccNumber(const char* text) {
    unsigned value = 0;
    for (int i = 3; i >= 0; --i) value = value << 8 | static_cast<unsigned char>(text[i]);
    return value;
}

// 24 bits with sign, from little-endian bytes.
std::int32_t sampleAt(const unsigned char* at, int bytes) {
    if (bytes == 2) {
        const auto value = static_cast<std::int16_t>(at[0] | at[1] << 8);
        return std::int32_t{value} * 256;
    }
    const std::uint32_t value =
        at[0] | static_cast<std::uint32_t>(at[1]) << 8 | static_cast<std::uint32_t>(at[2]) << 16;
    return static_cast<std::int32_t>(value << 8) >> 8;
}

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

// Of the kinds that the library takes: whole numbers of 16 bits where no more are there, else the finest.
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

// ADTS has a number for each layout, so four channels of AAC are three in front and one behind. Opus places
// more than two channels right only in the family of Vorbis.
bool setLayout(AVCodecContext& context, C s) {
    if (is(s, "aacaenc") && s.channels == 4)
        return av_channel_layout_from_mask(&context.ch_layout, AV_CH_LAYOUT_4POINT0) >= 0;
    if (is(s, "opusaenc") && s.channels > 2 && av_opt_set_int(context.priv_data, "mapping_family", 1, 0) < 0)
        return false;
    return setUsualLayout(context.ch_layout, s.channels);
}

constexpr int adtsRates[] = {96000, 88200, 64000, 48000, 44100, 32000,
                             24000, 22050, 16000, 12000, 11025, 8000};

// Seven bytes: MPEG-4, no CRC, low complexity, one block.
std::array<std::uint8_t, 7> adtsHeader(int samplerate, int channels, int payload) {
    const auto index = static_cast<unsigned>(
        std::find(std::begin(adtsRates), std::end(adtsRates), samplerate) - std::begin(adtsRates));
    const unsigned layout = channels == 8 ? 7 : static_cast<unsigned>(channels);
    const auto length = static_cast<unsigned>(payload) + 7;
    const unsigned bytes[] = {0xFF,
                              0xF1,
                              1u << 6 | index << 2 | layout >> 2,
                              (layout & 3) << 6 | length >> 11,
                              length >> 3 & 0xFF,
                              (length & 7) << 5 | 0x1F,
                              0xFC};
    std::array<std::uint8_t, 7> header;
    for (std::size_t i = 0; i < header.size(); ++i) header[i] = static_cast<std::uint8_t>(bytes[i] & 0xFF);
    return header;
}

}  // namespace

const SoundCodec* soundCodec(const char* module) {
    for (const SoundCodec& row : codecs)
        if (std::strcmp(row.module, module) == 0) return &row;
    return nullptr;
}

std::span<const QvParamRow<SoundSettings>> SoundSettings::rows() { return table; }

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
    const S& s = settings_;
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
    c.bit_rate = s.codec->kilobits.empty() ? 0 : static_cast<std::int64_t>(bitsPerSecond(s));
    c.bits_per_raw_sample = s.bits;
    c.thread_count = s.threads;
    if (const std::string why = setOptions(c, s.options); !why.empty()) return why;
    const int opened = avcodec_open2(&c, library, nullptr);
    if (opened < 0)
        return "The encoder does not take these settings (" + std::string(s.codec->encoder) + ": " +
               errorText(opened) + ")";
    frame_->format = c.sample_fmt;
    frame_->nb_samples = c.frame_size > 0 ? c.frame_size : 1024;
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
    head.codec = fourccNumber(settings_.codec->fourcc);
    head.rate = settings_.samplerate;
    head.channels = settings_.channels;
    head.bits = settings_.bits;
    head.bitrate = static_cast<int>(bitsPerSecond(settings_));
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
        const long long more = sent_ - c.initial_padding - taken_;
        if (last) head.trailingPadding = static_cast<int>(std::max(more, 0LL));
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
    if (settings_.stated() && bitsPerSecond(settings_) != 1000.0 * settings_.kilobits)
        qv_log()->warning("%s: %d kbit/s are used, as %d kbit/s are none of those for %d Hz and %d channels",
                          name(), static_cast<int>(bitsPerSecond(settings_) / 1000), settings_.kilobits,
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
    const int whole = context_->frame_size > 0 ? context_->frame_size : 1024;
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
    const auto* changed = av_packet_get_side_data(packet_.get(), AV_PKT_DATA_NEW_EXTRADATA, &bytes);
    if (changed && static_cast<int>(bytes) == c.extradata_size) std::memcpy(c.extradata, changed, bytes);
    if (packet_->size == 0) return QvStatus::ok;
    const int count =
        c.frame_size > 0 && !is(settings_, "flacaenc") ? c.frame_size : static_cast<int>(packet_->duration);
    QvWire::AudioUnit unit{};
    unit.samples = static_cast<std::uint32_t>(count) | QvWire::unitTimed;
    unit.pts = sent_ - c.initial_padding;
    sent_ += count;
    std::array<std::uint8_t, 7> adts;
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
