// A plug-in with a video encoder under names that presets wait for; QV_LINES_NAME replaces "h264venc". It
// writes a line of text for each picture, and takes few sizes and rates. "dvmux" can be planned with. A
// preset of its own leaves the choice between two multiplexers.
#include <cstdlib>
#include <memory>
#include <string>
#include <utility>

#include "core/encode/basemuxer.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvframerate.h"
#include "core/media/qvbuffer.h"
#include "core/stream/file/qvfilebufstream.h"
#include "core/stream/qvbufstrm.h"
#include "tests/plugins/textcoder.h"

namespace {

class LineEncoder : public TextCoder<QvVideoEncoder> {
  public:
    LineEncoder()
        : TextCoder(
              AnyDict("width", 320, "height", 240, "framerate", QvFramerate::f25p(), "profile", 0, "FOURCC",
                      static_cast<int>(QvFourcc::I420)),
              AnyDict("sizeRange", AnyDict("wmin", 16, "wmax", 720, "hmin", 16, "hmax", 576),
                      "framerateRange", AnyVector(Any(QvFramerate::f25p()), Any(QvFramerate::f50p())))) {
        ranges_.set("inFOURCC", AnyVector(Any(static_cast<int>(QvFourcc::I420))));
        ranges_.set("extension", "h264");
    }
    int writeFrame(QvFrame* frame) override {
        return write(std::to_string(frame->width()) + "x" + std::to_string(frame->height()) + "\n");
    }
    QvFrame* lastFrame() override { return nullptr; }
};

struct Module : QvModule {
    explicit Module(const char* name) : QvModule(QvModuleType::videoEncoder, name, "of a test", "Lines") {}
    QvCodec* create() override { return _setAttrs(new LineEncoder); }
};

// Takes streams and writes none of them: for plans.
class Planned : public BaseMuxer {
  public:
    QvBufStream* addStream(int type, const AnyDict&) override {
        auto stream = std::make_unique<QvNullBufStream>();
        stream->setOwner(this);
        return keep(type, std::move(stream));
    }
    int open() override { return QvStatus::ok; }
    int close() override { return QvStatus::ok; }
};

struct Multiplexer : QvModule {
    Multiplexer() : QvModule(QvModuleType::muxer, "dvmux", "of a test", "DV") {}
    QvCodec* create() override { return _setAttrs(new Planned); }
};

}  // namespace

extern "C" {
QV_API unsigned qv_plugin_abi = qvPluginAbi;
}

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("lines", "An encoder that presets wait for");
    if (plugin.nrModules() == 0) {
        const char* const other = std::getenv("QV_LINES_NAME");
        plugin.addModule(new Module(other ? other : "h264venc"));
        plugin.addModule(new Module("dvvenc"));
        plugin.addModule(new Multiplexer);
    }
    AnyDict preset("profile", 0x2800010, "name", "Two ways", "group", "Tests", "video", "rawvenc");
    preset.set("audio", "rawaenc");
    preset.set("muxers", AnyVector("rawmux", "rawavimux"));
    plugin.setAttr("presets", AnyVector(Any(preset)));
    return &plugin;
}
