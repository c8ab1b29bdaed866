// The pictures of one stream in presentation order at a constant rate: picture n is the same whether it is
// reached by reading from the start or by a seek.
//
// Picture 0 is the first that is presented, edit lists obeyed. The rate is constant if every time lies within
// half a tick of n/rate; otherwise it is the average, rounded to the nearest of the engine's rates, and
// picture n is the last one whose time is not after n/rate plus half a tick.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "core/measure/qvframerate.h"
#include "plugins/av/index/packetindex.h"
#include "plugins/av/picture/picturewords.h"

class QvFrame;
struct AVFrame;

namespace av {

struct PictureFormat {
    int width = 0, height = 0;
    int fourcc = 0;  // the engine's form, see picture/pictureform.h
    QvFramerate rate;
    bool variable = false;  // the times in the file are not those of a constant rate
    int frames = 0;         // exact
    double pixelAspect = 1;
    int fieldOrder = 0;                          // the engine's value
    int colourMatrix = 0;                        // the engine's value
    int primaries = 0, transfer = 0, space = 0;  // code points of ITU-T H.273; 0: not stated
    Turn turn;                                   // how the frames are still to be turned
    std::string codec;                           // as people know it: "H.264", "MPEG-2"
    std::string lost;                            // what the form can't hold, one line; "" for nothing
    double bitrate = 0;                          // bits a second; 0: unknown
};

class FrameReader {
  public:
    struct Options {
        int threads = 0;       // of the codec; 0: one a core
        bool upright = false;  // frames are turned as the film says, where their layout allows it
    };
    static std::unique_ptr<FrameReader> open(const MediaBytes& bytes, const std::string& format, int stream,
                                             std::shared_ptr<const PacketIndex> index, const Options& options,
                                             std::string& reason);
    ~FrameReader();
    FrameReader(const FrameReader&) = delete;
    FrameReader& operator=(const FrameReader&) = delete;

    const PictureFormat& format() const { return format_; }
    // The time of picture 0, as `zero` units of a second divided by `zeroBase`: where sound starts, too.
    std::int64_t zero() const { return zero_; }
    std::int64_t zeroBase() const { return zeroBase_; }

    // The next read gives picture n, 0 to format().frames. Cheap: the work is done by the read.
    bool seek(int n);
    enum class Read { picture, end, failed };
    // The next picture, in the engine's form, in frame(). After `failed`, failure() is the reason.
    Read read();
    QvFrame& frame() { return *frame_; }
    const std::string& failure() const { return failure_; }
    // Pictures so far that the codec reported as damaged, or did not deliver; those before picture 0, which
    // need others that are not in the file, from the start.
    int concealed() const;

  private:
    class Decoding;
    std::unique_ptr<Decoding> decoding_;
    PictureFormat format_;
    std::int64_t zero_ = 0, zeroBase_ = 1;
    std::unique_ptr<QvFrame> frame_;
    std::string failure_;
    int next_ = 0;  // picture

    FrameReader();
    bool describe(bool upright);
    void turnUpright();
};

}  // namespace av
