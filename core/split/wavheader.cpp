#include "core/split/wavheader_p.h"

#include <algorithm>
#include <cstring>

#include "core/engine/log/qvlog.h"
#include "core/stream/stdfile_p.h"

namespace {

constexpr uint64_t largestSize = 0xFFFFFFFF;
constexpr unsigned formatBytes = 40;
constexpr unsigned extensionBytes = 22;
constexpr unsigned extensibleFormat = 0xFFFE;
constexpr std::array<unsigned char, 16> pcmSubtype = {0x01, 0x00, 0x00, 0x00, 0x00, 0x00, 0x10, 0x00,
                                                      0x80, 0x00, 0x00, 0xAA, 0x00, 0x38, 0x9B, 0x71};

// Little-endian fields, one after the other.
class Fields {
  public:
    explicit Fields(unsigned char* at) : at_(at) {}

    Fields& text(const char (&fourLetters)[5]) { return bytes(fourLetters, 4); }
    Fields& u16(uint64_t value) { return number(value, 2); }
    Fields& u32(uint64_t value) { return number(std::min(value, largestSize), 4); }
    Fields& u64(uint64_t value) { return number(value, 8); }
    Fields& bytes(const void* data, size_t count) {
        std::memcpy(at_, data, count);
        at_ += count;
        return *this;
    }

  private:
    Fields& number(uint64_t value, int width) {
        for (int i = 0; i < width; ++i) *at_++ = static_cast<unsigned char>(value >> (8 * i));
        return *this;
    }

    unsigned char* at_;
};

}  // namespace

bool wavFormatIsLegal(const WavFormat& format) {
    return format.samplerate > 0 && format.bitsPerSample >= 1 && format.bitsPerSample <= 32 &&
           format.channels >= 1 && format.channels <= 0xFFFF / format.valueBytes();
}

namespace {

struct Sizes {
    uint64_t riff, data;

    explicit Sizes(const WavExtent& extent)
        : riff(std::max<uint64_t>(extent.fileBytes, 8) - 8),
          data(extent.fileBytes - std::min(extent.fileBytes, wavHeaderBytes + extent.trailing)) {}
    bool fit() const { return riff <= largestSize; }
};

std::array<unsigned char, wavHeaderBytes> rf64Header(const WavFormat& format, const Sizes& sizes) {
    constexpr unsigned plainFormatBytes = 16, plainFormat = 1;
    constexpr unsigned sizesBytes = 28;
    std::array<unsigned char, wavHeaderBytes> header;
    const auto sampleBytes = static_cast<uint64_t>(format.sampleBytes());
    const auto rate = static_cast<uint64_t>(format.samplerate);
    Fields fields(header.data());
    fields.text("RF64").u32(largestSize).text("WAVE");
    fields.text("ds64").u32(sizesBytes).u64(sizes.riff).u64(sizes.data).u64(sizes.data / sampleBytes).u32(0);
    fields.text("fmt ").u32(plainFormatBytes).u16(plainFormat).u16(static_cast<uint64_t>(format.channels));
    fields.u32(rate).u32(sampleBytes * rate).u16(sampleBytes);
    fields.u16(static_cast<uint64_t>(format.valueBytes()) * 8);
    fields.text("data").u32(largestSize);
    return header;
}

}  // namespace

std::array<unsigned char, wavHeaderBytes> wavHeader(const WavFormat& format, const WavExtent& extent) {
    const Sizes sizes(extent);
    if (extent.mayBeRf64 && extent.fileBytes != wavLengthUnknown && !sizes.fit())
        return rf64Header(format, sizes);
    std::array<unsigned char, wavHeaderBytes> header;
    const auto valueBytes = static_cast<uint64_t>(format.valueBytes());
    const auto sampleBytes = static_cast<uint64_t>(format.sampleBytes());
    const auto channels = static_cast<uint64_t>(format.channels);
    const auto rate = static_cast<uint64_t>(format.samplerate);
    Fields fields(header.data());
    fields.text("RIFF").u32(sizes.riff).text("WAVE");
    fields.text("fmt ").u32(formatBytes).u16(extensibleFormat).u16(channels).u32(rate);
    fields.u32(sampleBytes * rate).u16(sampleBytes).u16(valueBytes * 8).u16(extensionBytes);
    fields.u16(static_cast<uint64_t>(format.bitsPerSample)).u32(format.channelMask);
    fields.bytes(pcmSubtype.data(), pcmSubtype.size());
    fields.text("fact").u32(4).u32(sizes.data / sampleBytes * channels);
    fields.text("data").u32(sizes.data);
    return header;
}

bool writeWavHeader(const QvWideString& name, const WavFormat& format, QvIoFailure& failure,
                    uint64_t trailing, bool mayBeRf64) {
    StdFile file;
    bool ok = file.open(name, "r+b");
    const long long length = ok ? file.length() : -1;
    if (length >= 0) {
        const auto header = wavHeader(format, {static_cast<uint64_t>(length), trailing, mayBeRf64});
        ok = file.seek(0, SEEK_SET) && file.write(header.data(), header.size());
    } else {
        ok = false;
    }
    if (!file.close()) ok = false;
    if (!ok) failure.note(file.error(), "Failed to write the header of", name);
    if (ok && !mayBeRf64 && static_cast<uint64_t>(length) > largestSize + 8)
        qv_log()->warning(
            "[split writer] %s is larger than a WAV header can state (4 GiB): its size fields are "
            "0xFFFFFFFF, all samples are in the file.",
            qv_narrow_name(name.data(), name.size()).c_str());
    return ok;
}
