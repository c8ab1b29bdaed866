// Runs one transcode: opens what a task links, keeps picture and sound of the output together, reports
// progress, and closes everything in the right order. An application derives from it and overrides the
// callbacks.
//
//     class Job : public QvTranscoder {
//         int cbProgress(double part) override { printf("%3.0f %%\n", part * 100); return 0; }
//     };
//     Job job;
//     job.setEncoder(pipe);
//     job.setDecoder(decoder);
//     job.linkAll();
//     int result = job.transcode(true);          // on this thread
//     if (result < 0) puts(job.errorDesc());
//
// Threads: a synchronous run does everything on the caller's thread. An asynchronous run has one worker at
// lowered priority, which does all link steps, all encoding and all callbacks; meanwhile the caller may use
// stop, pause, unpause, isPaused, getState, isTranscoding and getParam, and nothing else.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/job/processparams.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvCodec;
class QvDecodePipe;
class QvDPipeList;
class QvEncodePipe;
class QvMuxer;
class QvTask;
class TranscodeRun;
class TransLink;

class QV_API QvTranscoder {
  public:
    enum State { notConnected = 1, connected = 2, transcoding = 3 };

    // With a null task the transcoder makes and owns one.
    explicit QvTranscoder(QvTask* task = nullptr);
    // A copy shares the task pointer and nothing else.
    QvTranscoder(const QvTranscoder& other);
    QvTranscoder& operator=(const QvTranscoder& other);

    // Stops a run and waits for its end. A derived class calls stop() in its own destructor, because its
    // callbacks are gone when this one runs. Never from a callback.
    virtual ~QvTranscoder();

    // Runs `task` in place of the current one, which comes back when the run is over.
    virtual int transcode(QvTask* task, bool synchronous);
    // Runs the current task. Synchronous: the result of the run. Asynchronous: 0 once the worker is started.
    // QvStatus::warning (-16): legal with a warning, and it ran; QvStatus::notLegal (-11) and other failures:
    // errorDesc() has the text and nothing was written.
    virtual int transcode(bool synchronous);
    // Ends a run and waits until it has ended; from any thread. In a callback it does not wait. Always 0.
    virtual int stop();
    // Requests the end and returns at once; from any thread and any callback. Between two runs the request is
    // for the next one. Like stop() it ends a wait for the reader of an output that is a pipe, a socket or a
    // terminal; such a run counts as stopped, and its output is a part.
    void requestStop();
    // Holds and resumes an asynchronous run between two steps; asserts in a synchronous one.
    virtual int pause();
    virtual int unpause();

    // "getOut", "twoPass", "metaName", "progress" (how often cbProgress comes: one of the keys "promile",
    // "frames", "time", "each", "off", "absoluteTime"), "writeLogfile", "closeEncoder", "smartRender",
    // "effects", "audioEffects", "chapters", "connMatrix", "timecodeOffset", and "startDelay": the
    // milliseconds that a run waits before its first step (0 to 10000, default 250), in which the caller
    // of an asynchronous run can finish what it does after transcode() returns.
    virtual int setParam(const char* name, const Any& value);
    // "twoPass", "secondPass", "connMatrix", "progress", "writeLogfile", "startDelay", "srPossible",
    // "deadLock" (true when no step has ended for over 60 s and five times the longest step).
    virtual void getParam(const char* name, Any& value) const;

    // Callbacks, all on the thread that runs the job. `result` is 0, 1 for a stopped run, the error of the
    // run (QvStatus::endOfStream, -4: the coded picture ended early and the output was closed all the same),
    // or the exit code of the post-process command. cbDone may start the next run. What a callback throws
    // ends the run as a failure.
    virtual void cbDone(int result);
    virtual int cbProgress(double part);  // 0 to 1; over both passes of a two-pass run
    virtual void cbPaused(bool paused);
    virtual int cbProcess();  // after every step; non-zero ends the run as a stop does
    virtual void cbPostprocess(const Any& command);
    virtual int cbMuxClose(QvMuxer* muxer);
    // Before the run, while sound is read for filters that need its level, such as `normalizer`: 0 to 1. On
    // the thread that calls transcode(), which fails if a stop is asked for meanwhile.
    virtual void cbMeasure(double part);

    // --- Setting up; all of these assert during a run --------------------------------------------------

    void setEncoder(QvEncodePipe* pipe);  // not owned
    QvEncodePipe* encoder() const;
    QvTask* task() const;
    void setDecoder(QvDecodePipe* decoder);       // for linkAll; drops all links
    void setAudioDecoder(QvDecodePipe* decoder);  // sound from another source; drops all links
    QvDecodePipe* videoDecoder() const;
    QvDecodePipe* audioDecoder() const;

    // See QvTask for these. A failure's text is in errorDesc().
    int linkAll();
    int link(QvDecodePipe* decoder, int type, int decStream, int encStream);
    int link(QvDecodePipe* decoder, int type, int decStream, int encStream, const ProcessParams& params);
    int linkMeta(QvDecodePipe* decoder, int type, int decStream, int encType, int encStream);
    int linkMeta(QvDecodePipe* decoder, int type, int decStream, int encType, int encStream,
                 const MetaProcessParams& params);
    void unlink();
    void unlinkAll();
    int nrLinks() const;
    TransLink* getLink(int index) const;
    TransLink* getLink(int type, int index) const;
    TransLink* getLinkForOutput(int type, int encStream) const;
    TransLink* getLinkForOutput(QvDecodePipe* decoder, int type, int encStream) const;
    int linkedTo(QvDecodePipe* decoder, int type, int decStream) const;
    const QvDPipeList& decoders() const;
    void debugOutLinks() const;

    // --- State of a run ------------------------------------------------------------------------------

    // A filter of a running link, or null; only inside cbProgress and cbProcess (assertion elsewhere).
    QvCodec* filter(int type, int stream, const char* name, int index) const;
    bool isPaused() const;
    int getState() const;
    bool isTranscoding() const { return getState() == transcoding; }
    int errorCode() const;
    int getErrorCode() const { return errorCode(); }
    const char* errorDesc() const;
    const char* getErrorDesc() const { return errorDesc(); }

  protected:
    int setError(int code, const char* format, ...) QV_PRINTF(3, 4);

  private:
    struct Private;
    bool startWorker(TranscodeRun& run);
    std::unique_ptr<Private> p_;
};
