// Any bytes open as a subtitle source or are refused; every frame of what opened can be read and drawn.
#include <algorithm>

#include "builtin/decoders/subimporter.h"
#include "core/arch/platform.h"
#include "core/caption/subtitle/qvsubtitlerender.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/media/qvbuffer.h"
#include "tests/fuzz/fuzz.h"

namespace {

QvTextRenderingOptions optionsFor(const QvFrame& frame) {
    QvTextRenderingOptions options;
    options.fontRegular = qv_platform().fontFile(QvFontFace::sans).c_str();
    options.charSize = frame.height() / 8;
    options.fontEffect = QvTextRenderingOptions::softShadow;
    return options;
}

QvFrame makeFrame() {
    QvFrame frame;
    frame.init(QvFourcc::BGR4, 160, 96);
    frame.setBlack();
    return frame;
}

void draw(const QvSubtitle& subtitle) {
    static QvFrame frame = makeFrame();
    static QvSubtitleRender render;
    static const int ready = render.init(optionsFor(frame));
    require(ready == 0 && render.render(frame, subtitle, nullptr) == 0);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const MemoryFile file(data, size, ".sub");
    SubImporter decoder;
    decoder.init();
    decoder.setParam("filename", file.name());
    const int status = decoder.open();
    require(status == 0 || status == -9);
    if (status == 0) {
        const int frames = decoder.nrFrames(0);
        for (const int frame : {0, 1, frames / 2, frames - 1}) {
            if (decoder.seekToFrame(std::max(frame, 0), 0) != 0) continue;
            decoder.readFrame(0);
            AnyDict meta;
            require((decoder.readMeta(0, 0, meta) == 0) == (decoder.subtitle() != nullptr));
            if (decoder.subtitle()) draw(*decoder.subtitle());
        }
    }
    decoder.close();
    return 0;
}
