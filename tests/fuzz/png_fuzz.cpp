// Feeds files to the PNG reader, with and without an alpha frame. The signature is supplied.
#include <cstdint>
#include <cstdio>
#include <memory>

#include <unistd.h>

#include "core/media/pngfile_p.h"
#include "core/media/qvframe.h"

namespace {

// What a reader may spend on one input; larger pictures are claims of the header only.
constexpr int maxBytes = 64 << 20;

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static constexpr unsigned char signature[] = {0x89, 'P', 'N', 'G', '\r', '\n', 0x1a, '\n'};
    static const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::tmpfile(), std::fclose);
    if (!file || size < 17) return 0;
    const auto side = [&](std::size_t at) {
        return data[at] << 24 | data[at + 1] << 16 | data[at + 2] << 8 | data[at + 3];
    };
    const long long width = side(8), height = side(12);
    if (width < 0 || height < 0 || width * height > maxBytes / 4) return 0;
    std::rewind(file.get());
    if (std::fwrite(signature, 1, sizeof(signature), file.get()) != sizeof(signature) ||
        std::fwrite(data, 1, size, file.get()) != size)
        return 0;
    std::fflush(file.get());
    if (ftruncate(fileno(file.get()), static_cast<off_t>(sizeof(signature) + size)) != 0) return 0;
    for (const bool withAlpha : {false, true}) {
        QvFrame picture, alpha;
        std::rewind(file.get());
        if (qvIsPng(file.get())) qvReadPng(file.get(), "input", picture, withAlpha ? &alpha : nullptr);
    }
    return 0;
}
