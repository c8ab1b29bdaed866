#include "tarsel/source/wavformat.h"

#include <cstdio>
#include <optional>
#include <string_view>

#include "tarsel/host/files.h"
#include "tarsel/words/messages.h"

namespace {

constexpr unsigned kExtensible = 0xFFFE;
constexpr size_t kHead = 1 << 16;  // bytes in which the format stands, but for odd files
constexpr const char* kReadable = "PCM of 8, 16 or 24 bits and 1 to 8 channels";

constexpr struct {
    unsigned tag;
    const char* name;
} kCodecs[] = {
    {0x0001, "PCM"},
    {0x0002, "Microsoft ADPCM"},
    {0x0003, "floating point"},
    {0x0006, "A-law"},
    {0x0007, "mu-law"},
    {0x0011, "IMA ADPCM"},
    {0x0031, "GSM 6.10"},
    {0x0040, "G.721 ADPCM"},
    {0x0050, "MPEG layer 2"},
    {0x0055, "MP3"},
    {0x00FF, "AAC"},
    {0x0161, "WMA"},
    {0x2000, "AC-3"},
    {0x2001, "DTS"},
    {0xF1AC, "FLAC"},
};

struct Format {
    unsigned tag = 0, channels = 0, blockBytes = 0, bits = 0;
    // Bytes of a PCM sample; 0 where the fields do not say.
    unsigned sampleBytes() const { return tag == 1 && channels > 0 ? blockBytes / channels : 0; }
};

unsigned word(std::string_view bytes, size_t at) {
    return static_cast<unsigned char>(bytes[at]) |
           static_cast<unsigned>(static_cast<unsigned char>(bytes[at + 1])) << 8;
}

// "RIFFWAVE" of a WAV file.
std::string formOf(std::string_view file) {
    return file.size() < 12 ? "" : std::string(file.substr(0, 4)) + std::string(file.substr(8, 4));
}

// Of the chunk "fmt ".
std::optional<Format> formatOf(std::string_view file) {
    for (size_t at = 12; at + 8 + 16 <= file.size();) {
        const size_t size = word(file, at + 4) | static_cast<size_t>(word(file, at + 6)) << 16;
        const std::string_view fields = file.substr(at + 8, size);
        if (file.substr(at, 4) == "fmt ") {
            if (fields.size() < 16) break;
            Format format{word(fields, 0), word(fields, 2), word(fields, 12), word(fields, 14)};
            if (format.tag == kExtensible && fields.size() >= 26) format.tag = word(fields, 24);
            return format;
        }
        at += 8 + size + size % 2;
    }
    return std::nullopt;
}

std::string describe(const Format& format) {
    char unknown[32];
    std::snprintf(unknown, sizeof unknown, "sound of type 0x%04x", format.tag);
    std::string text = unknown;
    for (const auto& codec : kCodecs)
        if (codec.tag == format.tag) text = codec.name;
    if (format.bits > 0) text += ", " + std::to_string(format.bits) + " bits";
    if (const unsigned bytes = format.sampleBytes(); bytes > (format.bits + 7) / 8)
        text += " in " + std::to_string(bytes) + " bytes";
    if (format.channels < 1 || format.channels > 8)
        text += ", " + std::to_string(format.channels) + " channels";
    return text;
}

bool readable(const Format& format) {
    return format.tag == 1 && format.sampleBytes() == format.bits / 8 && format.channels >= 1 &&
           format.channels <= 8 && (format.bits == 8 || format.bits == 16 || format.bits == 24);
}

}  // namespace

void refuseWav(const std::string& name) {
    const std::string head = firstBytes(name, kHead), form = formOf(head);
    if (form == "RIFXWAVE") throw failure(Msg::inputFormat, {name, "big-endian sound (RIFX)", kReadable});
    const bool wave = form == "RIFFWAVE" || form == "RF64WAVE" || form == "BW64WAVE";
    if (!wave) throw failure(Msg::inputNotWav, {name});
    const auto format = formatOf(head);
    if (!format) throw failure(Msg::inputWavDamaged, {name});
    if (readable(*format)) throw failure(Msg::inputWavNoData, {name});
    throw failure(Msg::inputFormat, {name, describe(*format), kReadable});
}
