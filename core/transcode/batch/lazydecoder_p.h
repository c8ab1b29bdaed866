// A decoder that is open only while it is read, so that a task can have more inputs than a process may have
// open files.
#pragma once

#include <functional>
#include <list>
#include <memory>
#include <utility>

#include "core/decode/qvdecoder.h"
#include "core/transcode/batch/sourcefacts_p.h"

class LazyDecoder;

// The open sources of a task. Beyond the limit one that no decoder uses is closed, or if there is none the
// one that was read least recently.
class OpenDecoders {
  public:
    // Several decoders are read in turn; `limit` is above their number.
    explicit OpenDecoders(int limit) : limit_(limit) {}

    int count() const { return static_cast<int>(order_.size() + idle_.size()); }

  private:
    friend class LazyDecoder;
    using Order = std::list<LazyDecoder*>;

    struct Idle {
        std::shared_ptr<const SourceFacts> facts;
        std::unique_ptr<QvDecodePipe> decoder;
    };

    void makeRoom();
    void keep(Idle idle) { idle_.push_front(std::move(idle)); }
    // An open decoder of that source, or null.
    std::unique_ptr<QvDecodePipe> take(const std::shared_ptr<const SourceFacts>& facts);

    Order order_;           // the last one read is the first
    std::list<Idle> idle_;  // the last one that was in use is the first
    int limit_;
};

// Answers from known facts while the source is closed. The first read opens it, selects its streams and seeks
// to their positions. If it is closed to make room, positions are kept, and the next read continues there.
// Calls that change the source, such as setParam, open it for good.
class LazyDecoder : public QvDecodePipe {
  public:
    using Opener = std::function<QvDecodePipe*()>;  // an open decoder for the caller, null when it fails

    // In state 2. `facts` are of what `opener` opens.
    LazyDecoder(std::shared_ptr<OpenDecoders> others, std::shared_ptr<const SourceFacts> facts,
                Opener opener);
    ~LazyDecoder() override;

    bool isAwake() const;
    void rest();    // closes the source, unless it is open for good
    void giveUp();  // leaves the source, unless it is open for good, to the next decoder of the same file

    using QvDecodePipe::getParam;
    using QvDecodePipe::getStreamParam;
    int init() override { return 0; }
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int close() override;
    int process() override;
    void* getInterface(int kind) const override;
    const char* name() const override;
    void store(AnyDict& dict) const override;
    int restore(const AnyDict& state) override;
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
    MediaTime duration(int type, int stream) override;
    // Null before the first read.
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
    struct Source;
    std::unique_ptr<Source> source_;
    std::shared_ptr<OpenDecoders> others_;

    QvDecodePipe* awake() const;        // null when the source can't be opened; the error is set
    QvDecodePipe& mustBeAwake() const;  // asserts that it can
    QvDecodePipe& forGood() const;      // the same, and it stays open
    int refuse() const;                 // the result of a call when the source can't be opened
    void leave();
    int copyError(int result);
};
