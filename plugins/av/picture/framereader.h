// The pictures of one stream in presentation order at a constant rate: picture n is the same whether it is
// reached by reading from the start or by a seek.
//
// Picture 0 is the first that is presented, with the edit list applied. The rate is constant if every time
// lies within half a tick of n/rate; otherwise it is the average, rounded to the nearest of the engine's
// rates, and picture n is the last one whose time is not after n/rate plus half a tick.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "plugins/av/index/packetindex.h"
#include "plugins/av/picture/picturesource.h"

struct AVFrame;

namespace av {

class FrameReader : public PictureSource {
  public:
    struct Options {
        int threads = 0;       // of the codec; 0: one a core
        bool upright = false;  // rotates as the film's display matrix says, if the pixel format allows it
        bool holes = false;    // pictures are missing between others; see planPictures
    };
    static std::unique_ptr<FrameReader> open(const MediaBytes& bytes, const std::string& format, int stream,
                                             std::shared_ptr<const PacketIndex> index, const Options& options,
                                             std::string& reason);
    ~FrameReader() override;
    FrameReader(const FrameReader&) = delete;
    FrameReader& operator=(const FrameReader&) = delete;

    const PictureFormat& format() const override { return format_; }
    // The time of picture 0 is zero() / zeroBase() seconds. Sound starts there, too.
    std::int64_t zero() const { return zero_; }
    std::int64_t zeroBase() const { return zeroBase_; }

    bool seek(int n) override;  // cheap: the work is done by the read
    Read read() override;
    QvFrame& frame() override { return *frame_; }
    const std::string& failure() const override { return failure_; }
    // Pictures so far that the codec reported as damaged or did not deliver. Those before picture 0 are
    // counted from the start: they can't be decoded because they need pictures that are not in the file.
    int concealed() const override;

  private:
    class Decoding;
    std::unique_ptr<Decoding> decoding_;
    PictureFormat format_;
    std::int64_t zero_ = 0, zeroBase_ = 1;
    std::unique_ptr<QvFrame> frame_;
    std::string failure_;
    int next_ = 0;  // picture that is read next

    FrameReader();
    bool describe(bool upright);
    void turnUpright();
};

}  // namespace av
