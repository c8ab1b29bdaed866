// The streams of an AVI file as encoders write to them, and their way into one file by time.
#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <vector>

#include "builtin/muxers/rawavimuxfile.h"
#include "builtin/muxers/rawavimuxpicture.h"
#include "core/arch/widename.h"
#include "core/stream/qvbufstrm.h"

// Pictures are written when they come. Sound is gathered, and written before the first picture that is
// later, so that each picture is followed by the sound of its time; sound that runs ahead of the pictures
// goes out when half a second of it has gathered. Encoders may write from threads of their own.
class AviInterleaver {
  public:
    struct Source {
        AviTrack track;
        AviPicture picture;  // of a video track
    };

    // All: false on failure.
    bool open(QvBufStream& output, std::vector<Source> sources, const AviFile::Limits& limits);
    bool picture(size_t track, const unsigned char* frame);
    bool sound(size_t track, const unsigned char* data, size_t bytes);
    bool close();

    size_t frameBytes(size_t track) const { return feeds_[track].picture.frameBytes(); }
    size_t soundBytes(size_t track) const { return feeds_[track].capacity; }
    // The first failure, in `failure`. False if there was none.
    bool tell(QvIoFailure& failure);

  private:
    struct Feed {
        AviPicture picture;
        std::vector<unsigned char> held{};  // sound
        size_t capacity = 0;                // of it, in whole samples
    };

    bool writeSound(size_t track, int64_t samples);
    bool writeDueSound();

    std::mutex lock_;
    AviFile file_;
    std::vector<Feed> feeds_;
    QvWideString name_;  // of the file, for messages
};

// What one encoder writes to, in pieces of any size. A picture that comes as a whole is written straight from
// where it lies.
class AviStream final : public QvBufStream {
  public:
    explicit AviStream(QvCodec* owner);
    ~AviStream() override;

    bufstream* input() override;
    bufstream* output() override { return nullptr; }
    void destroy(int abort) override;
    int begin(AviInterleaver& to, size_t track, bool video);
    bool holdsPart() const;  // of a picture

  private:
    class Record;
    std::unique_ptr<Record> record_;
};
