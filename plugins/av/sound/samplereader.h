// The samples of one sound stream as integers, from any sample on, the same whether they are reached by
// reading from the start or by a seek.
//
// Sample 0 is at the film's time zero: the first presented picture, edit lists obeyed. Sound before it is
// dropped, and silence precedes sound that starts later. Without a picture it is the stream's first sample
// after priming. Gaps in the times of packets are filled with silence, overlaps are cut.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "plugins/av/index/packetindex.h"

class QvPcm;

namespace av {

struct SoundFormat {
    int samplerate = 0;      // Hz
    int channels = 0;        // 1 to 64
    std::uint64_t mask = 0;  // the library's channel layout; 0: unknown
    int bits = 0;            // 8 (unsigned), 16 or 24 (three bytes); float and 32 bits are rounded to 24
    long long samples = 0;   // exact
    std::string codec;       // as people know it: "AAC", "PCM", "MP3"
    int bitrate = 0;         // kilobits a second; 0: unknown
    std::string lost;        // why the sound ends before the stream does; "": it does not
};

class SampleReader {
  public:
    // `zero`: the film's time zero in seconds as a fraction of `zeroBase` units; `hasZero` false without a
    // picture. Null with `reason`, a part of a sentence, for a codec that is not there and for forms beyond
    // the limits.
    static std::unique_ptr<SampleReader> open(const MediaBytes& bytes, const std::string& format, int stream,
                                              std::shared_ptr<const PacketIndex> index, bool hasZero,
                                              std::int64_t zero, std::int64_t zeroBase, std::string& reason);
    ~SampleReader();
    SampleReader(const SampleReader&) = delete;
    SampleReader& operator=(const SampleReader&) = delete;

    const SoundFormat& format() const { return format_; }
    // The next read starts at `sample`, 0 to format().samples. Cheap: the work is done by the read.
    bool seek(long long sample);
    // Puts up to `count` samples into `to`, which has room for them and this format, replacing what it had.
    // The number is smaller at the end only. -1 with failure().
    int read(QvPcm& to, int count);
    const std::string& failure() const { return failure_; }
    long long concealed() const {
        return concealed_;
    }  // packets that could not be decoded and became silence

  private:
    class Decoding;
    std::unique_ptr<Decoding> decoding_;
    SoundFormat format_;
    std::string failure_;
    long long concealed_ = 0;
    long long next_ = 0;  // sample
    bool moved_ = true;   // decoding does not continue where it was
    bool ended_ = false;
    long long blockAt_ = 0;  // place of what is decoded, and not all delivered
    std::vector<unsigned char> block_;

    SampleReader();
    bool fetch();
};

}  // namespace av
