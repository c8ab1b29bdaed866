#include "tarsel/source/wavformat.h"

#include <climits>
#include <cstdio>
#include <optional>
#include <string_view>

#include "tarsel/words/messages.h"

namespace {

constexpr unsigned kExtensible = 0xFFFE;
constexpr const char* kReadable = "PCM of 1 to 32 bits, float, A-law and mu-law of 1 to 256 channels";
constexpr unsigned kMostChannels = 256;

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
    unsigned tag = 0, channels = 0, blockBytes = 0, bits = 0, rate = 0;
    // Bytes of a PCM sample; 0 where the fields do not say.
    unsigned sampleBytes() const { return tag == 1 && channels > 0 ? blockBytes / channels : 0; }
    bool padded() const { return sampleBytes() > (bits + 7) / 8; }
};

// Numbers of a file: little-endian but for "RIFX".
struct Numbers {
    bool bigEndian;

    unsigned word(std::string_view bytes, size_t at) const {
        const unsigned first = static_cast<unsigned char>(bytes[at]);
        const unsigned second = static_cast<unsigned char>(bytes[at + 1]);
        return bigEndian ? first << 8 | second : second << 8 | first;
    }
    unsigned number(std::string_view bytes, size_t at) const {
        const unsigned first = word(bytes, at), second = word(bytes, at + 2);
        return bigEndian ? first << 16 | second : second << 16 | first;
    }
};

// "RIFFWAVE" of a WAV file.
std::string formOf(std::string_view file) {
    return file.size() < 12 ? "" : std::string(file.substr(0, 4)) + std::string(file.substr(8, 4));
}

// Of the chunk "fmt ".
std::optional<Format> formatOf(std::string_view file) {
    const Numbers numbers{file.substr(0, 4) == "RIFX"};
    const auto word = [&](std::string_view bytes, size_t at) { return numbers.word(bytes, at); };
    for (size_t at = 12; at + 8 + 16 <= file.size();) {
        const size_t size = numbers.number(file, at + 4);
        const std::string_view fields = file.substr(at + 8, size);
        if (file.substr(at, 4) == "fmt ") {
            if (fields.size() < 16) break;
            Format format{word(fields, 0), word(fields, 2), word(fields, 12), word(fields, 14),
                          numbers.number(fields, 4)};
            // In the first field of a GUID, where big-endian files have it in one of its four bytes.
            if (format.tag == kExtensible && fields.size() >= 28) {
                format.tag = numbers.word(fields, 24);
                if (numbers.bigEndian && format.tag == 0) format.tag = numbers.word(fields, 26);
                if (numbers.bigEndian && (format.tag & 0xFF) == 0) format.tag >>= 8;
            }
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
    if (format.padded()) text += " in " + std::to_string(format.sampleBytes()) + " bytes";
    if (format.channels < 1 || format.channels > kMostChannels)
        text += ", " + std::to_string(format.channels) + " channels";
    if (format.rate < 1 || format.rate > INT_MAX) text += ", " + std::to_string(format.rate) + " Hz";
    return text;
}

bool readable(const Format& format) {
    if (format.channels < 1 || format.channels > kMostChannels || format.padded()) return false;
    if (format.rate < 1 || format.rate > INT_MAX) return false;
    switch (format.tag) {
        case 1: return format.bits >= 1 && format.bits <= 32;
        case 3: return format.bits == 32 || format.bits == 64;
        case 6:
        case 7: return format.bits == 8;
        default: return false;
    }
}

}  // namespace

void refuseWav(const std::string& name, const std::string& head) {
    const std::string form = formOf(head);
    const bool wave = form == "RIFFWAVE" || form == "RIFXWAVE" || form == "RF64WAVE" || form == "BW64WAVE";
    if (!wave) throw failure(Msg::inputNotWav, {name});
    const auto format = formatOf(head);
    if (!format) throw failure(Msg::inputWavDamaged, {name});
    if (readable(*format)) throw failure(Msg::inputWavNoData, {name});
    throw failure(Msg::inputFormat, {name, describe(*format), kReadable});
}
