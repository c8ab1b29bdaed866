// Decoder "p2dec": a clip of P2 cards as one input: its picture, and each of its up to 16 sounds as a stream.
//
// Opened by the clip's document (CONTENTS/CLIP/NAME.XML) or by the folder of a card that holds one clip; any
// other XML document is refused without a line in the log for users. The picture and the sounds are MXF
// files, which decoders for "mxf" read; one that is shorter than its document says is "truncated". The parts
// of a take that lies on several cards are joined, wherever in it the document is: each part's sound begins
// with its picture, cut or with silence after it.
//
// Parameters: "filename" (text; after open by a folder the name of the document), "joinSpans" (Int32, 1: all
// parts of a take, 0: the one of the document), "openParameters" (Dict, for the decoders of the essence).
// Read only: "foreign" (Int32, 1: what did not open is no document of a clip), "clipName", "userClipName",
// "startTimecode" (Strings, absent where the clip has none), "meta" (Dict of them, and the same as "title"
// and "timecode"), "inputFiles" (Vector, all files), "filesize" (bytes of the essence).
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "builtin/decoders/p2/p2clip.h"
#include "builtin/decoders/p2/p2stream.h"
#include "builtin/shared/metainput.h"
#include "core/decode/qvdecoder.h"

class P2Dec : public QvDecodePipe {
  public:
    explicit P2Dec(const QvModule* module = nullptr);
    ~P2Dec() override;

    using QvDecodePipe::getParam;
    using QvDecodePipe::getStreamParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;

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
    int selected(AnyDict& dict) const override;
    bool isSelected(int type, int stream) const override;

    struct Settings {
        bool joinSpans = true;
    };

  private:
    MetaInput source_{false};
    Settings settings_;
    bool foreign_ = false;  // what the last open refused is no clip
    std::vector<P2Clip> take_;
    std::vector<std::unique_ptr<P2Stream>> streams_;  // the picture, then the sounds

    P2Stream* find(int type, int stream) const;
    int noStream(const char* operation);
    int noted(int result, const P2Stream& stream);
    int refuse(const P2Fault& fault);
    std::string openEssence(const Any& file, const P2Length& said, P2Stream& stream) const;
    std::string openStreams();
    void fillMeta(AnyDict& meta) const;
};
