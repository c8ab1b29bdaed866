// Any format, size and file: the decoder refuses to open or delivers exactly the frames that it promises.
#include <algorithm>

#include <fuzzer/FuzzedDataProvider.h>

#include "builtin/decoders/rawdec.h"
#include "tests/fuzz/fuzz.h"

namespace {

constexpr const char* codes[] = {"GRAY", "I420", "YV12", "I422", "W016", "YUY2", "UYVY", "Y216", "BGR3",
                                 "BGR4", "BGRA", "ARGB", "b64a", "R555", "R565", "BGR6", "BGRU", "none"};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    FuzzedDataProvider input(data, size);
    RawDecoder decoder;
    decoder.init();
    decoder.setParam("FOURCC", input.PickValueInArray(codes));
    for (const char* name : {"width", "height"})
        decoder.setParam(name, input.ConsumeIntegralInRange(-1, 2998));
    decoder.setParam("interlacedFlag", input.ConsumeIntegralInRange(0, 3));
    for (const char* name : {"fieldOrderFile", "invert"})
        decoder.setParam(name, input.ConsumeIntegralInRange(0, 1));
    decoder.setParam("offset", input.ConsumeIntegralInRange(0, 99));
    const auto contents = input.ConsumeRemainingBytes<std::uint8_t>();
    const MemoryFile file(contents.data(), contents.size());
    decoder.setParam("filename", file.name());
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
    return 0;
}
