#include "plugins/av/sound/samplereader.h"

#include <algorithm>
#include <cstring>
#include <utility>
#include <vector>

#include "core/media/qvbuffer.h"
#include "plugins/av/sound/sampleform.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

// Packets before the wanted one that are decoded, so that what a codec carries from packet to packet is
// there: the bit reservoir of MP3 reaches furthest.
constexpr std::size_t preroll = 12;

bool standsAlone(AVCodecID codec) {
    const AVCodecDescriptor* const row = avcodec_descriptor_get(codec);
    return row && (row->props & AV_CODEC_PROP_LOSSLESS) && !(row->props & AV_CODEC_PROP_LOSSY);
}

// As people, and the engine's logic, know them.
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

// Where each packet's samples lie is found out once, by decoding: only the codec knows how many there are.
class SampleReader::Decoding {
  public:
    bool open(const MediaBytes& bytes, const std::string& format, int stream,
              std::shared_ptr<const PacketIndex> index, std::string& reason);
    bool describe(SoundFormat& format, std::string& reason);
    // Samples of the whole stream.
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
    bool waiting_ = false, draining_ = false, started_ = false;
    std::size_t position_ = 0;           // packet that is read next
    std::size_t from_ = 0;               // packets before it are decoded, and not delivered
    std::vector<std::uint32_t> counts_;  // of a packet: samples
    std::vector<long long> starts_;      // of a packet: place of the first of them
    std::size_t current_ = 0;            // packet of the frame before
    long long within_ = 0;               // samples of it that were delivered
    int samplerate_ = 0, channels_ = 0;
    AVSampleFormat kind_ = AV_SAMPLE_FMT_NONE;
    long long lost_ = 0;
    std::string failure_;

    const std::vector<IndexedPacket>& packets() const { return index_->packets(stream_); }
    AVStream& stream() { return *input_->context().streams[stream_]; }
    bool isSame() const {
        return frame_->sample_rate == samplerate_ && frame_->ch_layout.nb_channels == channels_ &&
               frame_->format == kind_;
    }
    bool seek(std::size_t packet);
    Next decode();
    Next outOfMemory() {
        failure_ = "out of memory";
        return Next::failed;
    }
};

bool SampleReader::Decoding::open(const MediaBytes& bytes, const std::string& format, int stream,
                                  std::shared_ptr<const PacketIndex> index, std::string& reason) {
    input_ = MediaInput::open(bytes, format, reason);
    if (!input_) return false;
    stream_ = stream;
    index_ = std::move(index);
    input_->selectOnly(stream);
    const AVCodecParameters& parameters = *this->stream().codecpar;
    const AVCodec* const decoder = avcodec_find_decoder(parameters.codec_id);
    if (!decoder) {
        reason = std::string("there is no decoder for ") + avcodec_get_name(parameters.codec_id);
        return false;
    }
    codec_.reset(avcodec_alloc_context3(decoder));
    packet_.reset(av_packet_alloc());
    frame_.reset(av_frame_alloc());
    if (!codec_ || !packet_ || !frame_ || avcodec_parameters_to_context(codec_.get(), &parameters) < 0) {
        reason = "out of memory";
        return false;
    }
    codec_->pkt_timebase = this->stream().time_base;
    codec_->thread_count = 1;
    if (const int result = avcodec_open2(codec_.get(), decoder, nullptr); result < 0) {
        reason = std::string("its ") + avcodec_get_name(parameters.codec_id) + " can't be decoded (" +
                 errorText(result) + ")";
        return false;
    }
    return true;
}

bool SampleReader::Decoding::seek(std::size_t packet) {
    const bool atStart = packet == 0 && !started_;
    waiting_ = draining_ = false;
    av_packet_unref(packet_.get());
    avcodec_flush_buffers(codec_.get());
    position_ = packet;
    current_ = packet;
    within_ = 0;
    if (atStart) return true;
    const bool found =
        packet == 0 ? input_->rewind() : input_->seekTo(stream_, packets()[packet].which(), packet);
    if (!found) failure_ = input_->failure();
    return found;
}

// The next frame of the codec, into frame_.
SampleReader::Decoding::Next SampleReader::Decoding::decode() {
    for (;;) {
        const int result = avcodec_receive_frame(codec_.get(), frame_.get());
        if (result >= 0) return Next::block;
        if (result == AVERROR_EOF || (draining_ && result == AVERROR(EAGAIN))) return Next::end;
        if (result == AVERROR(ENOMEM)) return outOfMemory();
        if (draining_) continue;
        started_ = true;
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
        const int sent = avcodec_send_packet(codec_.get(), packet_.get());
        if (sent == AVERROR(ENOMEM)) return outOfMemory();
        waiting_ = sent == AVERROR(EAGAIN);
        if (waiting_) continue;
        if (sent < 0) ++lost_;
        av_packet_unref(packet_.get());
    }
}

bool SampleReader::Decoding::describe(SoundFormat& format, std::string& reason) {
    if (packets().empty()) {
        reason = "its stream of sound is empty";
        return false;
    }
    counts_.assign(packets().size(), 0);
    const AVCodecParameters& parameters = *stream().codecpar;
    // The first frame says what it is; a change of that later is the end of the stream.
    for (;;) {
        const Next next = decode();
        if (next == Next::failed) {
            reason = failure_;
            return false;
        }
        if (next == Next::end) break;
        if (samplerate_ == 0) {
            samplerate_ = frame_->sample_rate;
            channels_ = frame_->ch_layout.nb_channels;
            kind_ = static_cast<AVSampleFormat>(frame_->format);
        }
        if (!isSame()) break;
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (packet < counts_.size()) counts_[packet] += static_cast<std::uint32_t>(frame_->nb_samples);
    }
    lost_ = 0;
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
    format.bitrate = static_cast<int>(std::clamp<std::int64_t>(parameters.bit_rate / 1000, 0, 1'000'000));
    return true;
}

bool SampleReader::Decoding::place(bool hasZero, std::int64_t zero, std::int64_t zeroBase,
                                   SoundFormat& format, std::string& reason) {
    const AVRational base = stream().time_base, sample{1, samplerate_};
    const long long unit = av_rescale_q_rnd(1, base, sample, AV_ROUND_UP);
    const long long tolerance = std::max<long long>(samplerate_ / 20, 2 * unit);
    const long long origin = hasZero ? av_rescale(zero, samplerate_, std::max<std::int64_t>(zeroBase, 1)) : 0;
    starts_.assign(counts_.size(), 0);
    long long due = 0, shift = 0, end = 0;
    bool first = true;
    for (std::size_t i = 0; i < counts_.size(); ++i) {
        if (counts_[i] == 0) {
            starts_[i] = due;
            continue;
        }
        const IndexedPacket& packet = packets()[i];
        long long at = due;
        if (packet.pts != AV_NOPTS_VALUE) {
            at = av_rescale_q(std::clamp<std::int64_t>(packet.pts, -(1LL << 60), 1LL << 60), base, sample) +
                 packet.skipAtStart - origin;
            if (first && !hasZero) shift = -at;
            at += shift;
        }
        if (!first && std::llabs(at - due) <= tolerance) at = due;
        // A jump of the clock is none of the film's silence.
        if (!first && std::llabs(at - due) > 30LL * 60 * 60 * samplerate_) {
            shift += due - at;
            at = due;
        }
        starts_[i] = at;
        due = std::max(due, at + counts_[i]);
        if (first) due = at + counts_[i];
        end = std::max(end, due);
        first = false;
    }
    format.samples = std::max<long long>(end, 0);
    if (format.samples == 0) reason = "none of its sound belongs to the film";
    return format.samples > 0;
}

bool SampleReader::Decoding::start(long long sample) {
    std::size_t packet = counts_.size();
    for (std::size_t low = 0, high = counts_.size(); low < high;) {
        const std::size_t middle = low + (high - low) / 2;
        if (starts_[middle] + counts_[middle] > sample)
            packet = high = middle;
        else
            low = middle + 1;
    }
    from_ = packet;
    if (packet >= counts_.size()) packet = counts_.size() - 1;
    const std::size_t before = standsAlone(codec_->codec_id) ? 0 : preroll;
    return seek(packet - std::min(packet, before));
}

SampleReader::Decoding::Next SampleReader::Decoding::next(long long& at, std::vector<unsigned char>& block) {
    for (;;) {
        const Next result = decode();
        if (result != Next::block) return result;
        if (!isSame()) return Next::end;
        const auto packet = static_cast<std::size_t>(frame_->reordered_opaque);
        if (packet >= counts_.size() || packet < from_) continue;
        if (std::exchange(current_, packet) != packet) within_ = 0;
        at = starts_[packet] + within_;
        within_ += frame_->nb_samples;
        interleave(*frame_, block);
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
    if (sample != next_) moved_ = true;
    next_ = sample;
    return true;
}

// A block into block_, or none at the end.
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
