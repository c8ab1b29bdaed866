// Contract of the encode pipe: one output made of encoders, a multiplexer and a sink, shown to the
// transcoder as one object.
//
//     frames  --> video encoder --bitstream--+
//                                            +--> multiplexer --stream--> sink
//     samples --> audio encoder --bitstream--+
//
// The pipe owns the whole chain. Opening goes from the sink to the encoders, closing the other way; close
// and abort always finish every member and OR their results. One thread at a time.
#pragma once

#include <memory>

#include "core/encode/qvencoder.h"
#include "core/encode/qvmuxer.h"
#include "core/encode/qvsink.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

class FiltersState;
class QvAuQueuePoll;
class QvCancel;
class QvPreset;

// One output stream of a pipe. The pipe makes and deletes it; others read.
struct QV_API QvOStream {
    explicit QvOStream(int streamType);
    QvOStream(const QvOStream&) = delete;
    QvOStream& operator=(const QvOStream&) = delete;
    virtual ~QvOStream();

    int type;                          // 1 video, 2 audio, 4 subpicture
    QvEncoder* encoder = nullptr;      // owned by the pipe; null for a subpicture stream without encoder
    QvBufStream* bitstream = nullptr;  // what the multiplexer gave for this stream; owned by the multiplexer

    // The filter chain chosen for this stream; never null, empty at first.
    FiltersState& filters() const { return *filters_; }

    // A disabled stream is not opened. The flag lives in the bitstream; false without one.
    bool enabled() const;
    void setEnabled(bool on);

  private:
    std::unique_ptr<FiltersState> filters_;
};

// One value each for video, audio and subpicture.
template <class T>
struct QvAVS3plet {
    T video{};
    T audio{};
    T subpic{};
};

class QV_API QvEncodePipe : public QvCodec {
  public:
    explicit QvEncodePipe(const QvModule* module = nullptr) : QvCodec(module) {}

    // A new, initialised pipe of the module "encpipe", owned by the caller; null when it can't be made.
    static QvEncodePipe* create();

    // Ends without finishing: encoders, multiplexer and sink are aborted. Results ORed; state 2 after it.
    virtual int abort() = 0;
    // The multiplexer's, then the sink's flush; results ORed.
    virtual int flush();
    // Passes a frame (samples) to the video (audio) encoder of that number; asserts that there is one. A null
    // frame means smart rendering.
    virtual int writeFrame(QvFrame* frame, int stream) = 0;
    virtual int writePcm(QvPcm* pcm, int stream) = 0;

    // Set the pipe up by a preset, or by the built-in preset of a profile number. Existing streams are
    // replaced. QvStatus::invalidStructure for an unknown profile, failed when a stream can't be added.
    virtual int applyPreset(const QvPreset& preset, int keep) = 0;
    virtual int applyPreset(int profile, int keep) = 0;
    // The stream part of the state, tagged as a preset.
    virtual void storePreset(AnyDict& preset) const = 0;
    virtual const QvPreset* activePreset() const = 0;

    virtual int nrStreams(int mask = qvAllStreams) const = 0;
    virtual QvOStream* stream(int type, int nr) const = 0;    // null when absent
    virtual QvOStream* streamAt(int index) const = 0;         // asserts a bad index
    virtual TPtrList<QvOStream> streams(int type) const = 0;  // all of a type, or all for -1
    virtual int indexOf(QvOStream* stream) const = 0;         // among all streams, -1 when absent
    virtual int streamNr(QvOStream* stream) const = 0;        // among its type, -1 when absent

    // `params` is the name of a codec, or a dictionary of "codec" (a name, or an encoder's stored settings
    // with "name") and "stream" (parameters for the multiplexer); invalid for the preset's defaults. The
    // result is the stream's number within its type, or QvStatus::noStream, QvStatus::failed.
    virtual int addStream(int type, const Any& params) = 0;
    virtual int addSubpicStream(const Any& params);
    virtual void removeStream(QvOStream* stream) = 0;
    virtual void removeStream(int type, int nr) = 0;
    virtual void removeStreams(int mask) = 0;
    // Exchanges the encoder of a stream. With empty `params` the module gets the settings that it had when it
    // was last replaced in this pipe, or its defaults if it was not.
    virtual int setCodec(int type, int nr, const char* name, const AnyDict& params) = 0;
    // How many more streams of a type fit: -1 when the multiplexer takes none of that type at all, 0 when
    // it is full. Type 0: the room left in total.
    virtual int canAddStreams(int type) const;
    // Limits of the multiplexer; the result is the total.
    virtual int maxStreams(QvAVS3plet<int>* limits) const;
    // The limit of a type, or the total for 0.
    virtual int maxStreams(int type) const;

    virtual QvEncoder* encoder(int type, int nr) const = 0;  // null when absent
    virtual QvEncoder* encoder(int index) const = 0;         // place among all streams; null when absent
    virtual QvVideoEncoder* videoEncoder(int nr) const = 0;
    virtual QvAudioEncoder* audioEncoder(int nr) const = 0;

    // Exchanges the multiplexer and rebuilds the streams for it. QvStatus::illegalState while open.
    virtual int setMuxer(const char* name) = 0;
    virtual QvMuxer* getMuxer() const = 0;
    virtual bool programsSupported() const;
    virtual QvIProgramSetup* programSetup() const;

    virtual int setFilename(const Any& name);  // setParam("filename", ...)
    virtual Any getFilename();                 // getParam("filename")
    // Whether open() makes a missing folder of the file name.
    virtual void setCreateOutFolder(bool on) = 0;
    virtual bool createOutFolder() const = 0;

    virtual void setFilters(QvOStream* stream, const FiltersState& filters);
    virtual const FiltersState& filters(QvOStream* stream) const;

    virtual int setSink(const char* name) = 0;
    virtual QvSink* sink() const = 0;
    // The queue that a memory sink hands its access units to; null for other sinks. The sink's own.
    virtual QvAuQueuePoll* outputQueue() const;

    void* getInterface(int kind) const override;
    using QvCodec::getParam;

    // Gives `cancel` to the streams of the multiplexer and the sink, for the next open(): see
    // QvBufStream::setCancel. QvTranscoder does it by itself.
    void setCancel(const std::shared_ptr<QvCancel>& cancel);

    int nrVideoStreams() const { return nrStreams(qvVideoStream); }
    int nrAudioStreams() const { return nrStreams(qvAudioStream); }
    int nrSubpicStreams() const { return nrStreams(qvSubpicStream); }
    QvOStream* videoStream(int nr) const { return stream(qvVideoStream, nr); }
    QvOStream* audioStream(int nr) const { return stream(qvAudioStream, nr); }
    QvOStream* subpicStream(int nr) const { return stream(qvSubpicStream, nr); }
    int addVideoStream(const Any& params) { return addStream(qvVideoStream, params); }
    int addAudioStream(const Any& params) { return addStream(qvAudioStream, params); }
    void removeVideoStream(int nr) { removeStream(qvVideoStream, nr); }
    void removeAudioStream(int nr) { removeStream(qvAudioStream, nr); }
    void removeSubpicStream(int nr) { removeStream(qvSubpicStream, nr); }
    void clearStreams() { removeStreams(qvAllStreams); }
    QvVideoEncoder* getVideoEncoder(int nr) const { return videoEncoder(nr); }
    QvAudioEncoder* getAudioEncoder(int nr) const { return audioEncoder(nr); }
    // Assert a stream that is not there.
    void setFilters(int type, int nr, const FiltersState& filters);
    const FiltersState& filters(int type, int nr) const;
    // Display strings of a stream. Video: "1920x1080", rate, bit rate. Audio: "48000Hz", "mono", "stereo"
    // or "multi ch.", bit rate. Empty for a stream that is absent or has no encoder.
    void getStreamDesc(int type, int nr, AnyVector& out) const;
};
