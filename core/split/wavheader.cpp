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

std::array<unsigned char, wavHeaderBytes> wavHeader(const WavFormat& format, uint64_t fileBytes) {
    std::array<unsigned char, wavHeaderBytes> header;
    const auto valueBytes = static_cast<uint64_t>(format.valueBytes());
    const auto sampleBytes = static_cast<uint64_t>(format.sampleBytes());
    const auto channels = static_cast<uint64_t>(format.channels);
    const auto rate = static_cast<uint64_t>(format.samplerate);
    const uint64_t dataBytes = fileBytes - std::min<uint64_t>(fileBytes, wavHeaderBytes);
    Fields fields(header.data());
    fields.text("RIFF").u32(std::max<uint64_t>(fileBytes, 8) - 8).text("WAVE");
    fields.text("fmt ").u32(formatBytes).u16(extensibleFormat).u16(channels).u32(rate);
    fields.u32(sampleBytes * rate).u16(sampleBytes).u16(valueBytes * 8).u16(extensionBytes);
    fields.u16(static_cast<uint64_t>(format.bitsPerSample)).u32(0);  // no channel mask
    fields.bytes(pcmSubtype.data(), pcmSubtype.size());
    fields.text("fact").u32(4).u32(dataBytes / sampleBytes * channels);
    fields.text("data").u32(dataBytes);
    return header;
}

bool writeWavHeader(const QvWideString& name, const WavFormat& format, QvIoFailure& failure) {
    StdFile file;
    bool ok = file.open(name, "r+b");
    const long long length = ok ? file.length() : -1;
    if (length >= 0) {
        const auto header = wavHeader(format, static_cast<uint64_t>(length));
        ok = file.seek(0, SEEK_SET) && file.write(header.data(), header.size());
    } else {
        ok = false;
    }
    if (!file.close()) ok = false;
    if (!ok) failure.note(file.error(), "Failed to write the header of", name);
    if (ok && static_cast<uint64_t>(length) > largestSize + 8)
        qv_log()->warning(
            "[split writer] %s is larger than a WAV header can state (4 GiB): its size fields are "
            "0xFFFFFFFF, all samples are in the file.",
            qv_narrow_name(name.data(), name.size()).c_str());
    return ok;
}
