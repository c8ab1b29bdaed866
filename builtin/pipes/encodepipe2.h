// EncodePipe2: the encode pipe. Module "encpipe".
#pragma once

#include "builtin/pipes/output/members/activepreset.h"
#include "builtin/pipes/output/members/muxerplace.h"
#include "builtin/pipes/output/members/outputstreams.h"
#include "builtin/pipes/output/members/pipehost.h"
#include "builtin/pipes/output/muxerexchange.h"
#include "builtin/pipes/output/outputrun.h"
#include "builtin/pipes/output/pipestate.h"
#include "builtin/pipes/output/presetapplier.h"
#include "builtin/pipes/output/streambuilder.h"
#include "core/encode/qvencodepipe.h"

// A new pipe follows the first built-in preset, with a file sink, that preset's default multiplexer and one
// stream of each kind that it has a codec for. Streams, preset, multiplexer and sink change while it is not
// open; in the open state these calls are refused with QvStatus::illegalState.
//
// In addition to its own parameters, "muxer/NAME", "sink/NAME", "videoN/NAME" and "audioN/NAME" reach the
// members, and "videoN" or "audioN" alone takes a dictionary for that encoder. Other names go to all encoders
// and the multiplexer; a member that does not know one is passed over. "filesWritten" answers the files that
// the last run made, finished or not (QvMuxer, FileSink).
//
// The pipe itself checks its state and takes its parameters. Its parts do the rest; each uses only those
// above it:
//
//     streams_     the list of streams
//     end_         multiplexer and sink
//     preset_      the preset and the modules that it allows
//     builder_     adds and removes streams, exchanges encoders
//     exchange_    exchanges the multiplexer
//     state_       store and restore
//     applier_     applies a preset
//     run_         opens and closes
class EncodePipe2 : public QvEncodePipe, public QvIProgramSetup, private PipeHost {
  public:
    EncodePipe2() = default;
    ~EncodePipe2() override;

    int init() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    int open() override;
    int close() override;
    int abort() override;
    void* getInterface(int kind) const override;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;

    int setFilename(const Any& name) override { return QvEncodePipe::setFilename(name); }
    int writeFrame(QvFrame* frame, int stream) override;
    int writePcm(QvPcm* pcm, int stream) override;

    // keep: not 0 gives the new streams the filters that the old ones of their type and number had.
    int applyPreset(const QvPreset& preset, int keep) override;
    int applyPreset(int profile, int keep) override;
    void storePreset(AnyDict& preset) const override;
    const QvPreset* activePreset() const override { return &preset_.preset(); }

    int nrStreams(int mask = qvAllStreams) const override;
    QvOStream* stream(int type, int nr) const override;
    QvOStream* streamAt(int index) const override;
    TPtrList<QvOStream> streams(int type) const override;
    int indexOf(QvOStream* stream) const override;
    int streamNr(QvOStream* stream) const override;
    int addStream(int type, const Any& params) override;
    void removeStream(QvOStream* stream) override;
    void removeStream(int type, int nr) override;
    void removeStreams(int mask) override;
    int setCodec(int type, int nr, const char* name, const AnyDict& params) override;

    QvEncoder* encoder(int type, int nr) const override;
    QvEncoder* encoder(int index) const override;
    QvVideoEncoder* videoEncoder(int nr) const override;
    QvAudioEncoder* audioEncoder(int nr) const override;

    int setMuxer(const char* name) override;
    QvMuxer* getMuxer() const override { return end_.muxer(); }
    void setCreateOutFolder(bool on) override { state_.createOutFolder = on; }
    bool createOutFolder() const override { return state_.createOutFolder; }
    int setSink(const char* name) override;
    QvSink* sink() const override { return end_.sink(); }

    // Of the multiplexer; failed without one that has programs.
    int nrPrograms() const override;
    int addProgram(const QvProgram& program) override;
    int removeProgram(int index) override;
    int getProgram(int index, QvProgram& program) const override;
    int setProgram(int index, const QvProgram& program) override;
    // Here each element is the stream itself, a borrowed QvOStream*.
    int getProgramStreams(int index, AnyVector& streams) const override;

  private:
    const char* lastFailure() const override { return errorDesc(); }
    const void* pipe() const override { return this; }
    void storeFailure(int code, const char* text) override { setError(code, "%s", text); }

    int applyFirst(int profile);
    int finish(bool aborting);
    int refuseWhileOpen();
    int setMember(const char* name, const Any& value);
    int applyDeprecated(const Any& preset);
    int spread(int mask, bool toMuxer, const char* name, const Any& value);

    OutputStreams streams_;
    MuxerPlace end_{*this};
    ActivePreset preset_;
    StreamBuilder builder_{streams_, end_, preset_, *this};
    MuxerExchange exchange_{streams_, end_, preset_, builder_, *this};
    PipeState state_{streams_, end_, preset_, builder_, exchange_, *this};
    PresetApplier applier_{streams_, end_, preset_, builder_, exchange_, state_, *this};
    OutputRun run_{streams_, end_, *this};
    bool adjustCodecToMuxer_ = true;
};
