// EncodePipe2: the encode pipe. Module "encpipe".
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/encode/qvencodepipe.h"
#include "core/preset/qvpreset.h"

class QvModule;

// A new pipe follows the first built-in preset, with a file sink, that preset's default multiplexer and one
// stream of each kind that it has a codec for. Streams, preset, multiplexer and sink change while it is not
// open; in the open state these calls are refused with QvStatus::illegalState.
//
// Beside its own parameters, "muxer/NAME", "sink/NAME", "videoN/NAME" and "audioN/NAME" reach the members,
// and "videoN" or "audioN" alone takes a dictionary for that encoder. Other names go to all encoders and the
// multiplexer; who does not know one is passed over. "filesWritten" answers the files that the last run made,
// finished or not (QvMuxer, FileSink).
class EncodePipe2 : public QvEncodePipe, public QvIProgramSetup {
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

    int writeFrame(QvFrame* frame, int stream) override;
    int writePcm(QvPcm* pcm, int stream) override;

    // keep: not 0 gives the new streams the filters that the old ones of their type and number had.
    int applyPreset(const QvPreset& preset, int keep) override;
    int applyPreset(int profile, int keep) override;
    void storePreset(AnyDict& preset) const override;
    const QvPreset* activePreset() const override { return &preset_; }

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
    QvMuxer* getMuxer() const override { return muxer_.get(); }
    void setCreateOutFolder(bool on) override { createOutFolder_ = on; }
    bool createOutFolder() const override { return createOutFolder_; }
    int setSink(const char* name) override;
    QvSink* sink() const override { return sink_.get(); }

    // Of the multiplexer; failed without one that has programs.
    int nrPrograms() const override;
    int addProgram(const QvProgram& program) override;
    int removeProgram(int index) override;
    int getProgram(int index, QvProgram& program) const override;
    int setProgram(int index, const QvProgram& program) override;
    // Here each element is the stream itself, a borrowed QvOStream*.
    int getProgramStreams(int index, AnyVector& streams) const override;

  private:
    friend struct EncodePipeParams;

    struct Stream final : QvOStream {
        using QvOStream::QvOStream;
        void take(std::unique_ptr<QvEncoder> fresh) {
            encoder = fresh.get();
            owned = std::move(fresh);
        }
        std::unique_ptr<QvEncoder> owned;
    };
    using Streams = std::vector<std::unique_ptr<Stream>>;
    // What the argument of addStream asks for.
    struct Request {
        std::string codec;
        AnyDict settings;  // of the encoder
        AnyDict params;    // for the multiplexer
    };

    // --- Opening and closing
    void prepare();
    void prepareBuffers();
    void spreadFramerate();
    void limitAvchdBitrate();
    int openAll();
    int failOpen(const QvCodec& member, int result);
    void makeOutFolder();
    int finish(bool aborting);
    int finishEncoders(bool aborting);
    int finishMuxer(bool aborting);
    int finishSink(bool aborting);
    void tellUser(const std::string& reason);

    // --- Streams
    int refuseWhileOpen();
    Stream* find(int type, int nr) const;
    int numberOf(const Stream& stream) const;
    int addCodecStream(int type, const Any& params);
    int addSubpic(const Any& params);
    int decodeRequest(int type, const Any& params, Request& request);
    int fillDefaults(int type, Request& request);
    int _getStreamDefaults(int type, int nr, const char* codec, AnyDict& defaults) const;
    std::unique_ptr<QvEncoder> newEncoder(int type, const std::string& name) const;
    int configure(QvEncoder& encoder, int type, int nr, const AnyDict& params);
    int setUpEncoder(QvEncoder& encoder, const AnyDict& settings) const;
    int joinMuxer(Stream& stream, const char* name);
    int addReady(std::unique_ptr<Stream> stream, const AnyDict& params, const char* name);
    void detach(Stream& stream);
    bool compatible(const char* codec) const;
    bool takesAllCodecs() const;
    const AnyVector& allowedCodecs(int type) const;

    // --- Multiplexer and sink
    int _setMuxer(const char* name, bool changingPreset);
    int setInternalMuxer(const char* name, const char* sinkName);
    int replaceMuxer(std::unique_ptr<QvMuxer> fresh, bool changingPreset);
    void restoreMuxerSettings(QvMuxer& fresh);
    void dropMuxer();
    void rebuildAllowed();
    AnyVector describeForRebuild() const;
    void rebuildStreams(const AnyVector& former, const AnyVector& programs);
    void adjustForTransport();
    std::unique_ptr<QvMuxer> newMuxer(const char* name) const;
    bool hasTransportMuxer() const;

    // --- Presets and states
    int applyBuiltin(int index, int keep);
    int addDefaultStreams(const QvPreset& preset);
    int addPresetStreams(const QvPreset& preset);
    int applyLoosePreset(const QvPreset& preset);
    void giveFilters(const AnyVector& former);
    int addPrograms(const AnyVector& programs);
    int restoreBase(int profile, const Any* muxer);
    int restoreStreams(const Any& entries);
    int restoreStream(const AnyDict& entry, int type);
    int restoreOld(const AnyDict& state);
    void storeCommon(AnyDict& state) const;
    AnyDict storeStream(const Stream& stream) const;
    AnyVector storePrograms() const;

    // --- Helpers
    QvIProgramSetup* programs() const;
    int forward(QvCodec* target, const char* name, const Any& value) const;
    int forwardToEncoders(int mask, const char* name, const Any& value);
    int forwardToMuxer(const char* name, const Any& value);
    int takeError(const QvCodec& member, int result);

    // In this order: the multiplexer goes before the sink whose stream it holds.
    std::unique_ptr<QvSink> sink_;
    std::unique_ptr<QvMuxer> muxer_;
    Streams streams_;
    AnyDict allowed_;  // "muxers", "vcodecs", "acodecs": vectors of module names
    QvPreset preset_;
    Any sinkName_ = "filesink";
    Any filename_;
    AnyDict saved_;  // module name to the settings of an encoder or multiplexer that was replaced
    bool createOutFolder_ = false;
    bool adjustCodecToMuxer_ = true;
};
