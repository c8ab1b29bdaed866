// The streams of "avdec".
#pragma once

#include <memory>
#include <string>

#include "core/decode/basedecodepipe.h"
#include "core/media/qvbuffer.h"
#include "plugins/av/picture/framereader.h"
#include "plugins/av/sound/samplereader.h"
#include "plugins/av/text/subtitlereader.h"

struct AVStream;

namespace av {

// What all streams of a container say of themselves.
void describeStream(const AVStream& stream, AnyDict& params);

class PictureStream : public DPipeVideoStream {
  public:
    // `stream` of the container; null without one.
    PictureStream(std::unique_ptr<PictureSource> reader, const AVStream* stream);

    int read();  // as readFrame
    bool seek(long long frame);
    // The start of the frame that was read last, on the film's clock.
    MediaTime shownAt() const;
    PictureSource& reader() { return *reader_; }
    // The file was cut, or is damaged. Nothing changes if it has what it announces all the same.
    void setTruncated(long long expected);
    void setLost(long long pictures);  // between others
    void setEstimated(long long frames);

  private:
    std::unique_ptr<PictureSource> reader_;
    int concealed_ = 0;
    long long next_ = 0;  // frame
};

class SoundStream : public DPipeAudioStream {
  public:
    SoundStream(std::unique_ptr<SampleReader> reader, const AVStream& stream);

    int read(int count);  // as readSamples
    bool seek(long long sample);
    SampleReader& reader() { return *reader_; }
    void setTruncated(long long expected);
    void setEstimated(long long samples);

  private:
    std::unique_ptr<SampleReader> reader_;
    long long position_ = 0, concealed_ = 0;
};

class SubtitleStream : public DPipeStream {
  public:
    // `counted`: the reader knows all of them.
    SubtitleStream(std::unique_ptr<SubtitleReader> reader, const AVStream& stream, bool counted);
    SubtitleReader& reader() { return *reader_; }

  private:
    std::unique_ptr<SubtitleReader> reader_;
};

}  // namespace av
