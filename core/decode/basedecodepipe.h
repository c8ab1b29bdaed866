// Ready base of decoders: a list of stream objects that answers most of the contract.
//
// A subclass's open makes its streams with addStream and ends with QvDecodePipe::open. It replaces the reads
// and seeks that it supports; those it leaves assert.
#pragma once

#include <memory>
#include <vector>

#include "core/decode/qvdecoder.h"

// One stream of a BaseDecodePipe, which owns it.
class QV_API DPipeStream {
  public:
    explicit DPipeStream(int streamType) : type(streamType) {}
    DPipeStream(const DPipeStream&) = delete;
    DPipeStream& operator=(const DPipeStream&) = delete;
    virtual ~DPipeStream();

    virtual int select();
    virtual int deselect();

    int type;  // QvStreamType
    bool selected = false;
    AnyDict params;  // what getStreamParams answers
    Any name;
};

class QV_API DPipeVideoStream : public DPipeStream {
  public:
    DPipeVideoStream();
    ~DPipeVideoStream() override;

    std::unique_ptr<QvFrame> frame;  // may be null
};

class QV_API DPipeAudioStream : public DPipeStream {
  public:
    DPipeAudioStream();
    ~DPipeAudioStream() override;

    std::unique_ptr<QvPcm> pcm;  // may be null
};

class QV_API BaseDecodePipe : public QvDecodePipe {
  public:
    explicit BaseDecodePipe(const QvModule* module = nullptr);
    ~BaseDecodePipe() override;

    using QvDecodePipe::getParam;
    using QvDecodePipe::getStreamParam;

    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    // In state 3 deletes the streams; state 2.
    int close() override;

    // `type` is a mask; 0 means all types.
    int nrStreams(int type) const override;
    void getStreamParam(int type, int stream, const char* name, Any& value) const override;
    void getStreamParams(int type, int stream, AnyDict& params) const override;
    int seekToSample(long long sample, int stream) override;
    int seekToFrame(long long frame, int stream) override;
    int readFrame(int stream) override;
    int readSamples(int count, int stream) override;
    int nrFrames(int stream) const override;
    long long nrSamples(int stream) const override;
    QvFrame* getFramePtr(int stream) override;
    QvPcm* getAudioPtr(int stream) override;
    int select(int type, int stream) override;
    int deselect(int type, int stream) override;
    // Lists every stream of a type, selected or not.
    int selected(AnyDict& dict) const override;
    bool isSelected(int type, int stream) const override;

  protected:
    using StreamList = std::vector<std::unique_ptr<DPipeStream>>;

    const Any& filename() const { return filename_; }
    const StreamList& streams() const { return streams_; }
    // The nr-th stream of a type, null when there is none.
    DPipeStream* findStream(int type, int nr) const;
    // Appends and returns the stream.
    template <class Stream>
    Stream* addStream(std::unique_ptr<Stream> stream) {
        Stream* kept = stream.get();
        streams_.push_back(std::move(stream));
        return kept;
    }
    // For the start of an open that failed halfway, before state 3.
    void dropStreams() { streams_.clear(); }

    // 0 in that state; otherwise the error is set and it asserts. `method` is the operation's name, null for
    // "method".
    int checkState(int state, const char* method) const;
    // 0 for a number that the type has; otherwise the error is set and it asserts.
    int checkStream(int type, int stream, const char* method) const;

  private:
    StreamList streams_;
    Any filename_;

    DPipeStream& requireStream(int type, int stream) const;
};
