// A task: what is to be done; QvTranscoder does it. It holds the input decoders, the output (an encode pipe),
// the links between their streams, the processing parameters, and a command to run afterwards.
//
//     QvTask task;
//     task.setEncoder(pipe);
//     int index = task.link(decoder, 1, 0, 0);   // video 0 of the decoder to video 0 of the output
//     if (index < 0) puts(task.errorDesc());
//
// Stream types are bits: 1 video, 2 audio, 4 subpicture; in a mask 0 and 255 mean all.
//
// Ownership: the task owns its links and parameters. Decoders and the encode pipe belong to the caller.
// Misuse that a correct application can't reach is an assertion (QvAssertFailure); everything that
// depends on data is a status with a text in errorDesc(). One thread at a time.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/decode/qvdpipelist.h"
#include "core/job/processparams.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

class QvDecodePipe;
class QvEncodePipe;
struct QvFileOpenCb;
class TransLink;
class TransVLink;

class QV_API QvTask {
  public:
    static constexpr int ERRSIZ = 1024;  // size of the error text, terminating zero included

    QvTask();
    virtual ~QvTask();
    QvTask(const QvTask&) = delete;
    QvTask& operator=(const QvTask&) = delete;

    // The post-process command with its placeholders replaced by quoted file names; invalid when there is
    // none. %i1 %i2 ... and %i: the inputs; %op and %ob: folder and base name of the first output;
    // %o1 %o2 ... and %o: the outputs.
    virtual Any currentPostprocessCommand() const;

    // --- Links ----------------------------------------------------------------------------------

    // Joins one stream of `decoder`, which is opened and selected here if necessary, to one of the output.
    // Returns the index of the new link; 0 if the same two streams are linked already; a negative status,
    // with a text, if it can't be done. A subpicture stream can't be linked: the result is 0 with a warning
    // in the log.
    int link(QvDecodePipe* decoder, int type, int decStream, int encStream);
    // The same, and the link takes filters, points, chapters, channel map and quality log of `params`.
    int link(QvDecodePipe* decoder, int type, int decStream, int encStream, const ProcessParams& params);
    // Drops all links and joins every selected stream of `decoder` to the next output stream of its type.
    int link(QvDecodePipe* decoder);

    // Adds a caption source (`type` 4) to the video link that feeds output video stream `encStream`.
    int linkMeta(QvDecodePipe* decoder, int type, int decStream, int encType, int encStream);
    int linkMeta(QvDecodePipe* decoder, int type, int decStream, int encType, int encStream,
                 const MetaProcessParams& params);

    // Destroys all links and forgets the decoders (without deleting any).
    void unlink();

    int nrLinks() const;
    TransLink* getLink(int index) const;            // asserts an index out of range
    TransLink* getLink(int type, int index) const;  // the index-th link of a type, or null
    TransLink* getLinkForOutput(int type, int encStream) const;
    TransLink* getLinkForOutput(QvDecodePipe* decoder, int type, int encStream) const;
    TransLink* getLinkForInput(QvDecodePipe* decoder, int type, int decStream) const;
    int indexOfLink(const TransLink* link) const;  // -1 when it is not of this task
    // The output stream that a decoder stream feeds, or -1.
    int linkedTo(QvDecodePipe* decoder, int type, int decStream) const;
    TPtrList<TransLink> links() const;  // in the order of linking
    const QvDPipeList& decoders() const { return decoders_; }
    void debugOutLinks() const;  // one line a link, to the debug log

    void setEncoder(QvEncodePipe* pipe) { encoder_ = pipe; }
    QvEncodePipe* encoder() const { return encoder_; }

    // --- Processing parameters of the whole task ---------------------------------------------------

    // Points and smartRender go to every type of the mask; filters need a mask of exactly one type,
    // chapters type 1, a channel map type 2 (assertions). A link's own value wins over the task's.
    int setProcessParams(const ProcessParams& params, int typeMask);
    const ProcessParams& processParams(int type) const;
    void clearProcessParams(int typeMask);

    void setPostprocessCommand(const Any& command) { postprocess_ = command; }
    const Any& postprocessCommand() const { return postprocess_; }

    // --- Checks before a run -----------------------------------------------------------------------

    // 0, QvStatus::notLegal (-11) or QvStatus::warning (-16), with a line for each fault in `messages`.
    int checkLegal(AnyVector& messages);
    // 0, or a failure with a text: nothing linked, a muxer that needs video, too few views.
    int checkStreams();
    // Makes all links end at one time, like the streams of one segment: at the end of the shortest video, or
    // without video of the shortest stream. Shorter sound is not extended. The links get points of their own,
    // which replace those of the task. Returns 0.
    virtual int checkDurations();
    // How many video links can be encoded in two passes; they are appended to `list` unless it is null.
    int checkMultiPass(TPtrList<TransLink>* list) const;
    // How many links can pass their coded data through; `dict` (may be null) gets "vids", "auds", "subs".
    int checkSmartRender(AnyDict* dict) const;

    // --- Persistence -------------------------------------------------------------------------------

    // Writes the task as the dictionary of class "TranscodeTask" that restore reads.
    void store(AnyDict& dict, int options = 0) const;
    // These three are for states that the application itself has made. What no valid task holds, such as
    // another class or a source without an input file, is an assertion (QvAssertFailure). Files of any other
    // origin are opened with QvTaskFile (qvtaskfile.h), which reports each fault as a status with its place
    // and never throws.
    //
    // Makes the objects of a stored task. The opened decoders are appended to `decoders`, the pipe is put
    // into *encoderOut; the caller owns both. After a failure there is no pipe, and the list has the decoders
    // that were opened until then.
    int restore(const AnyDict& state, QvDPipeList& decoders, QvEncodePipe** encoderOut, int options = 0,
                QvFileOpenCb* callback = nullptr);
    // A new task by restore, or null with all that was made destroyed. `error`, if given, takes the text.
    static QvTask* fromState(const AnyDict& state, QvDPipeList& decoders, QvEncodePipe** encoderOut,
                             int options = 0, QvFileOpenCb* callback = nullptr, Any* error = nullptr);
    // Applies a stored task as a template to an open decoder, for the stream types of `typeMask`. The
    // caller owns the task and its encoder().
    static QvTask* fromStateWithSource(const AnyDict& state, QvDecodePipe* decoder, int typeMask);

    // One dictionary a link, in the order of `links`, as TransLink::open takes it.
    static void makeOpenParams(const QvTask& task, const TPtrList<TransLink>& links, AnyVector& out);

    int errorCode() const { return errorCode_; }
    const char* errorDesc() const { return errorText_.c_str(); }

    // "video", "audio" or "subpic"; asserts any other type.
    static const char* typeName(int type);

  protected:
    int setError(int code, const char* format, ...) QV_PRINTF(3, 4);

  private:
    int makeLink(QvDecodePipe* decoder, int type, int decStream, int encStream);
    int linkAllOfType(QvDecodePipe* decoder, int type);
    void updateBSEnabled();
    void addDecoder(QvDecodePipe* decoder);
    ProcessParams& paramsOf(int type);

    QvDPipeList decoders_;
    std::vector<std::unique_ptr<TransLink>> links_;
    QvEncodePipe* encoder_ = nullptr;
    Any postprocess_;
    ProcessParams params_[3];  // video, audio, subpicture
    std::string errorText_;
    int errorCode_ = 0;
};
