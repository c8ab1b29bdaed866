// Decoder "mvmetadec": the video streams of several inputs as the views of one picture, or joined into one.
//
// Reads metafiles ("mmf", "mvf") with views, or a set-up from memory; see QvViewSetup for both and for the
// layouts. Any other metafile is refused without a line in the log for users: another decoder may know it.
// All views have one size, rate and pixel format; the picture is as long as the shortest of those shown, and
// "truncated" if others are longer. An input whose frames have several views gives all of them. The sound is
// that of the first input.
//
// Parameters: "filename" (text) or "metaState" (Dict, what QvViewSetup::store makes; with a file, what it
// holds); "layout" (String, in the place of the set-up's own, until the next file); "openParameters" (Dict,
// for decoders of inputs without a stored state). Read only: "inputFailure" (String, why it did not open),
// "inputFiles" (Vector, the files of all inputs), "filesize" (bytes of all inputs); "isMeta" and "metaData"
// of a set-up from memory, for QvMetafile::saveDecoder.
#pragma once

#include <string>

#include "builtin/shared/metainput.h"
#include "core/compose/qvviewsetup.h"
#include "core/decode/basedecodepipe.h"

class MVStream;

class MVMetaDec : public BaseDecodePipe {
  public:
    explicit MVMetaDec(const QvModule* module = nullptr);
    ~MVMetaDec() override;

    using BaseDecodePipe::getParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;

    int readFrame(int stream) override;
    int seekToFrame(long long frame, int stream) override;
    QvFrame* getFramePtr(int stream) override;
    int readSamples(int count, int stream) override;
    int seekToSample(long long sample, int stream) override;
    QvPcm* getAudioPtr(int stream) override;

    struct Settings {
        std::string layout;  // empty: that of the set-up
    };

  private:
    MetaInput source_{true};
    Settings settings_;
    std::string inputFailure_;

    int refuse(int code, const std::string& reason);
    int readSetup(QvViewSetup& setup, bool& isNone);
    void addSounds(MVStream& picture);
    MVStream* picture() const;
    QvDecodePipe& soundInput(const char* method, int stream) const;
};
