// Decoder "meminput": what another decoder makes of a byte source.
//
//     in->setParam("source", qvSourceValue(source));
//     in->setParam("extension", "wav");               // or "decoder", or a "filename" with an extension
//     in->open();
//
// From open to close it is that decoder: streams, parameters, seeks, overrides and failures are passed on as
// they are, and frames and samples are the decoder's own buffers. Parameters of its own: "source" (a borrowed
// pointer, see QvByteSource), "decoder" (name of a module), "extension" (without the dot), "filename" (what
// the source is called; "memory" and the extension at first). Changing one of them closes it. All other
// parameters are kept until open, and set then.
//
// store writes the decoder and its state. The bytes are not stored: after restore, open fails until a source
// is set again.
#pragma once

#include <memory>
#include <string>

#include "core/decode/qvdecoder.h"
#include "core/stream/qvbytesource.h"

class MemInput : public QvDecodePipe {
  public:
    MemInput() = default;
    ~MemInput() override;

    void own(std::unique_ptr<QvByteSource> source);

    using QvDecodePipe::getParam;
    using QvDecodePipe::getStreamParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;
    // QvStatus::cannotParse, or the only decoder's own status, with the reasons of all that were tried.
    int open() override;
    int close() override;
    void* getInterface(int kind) const override;

    int nrStreams(int type) const override;
    void elementaryStream(int type, int stream, QvElementaryStream* out) const override;
    void getStreamParam(int type, int stream, const char* name, Any& value) const override;
    void getStreamParams(int type, int stream, AnyDict& params) const override;
    int setStreamParam(int type, int stream, const char* name, const Any& value) override;
    int seekToSample(long long sample, int stream) override;
    int seekToFrame(long long frame, int stream) override;
    int readFrame(int stream) override;
    int readSamples(int count, int stream) override;
    int nrFrames(int stream) const override;
    long long nrSamples(int stream) const override;
    int readMeta(int stream, int kind, AnyDict& out) override;
    int seek(const MediaTime& time, int type, int stream) override;
    int seekAll(const MediaTime& time) override;
    MediaTime duration(int type, int stream) override;
    QvFrame* getFramePtr(int stream) override;
    QvPcm* getAudioPtr(int stream) override;
    int select(int type, int stream) override;
    int deselect(int type, int stream) override;
    int selected(AnyDict& dict) const override;
    bool isSelected(int type, int stream) const override;
    AnyVector overridableParams(int type, int stream) override;
    int setOverride(int type, int stream, const char* name, const Any& value) override;
    const Any& override(int type, int stream, const char* name) override;
    const AnyVector& overrides(int type) const override;
    int encodedFrameSize(int stream) override;
    int readEncodedFrame(int stream, unsigned char* to) override;
    int setReadUserData(int type, int stream, bool on) override;
    bool readUserData(int type, int stream) const override;

  private:
    std::unique_ptr<QvByteSource> owned_;
    QvByteSource* source_ = nullptr;
    Any decoder_;
    Any extension_;
    Any filename_;
    AnyDict kept_;      // parameters of the decoder
    AnyDict restored_;  // its state, if it was restored
    std::unique_ptr<QvDecodePipe> inner_;

    int setOwn(Any& field, const char* name, const Any& value);
    int keep(const char* name, const Any& value);
    Any shownName() const;
    Any extension() const;
    int openWith(const char* module, std::string& reason);
    std::string setUp(QvDecodePipe& decoder) const;
    QvDecodePipe* opened();
    int passed(int result);
    template <class Operation>
    int pass(Operation&& operation);
};
