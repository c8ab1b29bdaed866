// A plug-in with two modules: "pcm8dec" reads bare 8-bit mono sound from files (*.pcm8) and byte sources, and
// "polarity" turns sound upside down. docs/plugins.md walks through it.
#include <algorithm>
#include <climits>
#include <cstring>
#include <memory>

#include "core/decode/basedecodepipe.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/filter/qvfilter.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvbuffer.h"
#include "core/stream/qvbytesource.h"

namespace {

struct Pcm8Settings {
    int samplerate = 8000;  // such a file doesn't tell
    QvByteSource* source = nullptr;
};

int setSource(Pcm8Settings& settings, const Any& value) {
    settings.source = qvSourceOf(value);
    return value.isValid() && !settings.source ? QvStatus::invalidParam : QvStatus::ok;
}

constexpr QvParamRow<Pcm8Settings> pcm8Rows[] = {
    {"samplerate", &Pcm8Settings::samplerate, qvParamStored, 1000, 192000, "samples a second"},
    {.name = qvSourceParam,
     .member = QvParamAccess<Pcm8Settings>{setSource, nullptr},
     .flags = qvParamWriteOnly,
     .help = "a byte source in the place of the file",
     .type = Any::Generic},
};
static_assert(qvParamTableOk<Pcm8Settings>(pcm8Rows));

class Pcm8Dec : public BaseDecodePipe {
  public:
    using BaseDecodePipe::getParam;

    int setParam(const char* name, const Any& value) override {
        if (auto result = _setRow<Pcm8Settings>(pcm8Rows, settings_, name, value)) return *result;
        return BaseDecodePipe::setParam(name, value);
    }
    void getParam(const char* name, Any& value) const override {
        if (!qvGetParamRow<Pcm8Settings>(pcm8Rows, settings_, name, value))
            BaseDecodePipe::getParam(name, value);
    }

    int open() override {
        // The file is a byte source, too, so that there is one way to read.
        if (!settings_.source) file_ = qvFileSource(filename());
        in_ = settings_.source ? settings_.source : file_.get();
        if (!in_ || in_->size() == QvByteSource::unknown || !in_->seek(0))
            return setError(QvStatus::cannotParse, "Failed to open file for reading");
        auto stream = std::make_unique<DPipeAudioStream>();
        const long long samples = in_->size();
        stream->params = AnyDict("codec", "PCM", "channels", 1, "samplerate", settings_.samplerate, "samples",
                                 samples, "bitsPerSample", 8, "bytesPerSample", 1);
        stream->params.set("duration", Any(static_cast<double>(samples) / settings_.samplerate));
        stream->pcm = std::make_unique<QvPcm>();
        if (stream->pcm->init(1024, 1, 1, settings_.samplerate) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "Out of memory");
        pcm_ = addStream(std::move(stream))->pcm.get();
        return BaseDecodePipe::open();  // ends every open: state 3
    }
    int close() override {
        in_ = nullptr;
        file_.reset();
        pcm_ = nullptr;
        return BaseDecodePipe::close();  // deletes the stream
    }

    int readSamples(int count, int stream) override {
        checkStream(qvAudioStream, stream, "readSamples");
        if (count > pcm_->size() && pcm_->grow(count - pcm_->size()) < 0)
            return setError(QvStatus::outOfMemory, "Out of memory");
        const int got =
            count > 0 ? static_cast<int>(in_->read(pcm_->ptr(0), static_cast<std::size_t>(count))) : 0;
        pcm_->setSamples(got);
        pcm_->setPosition(pcm_->position() + got);
        if (got == 0 && !in_->problem().empty())
            return setError(QvStatus::failed, "read samples failed: %s", in_->problem().c_str());
        return got > 0 || count <= 0 ? got : QvStatus::endOfStream;
    }
    int seekToSample(long long sample, int stream) override {
        checkStream(qvAudioStream, stream, "seekToSample");
        if (!in_->seek(sample)) return setError(QvStatus::endOfStream, "Seek failed");
        pcm_->setPosition(sample);
        return QvStatus::ok;
    }
    QvPcm* getAudioPtr(int) override { return pcm_; }

  private:
    Pcm8Settings settings_;
    std::unique_ptr<QvByteSource> file_;
    QvByteSource* in_ = nullptr;  // of the file, or the application's
    QvPcm* pcm_ = nullptr;        // the stream's
};

// Between the stages of an audio pipe a value has 32 bits and holds a number of 24; there is room to negate.
class Polarity : public QvAudioFilter {
  public:
    int open() override { return QvStatus::ok; }
    int close() override {
        out_.destroy();
        return QvStatus::ok;
    }
    int write(QvPcm& in) override {
        if (in.bytesPerSample() != 4) return setError(QvStatus::notSupported, "Needs 32 bits a sample");
        const int count = in.samples();
        if (!out_.inited() &&
            out_.init(std::max(count, 1), in.channels(), 4, in.samplerate()) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "Out of memory");
        const int before = out_.samples();
        if (count == 0) return QvStatus::ok;
        if (out_.write(count, in.ptr(0)) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "Out of memory");
        auto* values = reinterpret_cast<int*>(out_.ptr(before));
        std::transform(values, values + count * in.channels(), values,
                       [](int value) { return -std::max(value, -INT_MAX); });
        return QvStatus::ok;
    }
    int samples() const override { return out_.inited() ? out_.samples() : 0; }
    QvPcm* pcm() override { return &out_; }
    int erase(int n) override { return out_.erase(n); }

  private:
    QvPcm out_;
};

template <class Codec>
class Module : public QvModule {
  public:
    Module(int type, const char* name, const char* desc, const char* displayName)
        : QvModule(type, name, desc, displayName) {}
    QvCodec* create() override { return _setAttrs(new Codec); }
};

void addModules(QvPlugin& plugin) {
    auto* decoder =
        new Module<Pcm8Dec>(QvModuleType::decoder, "pcm8dec", "8-bit PCM reader", "8-bit PCM import");
    decoder->setAttr("exts", AnyVector(Any("pcm8")));
    decoder->setAttr("priority", 10);
    plugin.addModule(decoder);
    plugin.addModule(
        new Module<Polarity>(QvModuleType::audioFilter, "polarity", "Polarity", "Invert polarity"));
}

}  // namespace

// The engine refuses the file, with a sentence, if it has another version of the interface than this.
extern "C" {
QV_API unsigned qv_plugin_abi = qvPluginAbi;
}

extern "C" QV_API QvPlugin* plugin_init() {
    static QvPlugin plugin("pcm8", "Bare 8-bit sound");
    if (plugin.nrModules() == 0) addModules(plugin);
    plugin.setAttr("version", "1.0");
    plugin.setAttr("versionDate", "2025-03-01");
    return &plugin;
}
