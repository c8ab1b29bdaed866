// What one video or audio conversion has to do, from the format of a decoder stream to that of an encoder.
#pragma once

#include <memory>
#include <string>

#include "core/arch/api.h"
#include "core/measure/qvgeometry.h"
#include "core/value/anycontainer.h"

class QvCancel;

struct VideoJobDescription {
    int inWidth = 0;  // pixels
    int inHeight = 0;
    unsigned inFOURCC = 0;
    int inITU = 0;  // colour matrix: 0 unknown, 1 BT.601, 2 BT.709
    QvFramerate inFramerate;
    int startFrame = 0;  // first input frame
    int stopFrame = 0;   // last input frame, inclusive
    double inFrameAspect = 1.0;
    int outITU = 0;
    int outWidth = 0;
    int outHeight = 0;
    unsigned outFOURCC = 0;
    QvFramerate outFramerate;
    double outFrameAspect = 1.0;
    int topBlankingLines = 0;  // lines of blanking that the encoder wants on top
    AnyDict filters;           // a FiltersState
    // For filters that are a QvCancellable; null for none.
    std::shared_ptr<QvCancel> cancel;
};

// How well an audio chain converts where it does so by itself. The defaults are the plain conversions; a
// chain whose converter does not know a value can't be built.
struct QV_API AudioConversion {
    std::string rateQuality = "standard";  // "quality" of `srconvert`: "standard", "high"
    std::string dither = "none";           // of the last `aquant`: "none", "triangular"
    bool clipWarning = true;               // of the last `aquant`: whether it warns of clipped samples
    // After the end of the input the filters get silence, so that what they hold comes out, and a step of a
    // link always has all samples that are due, even if the input has none at all. Off: the step in which the
    // input ends is shorter, silence without filters follows, and an input that ends within the first step is
    // a failure.
    bool padEnd = false;

    AudioConversion() = default;
    // Keys "rateQuality" and "dither" (texts), "clipWarning" and "padEnd" (Int32); what is absent or of
    // another type keeps its default.
    explicit AudioConversion(const AnyDict& stored);
    AnyDict stored() const;  // what differs from the defaults
};

struct AudioJobDescription {
    int inBitsPerSample = 0;
    int inSamplerate = 0;
    int inChannels = 0;
    int outBitsPerSample = 0;
    int outSamplerate = 0;
    int outChannels = 0;
    // One entry an output channel: a source dictionary with "channel" and optionally "stream", a vector of
    // such (mixed), or false for silence. Empty: channels go straight through.
    AnyVector connMatrix;
    AnyVector filters;  // stored audio filters
    AudioConversion conversion;
};
