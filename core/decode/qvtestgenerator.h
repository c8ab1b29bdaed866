// The convenient way to the test generator, module "testgen": a source without a file, whose video streams
// show a test card with a running timecode and whose audio streams beep each second.
//
//     GeneratorVParams video;
//     video.duration = MediaTime(10.0);
//     video.framerate.set25p();
//     video.width = 1280;
//     video.height = 720;
//     std::unique_ptr<QvDecodePipe> source(QvTestGenerator::create(&video, nullptr));
//     source->open();
//
// Video is BGR4. Reading continues beyond "frames", with rising numbers: the reader counts. Sound is 16-bit
// stereo at 44100 Hz, whatever is asked for, and ends. See builtin/decoders/testcard.h for the picture.
//
// The dictionary that describes them, parameter "streams" of the module, has the Vectors "vids" and "auds"
// with a Dict for each stream. A video stream's: "framerate" (Framerate, or Float frames a second), "picture"
// or "width" and "height", "frameAspect" (Float, default from the size), "duration" (MediaTime, or Float
// seconds) or "frames", "nrViews" (1 .. 10, default 1). An audio stream's: "duration" or "samples". "content"
// (String) gives other things than the card and the beep: of video "black", of any size; of sound "silence",
// then with "samplerate" (1 .. 768000), "channels" (1 .. 64) and "bitsPerSample" (16, 24, 32). The parameter
// "mode" with "graybar" gives a still picture of gray bars in place of the card.
#pragma once

#include "core/arch/api.h"
#include "core/measure/qvgeometry.h"
#include "core/value/any.h"
#include "core/value/ptrlist.h"

class QvDecodePipe;

struct QV_API GeneratorVParams {
    MediaTime duration;
    QvFramerate framerate;  // 24 progressive
    // The size, in place of width and height: the name of a PNG file, or a Generic of size 0 that points to a
    // QvFrame, or a Vector of these, of which the first counts.
    Any picture;
    int width = 0;           // pixels; of width and height one at least is 32 or more
    int height = 0;          // rows
    double frameAspect = 0;  // width to height as shown; 0: square pixels
    unsigned fourcc = 0;     // no effect
    int period = 0;          // no effect
    int nrViews = 0;         // views in a frame; 1 below 1 and above 10
};

struct QV_API GeneratorAParams {
    MediaTime duration;
    int samplerate = 0;  // no effect, as all below
    int channels = 0;
    int bitsPerSample = 0;
    int period = 0;
    int soundByte = 0;
};

class QV_API QvTestGenerator {
  public:
    // A generator to be opened, owned by the caller, or null without the module. Lists and elements may be
    // null and stay the caller's.
    static QvDecodePipe* create(const TPtrList<GeneratorVParams>* videos,
                                const TPtrList<GeneratorAParams>* audios);
    static QvDecodePipe* create(const GeneratorVParams* video, const GeneratorAParams* audio);
};
