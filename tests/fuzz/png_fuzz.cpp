// Feeds chunks to the PNG reader, with and without an alpha frame. Signature and checksums are supplied, so
// that inputs get past them.
#include <zlib.h>

#include <cstdio>
#include <memory>
#include <vector>

#include "core/image/pngfile_p.h"
#include "core/media/qvframe.h"
#include "tests/fuzz/fuzz.h"

namespace {

using Bytes = std::vector<unsigned char>;

// What a reader may spend on one input; larger pictures only cost time.
constexpr long long maxPixels = 4 << 20;

std::size_t numberAt(const Bytes& bytes, std::size_t at) {
    return static_cast<std::size_t>(bytes[at]) << 24 | static_cast<std::size_t>(bytes[at + 1]) << 16 |
           static_cast<std::size_t>(bytes[at + 2]) << 8 | bytes[at + 3];
}

// Chunks are length, name, data and checksum; each but the data takes four bytes.
void mendChecksums(Bytes& file) {
    for (std::size_t at = 8; at + 12 <= file.size();) {
        const std::size_t length = numberAt(file, at);
        if (length > file.size() - at - 12) return;
        const auto sum = crc32(0, file.data() + at + 4, static_cast<uInt>(length + 4));
        for (std::size_t i = 0; i < 4; ++i)
            file[at + 8 + length + i] = static_cast<unsigned char>(sum >> (24 - 8 * i));
        at += 12 + length;
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 25) return 0;
    Bytes bytes = {0x89, 'P', 'N', 'G', '\r', '\n', 0x1a, '\n'};
    bytes.insert(bytes.end(), data, data + size);
    const auto width = static_cast<double>(numberAt(bytes, 16)),
               height = static_cast<double>(numberAt(bytes, 20));
    if (width * height > static_cast<double>(maxPixels)) return 0;
    mendChecksums(bytes);
    const MemoryFile memory(bytes.data(), bytes.size());
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(memory.name(), "rb"), std::fclose);
    for (const bool withAlpha : {false, true}) {
        QvFrame picture, alpha;
        std::rewind(file.get());
        if (qvIsPng(file.get())) qvReadPng(file.get(), "input", picture, withAlpha ? &alpha : nullptr);
    }
    return 0;
}
