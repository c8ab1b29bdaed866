// Calls the picture scaler with any formats, sizes, strides, flags and rectangles. Both pictures stand in
// memory of just the size that an accepted call may use, so that the sanitizer sees one byte too many.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "builtin/kernels/formats.h"
#include "core/filter/srscaler.h"
#include "core/media/fourcc.h"

namespace {

class Input {
  public:
    Input(const uint8_t* data, size_t size) : data_(data), left_(size) {}
    unsigned take(int bytes) {
        unsigned value = 0;
        for (; bytes > 0 && left_ > 0; --bytes, --left_) value = value << 8 | *data_++;
        return value;
    }
    const uint8_t* rest() const { return data_; }
    size_t left() const { return left_; }

  private:
    const uint8_t* data_;
    size_t left_;
};

struct Given {
    unsigned fourcc;
    int width, height, stride;
    std::vector<uint8_t> memory;
};

unsigned fourccOf(Input& input) {
    const unsigned choice = input.take(1);
    if (choice >= 250) return input.take(4);
    if (choice >= 240) return qvFourcc("HDYC");
    std::string name = srk::formats()[choice % srk::formatCount].name;
    if (name[2] == 'X') name = name.substr(0, 2) + std::to_string(100 + 9 + input.take(1) % 8).substr(1);
    return codeOf(name);
}

Given givenOf(Input& input) {
    Given given;
    given.fourcc = fourccOf(input);
    given.width = static_cast<int>(input.take(1)) - 2;
    given.height = static_cast<int>(input.take(1)) % 80 - 2;
    const unsigned stride = input.take(2);
    given.stride = stride % 3 ? 0 : static_cast<int16_t>(stride);
    return given;
}

// The planes of a picture as they lie in its memory, each walked upwards if its bit is set.
QvScalePicture record(Given& given, unsigned upwards) {
    QvScalePicture none = {qvFourcc("EXT1"), given.fourcc, given.width, given.height, 0, 0, 0, {}};
    if (given.memory.empty()) return none;
    srk::Picture picture =
        layoutOf(given.fourcc, given.width, given.height, given.memory.data(), std::abs(given.stride));
    walkUpwards(picture, upwards);
    return recordOf(given.fourcc, picture);
}

void asRecords(Given& source, Given& target, unsigned mode, unsigned flags, const int* rectangles) {
    const QvScalePicture from = record(source, flags >> 9), to = record(target, flags >> 16);
    SRScaler(mode, from.tag, &from, 0, 0, 0, to.tag, const_cast<QvScalePicture*>(&to), 0, 0, 0, 0, flags,
             rectangles);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Input input(data, size);
    Given source = givenOf(input), target = givenOf(input);
    const unsigned flags = input.take(4);
    const unsigned modes = input.take(1);
    const unsigned mode = (modes & 3) | (modes & 4 ? QvScale::placeTarget : 0);
    int rectangles[8];
    for (int i = 0; i < 8; ++i)
        rectangles[i] = static_cast<int>(modes & 8 ? input.take(4) : input.take(i < 4 ? 2 : 1));
    for (Given* given : {&source, &target})
        given->memory.resize(bytesOf(given->fourcc, given->width, given->height, given->stride));
    for (size_t i = 0; i < source.memory.size(); ++i)
        source.memory[i] = input.left() ? input.rest()[i % input.left()] : static_cast<uint8_t>(i * 37);
    // The first line of a picture that goes upwards is the last one in memory.
    const auto start = [](Given& given) -> uint8_t* {
        if (given.memory.empty()) return nullptr;
        return given.memory.data() +
               (given.stride < 0 ? -static_cast<long long>(given.stride) * (given.height - 1) : 0);
    };
    SRScaler(mode, source.fourcc, start(source), source.stride, source.width, source.height, target.fourcc,
             start(target), target.stride, target.width, target.height, 0, flags,
             modes & 16 ? rectangles : nullptr);
    if (modes & 32) asRecords(source, target, mode, flags, modes & 16 ? rectangles : nullptr);
    return 0;
}
