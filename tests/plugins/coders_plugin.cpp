// Encoders and multiplexers under names that people ask for, with what the tool sets: quality, bit rates and
// two passes. An encoder writes lines of text: what it is set to, and one for each picture or piece of sound.
// The multiplexers put the lines of all streams into one file, below a line of their own.
#include <memory>
#include <string>
#include <utility>

#include "core/encode/basemuxer.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/measure/bitrate.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvframerate.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvpcm.h"
#include "core/stream/file/qvfilebufstream.h"
#include "core/stream/qvbufstrm.h"
#include "tests/plugins/textcoder.h"

namespace {

struct Coder {
    const char* name;
    bool twoPass;
    AnyDict settings, ranges;
};

// What both kinds of encoder share: settings of rate control, and a line that states them.
template <class Base>
class LineCoder : public TextCoder<Base> {
  public:
    explicit LineCoder(const Coder& coder) : TextCoder<Base>(coder.settings, coder.ranges) {
        ranges_.set("twoPassPossible", coder.twoPass ? 1 : 0);
        if (coder.twoPass) values_.set("twoPass", 0);
        values_.set("profile", 0);
    }
    int setParam(const char* name, const Any& value) override {
        const std::string key = name;
        if (key == "firstPass" || key == "meta") {
            (key == "meta" ? statistics_ : first_) = value.isTrue();
            return QvStatus::ok;
        }
        if (key == "crf" && values_.isSet("crf") && (value.asInt32(-1) < 0 || value.asInt32(-1) > 51))
            return this->setError(QvStatus::invalidParam, "\"crf\" takes 0 to 51");
        return TextCoder<Base>::setParam(name, value);
    }
    int open() override {
        return write(std::string(this->name()) + " crf " + text("crf") + " rate " + text("vBitrate") +
                     text("bitrate") + " tune " + text("tune") + (statistics_ ? " with statistics" : "") +
                     "\n");
    }

  protected:
    using TextCoder<Base>::values_, TextCoder<Base>::ranges_;

    int write(std::string line) { return first_ ? QvStatus::ok : TextCoder<Base>::write(std::move(line)); }

  private:
    std::string text(const char* name) const {
        const Any value = values_.get(name);
        if (value.isBitrate()) return std::to_string(value.asBitrate().target);
        if (value.isDouble()) return std::to_string(static_cast<long long>(value.asDouble()));
        return value.isText() ? value.asString() : value.isInt() ? std::to_string(value.toInt64()) : "";
    }

    bool first_ = false, statistics_ = false;
};

class Pictures : public LineCoder<QvVideoEncoder> {
  public:
    using LineCoder::LineCoder;
    int writeFrame(QvFrame*) override { return write("picture\n"); }
    QvFrame* lastFrame() override { return nullptr; }
};

class Sounds : public LineCoder<QvAudioEncoder> {
  public:
    using LineCoder::LineCoder;
    int writePcm(QvPcm*, int) override { return write("sound\n"); }
};

const AnyDict& pictureSettings() {
    static const AnyDict settings("width", 320, "height", 240, "framerate", QvFramerate::f25p(), "FOURCC",
                                  static_cast<int>(QvFourcc::I420));
    return settings;
}

AnyDict soundSettings() { return AnyDict("samplerate", 48000, "channels", 2, "bitsPerSample", 16); }

AnyDict pictureRanges() {
    AnyDict ranges("inFOURCC", AnyVector(Any(static_cast<int>(QvFourcc::I420))), "extension", "line");
    return ranges;
}

Coder h264() {
    Coder coder{"h264venc", true, pictureSettings(), pictureRanges()};
    coder.settings.set("crf", 23);
    coder.settings.set("vbr", 1);
    coder.settings.set("vBitrate", 2e6);
    coder.settings.set("minVBitrate", 0.0);
    coder.settings.set("maxVBitrate", 0.0);
    coder.settings.set("tune", "");
    coder.ranges.set("bitrateRange",
                     AnyVector(Any(AnyDict("type", 1, "range", AnyVector(100000, 50000000)))));
    return coder;
}

Coder aac() {
    Coder coder{"aacaenc", false, soundSettings(), AnyDict("extension", "line")};
    coder.settings.set("bitrate", QvBitrate(QvBitrate::cbr, 128000));
    coder.ranges.set("bitrateRange",
                     AnyVector(Any(AnyDict("type", 0, "range", AnyVector(96000, 128000, 192000)))));
    return coder;
}

Coder flac() { return {"flacaenc", false, soundSettings(), AnyDict("extension", "line")}; }
Coder ffv1() { return {"ffv1venc", false, pictureSettings(), pictureRanges()}; }

template <class Kind>
struct CoderModule : QvModule {
    CoderModule(int kind, Coder (*coder)(), const AnyVector& muxers)
        : QvModule(kind, coder().name, "of a test", coder().name), coder_(coder) {
        if (!muxers.empty()) setAttr("compatMuxers", muxers);
    }
    QvCodec* create() override { return _setAttrs(new Kind(coder_())); }

  private:
    Coder (*coder_)();
};

// Writes into what another stream ends in.
class Shared : public QvBufStream {
  public:
    explicit Shared(QvBufStream& to) : to_(to) {}
    bufstream* input() override { return to_.input(); }
    bufstream* output() override { return to_.output(); }

  private:
    QvBufStream& to_;
};

class Container : public BaseMuxer {
  public:
    using BaseMuxer::getParam;

    QvBufStream* addStream(int type, const AnyDict&) override {
        return keep(type, std::make_unique<Shared>(*outStream()));
    }
    int setParam(const char* name, const Any& value) override {
        if (std::string(name) != "seekable") return BaseMuxer::setParam(name, value);
        seekable_ = value.asInt32(1);
        return QvStatus::ok;
    }
    void getParam(const char* name, Any& value) const override {
        if (std::string(name) == "seekable")
            value = seekable_;
        else if (std::string(name) == "maxStreams")
            value = AnyDict("vids", 1, "auds", 4, "subs", 0, "total", 5);
        else
            BaseMuxer::getParam(name, value);
    }
    int open() override {
        std::string line = std::string(name()) + " seekable " + std::to_string(seekable_) + "\n";
        auto* const out = outStream()->input();
        out->copybytes(out, reinterpret_cast<unsigned char*>(line.data()),
                       static_cast<unsigned>(line.size()));
        return QvStatus::ok;
    }
    int close() override { return QvStatus::ok; }

  private:
    int seekable_ = 1;
};

struct ContainerModule : QvModule {
    explicit ContainerModule(const char* name) : QvModule(QvModuleType::muxer, name, "of a test", name) {
        if (std::string(name) == "y4mmux") setAttr("compatEncoders", AnyVector(Any("rawvenc")));
    }
    QvCodec* create() override { return _setAttrs(new Container); }
};

AnyDict anyCodec() {
    AnyDict preset("profile", 0x2800020, "name", "Any codec", "group", "Tests");
    preset.set("video", AnyVector("h264venc", "ffv1venc", "rawvenc"));
    preset.set("audio", AnyVector("aacaenc", "flacaenc"));
    preset.set("muxers", AnyVector("mkvmux", "mp4mux", "y4mmux"));
    return preset;
}

}  // namespace

extern "C" {
QV_API unsigned qv_plugin_abi = qvPluginAbi;
}

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("coders", "Encoders that are asked for by name");
    if (plugin.nrModules() > 0) return &plugin;
    constexpr int video = QvModuleType::videoEncoder, audio = QvModuleType::audioEncoder;
    plugin.addModule(new CoderModule<Pictures>(video, h264, AnyVector("mkvmux")));
    plugin.addModule(new CoderModule<Pictures>(video, ffv1, AnyVector("mkvmux")));
    plugin.addModule(new CoderModule<Sounds>(audio, aac, AnyVector()));
    plugin.addModule(new CoderModule<Sounds>(audio, flac, AnyVector("mkvmux")));
    for (const char* const name : {"mp4mux", "mkvmux", "y4mmux"}) plugin.addModule(new ContainerModule(name));
    plugin.setAttr("presets", AnyVector(Any(anyCodec())));
    return &plugin;
}
