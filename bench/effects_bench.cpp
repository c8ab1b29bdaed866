// What effects cost on frames of 1920 x 1080, as ratios to copying the frame.
#include <cstring>
#include <memory>
#include <string>

#include "bench/ratio.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/image/qvimage.h"
#include "core/media/qvframe.h"

namespace {

constexpr int width = 1920, height = 1080;
constexpr const char* logoFile = "/tmp/tarsel_bench_logo.png";

struct Effect {
    const char* name;
    AnyDict params;
};

void measure(QvRatioBench& bench, const Effect& effect, unsigned fourcc, double aim) {
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(effect.name));
    auto& filter = dynamic_cast<QvVideoFilter&>(*codec);
    filter.setParamDict(effect.params);
    if (filter.open() != 0) return QvRatioBench::tell(std::string("can't open ") + effect.name, 0, "");
    QvFrame frame, copy;
    frame.init(fourcc, width, height);
    for (int i = 0; i < frame.total_bytes(); ++i)
        frame.plane()[i] = static_cast<unsigned char>(i * 7 + i / 997);
    copy = frame;
    const auto bytes = static_cast<size_t>(frame.total_bytes());
    bench.compare(
        std::string(effect.name) + " on " + qvFourccText(fourcc).data() + " : memcpy", aim,
        [&] { filter.applySupported() ? filter.apply(frame) : filter.write(frame); },
        [&] { std::memcpy(copy.plane(), frame.plane(), bytes); });
}

}  // namespace

int main() {
    init_wrapper(nullptr);
    {
        QvFrame logo;
        logo.init(QvFourcc::BGR3, 320, 160);
        logo.setRGB(200, 100, 50);
        QvImage::saveFrame(logo, Any(logoFile), QvImage::png);
        const Effect flip{"flipper", AnyDict()},
            dark{"brightness", AnyDict("brightness", -0.1, "gamma", 1.2)};
        // Long enough that no frame of the measurement is untouched.
        const Effect fade{"videofade", AnyDict("fade_in", 1 << 30)};
        const Effect over{"logo", AnyDict("filename", logoFile, "xpos", -20, "ypos", -20, "alpha", 0.5)};
        const Effect crop{"cropper", AnyDict("inputHeight", height, "inputWidth", width, "mode", 4)};
        QvRatioBench bench("effects in place, 1920 x 1080");
        measure(bench, flip, QvFourcc::I420, 2);
        measure(bench, dark, QvFourcc::I420, 2);
        measure(bench, dark, QvFourcc::YUYV, 2);
        measure(bench, dark, QvFourcc::Y216, 4);
        measure(bench, fade, QvFourcc::I420, 2);
        measure(bench, fade, QvFourcc::Y216, 2);
        measure(bench, fade, QvFourcc::v210, 8);
        measure(bench, over, QvFourcc::I420, 0.2);
        measure(bench, over, QvFourcc::BGR4, 0.2);
        measure(bench, crop, QvFourcc::I420, 1);
    }
    cleanup_wrapper();
}
