#include "plugins/av/sound/decodedsamples.h"

#include <algorithm>
#include <utility>

#include "plugins/av/sound/sampleform.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

// On what the samples of a packet depend: it decides how many packets earlier decoding has to start.
enum class Dependence {
    none,    // on the packets since the last key packet
    recent,  // on some packets before: overlap, filters, bit reservoir of MP3 (511 bytes), levels of Opus
    all,     // on all packets before, as with generators of noise and dither
};
// Decoding starts at least so far back where packets depend on recent ones.
constexpr std::size_t leastPackets = 12;
constexpr std::size_t leastBytes = 1024;
constexpr std::size_t leastSamples = 9600;
constexpr std::size_t leastOpusSamples = 48000;

Dependence dependenceOf(AVCodecID codec) {
    const AVCodecDescriptor* const row = avcodec_descriptor_get(codec);
    if (row && (row->props & AV_CODEC_PROP_LOSSLESS) && !(row->props & AV_CODEC_PROP_LOSSY))
        return Dependence::none;
    switch (codec) {
        case AV_CODEC_ID_ADPCM_IMA_WAV:
        case AV_CODEC_ID_ADPCM_MS: return Dependence::none;
        case AV_CODEC_ID_MP3:
        case AV_CODEC_ID_VORBIS:
        case AV_CODEC_ID_OPUS:
        case AV_CODEC_ID_DTS: return Dependence::recent;
        default:
            return codec >= AV_CODEC_ID_FIRST_AUDIO && codec < AV_CODEC_ID_ADPCM_IMA_QT ? Dependence::none
                                                                                        : Dependence::all;
    }
}

// The first packets are decoded to check the numbers of samples that packets state.
constexpr std::size_t probedPackets = 16;

// Bytes of the AMR frame with this first byte. Some containers put several frames into a packet, but the
// decoder only takes the first frame of a packet.
int amrFrameBytes(AVCodecID codec, int first) {
    constexpr int narrow[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 1, 1, 1, 1, 1, 1, 1},
                  wide[16] = {18, 24, 33, 37, 41, 47, 51, 59, 61, 6, 1, 1, 1, 1, 1, 1};
    return (codec == AV_CODEC_ID_AMR_WB ? wide : narrow)[first >> 3 & 15];
}

// Pre-skip, the samples to drop at the start, from the header of Opus; 0 for other codecs.
std::uint32_t headerPriming(const AVCodecParameters& codec) {
    constexpr int at = 10;  // byte of the header
    if (codec.codec_id != AV_CODEC_ID_OPUS || codec.extradata_size < at + 2) return 0;
    return codec.extradata[at] | static_cast<std::uint32_t>(codec.extradata[at + 1]) << 8;
}

// The codec's name for users. The engine compares it, too.
std::string nameOf(AVCodecID codec) {
    if (codec >= AV_CODEC_ID_FIRST_AUDIO && codec < AV_CODEC_ID_ADPCM_IMA_QT) return "PCM";
    switch (codec) {
        case AV_CODEC_ID_AAC:
        case AV_CODEC_ID_AAC_LATM: return "AAC";
        case AV_CODEC_ID_AC3: return "AC-3";
        case AV_CODEC_ID_EAC3: return "E-AC-3";
        case AV_CODEC_ID_MP2: return "MP2";
        case AV_CODEC_ID_MP3: return "MP3";
        case AV_CODEC_ID_OPUS: return "Opus";
        case AV_CODEC_ID_VORBIS: return "Vorbis";
        case AV_CODEC_ID_FLAC: return "FLAC";
        case AV_CODEC_ID_ALAC: return "ALAC";
        case AV_CODEC_ID_DTS: return "DTS";
        default: return avcodec_get_name(codec);
    }
}

}  // namespace

std::unique_ptr<DecodedSamples> DecodedSamples::open(const MediaBytes& bytes, const std::string& format,
                                                     int stream, std::shared_ptr<const PacketIndex> index,
                                                     std::string& reason) {
    std::unique_ptr<DecodedSamples> made(new DecodedSamples);
    made->input_ = MediaInput::open(bytes, format, reason);
    if (!made->input_) return nullptr;
    made->stream_ = stream;
    made->index_ = std::move(index);
    made->input_->selectOnly(stream);
    made->packet_.reset(av_packet_alloc());
    made->frame_.reset(av_frame_alloc());
    if (!made->packet_ || !made->frame_) {
        reason = "out of memory";
        return nullptr;
    }
    return made->openCodec(reason) ? std::move(made) : nullptr;
}

// Every seek opens a new codec: a flushed one still depends on what it decoded before.
bool DecodedSamples::openCodec(std::string& reason) {
    const AVCodecParameters& parameters = *stream().codecpar;
    const AVCodec* const decoder = avcodec_find_decoder(parameters.codec_id);
    if (!decoder) {
        reason = parameters.codec_id == AV_CODEC_ID_NONE
                     ? std::string("the file does not say what it is")
                     : std::string("there is no decoder for ") + nameOf(parameters.codec_id);
        return false;
    }
    codec_.reset(avcodec_alloc_context3(decoder));
    if (!codec_ || avcodec_parameters_to_context(codec_.get(), &parameters) < 0) {
        reason = "out of memory";
        return false;
    }
    codec_->pkt_timebase = stream().time_base;
    codec_->thread_count = 1;
    if (trustsCounts_) codec_->flags2 |= AV_CODEC_FLAG2_SKIP_MANUAL;
    if (const int result = avcodec_open2(codec_.get(), decoder, nullptr); result < 0) {
        reason = std::string("its ") + nameOf(parameters.codec_id) + " can't be decoded (" +
                 errorText(result) + ")";
        return false;
    }
    return true;
}

bool DecodedSamples::seek(std::size_t packet) {
    const bool atStart = packet == 0 && !started_;
    pending_ = draining_ = false;
    av_packet_unref(packet_.get());
    if (std::exchange(used_, false) && !openCodec(failure_)) return false;
    position_ = packet;
    currentPacket_ = packet;
    doneOfCurrent_ = 0;
    if (atStart) return true;
    const bool found =
        packet == 0 ? input_->rewind() : input_->seekTo(stream_, index_->keyOf(stream_, packet), packet);
    if (!found) failure_ = input_->failure();
    return found;
}

// Sends the packet to the codec; of AMR, its next frame.
int DecodedSamples::send() {
    AVPacket& packet = *packet_;
    const AVCodecID codec = codec_->codec_id;
    if (packet.size == 0 || (codec != AV_CODEC_ID_AMR_NB && codec != AV_CODEC_ID_AMR_WB)) {
        const int result = avcodec_send_packet(codec_.get(), &packet);
        pending_ = result == AVERROR(EAGAIN);
        return result;
    }
    const int all = packet.size, bytes = std::min(amrFrameBytes(codec, packet.data[0]), all);
    packet.size = bytes;
    const int result = avcodec_send_packet(codec_.get(), &packet);
    packet.size = all;
    pending_ = result == AVERROR(EAGAIN);
    if (!pending_ && bytes < all) {
        packet.data += bytes;
        packet.size -= bytes;
        pending_ = true;
    }
    return result;
}

DecodedSamples::Next DecodedSamples::outOfMemory() {
    failure_ = "out of memory";
    return Next::failed;
}

// Decodes the next frame into frame_.
DecodedSamples::Next DecodedSamples::decode() {
    for (;;) {
        const int result = avcodec_receive_frame(codec_.get(), frame_.get());
        if (result >= 0) return Next::block;
        if (result == AVERROR_EOF || (draining_ && result == AVERROR(EAGAIN))) return Next::end;
        if (result == AVERROR(ENOMEM)) return outOfMemory();
        if (draining_) continue;
        started_ = used_ = true;
        if (!pending_) {
            const MediaInput::Read read = input_->read(*packet_);
            if (read == MediaInput::Read::failed && position_ < packets().size()) {
                failure_ = input_->failure();
                return Next::failed;
            }
            if (read != MediaInput::Read::packet) {
                draining_ = true;
                avcodec_send_packet(codec_.get(), nullptr);
                continue;
            }
            codec_->reordered_opaque = static_cast<std::int64_t>(position_++);
        }
        const int sent = send();
        if (sent == AVERROR(ENOMEM)) return outOfMemory();
        if (sent < 0 && sent != AVERROR(EAGAIN)) ++undecoded_;
        if (!pending_) av_packet_unref(packet_.get());
    }
}

// The first frame decides rate, channels and format of the sound. Where they change later, the sound ends.
void DecodedSamples::adoptFormat(const AVFrame& frame) {
    if (samplerate_ != 0) return;
    samplerate_ = rate();
    channels_ = frame.ch_layout.nb_channels;
    sampleFormat_ = static_cast<AVSampleFormat>(frame.format);
}

// Whether all packets state how many samples they have, and the first ones decode to as many.
bool DecodedSamples::checkStatedCounts() {
    const auto& all = packets();
    if (std::any_of(all.begin(), all.end(),
                    [](const IndexedPacket& packet) { return packet.samples == unknownSamples; }))
        return false;
    codec_->flags2 |= AV_CODEC_FLAG2_SKIP_MANUAL;
    std::vector<std::uint64_t> decoded(std::min(all.size(), probedPackets), 0);
    while (decode() == Next::block) {
        adoptFormat(*frame_);
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (!hasSameFormat() || packet >= decoded.size()) break;
        if (const auto* skip = av_frame_get_side_data(frame_.get(), AV_FRAME_DATA_SKIP_SAMPLES);
            skip && skip->size >= 4 && packet == 0 && decoded[0] == 0)
            codecPriming_ = AV_RL32(skip->data);
        decoded[packet] += static_cast<std::uint64_t>(frame_->nb_samples);
    }
    // AAC with spectral band replication may state half of its sample rate, and half of the samples.
    const bool doubles =
        stream().codecpar->codec_id == AV_CODEC_ID_AAC || stream().codecpar->codec_id == AV_CODEC_ID_AAC_LATM;
    primingScale_ = doubles && decoded[0] == 2 * std::uint64_t{all[0].samples} ? 2 : 1;
    for (std::size_t i = 0; i < decoded.size(); ++i)
        if (decoded[i] != std::uint64_t{all[i].samples} * primingScale_) return false;
    counts_.clear();
    counts_.reserve(all.size());
    for (const IndexedPacket& packet : all) counts_.push_back(packet.samples * primingScale_);
    return samplerate_ != 0;
}

// Decodes the whole stream once.
bool DecodedSamples::countByDecoding(std::string& reason) {
    samplerate_ = 0;
    counts_.assign(packets().size(), 0);
    Next result = seek(0) ? decode() : Next::failed;
    for (; result == Next::block; result = decode()) {
        adoptFormat(*frame_);
        if (!hasSameFormat()) {
            formatChange_ = "it changes to " + std::to_string(rate()) + " Hz and " +
                            std::to_string(frame_->ch_layout.nb_channels) + " channels, and ends there";
            break;
        }
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (packet < counts_.size()) counts_[packet] += static_cast<std::uint32_t>(frame_->nb_samples);
    }
    if (result == Next::failed) reason = failure_;
    return result != Next::failed;
}

bool DecodedSamples::describe(SoundFormat& format, std::string& reason) {
    if (packets().empty()) {
        reason = "its stream of sound is empty";
        return false;
    }
    trustsCounts_ = checkStatedCounts();
    if (!trustsCounts_ && !countByDecoding(reason)) return false;
    undecoded_ = 0;
    currentPacket_ = noPacket;
    const AVCodecParameters& parameters = *stream().codecpar;
    format.samplerate = samplerate_;
    format.channels = channels_;
    format.bits = bitsOf(sampleFormat_);
    if (samplerate_ < 1 || samplerate_ > limits::samplerate || channels_ < 1 ||
        channels_ > limits::channels || format.bits == 0) {
        reason =
            samplerate_ == 0 ? "none of its sound can be decoded" : "its sound has a form that is not known";
        return false;
    }
    if (frame_->ch_layout.order == AV_CHANNEL_ORDER_NATIVE) format.mask = frame_->ch_layout.u.mask;
    if (parameters.ch_layout.order == AV_CHANNEL_ORDER_NATIVE) format.mask = parameters.ch_layout.u.mask;
    format.codec = nameOf(parameters.codec_id);
    format.lost = formatChange_;
    format.bitrate = static_cast<int>(std::clamp<std::int64_t>(parameters.bit_rate / 1000, 0, 1'000'000));
    return true;
}

// Samples to drop at the start as Matroska states them, which its times take into account: where pictures say
// when the film starts, the times do.
std::uint32_t DecodedSamples::statedPriming() {
    const AVCodecParameters& codec = *stream().codecpar;
    if (av_match_name("matroska", input_->context().iformat->name) <= 0 || codec.sample_rate < 1) return 0;
    const std::int64_t samples = av_rescale(codec.initial_padding, samplerate_, codec.sample_rate);
    return static_cast<std::uint32_t>(std::clamp<std::int64_t>(samples, 0, samplerate_));
}

bool DecodedSamples::place(bool hasZero, std::int64_t zero, std::int64_t zeroBase, SoundFormat& format,
                           std::string& reason) {
    const AVRational base = stream().time_base;
    const std::int64_t origin =
        hasZero ? av_rescale(zero, samplerate_, std::max<std::int64_t>(zeroBase, 1)) : 0;
    places_.set(packets(), counts_,
                {trustsCounts_, primingScale_,
                 std::max({headerPriming(*stream().codecpar), codecPriming_, hasZero ? 0 : statedPriming()})},
                {base.num, base.den, samplerate_, hasZero, origin});
    counts_ = {};
    format.samples = places_.samples();
    if (format.samples == 0) reason = "none of its sound belongs to the film";
    return format.samples > 0;
}

// The packet with which decoding has to start so that `packet` gives the same samples as when the stream is
// decoded from its start.
std::size_t DecodedSamples::startFor(std::size_t packet) const {
    const auto& all = packets();
    const AVCodecID codec = codec_->codec_id;
    switch (dependenceOf(codec)) {
        case Dependence::all: return 0;
        case Dependence::none:
            while (packet > 0 && !all[packet].key()) --packet;
            return packet;
        case Dependence::recent: break;
    }
    const std::size_t enough = codec == AV_CODEC_ID_OPUS ? leastOpusSamples : leastSamples;
    std::size_t before = 0, bytes = 0, samples = 0;
    while (packet > 0 && (before < leastPackets || bytes < leastBytes || samples < enough)) {
        --packet;
        ++before;
        bytes += all[packet].bytes;
        samples += places_.of(packet).front + places_.of(packet).kept;
    }
    return packet;
}

bool DecodedSamples::start(long long sample) {
    firstWanted_ = places_.packetAt(sample);
    const std::size_t first = startFor(std::min(firstWanted_, places_.packets() - 1));
    if (used_ && !draining_ && firstWanted_ > currentPacket_ && first <= position_) return true;
    return seek(first);
}

DecodedSamples::Next DecodedSamples::next(long long& at, std::vector<unsigned char>& block) {
    for (;;) {
        const Next result = decode();
        if (result != Next::block) return result;
        if (!hasSameFormat()) return Next::end;
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (packet >= places_.packets() || packet < firstWanted_) continue;
        if (std::exchange(currentPacket_, packet) != packet) doneOfCurrent_ = 0;
        const SamplePlaces::Place& place = places_.of(packet);
        const long long first = std::max<long long>(doneOfCurrent_, place.front),
                        end = std::min<long long>(doneOfCurrent_ + frame_->nb_samples,
                                                  static_cast<long long>(place.front) + place.kept);
        const long long skipped = first - std::exchange(doneOfCurrent_, doneOfCurrent_ + frame_->nb_samples);
        if (first >= end) continue;
        at = place.start + first - place.front;
        interleave(*frame_, static_cast<int>(skipped), static_cast<int>(end - first), block);
        return Next::block;
    }
}

}  // namespace av
