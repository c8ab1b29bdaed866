// What text on pictures costs, in multiples of copying one picture of 1920 x 1080.
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "bench/ratio.h"
#include "core/caption/subtitle/qvsubtitlerender.h"
#include "core/caption/subtitle/qvsubtitles.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/decode/qvdecoder.h"
#include "core/decode/qvtestgenerator.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"
#include "core/media/qvbuffer.h"

namespace {

constexpr int width = 1920;
constexpr int height = 1080;

class Copy {
  public:
    void operator()() { std::memcpy(to_.data(), from_.data(), from_.size()); }

  private:
    std::vector<unsigned char> from_ = std::vector<unsigned char>(4 * width * height, 1);
    std::vector<unsigned char> to_ = std::vector<unsigned char>(4 * width * height, 2);
};

std::unique_ptr<QvDecodePipe> openGenerator() {
    GeneratorVParams video;
    video.duration = MediaTime(3600.0);
    video.framerate = QvFramerate(25.0);
    video.width = width;
    video.height = height;
    std::unique_ptr<QvDecodePipe> generator(QvTestGenerator::create(&video, nullptr));
    return generator && generator->open() == 0 ? std::move(generator) : nullptr;
}

QvSubtitle dialogue(int number) {
    QvSubtitle subtitle;
    subtitle.text =
        ("Two lines of dialogue, as they are|spoken in a film, number " + std::to_string(number)).c_str();
    subtitle.rows = 2;
    return subtitle;
}

}  // namespace

int main() {
    init_wrapper(nullptr);
    Copy copy;
    QvRatioBench bench("text at 1920 x 1080 : memcpy of the picture");

    const auto generator = openGenerator();
    if (!generator) return 1;
    bench.compare(
        "frame of the test generator", 2.0, [&] { generator->readFrame(0); }, [&] { copy(); });

    QvFrame frame;
    frame.init(QvFourcc::BGR4, width, height);
    frame.setBlack();
    QvTextRenderingOptions options;
    options.fontRegular = qv_registry()->defaultFontFile(0);
    options.charSize = 58;
    for (const int effect : {QvTextRenderingOptions::noEffect, QvTextRenderingOptions::softShadow}) {
        options.fontEffect = effect;
        QvSubtitleRender render;
        if (render.init(options) != 0) return 1;
        const std::string how = QvTextRenderingOptions::effectName(effect);
        const QvSubtitle still = dialogue(0);
        bench.compare(
            "subtitle that stays, " + how, 0.3, [&] { render.render(frame, still, nullptr); },
            [&] { copy(); });
        int number = 0;
        bench.compare(
            "subtitle that changes, " + how, 2.0, [&] { render.render(frame, dialogue(++number), nullptr); },
            [&] { copy(); });
    }
    cleanup_wrapper();
    return 0;
}
