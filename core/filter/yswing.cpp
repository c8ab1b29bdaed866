#include <array>
#include <cstddef>
#include <memory>

#include "core/filter/qvprocessutil.h"
#include "core/media/qvbuffer.h"

namespace {

constexpr std::array<unsigned char, 256> make8() {
    std::array<unsigned char, 256> table{};
    for (std::size_t i = 0; i < table.size(); ++i)
        table[i] = static_cast<unsigned char>(static_cast<double>(i) * 219.0 / 255.0 + 16.0 + 0.5);
    return table;
}

using Table16 = std::array<unsigned short, 65536>;

std::unique_ptr<Table16> make16() {
    auto table = std::make_unique<Table16>();
    for (std::size_t i = 0; i < table->size(); ++i)
        (*table)[i] = static_cast<unsigned short>(static_cast<double>(i) * 56064.0 / 65535.0 + 4096.0 + 0.5);
    return table;
}

constexpr auto swing8 = make8();

}  // namespace

const unsigned char* YSwingCorrect::table8() { return swing8.data(); }

const unsigned short* YSwingCorrect::table16() {
    static const auto table = make16();
    return table->data();
}

int YSwingCorrect::correct(QvFrame& frame) {
    if (frame.four_cc() != QvFourcc::Y216) return 0;
    const unsigned short* table = table16();
    for (int y = 0; y < frame.height(0); ++y) {
        auto* words = reinterpret_cast<unsigned short*>(frame.plane(0, false) + y * frame.stride(0, false));
        // A pixel is two words, luma first.
        for (int x = 0; x < frame.width(0); ++x) words[2 * x] = table[words[2 * x]];
    }
    return 0;
}
