// Contract of a multiplexer: takes one bitstream from each encoder and writes the container into one
// output stream, which is attached as an encoder's is.
#pragma once

#include "core/encode/qvencoder.h"
#include "core/measure/streamtype.h"
#include "core/value/anycontainer.h"

class QvFileMuxConfig;

// "video", "audio" or "subpic"; the last for any other value too.
QV_API const char* qvStreamTypeName(int type);

// A multiplexer answers through getParam: "maxStreams" (a dictionary of the Int32 entries "vids", "auds",
// "subs", "total"), "programsSupported", "extension", "pal", "dropFrameTC", "type". One that writes files
// of its own also answers "filenames" (all the names it uses) and "filesWritten" (those that exist on disk
// because of the last run, finished or not: what a caller has to remove or rename after an abort).
class QV_API QvMuxer : public QvEncoder {
  public:
    explicit QvMuxer(const QvModule* module = nullptr) : QvEncoder(module) {}

    // Returns the bitstream that the encoder is to write to, owned by the multiplexer until
    // removeStream(s); null on failure. `params` holds "codec" (the encoder's module name) and "extension"
    // when known, and what else the caller has for this stream.
    virtual QvBufStream* addStream(int type, const AnyDict& params) = 0;
    virtual void removeStreams(int mask) = 0;
    virtual void removeStream(int type, int nr) = 0;
    // Streams of a type; of all types for 0 or 255.
    virtual int nrStreams(int type) const = 0;
    virtual QvBufStream* stream(int type, int nr) const = 0;
    virtual int flush();
    // Multiplexes elementary streams that lie in files ("core/encode/qvfilemux.h") into `output`, from adding
    // the streams to closing. 0; QvFileMux::cancelled; or a status with a text that names the file at fault,
    // with everything closed. Without streams QvStatus::invalidArgument, with nothing done: this is how it is
    // asked whether it can. Base, which can't: -1, without a text.
    virtual int muxElementaryStreams(QvFileMuxConfig& config, QvBufStream& output);
    // Parameters of one stream within a program. Base: each entry goes to setStreamParam with the
    // invalid parameter failure absorbed; the result is the sum of the results.
    virtual int setStreamParams(int program, int stream, const AnyDict& params);
    // Base: clears `params`.
    virtual void getStreamParams(int program, int stream, AnyDict& params) const;
    // Base: QvStatus::invalidParam.
    virtual int setStreamParam(int program, int stream, const char* name, const Any& value);
    // Base: the entry of what getStreamParams answers, invalid when it is absent.
    virtual void getStreamParam(int program, int stream, const char* name, Any& value) const;

    // Accepts without effect: "profile", "type", "pal", "filename", "settings", "bitrate",
    // "adjustSettings", "_totalFrames", "meta", "timecodeOffset".
    int setParam(const char* name, const Any& value) override;
    // Base: "maxStreams" 1 video, 1 audio, no subpicture, 2 in all; "programsSupported" 0.
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void* getInterface(int kind) const override;
};

// One program of a multiplexer that has them (the transport-stream kind). PIDs are 13 bits.
struct QvProgram {
    int program_number = 0;
    int program_PID = 0;
    int PCR_PID = 0;
};

// Reached by getInterface(17) of a multiplexer. Program indexes run from 0 to nrPrograms() - 1.
class QV_API QvIProgramSetup {
  public:
    virtual int nrPrograms() const = 0;
    // Appends a program; its index, or a status below 0.
    virtual int addProgram(const QvProgram& program) = 0;
    virtual int removeProgram(int index) = 0;
    virtual int getProgram(int index, QvProgram& program) const = 0;
    virtual int setProgram(int index, const QvProgram& program) = 0;
    // Fills `streams` with one Pair (stream type, number within the type) for each stream of the program.
    virtual int getProgramStreams(int index, AnyVector& streams) const = 0;

  protected:
    ~QvIProgramSetup() = default;
};

constexpr int qvProgramSetupInterface = 17;
