// The transcoder of one target of a watched file.
#pragma once

#include <memory>

#include "core/transcode/run/qvtranscoder.h"

class QvDecodePipe;
class QvEncodePipe;
class QvWatchProcessor;

class QvTranscodeWatch : public QvTranscoder {
  public:
    explicit QvTranscodeWatch(QvWatchProcessor& processor);
    ~QvTranscodeWatch() override { stop(); }

    // A transcoder with a task of its own that links stream k of the decoder to stream k of the pipe; both
    // outlive it. Null, with a line in the log, when that can't be done.
    static std::unique_ptr<QvTranscodeWatch> create(QvWatchProcessor& processor, QvDecodePipe& decoder,
                                                    QvEncodePipe& pipe);

  private:
    bool linkStreams(QvDecodePipe& decoder, int type, int count, const char* failure);

    [[maybe_unused]] QvWatchProcessor& processor_;
};
