// QvUtil: the engine's static services under one name. Each is implemented next to its own subject, or one
// line in core/engine/qvutil.cpp leads there.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvCodec;
class QvDecodePipe;
class QvEncodePipe;
class QvFramerate;

class QV_API QvUtil {
  public:
    // --- Pixel formats (core/measure/fourcc.h)

    // FOURCCs hold their first character in the lowest byte: "BGRA" is 0x41524742.
    static bool equalFcc(unsigned a, unsigned b);  // also BGRA and BGR4, YUY2 and YUYV
    // Both in one of BGRA ARGB BGR4 R32C, YUYV YUY2 UYVY, I420 YV12.
    static bool exchengeableFOURCC(int a, int b);
    static int macroblocks(int width, int height);  // of 16x16, parts counted whole; 0 for no area

    // --- Picture shape (core/measure/pictureaspect.cpp)

    // The pixel aspect x:y, width to height, of a picture that is shown `frameAspect` wide for 1 high. With
    // `broadcast` the sizes of television have their fixed aspects. x:y is 1:1, and the result 0, if a size
    // or the aspect is 0; -1, with 1:1, if no ratio with terms below 10000 comes near enough.
    static int getPixelAspect(int* x, int* y, double frameAspect, int width, int height, bool broadcast);
    // The inverse: the width for a height of 1 that pixels of x:y give the picture. 0 if an argument is not
    // above 0.
    static double getFrameAspect(int x, int y, int width, int height, bool broadcast);

    // --- Numbers (core/engine/qvutil.cpp)

    static float clip(float value, float low, float high);
    static bool equ(double a, double b, double tolerance);                             // QvNum::equ
    static int ratio(double value, int& num, int& den, int maxDen, double tolerance);  // QvNum::ratio
    // Index of the number nearest to `value`, the first of equally near ones; `nearest`, which may be null,
    // receives it. Elements that are no numbers are passed over; -1 if there is none.
    static int findClosestDouble(const AnyVector& values, double value, double* nearest);
    // "value": the count, "name": with `named` "mono" and "stereo" for 1 and 2; else "1 channel", "2
    // channels".
    static AnyDict channelDesc(int channels, bool named);
    // A dictionary goes to `back`, or to `front` if its "_front" is true; each list rises by "_position",
    // equal ones in their order. With `onlyActive` those whose "_on" is not true are left out.
    static void getSortedEffects(const AnyVector& in, AnyVector& front, AnyVector& back, bool onlyActive);
    // MD5 of a text's characters (a WString's as UTF-8) or a Generic's bytes, in words of four bytes, each
    // least significant byte first and without leading zeros: mostly 32 characters, at times fewer. At most
    // maxChars / 2 bytes of the digest are printed. Invalid for other values.
    static Any md5Digest(const Any& value, int maxChars);

    // --- Time (core/measure/clocktime.cpp)

    // Frame number, truncated, at a time in ticks of a 27 MHz clock. `rate` is made a fraction with a
    // denominator below 10000. The flag belongs to the interface and changes nothing.
    static long long pts2FrameNr(long long pts, double rate, bool flag);
    // Truncated. 0 for a rate of 0.
    static long long samplesForFrames(int frames, const QvFramerate& rate, int samplerate);
    static void sec2hms(double seconds, int& h, int& m, int& s);  // whole seconds, truncated
    static void msec2hmsmsec(long long milliseconds, int& h, int& m, int& s, int& ms);
    // "1:02:03:004" with its zero; the buffer holds at least posSize characters.
    static void printPos(char* buffer, long long milliseconds);
    static constexpr int posSize = 40;
    static void sleep(int milliseconds);

    // --- Facts of the build and the machine (core/engine/facts/buildfacts.cpp)

    static Any libraryPath();
    static Any libraryVersion();  // "2.5.10.7839"
    static Any buildDate();       // "2011-10-12"
    static Any buildPlatform();   // "Linux x64"
    static Any cpuDescription();  // "Processors: 8 Features: MMX MMXEXT ..."

    // --- Names (core/engine/files/nameutil.cpp)

    static Any tempDir();
    static void winFname(const Any& in, Any& out);
    static Any getExt(const Any& name, bool lower);
    static Any getBasename(const Any& name);
    static Any getPath(const Any& name);
    static bool isAbsolutePath(const Any& name);
    // A new name for a temporary folder: folder, separator, "Tarsel_metadata_", a random number, "_", the
    // time in seconds. Nothing is made on the disc.
    static Any makeMetaName(const Any& folder);
    // The folders of a P2 card below `root`, as full names, parents before children: CONTENTS and in it CLIP,
    // VIDEO, AUDIO, ICON, PROXY and VOICE. Empty if `root` is no text.
    static AnyVector getP2FolderStructure(const Any& root);

    // --- Profiles (core/preset/profiletests.cpp)

    static bool isProfile1(int profile);      // a number of the second scheme, 0x1000000 and above
    static bool isProfile2(int profile);      // a number of the current scheme, 0x2000000 and above
    static bool isExProfile(int profile);     // XDCAM EX, of either scheme
    static bool isMpeg2Profile(int profile);  // video is MPEG-2, of either scheme
    // The word for step `quality` of a constant-quality setting, 0 the best: with 3 `steps` "Best", "Better",
    // "Good", with any other count "Highest", "High", "Medium", "Lowest". Beyond either end the end's word.
    static const char* cqtQualityStr(int quality, int steps);

    // --- Bit rates of an encode pipe, in bits per second (core/encode/rateplan.cpp)

    // Sums of the targets of the pipe's video and audio encoders. -1, with both 0, without a pipe.
    static int getRates(const QvEncodePipe* pipe, double& video, double& audio);
    // What one video stream may take for a file of `bytes` to last `seconds`, after the audio streams and one
    // part in fifty for the multiplexer. 0 if nothing is left or an argument is not above 0.
    static double targetBitrate(const QvEncodePipe* pipe, double seconds, double bytes);
    // Fits the pipe into `bytes`: rates for one video and one audio stream. Audio keeps its rate unless it
    // would take more than a third, and then takes a third; video takes the rest. -1 with both 0 as above.
    static int suggestRates(const QvEncodePipe* pipe, double seconds, double bytes, double& video,
                            double& audio);
    // A field of a codec's settings record: what "settings", as a dictionary, holds under `field`. Invalid if
    // there is none.
    static Any codecStructParam(const QvCodec* codec, const char* field);

    // --- Decoder settings for an encoder (core/encode/matchparams.cpp)

    // Copies the named parameters of the decoder's stream 0 of a type, 1 video or 2 audio, to the pipe's
    // first encoder of the type; of "framerate" the nearest in the encoder's "framerateRange". What either
    // side does not know is passed over, what the decoder lacks with a warning in the log. Nothing happens
    // if one of them is null. Another type is an assertion.
    static void matchParams(const QvDecodePipe* decoder, int type, QvEncodePipe* pipe,
                            const AnyVector& names);

    // --- Parameter traces, debug log (core/engine/modules/paramtrace.cpp)

    // One line, and one for each element: `indent` levels of two blanks, label, type, and from column
    // `column` the value.
    static void debugOutAny(const char* label, const Any& value, int indent = 0, int column = 40,
                            bool recurse = true);
    static void debugOutDict(const AnyDict& dict, int indent = 0, int column = 40);
    static void debugOutVector(const AnyVector& vector, int indent = 0, int column = 40);
    static void debugOutSetParam(const QvCodec* codec, const char* name, const Any& value);
};
