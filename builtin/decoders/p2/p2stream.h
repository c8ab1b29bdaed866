// One stream of a clip of P2 cards: the same stream of the decoders of all its parts, one after the other.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "builtin/decoders/p2/p2clip.h"
#include "core/decode/qvdecoder.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvpcm.h"
#include "core/value/anycontainer.h"

class P2Stream {
  public:
    explicit P2Stream(int type) : type_(type) {}  // qvVideoStream or qvAudioStream

    // Appends the first stream of this type of an open decoder, which is `said` to be so long. Why it can't
    // follow; empty if it does.
    std::string append(std::unique_ptr<QvDecodePipe> decoder, const P2Length& said);
    // For a sound: each part but the last one is as long as its picture, whatever its file holds.
    void alignTo(const P2Stream& picture);
    // When all parts are there: fills params().
    void describe();

    int select();
    int deselect();
    bool selected() const { return selected_; }

    // As QvDecodePipe says; failure() is the reason of statuses below -4 and of -1.
    int readFrame();
    int readSamples(int count);
    int seek(long long place);  // a frame or a sample
    const std::string& failure() const { return failure_; }
    QvFrame* frame() const { return frame_; }
    QvPcm* pcm();

    int type() const { return type_; }
    long long length() const;  // frames or samples
    AnyDict& params() { return params_; }
    const AnyDict& params() const { return params_; }
    const QvDecodePipe& firstDecoder() const { return *parts_.front().decoder; }
    long long bytes() const;

  private:
    struct Part {
        std::unique_ptr<QvDecodePipe> decoder;
        AnyDict params;
        long long start = 0;   // in the whole stream
        long long length = 0;  // of which the decoder may have less
    };

    int type_;
    std::vector<Part> parts_;
    AnyDict params_;
    bool selected_ = false;
    std::size_t at_ = 0;      // the part that is read
    long long position_ = 0;  // next to be read
    QvFrame* frame_ = nullptr;
    int ownNumber_ = -1;  // of `frame_`, as its decoder counts
    QvPcm joined_;        // samples where there are several parts
    std::string failure_;

    const char* lengthKey() const;
    const char* expectedKey() const;
    void compare(Part& part, const P2Length& said) const;
    int enterPart();
    int readPiece(int count, long long left);
    int fail(int code, const std::string& text);
};
