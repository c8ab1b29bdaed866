// The decoder of one sound stream: its samples in the film, and from where they have to be decoded.
//
// Usually the packets state how many samples they have. If some don't, or it is wrong, the stream is decoded
// once to count them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "plugins/av/index/packetindex.h"
#include "plugins/av/sound/sampleplaces.h"
#include "plugins/av/sound/soundformat.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/mediainput.h"

namespace av {

class DecodedSamples {
  public:
    // Null with `reason`, a part of a sentence.
    static std::unique_ptr<DecodedSamples> open(const MediaBytes& bytes, const std::string& format,
                                                int stream, std::shared_ptr<const PacketIndex> index,
                                                std::string& reason);

    // Two steps before the first start(); each returns false with `reason`. describe() sets all of the format
    // but `samples`, place() sets that: it decides which of the stream's samples belong to the film.
    bool describe(SoundFormat& format, std::string& reason);
    bool place(bool hasZero, std::int64_t zero, std::int64_t zeroBase, SoundFormat& format,
               std::string& reason);

    // Moves so that the next block has this sample of the film, or the first one after it. False
    // with failure().
    bool start(long long sample);
    enum class Next { block, end, failed };
    // The next block of samples, interleaved. `at` is the sample of the film with which it begins.
    Next next(long long& at, std::vector<unsigned char>& block);
    const std::string& failure() const { return failure_; }
    long long undecoded() const { return undecoded_; }  // packets that the decoder rejected since describe()

  private:
    static constexpr std::size_t noPacket = static_cast<std::size_t>(-1);

    std::unique_ptr<MediaInput> input_;
    std::shared_ptr<const PacketIndex> index_;
    int stream_ = 0;
    CodecPtr codec_;
    PacketPtr packet_;
    FramePtr frame_;
    bool pending_ = false;               // packet_ still has data for the codec
    bool draining_ = false;              // the end of the stream was sent to the codec
    bool started_ = false;               // something was read from the file
    bool used_ = false;                  // the codec was given packets
    std::size_t position_ = 0;           // packet that is read next
    std::size_t firstWanted_ = 0;        // packets before it are decoded, but not delivered
    std::vector<std::uint32_t> counts_;  // samples of each packet; empty after place()
    // The numbers of samples that the packets state are right. Then priming and padding are cut here,
    // otherwise by the codec.
    bool trustsCounts_ = false;
    unsigned primingScale_ = 1;       // see Priming::scale
    std::uint32_t codecPriming_ = 0;  // that the codec reports, as from an encoder's tag in MP3
    SamplePlaces places_;
    std::size_t currentPacket_ = noPacket;  // of the last decoded frame
    long long doneOfCurrent_ = 0;           // samples of that packet that were decoded
    int samplerate_ = 0, channels_ = 0;
    AVSampleFormat sampleFormat_ = AV_SAMPLE_FMT_NONE;
    long long undecoded_ = 0;
    std::string failure_;
    std::string formatChange_;  // "", or why the sound ends early

    const std::vector<IndexedPacket>& packets() const { return index_->packets(stream_); }
    AVStream& stream() { return *input_->context().streams[stream_]; }
    // Of the last frame. The codec's value comes first: in MPEG audio the first frame after a change of the
    // sample rate still states the old one.
    int rate() const { return codec_->sample_rate > 0 ? codec_->sample_rate : frame_->sample_rate; }
    bool hasSameFormat() const {
        return rate() == samplerate_ && frame_->ch_layout.nb_channels == channels_ &&
               frame_->format == sampleFormat_;
    }
    DecodedSamples() = default;
    bool openCodec(std::string& reason);
    bool seek(std::size_t packet);
    int send();
    Next decode();
    Next outOfMemory();
    std::uint32_t statedPriming();
    bool checkStatedCounts();
    bool countByDecoding(std::string& reason);
    void adoptFormat(const AVFrame& frame);
    std::size_t startFor(std::size_t packet) const;
};

}  // namespace av
