// QvPushEncoder: for an application that has frames and samples of its own, such as a capture source. It
// writes them here, and a thread of the engine pulls them through an ordinary video link and audio link, with
// their conversions, filters and channel maps, into an encode pipe.
//
//     QvPushEncoder push;
//     push.setEncoder(pipe);                                     // stays the caller's
//     push.addVideoStream(video, nullptr);                       // "FOURCC", "width", "height", "framerate"
//     push.addAudioStream(audio, nullptr);                       // "samplerate", "channels", "bitsPerSample"
//     if (push.open() || push.start()) fail(push.errorDesc());
//     while (capture(frame, samples)) push.writeFrame(&frame, 0), push.writeSamples(&samples, 0);
//     push.writeSamples(nullptr, 0);                             // the sound ends here
//     do push.process(); while (push.needsVideo(0) == false && push.running());
//     push.writeFrame(nullptr, 0);                               // everything queued is taken: the end
//     result = push.close(false);
//     result |= pipe->close();
//
// An end mark of video takes effect at once: frames that are still queued are dropped. So wait with process()
// until the worker needs video, and then write the mark. Queued samples are kept at the end mark of sound.
// Sound beyond the time of the pictures is dropped; where it ends before them, silence follows.
//
// Writes may come from any thread; those of one stream have to be in order. They copy and never wait: when
// the worker is slower than the caller, memory grows, with a warning in the log. The other operations belong
// to one thread. Only the first video and the first audio stream are encoded.
#pragma once

#include <memory>

#include "core/arch/api.h"

class AnyDict;
class ProcessParams;
class QvEncodePipe;
class QvFrame;
class QvPcm;

class QV_API QvPushEncoder {
  public:
    QvPushEncoder();
    QvPushEncoder(const QvPushEncoder&) = delete;
    QvPushEncoder& operator=(const QvPushEncoder&) = delete;
    ~QvPushEncoder();  // closes with abort; the pipe must still be there

    // These three, and open, assert "Invalid state" unless closed.
    int setEncoder(QvEncodePipe* encoder);
    // Memory for "bufferLength" (optional) frames is made at first, 4 by default; "frames" (optional) ends
    // the stream after so many. Only the filters of `process`, which may be null, are used. QvStatus::failed
    // for a format that is impossible, QvStatus::outOfMemory; nothing is added then.
    int addVideoStream(AnyDict& params, ProcessParams* process);
    // Memory for "bufferLength" (optional) samples is made at first, 48000 by default; "bytesPerSample" or
    // "bitsPerSample" may be left out. Rates up to 96000, 8, 16, 20, 24 or 32 bits. Of `process` the filters
    // and the channel map are used. QvStatus::failed for an impossible format; nothing is added then.
    int addAudioStream(AnyDict& params, ProcessParams* process);
    // Readies the links and then opens the pipe, so that links that can't work leave no empty file.
    // The statuses of the links are ORed. On failure the state stays closed.
    int open();
    int start();  // the worker; asserts "Invalid state" unless open

    // Queues a copy. Null is the end mark of the stream; the result is QvStatus::endOfStream then. A stream
    // that was not added is an assertion, a frame of another format QvStatus::invalidArgument. After a
    // failure of the output its status is returned, and nothing is queued.
    int writeFrame(QvFrame* frame, int stream);
    // The same for the filled samples of a block; 0 for the end mark.
    int writeSamples(QvPcm* samples, int stream);

    // Whether the worker waits for a frame or for samples of that stream.
    bool needsVideo(int stream) const;
    bool needsAudio(int stream) const;
    // Waits until the worker needs input or has ended. 0
    int process();
    bool running() const;
    bool finished() const { return false; }  // always; ask running() for the end of the work
    // Ends the worker, with `abort` after the step it is in, otherwise when it has taken the sound that is
    // there. The pipe stays open. The status of the worker: 0, or that of the first step that failed.
    int close(bool abort);

    QvEncodePipe* encodePipe() const;
    const char* errorDesc() const;  // of the last failure of the output or of an operation, "" without one

  private:
    struct PushEncoder_p;
    std::unique_ptr<PushEncoder_p> p_;
};
