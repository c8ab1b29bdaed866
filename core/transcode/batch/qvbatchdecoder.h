// Several segments of input, one after the other, as one decoder whose streams have the format of an output.
//
//     QvBatchDecoder joined;
//     joined.addOutputVideoStream(job);           // what is asked for; its in... fields are not used
//     joined.insertSegment(first, -1);
//     joined.insertSegment(second, -1);
//     joined.open();                              // opens a conversion for each stream and segment
//     while (joined.readFrame(0) == 0) use(*joined.getFramePtr(0));
//
// Video decides where a segment ends: sound that is longer is dropped there, and sound that is shorter is
// filled up with silence. Without video the sound does. nrSamples() counts the samples of the sources, a
// stream's "samples" those that reads give. After the last segment every read returns -4
// (QvStatus::endOfStream).
//
// The parameter "endedEarly" is a Vector of the names of inputs whose sound ended before its announced
// length; the rest was filled with silence. "clippedSamples" of an audio stream counts the samples beyond
// full scale in its sources.
//
// A stored task has the inputs instead of this decoder: "segmentFiles" is the Vector of the entries of a
// state's "files", each once. "segmentSources", asked with a Pair of type and stream in the value, is the
// "sources" of that stream, and an empty Vector when asked with anything else.
//
// The decoders belong to the caller and outlive this one. Their streams are selected only for their segment,
// so that they can do without file and codec before. One thread at a time.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/decode/qvdecoder.h"
#include "core/decode/qvinputstream.h"
#include "core/job/jobdescription.h"
#include "core/job/processparams.h"

class QV_API QvBatchDecoder : public QvDecodePipe {
  public:
    // Streams in any order of the types; they belong to the caller and are copied. `points`, if valid, are
    // for the streams without points of their own.
    struct InputSegment {
        InOutPoints points;
        QvIStreamList streams;
    };

    QvBatchDecoder();
    ~QvBatchDecoder() override;

    void addOutputVideoStream(const VideoJobDescription& job);
    void addOutputAudioStream(const AudioJobDescription& job);
    void clearOutputStreams(int typeMask);  // QvStreamType
    // In front of `position`, -1 appends. 0, or -1 with a text: another number of streams than the output
    // has; nothing is kept then.
    int insertSegment(const InputSegment& segment, int position);
    void clearSegments();

    using QvDecodePipe::getParam;
    int init() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;
    const char* name() const override;  // "batchdec"
    int nrStreams(int type) const override;
    void getStreamParam(int type, int stream, const char* name, Any& value) const override;
    void getStreamParams(int type, int stream, AnyDict& params) const override;
    int seekToSample(long long sample, int stream) override;  // to 0 only (assertion)
    int seekToFrame(long long frame, int stream) override;    // to 0 only (assertion)
    int readFrame(int stream) override;
    int readSamples(int count, int stream) override;
    int nrFrames(int stream) const override;
    long long nrSamples(int stream) const override;
    QvFrame* getFramePtr(int stream) override;
    QvPcm* getAudioPtr(int stream) override;
    int select(int type, int stream) override;
    int deselect(int type, int stream) override;
    int selected(AnyDict& dict) const override;  // an assertion
    bool isSelected(int type, int stream) const override;
    int setReadUserData(int type, int stream, bool on) override;  // of every segment that can
    bool readUserData(int type, int stream) const override;       // of any segment

  private:
    struct Private;
    std::unique_ptr<Private> p_;
};
