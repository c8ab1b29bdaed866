// Decoder "rawdec": frames of a known format, one after the other in a plain file.
//
//     | offset | frame 0 | frame 1 | ... | frame n-1 | rest of less than a frame, never read
//
// A frame's bytes are the planes of its FOURCC at their default strides. "BGR6" (16 bits a component, the
// high byte at odd positions), "BGRU" (three bytes a pixel, rows without padding) and "v210" (delivered as
// Y216) are known in addition to the formats of QvFrame. A rest after the last frame sets "truncated" in
// the stream's parameters.
//
// Parameters: "filename", "source" (see QvByteSource; it has to know its size and to be sought), "FOURCC" or
// "extendedFOURCC" (Int32, or String of four characters; default "BGR4"), "width", "height" (pixels, default
// 320 x 240), "framerate" (Framerate or frames a second, default 25), "offset" (bytes), "frameAspect" (0:
// square pixels), "invert" (rows are bottom first in the file), "fieldOrderFile" (a frame's fields come one
// after the other in the file) and "interlacedFlag" (0 progressive, 1 top field first, 2 bottom field first).
// Changing a frame's format or the offset rewinds.
#pragma once

#include <memory>
#include <vector>

#include "builtin/decoders/inputfile.h"
#include "core/decode/qvdecoder.h"
#include "core/media/qvbuffer.h"

class QvVideoFilter;

class RawDecoder : public QvDecodePipe {
  public:
    explicit RawDecoder(const QvModule* module = nullptr);
    ~RawDecoder() override;

    using QvDecodePipe::getParam;
    using QvDecodePipe::getStreamParam;
    int init() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int restore(const AnyDict& state) override;
    int open() override;
    int close() override;

    int nrStreams(int type) const override;
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

    // What the application sets by name.
    struct Settings {
        int width = 320;
        int height = 240;
        QvFramerate framerate{25.0};  // its interlaced is "interlacedFlag"
        double frameAspect = 0;
        bool invert = false;
        bool fieldOrderFile = false;
        long long offset = 0;
    };

  private:
    enum class FileFormat { plain, rgb48, rgbUnpadded, v210 };

    Any filename_;
    QvByteSource* source_ = nullptr;  // in the place of the file; borrowed
    InputFile file_;
    Settings settings_;
    unsigned extendedFOURCC_ = QvFourcc::BGR4;  // of the file
    FileFormat fileFormat_ = FileFormat::plain;
    unsigned fourcc_ = 0;   // of the frames that are read, which v210 is before its conversion
    int frameNr_ = -1;      // of the current frame
    bool pending_ = false;  // the current frame is in place and not yet read
    bool seekable_ = false;
    bool selected_ = false;
    QvFrame frame_;      // not inited while there can be none of this size
    QvFrame fields_[2];  // in the file's order
    std::vector<unsigned char> readBuffer_;
    std::unique_ptr<QvCodec> converter_;  // of v210 only

    int setSource(const Any& value);
    int setFOURCC(const Any& value);
    int changeFormat(unsigned code);
    int changeSettings(const Settings& changed);
    int makeFrame();
    void makeFields();
    int checkFields();
    int makeConverter();
    QvVideoFilter* converterFilter() const;
    int rewind();

    bool isFieldFile() const { return settings_.fieldOrderFile && settings_.framerate.interlaced() != 0; }
    long long frameBytes() const;  // in the file; 0 without a frame
    long long payload() const;     // bytes after the offset
    double frameAspect() const;

    int readNext();
    int readImage(QvFrame& to);
    int readPacked(QvFrame& to);
    int readRows(QvFrame& to);
    int convert();
    int refuse(int stream);
    int readFailed();
    void describe(AnyDict& params) const;
    void storeSettings(AnyDict& dict) const;
};
