// Turns a job description into a ready processing pipe, and describes filter parameters to user interfaces.
//
// Order of a video chain: front custom filters; a rate reduction; flipper; cropper; deinterlacer; scaler; any
// other rate conversion; back custom filters. Order of an audio chain: aquant to 32 bits; front custom
// filters; rate and channel converter, the rate converter on the side with fewer channels; back custom
// filters; aquant to the output's width. A chain without any filter is no pipe at all.
#pragma once

#include "core/arch/api.h"
#include "core/decode/qvdecoder.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class MediaTime;
class QvAProcessPipe;
class QvEncodePipe;
class QvFrame;
class QvFramerate;
class QvMuxer;
class QvVProcessPipe;
struct AudioJobDescription;
struct VideoJobDescription;

enum QvGuiControl {
    QV_GUI_EDITBOX = 1,
    QV_GUI_EDIT = QV_GUI_EDITBOX,
    QV_GUI_SLIDER = 2,
    QV_GUI_CHECKBOX = 3,
    QV_GUI_FILESELECT_LOAD = 4,
    QV_GUI_FILESELECT_SAVE = 5,
    QV_GUI_COMBOBOX = 6
};

class QV_API QvProcessUtil {
  public:
    // An open pipe, owned by the caller; null when the job needs no processing.
    static QvVProcessPipe* createVideoPipe(const VideoJobDescription& job);
    // The same for pictures of several views; the job must outlive the pipe if there are 2 or more. Null also
    // when that pipe does not open.
    static QvVProcessPipe* createVideoPipeMV(const VideoJobDescription& job, int nrViews);
    // A null module name means "vprocess"; a name without module asserts. A pipe that fails to open asserts.
    static QvVProcessPipe* createVideoPipeAux(const VideoJobDescription& job, const char* moduleName,
                                              bool deferOpen);
    // Sets in the encoder what the pipe (null: none) already does and what the encoder is to do itself.
    static void adjustVideoEncoder(const VideoJobDescription& job, QvVProcessPipe* pipe,
                                   QvEncodePipe* encoderPipe, int encoderStream);

    // A pipe that is not open yet, owned by the caller; null when the job needs no processing. A delay filter
    // that asks for no or a negative delay becomes the time at the input's start that is to be skipped.
    static QvAProcessPipe* createAudioPipe(const AudioJobDescription& job, MediaTime& delayOut);
    // Sets a report on the stream's samples from..to as "_streamReport" on each filter that needs one
    // ("_needsReport", QvReportNeed). Reads the stream, and leaves it at its beginning, if any does. All
    // levels are Floats:
    //   "peakLeveldB"         dB     peak of the decoder's samples; absent for samples of four bytes
    // and for QvReportNeed::loudness, of the sound that a second chain of the same filters gives to this one:
    //   "integratedLoudness"  LUFS   minus infinity if nothing is loud enough
    //   "loudnessRange"       LU
    //   "truePeakdB"          dBTP   minus infinity for silence, as the two below
    //   "samplePeakdB"        dBFS
    //   "rmsdB"               dBFS
    // The pipe is not open yet. What can't be measured is logged and left out.
    // `watch` gets the part of all readings that is done; false if it ended them, and no further report is
    // set.
    static bool applyStreamReport(QvAProcessPipe* pipe, QvDecodePipe* decoder, int decoderStream,
                                  long long from, long long to, const QvReadWatch& watch = {});

    // Frame numbers at one rate to another. The first element decides whether they are Int32 or Int64; `out`
    // is unchanged when `in` is empty.
    static void rescaleTimePoints(const AnyVector& in, const QvFramerate& fromRate, const QvFramerate& toRate,
                                  AnyVector* out);
    // What each stream has to be delayed by in smart rendering, in ticks: "video" and "audio", one Int64 a
    // stream; empty when no stream has a delay.
    static void calculateSRAudioDelayCorrections(QvMuxer* muxer, AnyDict& dict);

    // Description of a parameter of type Any::Int32, Float, String or WString. Without a `min` of that type
    // there is no range.
    static AnyDict createParamDesc(const char* name, int type, int guiControl, const char* description,
                                   const Any& min = Any(), const Any& max = Any(), const Any& step = Any());
    static AnyDict createParamDesc(const char* name, int type, int guiControl, const char* description,
                                   const AnyVector& allowed);
    // False, with the first fault in `error` if given, for a description that no user interface could show.
    static bool checkParamDesc(const AnyDict& desc, Any* error = nullptr);
};

// Full-range luma to studio range.
class QV_API YSwingCorrect {
  public:
    // Changes the luma words of a Y216 frame; other frames are left alone. 0.
    static int correct(QvFrame& frame);
    static const unsigned char* table8();    // 256 entries
    static const unsigned short* table16();  // 65536 entries
};
