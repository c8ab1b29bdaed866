// An input of the mix: one stream of a decoder, converted to 32 bits at the sample rate of the mix.
#pragma once

#include <memory>
#include <string>

#include "core/decode/qvinputstream.h"
#include "core/media/qvpcm.h"

class FiltersState;
class QvAProcessPipe;

class ADecStream : public QvIStream {
  public:
    // The decoder has to be open and to outlive this.
    ADecStream(QvDecodePipe* decoder, int number, const Any& file);
    ADecStream(const ADecStream&) = delete;
    ADecStream& operator=(const ADecStream&) = delete;
    ~ADecStream() override;

    // Selects the stream and builds its conversion. `filters` may be null. 0, or a status with the reason.
    int prepare(int targetRate, const FiltersState* filters, std::string& reason);

    // Fills pcm() with `count` samples; after the end or a failure they are silence. 0; -4 after the end;
    // another status after a failure. Both last until the next seek.
    int read(int count);
    // `sample` counts at the rate of the mix. Filters are reset. 0, -4 or -1.
    int seek(long long sample);

    const Any& file() const { return file_; }  // "filename" of the decoder
    QvPcm& pcm() { return pcm_; }
    int channels() const { return channels_; }
    long long targetSamples() const;  // the length at the rate of the mix

  private:
    Any file_;
    std::unique_ptr<QvAProcessPipe> pipe_;  // null: nothing to convert
    int status_ = 0;
    QvPcm pcm_;
    int targetRate_ = 0;
    int sourceRate_ = 0;
    int channels_ = 0;
    long long samples_ = 0;  // at sourceRate_

    int readPipe(int count);
    int readPlain(int count);
    int append(const QvPcm& from, int count);
};
