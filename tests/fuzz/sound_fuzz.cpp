// A filter of sound with any parameters and any input gives a status or an assertion. Where it works, the
// sizes of the buffers written make no difference to what comes out.
#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <memory>
#include <vector>

#include "core/arch/qvexception.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvpcm.h"
#include "tests/fuzz/fuzz.h"

namespace {

// Zeros after the end.
class Choices {
  public:
    Choices(const std::uint8_t* data, std::size_t size) : data_(data), end_(data + size) {}
    unsigned next() { return data_ < end_ ? *data_++ : 0u; }
    template <class T, std::size_t n>
    T oneOf(const T (&list)[n]) {
        return list[next() % n];
    }
    void fill(unsigned char* to, std::size_t count) {
        for (std::size_t i = 0; i < count; ++i) to[i] = static_cast<unsigned char>(next());
    }

  private:
    const std::uint8_t *data_, *end_;
};

Any anyValue(Choices& choices, int depth = 0) {
    static const int integers[] = {0,  1,  -1, -2,   2,    8,     12,    16,    20,
                                   24, 32, 77, 1000, 8000, 44100, 48000, 192000};
    static const double numbers[] = {0, -3, 6.1, 48, 1e308, -1e308, std::numeric_limits<double>::quiet_NaN()};
    static const char* words[] = {"", "high", "standard", "triangular", "none", "44100"};
    switch (choices.next() % 6) {
        case 0: return Any(choices.oneOf(numbers));
        case 1: return Any(choices.oneOf(words));
        case 2: {
            AnyVector list;
            for (unsigned n = choices.next() % 18; n > 0 && depth < 2; --n)
                list.append(anyValue(choices, depth + 1));
            return Any(list);
        }
        default: return Any(choices.oneOf(integers));
    }
}

using Filter = std::unique_ptr<QvAudioFilter>;
using Bytes = std::vector<unsigned char>;

Filter openedFilter(const char* module, Choices choices) {
    Filter filter(static_cast<QvAudioFilter*>(qv_registry()->newCodec(module)));
    filter->init();
    const AnyVector rows = qvParameters(*filter);
    for (unsigned n = choices.next() % 8; n > 0 && !rows.empty(); --n) {
        const Any& row = rows.at(static_cast<int>(choices.next()) % rows.size());
        try {
            filter->setParam(row.asDict().get("name").asString(), anyValue(choices));
        } catch (const QvParamException&) {
        }
    }
    return filter->open() == 0 ? std::move(filter) : nullptr;
}

// Writes blocks of so many samples and takes what comes out. False if the filter refuses one.
bool run(QvAudioFilter& filter, const Bytes& in, int channels, int width, int block, Bytes& out) {
    const int bytes = channels * width, all = static_cast<int>(in.size()) / bytes;
    for (int at = 0; at < all; at += block) {
        QvPcm pcm;
        const int n = std::min(block, all - at);
        require(pcm.init(n, channels, width, 48000) == 0);
        std::memcpy(pcm.ptr(0), in.data() + std::ptrdiff_t{at} * bytes, static_cast<std::size_t>(n * bytes));
        pcm.setSamples(n);
        if (filter.write(pcm) != 0) return false;
        const int made = filter.samples();
        require(made >= 0 && made <= filter.pcm()->size());
        if (made > 0)
            out.insert(out.end(), filter.pcm()->ptr(0),
                       filter.pcm()->ptr(0) + filter.pcm()->samples2bytes(made));
        filter.erase(made);
        require(filter.samples() == 0);
    }
    return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const bool started = init_wrapper(nullptr) == 0;
    require(started);
    static const char* modules[] = {"aquant", "chconvert", "srconvert", "avol"};
    Choices choices(data, size);
    const char* module = choices.oneOf(modules);
    const int channels = 1 + static_cast<int>(choices.next() % 16),
              width = 1 + static_cast<int>(choices.next() % 4);
    const int block = 1 + static_cast<int>(choices.next() % 40);
    Bytes in(static_cast<std::size_t>(64 * channels * width));
    choices.fill(in.data(), std::min<std::size_t>(in.size(), choices.next()));
    Bytes whole, parts;
    try {
        const Filter one = openedFilter(module, choices), other = openedFilter(module, choices);
        require(!one == !other);
        if (!one || !run(*one, in, channels, width, 64, whole)) return 0;
        require(run(*other, in, channels, width, block, parts));
        // With batches of 0 silence stands in for input that is still to come.
        if (one->getParam("splsToGet") == Any(0)) return 0;
        // libsoxr may hold back more or less of it.
        if (one->getParam("quality") == Any("high")) parts.resize(std::min(parts.size(), whole.size()));
        if (one->getParam("quality") == Any("high")) whole.resize(parts.size());
        require(parts == whole);
    } catch (const QvAssertFailure&) {
    }
    return 0;
}
