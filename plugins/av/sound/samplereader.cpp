#include "plugins/av/sound/samplereader.h"

#include <algorithm>
#include <cstring>
#include <utility>
#include <vector>

#include "core/media/qvbuffer.h"
#include "plugins/av/sound/sampleform.h"
#include "plugins/av/sound/sampleplaces.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

// What a codec carries from packet to packet: it decides how many packets earlier decoding has to start.
enum class Memory {
    none,   // a key packet is enough
    fades,  // overlaps, filters, the bit reservoir of MP3 (511 bytes back), the levels of Opus
    stays,  // generators of noise and dither: only decoding from the start gives the same
};
constexpr std::size_t prerollPackets = 12;
constexpr std::size_t prerollBytes = 1024;
constexpr std::size_t prerollSamples = 9600;
constexpr std::size_t opusPrerollSamples = 48000;

Memory memoryOf(AVCodecID codec) {
    const AVCodecDescriptor* const row = avcodec_descriptor_get(codec);
    if (row && (row->props & AV_CODEC_PROP_LOSSLESS) && !(row->props & AV_CODEC_PROP_LOSSY))
        return Memory::none;
    switch (codec) {
        case AV_CODEC_ID_ADPCM_IMA_WAV:
        case AV_CODEC_ID_ADPCM_MS: return Memory::none;
        case AV_CODEC_ID_MP3:
        case AV_CODEC_ID_VORBIS:
        case AV_CODEC_ID_OPUS:
        case AV_CODEC_ID_DTS: return Memory::fades;
        default:
            return codec >= AV_CODEC_ID_FIRST_AUDIO && codec < AV_CODEC_ID_ADPCM_IMA_QT ? Memory::none
                                                                                        : Memory::stays;
    }
}

constexpr std::size_t nothing = static_cast<std::size_t>(-1);

// Packets that are decoded at the start to check the numbers of samples that packets state.
constexpr std::size_t probedPackets = 16;

// Bytes of the frame of AMR that begins there; some containers put several into a packet, and the codec takes
// the first one of these.
int amrFrame(AVCodecID codec, int first) {
    constexpr int narrow[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 1, 1, 1, 1, 1, 1, 1},
                  wide[16] = {18, 24, 33, 37, 41, 47, 51, 59, 61, 6, 1, 1, 1, 1, 1, 1};
    return (codec == AV_CODEC_ID_AMR_WB ? wide : narrow)[first >> 3 & 15];
}

// Samples to drop at the start, as the header of Opus states them.
std::uint32_t ownPriming(const AVCodecParameters& codec) {
    constexpr int at = 10;
    if (codec.codec_id != AV_CODEC_ID_OPUS || codec.extradata_size < at + 2) return 0;
    return codec.extradata[at] | static_cast<std::uint32_t>(codec.extradata[at + 1]) << 8;
}

// The names that users see and that the engine compares.
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

// Packets state how many samples they have. If some do not, or are wrong, the stream is decoded once to
// count.
class SampleReader::Decoding {
  public:
    bool open(const MediaBytes& bytes, const std::string& format, int stream,
              std::shared_ptr<const PacketIndex> index, std::string& reason);
    bool describe(SoundFormat& format, std::string& reason);
    // Samples of the whole stream, after describe().
    bool place(bool hasZero, std::int64_t zero, std::int64_t zeroBase, SoundFormat& format,
               std::string& reason);
    bool start(long long sample);  // decoding delivers this sample next, or later ones
    // The next block of samples. `at` is its place in the film.
    enum class Next { block, end, failed };
    Next next(long long& at, std::vector<unsigned char>& block);
    const std::string& failure() const { return failure_; }
    long long lost() const { return lost_; }

  private:
    std::unique_ptr<MediaInput> input_;
    std::shared_ptr<const PacketIndex> index_;
    int stream_ = 0;
    CodecPtr codec_;
    PacketPtr packet_;
    FramePtr frame_;
    bool waiting_ = false, draining_ = false;
    bool started_ = false, used_ = false;  // the file was read; the codec was given packets
    std::size_t position_ = 0;             // packet that is read next
    std::size_t from_ = 0;                 // packets before it are decoded, and not delivered
    std::vector<std::uint32_t> counts_;    // of a packet: samples, until they are placed
    bool told_ = false;  // by the packets: priming and padding are cut here, not by the codec
    unsigned primingScale_ = 1;
    std::uint32_t knownPriming_ = 0;  // what the codec knows of the encoder that made the stream
    SamplePlaces places_;
    std::size_t current_ = nothing;  // packet of the frame before
    long long within_ = 0;           // samples of it that were decoded
    int samplerate_ = 0, channels_ = 0;
    AVSampleFormat kind_ = AV_SAMPLE_FMT_NONE;
    long long lost_ = 0;
    std::string failure_, change_;

    const std::vector<IndexedPacket>& packets() const { return index_->packets(stream_); }
    AVStream& stream() { return *input_->context().streams[stream_]; }
    // In MPEG audio the first frame after a change of the rate still states the old one.
    int rate() const { return codec_->sample_rate > 0 ? codec_->sample_rate : frame_->sample_rate; }
    bool isSame() const {
        return rate() == samplerate_ && frame_->ch_layout.nb_channels == channels_ && frame_->format == kind_;
    }
    bool openCodec(std::string& reason);
    bool seek(std::size_t packet);
    int send();
    Next decode();
    Next outOfMemory() {
        failure_ = "out of memory";
        return Next::failed;
    }
    bool decodesAsTold();
    bool countByDecoding(std::string& reason);
    void take(const AVFrame& frame);
    std::size_t startFor(std::size_t packet) const;
};

bool SampleReader::Decoding::open(const MediaBytes& bytes, const std::string& format, int stream,
                                  std::shared_ptr<const PacketIndex> index, std::string& reason) {
    input_ = MediaInput::open(bytes, format, reason);
    if (!input_) return false;
    stream_ = stream;
    index_ = std::move(index);
    input_->selectOnly(stream);
    packet_.reset(av_packet_alloc());
    frame_.reset(av_frame_alloc());
    if (packet_ && frame_) return openCodec(reason);
    reason = "out of memory";
    return false;
}

// Each start gets a new codec: a flushed one still remembers some of what it decoded before.
bool SampleReader::Decoding::openCodec(std::string& reason) {
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
    if (told_) codec_->flags2 |= AV_CODEC_FLAG2_SKIP_MANUAL;
    if (const int result = avcodec_open2(codec_.get(), decoder, nullptr); result < 0) {
        reason = std::string("its ") + nameOf(parameters.codec_id) + " can't be decoded (" +
                 errorText(result) + ")";
        return false;
    }
    return true;
}

bool SampleReader::Decoding::seek(std::size_t packet) {
    const bool atStart = packet == 0 && !started_;
    waiting_ = draining_ = false;
    av_packet_unref(packet_.get());
    if (std::exchange(used_, false) && !openCodec(failure_)) return false;
    position_ = packet;
    current_ = packet;
    within_ = 0;
    if (atStart) return true;
    const bool found =
        packet == 0 ? input_->rewind() : input_->seekTo(stream_, index_->keyOf(stream_, packet), packet);
    if (!found) failure_ = input_->failure();
    return found;
}

// Sends the packet to the codec; of several frames in it, the first that is left.
int SampleReader::Decoding::send() {
    AVPacket& packet = *packet_;
    const AVCodecID codec = codec_->codec_id;
    if (packet.size == 0 || (codec != AV_CODEC_ID_AMR_NB && codec != AV_CODEC_ID_AMR_WB)) {
        const int result = avcodec_send_packet(codec_.get(), &packet);
        waiting_ = result == AVERROR(EAGAIN);
        return result;
    }
    const int all = packet.size, bytes = std::min(amrFrame(codec, packet.data[0]), all);
    packet.size = bytes;
    const int result = avcodec_send_packet(codec_.get(), &packet);
    packet.size = all;
    waiting_ = result == AVERROR(EAGAIN);
    if (!waiting_ && bytes < all) {
        packet.data += bytes;
        packet.size -= bytes;
        waiting_ = true;
    }
    return result;
}

// Decodes the next frame into frame_.
SampleReader::Decoding::Next SampleReader::Decoding::decode() {
    for (;;) {
        const int result = avcodec_receive_frame(codec_.get(), frame_.get());
        if (result >= 0) return Next::block;
        if (result == AVERROR_EOF || (draining_ && result == AVERROR(EAGAIN))) return Next::end;
        if (result == AVERROR(ENOMEM)) return outOfMemory();
        if (draining_) continue;
        started_ = used_ = true;
        if (!waiting_) {
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
        if (sent < 0 && sent != AVERROR(EAGAIN)) ++lost_;
        if (!waiting_) av_packet_unref(packet_.get());
    }
}

// The first frame determines rate, channels and format of the sound. The stream ends where they change.
void SampleReader::Decoding::take(const AVFrame& frame) {
    if (samplerate_ != 0) return;
    samplerate_ = rate();
    channels_ = frame.ch_layout.nb_channels;
    kind_ = static_cast<AVSampleFormat>(frame.format);
}

// Whether all packets state how many samples they have, and the first ones really have as many.
bool SampleReader::Decoding::decodesAsTold() {
    const auto& all = packets();
    if (std::any_of(all.begin(), all.end(),
                    [](const IndexedPacket& packet) { return packet.samples == unknownSamples; }))
        return false;
    codec_->flags2 |= AV_CODEC_FLAG2_SKIP_MANUAL;
    std::vector<std::uint64_t> decoded(std::min(all.size(), probedPackets), 0);
    while (decode() == Next::block) {
        take(*frame_);
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (!isSame() || packet >= decoded.size()) break;
        if (const auto* skip = av_frame_get_side_data(frame_.get(), AV_FRAME_DATA_SKIP_SAMPLES);
            skip && skip->size >= 4 && packet == 0 && decoded[0] == 0)
            knownPriming_ = AV_RL32(skip->data);
        decoded[packet] += static_cast<std::uint64_t>(frame_->nb_samples);
    }
    // AAC with spectral band replication may state half of its rate.
    const bool doubles =
        stream().codecpar->codec_id == AV_CODEC_ID_AAC || stream().codecpar->codec_id == AV_CODEC_ID_AAC_LATM;
    const std::uint64_t told = all[0].samples;
    primingScale_ = doubles && decoded[0] == 2 * told ? 2 : 1;
    for (std::size_t i = 0; i < decoded.size(); ++i)
        if (decoded[i] != std::uint64_t{all[i].samples} * primingScale_) return false;
    counts_.clear();
    counts_.reserve(all.size());
    for (const IndexedPacket& packet : all) counts_.push_back(packet.samples * primingScale_);
    return samplerate_ != 0;
}

bool SampleReader::Decoding::countByDecoding(std::string& reason) {
    samplerate_ = 0;
    counts_.assign(packets().size(), 0);
    Next result = seek(0) ? decode() : Next::failed;
    for (; result == Next::block; result = decode()) {
        take(*frame_);
        if (!isSame()) {
            change_ = "it changes to " + std::to_string(rate()) + " Hz and " +
                      std::to_string(frame_->ch_layout.nb_channels) + " channels, and ends there";
            break;
        }
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (packet < counts_.size()) counts_[packet] += static_cast<std::uint32_t>(frame_->nb_samples);
    }
    if (result == Next::failed) reason = failure_;
    return result != Next::failed;
}

bool SampleReader::Decoding::describe(SoundFormat& format, std::string& reason) {
    if (packets().empty()) {
        reason = "its stream of sound is empty";
        return false;
    }
    told_ = decodesAsTold();
    if (!told_ && !countByDecoding(reason)) return false;
    lost_ = 0;
    current_ = nothing;
    const AVCodecParameters& parameters = *stream().codecpar;
    format.samplerate = samplerate_;
    format.channels = channels_;
    format.bits = bitsOf(kind_);
    if (samplerate_ < 1 || samplerate_ > limits::samplerate || channels_ < 1 ||
        channels_ > limits::channels || format.bits == 0) {
        reason =
            samplerate_ == 0 ? "none of its sound can be decoded" : "its sound has a form that is not known";
        return false;
    }
    if (frame_->ch_layout.order == AV_CHANNEL_ORDER_NATIVE) format.mask = frame_->ch_layout.u.mask;
    if (parameters.ch_layout.order == AV_CHANNEL_ORDER_NATIVE) format.mask = parameters.ch_layout.u.mask;
    format.codec = nameOf(parameters.codec_id);
    format.lost = change_;
    format.bitrate = static_cast<int>(std::clamp<std::int64_t>(parameters.bit_rate / 1000, 0, 1'000'000));
    return true;
}

bool SampleReader::Decoding::place(bool hasZero, std::int64_t zero, std::int64_t zeroBase,
                                   SoundFormat& format, std::string& reason) {
    const AVRational base = stream().time_base;
    const std::int64_t origin =
        hasZero ? av_rescale(zero, samplerate_, std::max<std::int64_t>(zeroBase, 1)) : 0;
    places_.set(packets(), counts_,
                {told_, primingScale_, std::max(ownPriming(*stream().codecpar), knownPriming_)},
                {base.num, base.den, samplerate_, hasZero, origin});
    counts_ = {};
    format.samples = places_.samples();
    if (format.samples == 0) reason = "none of its sound belongs to the film";
    return format.samples > 0;
}

// Where decoding has to start so that this packet gives the same samples as from the start of the stream.
std::size_t SampleReader::Decoding::startFor(std::size_t packet) const {
    const auto& all = packets();
    const AVCodecID codec = codec_->codec_id;
    switch (memoryOf(codec)) {
        case Memory::stays: return 0;
        case Memory::none:
            while (packet > 0 && !all[packet].key()) --packet;
            return packet;
        case Memory::fades: break;
    }
    const std::size_t enough = codec == AV_CODEC_ID_OPUS ? opusPrerollSamples : prerollSamples;
    std::size_t before = 0, bytes = 0, samples = 0;
    while (packet > 0 && (before < prerollPackets || bytes < prerollBytes || samples < enough)) {
        --packet;
        ++before;
        bytes += all[packet].bytes;
        samples += places_.of(packet).front + places_.of(packet).kept;
    }
    return packet;
}

bool SampleReader::Decoding::start(long long sample) {
    from_ = places_.packetAt(sample);
    const std::size_t first = startFor(std::min(from_, places_.packets() - 1));
    if (used_ && !draining_ && from_ > current_ && first <= position_) return true;
    return seek(first);
}

SampleReader::Decoding::Next SampleReader::Decoding::next(long long& at, std::vector<unsigned char>& block) {
    for (;;) {
        const Next result = decode();
        if (result != Next::block) return result;
        if (!isSame()) return Next::end;
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (packet >= places_.packets() || packet < from_) continue;
        if (std::exchange(current_, packet) != packet) within_ = 0;
        const SamplePlaces::Place& place = places_.of(packet);
        const long long first = std::max<long long>(within_, place.front),
                        end = std::min<long long>(within_ + frame_->nb_samples,
                                                  static_cast<long long>(place.front) + place.kept);
        const long long skipped = first - std::exchange(within_, within_ + frame_->nb_samples);
        if (first >= end) continue;
        at = place.start + first - place.front;
        interleave(*frame_, static_cast<int>(skipped), static_cast<int>(end - first), block);
        return Next::block;
    }
}

SampleReader::SampleReader() = default;
SampleReader::~SampleReader() = default;

std::unique_ptr<SampleReader> SampleReader::open(const MediaBytes& bytes, const std::string& format,
                                                 int stream, std::shared_ptr<const PacketIndex> index,
                                                 bool hasZero, std::int64_t zero, std::int64_t zeroBase,
                                                 std::string& reason) {
    std::unique_ptr<SampleReader> reader(new SampleReader);
    reader->decoding_ = std::make_unique<Decoding>();
    Decoding& decoding = *reader->decoding_;
    if (!decoding.open(bytes, format, stream, std::move(index), reason) ||
        !decoding.describe(reader->format_, reason) ||
        !decoding.place(hasZero, zero, zeroBase, reader->format_, reason))
        return nullptr;
    return reader;
}

bool SampleReader::seek(long long sample) {
    if (sample < 0 || sample > format_.samples) return false;
    const auto size = static_cast<std::size_t>(format_.channels) * static_cast<std::size_t>(format_.bits / 8);
    const bool isThere =
        sample >= blockAt_ && sample < blockAt_ + static_cast<long long>(block_.size() / size);
    if (sample != next_ && !isThere) moved_ = true;
    next_ = sample;
    return true;
}

// Reads the next block into block_, which is empty at the end.
bool SampleReader::fetch() {
    if (std::exchange(moved_, false)) {
        block_.clear();
        ended_ = false;
        if (!decoding_->start(next_)) {
            failure_ = decoding_->failure();
            moved_ = true;
            return false;
        }
    }
    const auto result = decoding_->next(blockAt_, block_);
    concealed_ = std::max(concealed_, decoding_->lost());
    if (result == Decoding::Next::block) return true;
    block_.clear();
    ended_ = true;
    if (result == Decoding::Next::failed) failure_ = decoding_->failure();
    return result == Decoding::Next::end;
}

int SampleReader::read(QvPcm& to, int count) {
    const auto frame =
        static_cast<std::size_t>(format_.channels) * static_cast<std::size_t>(format_.bits / 8);
    count = static_cast<int>(std::min<long long>(count, format_.samples - next_));
    to.setSamples(0);
    int done = 0;
    while (done < count) {
        const auto size = static_cast<long long>(block_.size() / frame);
        if (moved_ || (!ended_ && next_ >= blockAt_ + size)) {
            if (!fetch()) return -1;
            continue;
        }
        // Silence up to the block, and after the last one.
        const bool silent = ended_ || next_ < blockAt_;
        long long n = count - done;
        if (!ended_) n = std::min(n, silent ? blockAt_ - next_ : blockAt_ + size - next_);
        unsigned char* const target = to.ptr(done);
        if (silent)
            std::memset(target, format_.bits == 8 ? 0x80 : 0, static_cast<std::size_t>(n) * frame);
        else
            std::memcpy(target, block_.data() + static_cast<std::size_t>(next_ - blockAt_) * frame,
                        static_cast<std::size_t>(n) * frame);
        done += static_cast<int>(n);
        next_ += n;
    }
    to.setSamples(done);
    return done;
}

}  // namespace av
