// The samples of one sound stream as integers, from any sample on, the same whether they are reached by
// reading from the start or by a seek.
//
// Sample 0 is at the time of the film's first picture (with its edit list applied). Earlier sound is dropped;
// before sound that starts later there is silence. In a film without pictures sample 0 is the stream's first
// sample after priming. Gaps in the times of packets are filled with silence, overlaps are cut.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "plugins/av/index/packetindex.h"
#include "plugins/av/sound/soundformat.h"

class QvPcm;

namespace av {

class DecodedSamples;

class SampleReader {
  public:
    // The film's first picture is at `zero` / `zeroBase` seconds; `hasZero` is false if it has none. Null
    // with `reason`, a part of a sentence, for a codec without a decoder, for formats beyond the limits
    // (source/limits.h), and for a stream without a sample in the film.
    static std::unique_ptr<SampleReader> open(const MediaBytes& bytes, const std::string& format, int stream,
                                              std::shared_ptr<const PacketIndex> index, bool hasZero,
                                              std::int64_t zero, std::int64_t zeroBase, std::string& reason);
    ~SampleReader();
    SampleReader(const SampleReader&) = delete;
    SampleReader& operator=(const SampleReader&) = delete;

    const SoundFormat& format() const { return format_; }
    // The next read starts at `sample`, 0 to format().samples. Cheap: the work is done by the read.
    bool seek(long long sample);
    // Replaces the content of `to`, which has this format and room for `count` samples. Returns how many it
    // got: fewer than `count` at the end only. -1: see failure().
    int read(QvPcm& to, int count);
    const std::string& failure() const { return failure_; }
    // Packets so far that could not be decoded and became silence.
    long long concealed() const { return concealed_; }

  private:
    std::unique_ptr<DecodedSamples> decoded_;
    SoundFormat format_;
    std::string failure_;
    long long concealed_ = 0;
    long long next_ = 0;                // sample that is read next
    bool restart_ = true;               // decoding starts again at next_
    bool ended_ = false;                // there is no block after block_
    long long blockAt_ = 0;             // sample of the film with which block_ begins
    std::vector<unsigned char> block_;  // decoded samples

    SampleReader();
    bool fetch();
    std::size_t sampleBytes() const;  // all channels
};

}  // namespace av
