// Calls the picture scaler with any formats, sizes, strides, flags and rectangles. Both pictures stand in
// memory of just the size that an accepted call may use, so that the sanitizer sees one byte too many.
#include <cstdint>
#include <vector>

#include <fuzzer/FuzzedDataProvider.h>

#include "tests/builtin/kernels/layouts.h"

namespace {

using Input = FuzzedDataProvider;

struct Given {
    unsigned fourcc;
    int width, height, stride;
    std::vector<uint8_t> memory;

    // The first line of a picture that goes upwards is the last one in memory.
    uint8_t* start() {
        if (memory.empty()) return nullptr;
        return memory.data() + (stride < 0 ? -static_cast<long long>(stride) * (height - 1) : 0);
    }
    // The planes as they lie in memory, each walked upwards if its bit is set.
    QvScalePicture record(unsigned upwards) {
        if (memory.empty()) return {qvFourcc("EXT1"), fourcc, width, height, 0, 0, 0, {}};
        srk::Picture picture = layoutOf(fourcc, width, height, memory.data(), std::abs(stride));
        walkUpwards(picture, upwards);
        return recordOf(fourcc, picture);
    }
};

unsigned fourccOf(Input& input) {
    const auto choice = input.ConsumeIntegral<uint8_t>();
    if (choice >= 250) return input.ConsumeIntegral<unsigned>();
    if (choice >= 240) return qvFourcc("HDYC");
    std::string name = srk::formats()[choice % srk::formatCount].name;
    if (name[2] == 'X')
        name = name.substr(0, 2) + std::to_string(100 + input.ConsumeIntegralInRange(9, 16)).substr(1);
    return codeOf(name);
}

Given givenOf(Input& input) {
    Given given = {
        fourccOf(input), input.ConsumeIntegralInRange(-2, 253), input.ConsumeIntegralInRange(-2, 77), 0, {}};
    if (input.ConsumeIntegralInRange(0, 2) == 0) given.stride = input.ConsumeIntegral<int16_t>();
    given.memory.resize(bytesOf(given.fourcc, given.width, given.height, given.stride));
    return given;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Input input(data, size);
    Given source = givenOf(input), target = givenOf(input);
    const auto flags = input.ConsumeIntegral<unsigned>();
    const unsigned mode =
        input.ConsumeIntegralInRange(0u, 3u) | (input.ConsumeBool() ? QvScale::placeTarget : 0);
    const bool wild = input.ConsumeBool(), given = input.ConsumeBool(), records = input.ConsumeBool();
    int rectangles[8];
    for (int& place : rectangles)
        place = wild ? input.ConsumeIntegral<int>()
                     : input.ConsumeIntegral<uint16_t>() >> (&place < rectangles + 4 ? 0 : 8);
    const int* const areas = given ? rectangles : nullptr;
    const auto rest = input.ConsumeRemainingBytes<uint8_t>();
    for (size_t i = 0; i < source.memory.size(); ++i)
        source.memory[i] = rest.empty() ? static_cast<uint8_t>(i * 37) : rest[i % rest.size()];
    SRScaler(mode, source.fourcc, source.start(), source.stride, source.width, source.height, target.fourcc,
             target.start(), target.stride, target.width, target.height, 0, flags, areas);
    if (!records) return 0;
    const QvScalePicture from = source.record(flags >> 9);
    QvScalePicture to = target.record(flags >> 16);
    SRScaler(mode, from.tag, &from, 0, 0, 0, to.tag, &to, 0, 0, 0, 0, flags, areas);
    return 0;
}
