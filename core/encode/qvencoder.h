// Contracts of the encoders: what turns frames and samples into a bitstream.
//
// Calling order, kept by the encode pipe:
//     setParam...  attachOutStream  setParam("adjustSettings", 1)  open
//     writeFrame | writePcm ...     close | abort                  detachOutStream
//
// States are those of QvCodec: 1 created, 2 initialised, 3 open. An encoder belongs to the thread that
// drives it; one that gives what writeFrame gets to a worker of its own does the locking.
#pragma once

#include "core/encode/codecstate.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/status.h"

class QvBufStream;
class QvFrame;
class QvPcm;

class QV_API QvEncoder : public QvCodec {
  public:
    explicit QvEncoder(const QvModule* module = nullptr) : QvCodec(module) {}

    // Makes `stream` the output and itself its attachee (QvBufStream::setAtachee). An output that was
    // attached before is detached first. The stream stays its maker's: a multiplexer's for an encoder, a
    // sink's for a multiplexer. QvStatus::invalidArgument for null.
    virtual int attachOutStream(QvBufStream* stream);
    // Gives the output back. Without one nothing happens. Base: forgets the stream, 0.
    virtual int detachOutStream();
    // Stops at once without finishing the bitstream. Base: close().
    virtual int abort();

  protected:
    // The attached output, null without one. Not owned.
    QvBufStream* outStream() const { return outStream_; }

  private:
    QvBufStream* outStream_ = nullptr;
};

// A video encoder answers through getParam, as far as the layers above read it: "framerate"
// (QvFramerate), "width", "height", "inFOURCC" (vector of the input formats it takes) or
// "selectedFOURCC", "bitrate" (QvBitrate), "nrViews", "extension", "vBitrate", "maxVBitrate",
// "srPossible", "_needTopBlanking", "_isAVCHD", and optionally "dstBuffSize", the bytes that its output
// must be able to hold; "takesUserData" is true for one that writes the user data of frames, which sources
// read only if somebody wants them.
class QV_API QvVideoEncoder : public QvEncoder {
  public:
    explicit QvVideoEncoder(const QvModule* module = nullptr) : QvEncoder(module) {}

    // Encodes one picture; 0 on success. The encoder keeps no pointer to the frame after the call: the
    // caller's buffer is reused at once. A null frame means smart rendering: the source's coded data is
    // passed along in place of a picture.
    virtual int writeFrame(QvFrame* frame) = 0;
    // The frame kept for previews, null when there is none. Valid until the next call on the encoder.
    virtual QvFrame* lastFrame() = 0;
    virtual bool isKind(int kind) const { return kind == 7; }

    // "bitrate" (QvBitrate) is spread over "vbr", "vBitrate", "minVBitrate" and "maxVBitrate" through the
    // virtual setParam; a failure of one of them is the result. "timecodeOffset", "extension",
    // "adjustSettings" and "getQualityStats" are accepted without effect.
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void* getInterface(int kind) const override;
};

// An audio encoder answers: "samplerate" (Hz), "channels", "bitsPerSample", "bitrate" (QvBitrate),
// "aBitrate" (kilobits a second) and "extension".
class QV_API QvAudioEncoder : public QvEncoder {
  public:
    explicit QvAudioEncoder(const QvModule* module = nullptr) : QvEncoder(module) {}

    // Encodes the first `samples` samples of every channel, or all that are filled for -1; 0 on success.
    // The buffer is the caller's again after the call.
    virtual int writePcm(QvPcm* pcm, int samples = -1) = 0;
    virtual bool isKind(int kind) const { return kind == 6; }

    // "timecodeOffset", "smartRender", "adjustSettings" and "tsAdjust" are accepted without effect.
    int setParam(const char* name, const Any& value) override;
    void* getInterface(int kind) const override;
};
