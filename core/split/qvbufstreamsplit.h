// The output streams of the elementary stream export. Each is either a plain file, or splits the encoder's
// output: a file for each picture, or WAV files. They write in the encoder's thread, when it reports an
// access unit.
//
// Failures to open or write are logged, stop the ring, so that the encoder gets no more room, and stay in
// ioError().
#pragma once

#include <array>
#include <memory>

#include "core/stream/fifo/qvbuffifo.h"

class QvColorConverter;
class QvFileBufStream;
class QvFrame;
class PictureQueue;

// Parameters: "outfilename"; "split" Int32 0 for a plain file, anything else for files NAME#0.EXT, NAME#1.EXT
// and so on; "firstNumber" (Int32) in the place of 0; "nrDigits" (Int32), its width, with zeros in front;
// "png" true to write each access unit as a PNG picture, which "width", "height" and "FOURCC" describe.
// "chunk" must hold a whole picture then, and formats other than BGR3 need the module "scaler". "parallel"
// true: PNG pictures are packed on the engine's pool of threads, several at once. The files are written in
// order, but later than their units: a failure stops the ring at the next unit, or is in ioError() after
// destroy(0); destroy(1) drops what is not written yet.
class QV_API QvBsSplitVideo : public QvBufStreamFifoCb {
  public:
    explicit QvBsSplitVideo(QvCodec* owner = nullptr);
    ~QvBsSplitVideo() override;

    using QvBufStream::init;
    // Asserts that "outfilename" is text. -1 for an impossible picture format.
    int init(const AnyDict& params) override;
    void destroy(int abort) override;
    void flush() override;
    bufstream* input() override;
    bufstream* output() override;
    int registerObserver(QvAuxInfoObserver* observer) override;
    int unregisterObserver(QvAuxInfoObserver* observer) override;  // a plain file still calls one in the list
    int unregisterAllObservers() override;
    TPtrList<QvAuxInfoObserver>* observers() override;

    void cbProgress(int bytes) override;
    void cbAuxinfo(unsigned offset, unsigned id, void* info, unsigned size) override;

  private:
    int initPlain(const AnyDict& params);
    int initPictures();
    Any _currentFilename() const;
    void writeAccessUnit(unsigned bytes);
    bool writePicture(bufstream* ring, unsigned bytes, const Any& name);
    bool savePicture(const QvFrame& frame, const Any& name);
    bool writeFile(bufstream* ring, unsigned bytes, const Any& name);
    void noteLost();

    TPtrList<QvAuxInfoObserver> observers_;
    int fileCounter_ = 0;
    int nrDigits_ = 0;
    Any baseName_, extension_, path_;  // parts of "outfilename"
    bool split_ = false;
    bool png_ = false;
    int width_ = 0, height_ = 0;
    unsigned fourcc_ = 0;
    std::unique_ptr<QvFileBufStream> inner_;  // null in split mode
    // To BGR3; null unless the pictures have another format.
    std::unique_ptr<QvColorConverter> converter_;
    std::unique_ptr<QvFrame> converted_;
    std::unique_ptr<PictureQueue> queue_;  // null unless pictures are packed in parallel
};

// Parameters: "outfilename"; "isPcm" Int32 0 for a plain file, anything else for WAV; "split" true for one
// mono file for each channel, NAME#00.EXT, NAME#01.EXT and so on, at most 32; "samplerate", "channels" and
// "bitsPerSample" (20 bits stand in 3 bytes).
//
// The header is written when STREAM_END_CODE comes; before that the file has 80 zero bytes in its place. Size
// fields that a file beyond 4 GiB can't state are 0xFFFFFFFF, with a warning; the samples are all there.
//
// These parameters are off by default. "rf64" true: such a large file gets an RF64 header instead, without a
// warning. "channelMask" (Int32 or Int64): the speaker positions, which the header states unless the file is
// RF64 or a split. "chunks" (see QvWavChunks): they follow the samples, in every file of a split; a stream,
// which has to end with its samples, gets none.
//
// A pipe, a socket or a device gets its header at once. Its sizes are those of "expectedSamples" (Int32 or
// Int64, of each channel), or 0xFFFFFFFF without that: readers take the stream to its end then.
class QV_API QvBsSplitAudio : public QvBufStreamFifoCb {
  public:
    static constexpr int maxFiles = 32;

    explicit QvBsSplitAudio(QvCodec* owner = nullptr);
    ~QvBsSplitAudio() override;

    using QvBufStream::init;
    int init(const AnyDict& params) override;  // -1 for a format that no WAV can hold, and without a file
    void destroy(int abort) override;
    void flush() override;
    bufstream* input() override;
    bufstream* output() override;

    void cbProgress(int bytes) override;
    void cbAuxinfo(unsigned offset, unsigned id, void* info, unsigned size) override;

  private:
    struct Wav;

    int initPlain(const AnyDict& params);
    int openFiles();
    bool openFile(const Any& name);
    bool takeChunks();
    std::array<unsigned char, 80> streamHeader();
    static Any _channelFileName(const Any& name, int channel);
    void _onAudioBytes(unsigned bytes);
    bool writeInterleaved(bufstream* ring, unsigned bytes);
    bool writeChannels(bufstream* ring, unsigned bytes);
    bool takeSamples(bufstream* ring, unsigned bytes);
    bool writeItem(int file, const unsigned char* data, unsigned bytes);
    void onStreamEnd();
    bool writeChunks(int file);
    bool closeFile(int file);
    void _writeWavHeaders();

    std::unique_ptr<Wav> wav_;                // null unless the ring is used
    std::unique_ptr<QvFileBufStream> inner_;  // null when the ring is used
};
