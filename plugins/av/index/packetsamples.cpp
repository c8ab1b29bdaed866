#include "plugins/av/index/packetsamples.h"

#include "plugins/av/source/avheaders.h"

namespace av {

namespace {

using Bytes = std::span<const std::uint8_t>;

std::uint32_t bits(Bytes data, std::size_t at, int count) {
    std::uint32_t value = 0;
    for (; count > 0; --count, ++at)
        value = value << 1 | (at / 8 < data.size() ? data[at / 8] >> (7 - at % 8) & 1u : 0u);
    return value;
}

// Blocks of 256 samples. Only E-AC-3 has others than six.
std::uint32_t ofAc3(Bytes data, bool enhanced) {
    constexpr std::uint32_t blocks[] = {1, 2, 3, 6};
    if (data.size() < 6) return 0;
    const bool swapped = data[0] == 0x77 && data[1] == 0x0B;
    if (!swapped && (data[0] != 0x0B || data[1] != 0x77)) return 0;
    if (!enhanced || bits(data, 32, 2) == 3) return 6 * 256;
    return blocks[bits(data, 34, 2)] * 256;
}

// At 48 kHz. The first byte says the length of a frame and how many there are.
std::uint32_t ofOpus(Bytes data) {
    if (data.empty()) return 0;
    const unsigned config = data[0] >> 3, code = data[0] & 3;
    constexpr std::uint32_t silk[] = {480, 960, 1920, 2880}, hybrid[] = {480, 960},
                            celt[] = {120, 240, 480, 960};
    const std::uint32_t frame = config < 12   ? silk[config & 3]
                                : config < 16 ? hybrid[config & 1]
                                              : celt[config & 3];
    if (code < 3) return code == 0 ? frame : 2 * frame;
    return data.size() < 2 ? 0 : (data[1] & 63u) * frame;
}

// The codec's header has the usual length of a frame; one that is shorter states its own.
std::uint32_t ofAlac(Bytes data, Bytes header) {
    constexpr std::size_t usual = 12 * 8, hasLength = 19, length = 23;
    if (header.size() < 36) return unknownSamples;
    return bits(data, hasLength, 1) ? bits(data, length, 32) : bits(header, usual, 32);
}

// The core, in the byte order of discs; an extension of another rate shows when the first packets are
// decoded.
std::uint32_t ofDts(Bytes data) {
    constexpr std::uint32_t sync = 0x7FFE8001;
    return bits(data, 0, 32) == sync ? (bits(data, 39, 7) + 1) * 32 : unknownSamples;
}

bool isFixed(AVCodecID codec) {
    return codec == AV_CODEC_ID_AAC || codec == AV_CODEC_ID_AAC_LATM || codec == AV_CODEC_ID_TRUEHD ||
           codec == AV_CODEC_ID_MLP;
}

bool followsFromBytes(AVCodecID codec) {
    switch (codec) {
        case AV_CODEC_ID_ADPCM_IMA_WAV:
        case AV_CODEC_ID_ADPCM_IMA_QT:
        case AV_CODEC_ID_ADPCM_MS:
        case AV_CODEC_ID_AMR_NB:
        case AV_CODEC_ID_AMR_WB:
        case AV_CODEC_ID_GSM:
        case AV_CODEC_ID_GSM_MS: return true;
        default: return codec >= AV_CODEC_ID_FIRST_AUDIO && codec < AV_CODEC_ID_ADPCM_IMA_QT;
    }
}

}  // namespace

void PacketSamples::FreeVorbis::operator()(AVVorbisParseContext* context) const {
    av_vorbis_parse_free(&context);
}

PacketSamples::PacketSamples(const AVCodecParameters& codec) : codec_(&codec) {
    if (codec.codec_id == AV_CODEC_ID_VORBIS && codec.extradata_size > 0)
        vorbis_.reset(av_vorbis_parse_init(codec.extradata, codec.extradata_size));
}

PacketSamples::~PacketSamples() = default;
PacketSamples::PacketSamples(PacketSamples&&) noexcept = default;

std::uint32_t PacketSamples::keepsForm(int form, std::uint32_t samples) {
    if (form_ < 0) form_ = form;
    return form_ == form ? samples : unknownSamples;
}

// Layers I to III: a frame's header has its length, which the packet may not reach.
std::uint32_t PacketSamples::ofMpeg(Bytes data) {
    constexpr int kilobits[2][3][15] = {
        // MPEG-1, layers I to III
        {{0, 32, 64, 96, 128, 160, 192, 224, 256, 288, 320, 352, 384, 416, 448},
         {0, 32, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320, 384},
         {0, 32, 40, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320}},
        // MPEG-2 and 2.5
        {{0, 32, 48, 56, 64, 80, 96, 112, 128, 144, 160, 176, 192, 224, 256},
         {0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160},
         {0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160}}};
    if (data.size() < 4 || bits(data, 0, 11) != 0x7FF) return 0;
    const unsigned version = bits(data, 11, 2), layer = 4 - bits(data, 13, 2), rate = bits(data, 16, 4),
                   frequency = bits(data, 20, 2);
    if (version == 1 || layer == 4 || rate == 15 || frequency == 3) return 0;
    if (rate == 0) return unknownSamples;  // "free format"
    const bool low = version != 3;
    const std::uint32_t samples = layer == 1 ? 384 : layer == 3 && low ? 576 : 1152;
    constexpr int hertz[] = {44100, 48000, 32000};
    const int full = hertz[frequency], halved = version == 3 ? full : version == 2 ? full / 2 : full / 4;
    const unsigned bytes = samples / 8 * static_cast<unsigned>(kilobits[low][layer - 1][rate]) * 1000 /
                           static_cast<unsigned>(halved);
    if (data.size() + 8 < bytes) return unknownSamples;
    const bool mono = bits(data, 24, 2) == 3;
    return keepsForm(halved * 2 + (mono ? 1 : 0), samples);
}

std::uint32_t PacketSamples::ofFlac(Bytes data) {
    if (data.size() < 7 || bits(data, 0, 15) != 0x7FFC) return 0;
    const unsigned size = bits(data, 16, 4), channels = bits(data, 24, 4);
    // The number of the frame or sample, coded as a character of UTF-8, is between.
    std::size_t after = 5;
    for (unsigned lead = data[4]; (lead & 0xC0) == 0xC0; lead = lead << 1 & 0xFF) ++after;
    std::uint32_t samples = 0;
    switch (size) {
        case 0: return 0;
        case 1: samples = 192; break;
        case 6: samples = bits(data, after * 8, 8) + 1; break;
        case 7: samples = bits(data, after * 8, 16) + 1; break;
        default: samples = size < 6 ? 576u << (size - 2) : 256u << (size - 8);
    }
    // Codes 8 to 10 are ways to code two channels.
    return keepsForm(static_cast<int>(bits(data, 20, 4) << 4 | (channels < 8 ? channels : 1)), samples);
}

// A packet completes the overlap with the one before it: the first gives nothing.
std::uint32_t PacketSamples::ofVorbis(Bytes data) {
    if (!vorbis_) return unknownSamples;
    int flags = 0;
    const int samples =
        av_vorbis_parse_frame_flags(vorbis_.get(), data.data(), static_cast<int>(data.size()), &flags);
    if (flags != 0) return 0;
    if (samples < 0) return unknownSamples;
    const bool first = !vorbisStarted_;
    vorbisStarted_ = true;
    return first ? 0 : static_cast<std::uint32_t>(samples);
}

std::uint32_t PacketSamples::next(const AVPacket& packet) {
    // Headers that change in mid-stream may change everything.
    if (av_packet_get_side_data(&packet, AV_PKT_DATA_PARAM_CHANGE, nullptr)) return unknownSamples;
    const Bytes data(packet.data, static_cast<std::size_t>(packet.size));
    const AVCodecID codec = codec_->codec_id;
    switch (codec) {
        case AV_CODEC_ID_MP1:
        case AV_CODEC_ID_MP2:
        case AV_CODEC_ID_MP3: return ofMpeg(data);
        case AV_CODEC_ID_AC3: return ofAc3(data, false);
        case AV_CODEC_ID_EAC3: return ofAc3(data, true);
        case AV_CODEC_ID_OPUS: return ofOpus(data);
        case AV_CODEC_ID_VORBIS: return ofVorbis(data);
        case AV_CODEC_ID_FLAC: return ofFlac(data);
        case AV_CODEC_ID_ALAC:
            return ofAlac(data, {codec_->extradata, static_cast<std::size_t>(codec_->extradata_size)});
        case AV_CODEC_ID_DTS: return ofDts(data);
        default: break;
    }
    int samples = 0;
    if (followsFromBytes(codec))
        samples = av_get_audio_frame_duration2(const_cast<AVCodecParameters*>(codec_), packet.size);
    else if (isFixed(codec))
        samples = codec_->frame_size;
    return samples > 0 ? static_cast<std::uint32_t>(samples) : unknownSamples;
}

}  // namespace av
