// The first bytes choose format and size, the rest is the file: whatever they are, the decoder refuses to
// open or delivers exactly the frames that it promises.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>

#include <unistd.h>

#include "builtin/decoders/rawdec.h"

namespace {

constexpr const char* codes[] = {"GRAY", "I420", "YV12", "I422", "W016", "YUY2", "UYVY", "Y216", "BGR3",
                                 "BGR4", "BGRA", "ARGB", "b64a", "R555", "R565", "BGR6", "BGRU", "none"};

struct Setup {
    std::uint16_t width;
    std::uint16_t height;
    std::uint8_t code;
    std::uint8_t flags;  // bits 0 and 1 interlaced, 2 fields apart, 3 bottom first
    std::uint16_t offset;
};

void require(bool holds) {
    if (!holds) std::abort();
}

void apply(RawDecoder& decoder, const Setup& setup) {
    decoder.setParam("width", static_cast<int>(setup.width % 3000) - 1);
    decoder.setParam("height", static_cast<int>(setup.height % 3000) - 1);
    decoder.setParam("FOURCC", codes[setup.code % std::size(codes)]);
    decoder.setParam("interlacedFlag", setup.flags & 3);
    decoder.setParam("fieldOrderFile", setup.flags >> 2 & 1);
    decoder.setParam("invert", setup.flags >> 3 & 1);
    decoder.setParam("offset", setup.offset % 100);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    Setup setup;
    if (size < sizeof setup) return 0;
    std::memcpy(&setup, data, sizeof setup);
    static const std::string name = "/tmp/raw-fuzz-" + std::to_string(getpid()) + ".raw";
    std::ofstream(name, std::ios::binary)
        .write(reinterpret_cast<const char*>(data + sizeof setup),
               static_cast<std::streamsize>(size - sizeof setup));
    RawDecoder decoder;
    decoder.init();
    apply(decoder, setup);
    decoder.setParam("filename", name.c_str());
    if (decoder.open() == 0) {
        const int frames = decoder.nrFrames(0);
        const int looked = std::min(frames, 50);
        for (int i = 0; i < looked; ++i) require(decoder.readFrame(0) == 0);
        require(frames > looked || decoder.readFrame(0) == -4);
        require((decoder.seekToFrame(frames - 1, 0) == 0) == (frames > 0));
        require(frames == 0 || (decoder.readFrame(0) == 0 && decoder.readFrame(0) == -4));
        AnyDict params;
        decoder.getStreamParams(qvVideoStream, 0, params);
        require(params.getInt32("frames") == frames);
    }
    decoder.close();
    std::remove(name.c_str());
    return 0;
}
