// RawAudioEnc: writes PCM as it is. Module "rawaenc".
#pragma once

#include <cstdint>

#include "builtin/encoders/rawaencsettings.h"
#include "core/encode/qvencoder.h"
#include "core/engine/modules/qvmodule.h"

// What differs by multiplexer.
struct RawAudioTarget {
    bool announcedUnits = false;  // each writePcm is announced; units that its ring can't hold go in pieces
    bool markedEnd = false;       // close marks the end of the stream
    bool lpcmHeader = false;      // six bytes that describe the format come before the first samples
};

// Samples go to the output as they lie in the buffer: interleaved, little-endian, (bits + 7) / 8 bytes a
// value, 8 bits unsigned. With the multiplexers "rawmux" and "memmux" each writePcm is announced as an access
// unit, in pieces of whole samples when the output can't hold it at once; with "rawmux" close marks the end
// of the stream.
class RawAudioEnc : public QvAudioEncoder {
  public:
    RawAudioEnc() = default;
    ~RawAudioEnc() override;

    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;

    int attachOutStream(QvBufStream* stream) override;
    int open() override;
    int close() override;
    int abort() override;
    // QvStatus::invalidArgument when the buffer has another format than was set, or fewer samples.
    int writePcm(QvPcm* pcm, int samples = -1) override;

  private:
    int putHeader(class RawOutput& output);
    int putUnits(RawOutput& output, const unsigned char* data, uint64_t bytes);
    int putUnit(RawOutput& output, const unsigned char* data, uint64_t bytes);

    RawAudioSettings settings_;
    bool headerDue_ = false;
    RawAudioTarget target_;  // of the multiplexer at open()
};
