#include "core/decode/decodefactory.h"

#include <memory>
#include <string>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/memoryinput_p.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/stream/qvbytesource.h"

namespace {

// Names as they are shown: one, or all of a Vector.
Any shownNames(const Any& filename) {
    const Any text = (filename.isVector() ? filename.asVector().join(", ") : filename).toString();
    return text.isString() ? text : Any("");
}

Any extensionOf(const Any& filename) {
    if (filename.isText()) return QvFile::getExt(filename, true);
    if (filename.isVector())
        for (const Any& name : filename.asVector()) {
            if (!name.isText()) continue;
            const Any ext = QvFile::getExt(name, true);
            if (ext.size() > 0) return ext;
        }
    return Any("");
}

// The caller's callback, if there is one, and what it gets.
class Reporter {
  public:
    Reporter(const Any& filename, QvFileOpenCb* callback) : callback_(callback) { data_.filename = filename; }

    void started() {
        if (callback_) callback_->fileOpenStarted(data_);
    }
    void started(const char* module) {
        data_.moduleName = module;
        started();
    }
    void failed(const Any& text) { finished(QvStatus::failed, text, 0); }
    void failed(const Any& text, const QvDecodePipe& decoder) {
        if (*decoder.errorDesc()) data_.reason = decoder.errorDesc();
        failed(text);
    }
    void succeeded(const Any& text, int percent) { finished(QvStatus::ok, text, percent); }

  private:
    QvFileOpenCb* callback_;
    QvFileOpenCbData data_;

    void finished(int result, const Any& text, int percent) {
        data_.text = text;
        data_.percent = percent;
        if (callback_) callback_->fileOpenFinished(result, data_);
        data_.reason.invalidate();
    }
};

Any failedToOpen(const Any& filename, const char* decoder) {
    return Any::sprintf("Failed to open file '%s' using '%s'.", shownNames(filename).asString(), decoder);
}

Any opened(const Any& filename, const char* decoder) {
    return Any::sprintf("Successfully opened file '%s' with decoder '%s'.", shownNames(filename).asString(),
                        decoder);
}

Any noInstance(const char* decoder) {
    return Any::sprintf("Failed to create instance of decoder '%s'.", decoder);
}

void logError(const Any& text) { qv_dbg()->logs(QvLogMask::error, text.asString()); }

void logOpening(const Any& filename) {
    if (!filename.isVector()) {
        qv_dbg()->debug("Opening file '%s' ...", shownNames(filename).asString());
        return;
    }
    qv_dbg()->debug("Opening files:");
    for (const Any& name : filename.asVector())
        if (name.isString()) qv_dbg()->debug("   '%s' ...", name.asString());
}

// A decoder of this module, ready for parameters, or null with the failure reported.
std::unique_ptr<QvDecodePipe> makeDecoder(QvModule& module, Reporter& reporter) {
    std::unique_ptr<QvCodec> codec(module.create());
    auto* decoder = codec ? static_cast<QvDecodePipe*>(codec->getInterface(QvModuleType::decoder)) : nullptr;
    if (decoder && decoder->init() == QvStatus::ok) {
        codec.release();
        return std::unique_ptr<QvDecodePipe>(decoder);
    }
    const Any text = noInstance(module.displayName());
    logError(text);
    reporter.failed(text);
    return nullptr;
}

void setUp(QvDecodePipe& decoder, const Any& filename, const Any& fourcc, const Any* openParams) {
    if (openParams) {
        try {
            decoder.setParam("openParameters", *openParams);
        } catch (const QvParamException&) {
            qv_dbg()->error("Decoder %s does not support open parameters.", decoder.name());
        }
    }
    decoder.setParam(filename.isVector() ? "filenames" : "filename", filename);
    if (!fourcc.isValid()) return;
    try {
        decoder.setParam("FOURCC", fourcc);
    } catch (const QvParamException&) {  // few decoders have this parameter
    }
}

// Why `decoder` does not take these parameters; "" when it has taken all.
std::string setAll(QvDecodePipe& decoder, const AnyDict& params) {
    const std::string module = decoder.name();
    for (const Any& row : qvParameters(decoder)) {
        const AnyDict& described = row.asDict();
        const char* name = described.getString("name", "");
        if (described.isSet("needed") && !params.isSet(name)) return module + " needs '" + name + "'";
    }
    for (const auto [name, value] : params) {
        int result = QvStatus::invalidParam;
        bool known = true;
        try {
            result = decoder.setParam(name, *value);
        } catch (const QvParamException&) {
            known = false;
        }
        if (!known) return module + " has no parameter '" + name + "'";
        if (result == QvStatus::ok) continue;
        if (*decoder.errorDesc()) return module + ": " + decoder.errorDesc();
        return module + " does not take the value of '" + name + "'";
    }
    return "";
}

void applyOverrides(QvDecodePipe& decoder, int type, const Any& saved) {
    if (!saved.isVector()) return;
    const AnyVector& streams = saved.asVector();
    for (int n = 0; n < decoder.nrStreams(type); ++n) {
        if (!streams.at(n).isDict()) continue;
        int stream = 0;  // the entry's position, see the header
        for (const auto [key, value] : streams.at(n).asDict()) {
            if (stream < decoder.nrStreams(type))
                decoder.setOverride(type, stream, key, *value);
            else
                qv_dbg()->warning("[DecFactory] no stream %d to override %s of", stream, key);
            ++stream;
        }
    }
}

}  // namespace

AnyVector qvDecodersOf(const Any& extension) {
    AnyVector modules = qv_registry()->decoders(extension.asString(""));
    if (!modules.empty()) return modules;
    for (int i = 0; i < qv_registry()->nrModules(0); ++i) {
        const QvModule& module = *qv_registry()->module(i);
        const Any extensions = module.getAttr("exts");
        if (module.getAttr("type").toInt32() != QvModuleType::decoder || !extensions.isVector()) continue;
        for (const Any& own : extensions.asVector())
            if (own == extension) modules.append(Any(module.name()));
    }
    return modules;
}

QvDecodePipe* QvDecFactory::decodePipe(const Any& filename, const Any& fourcc, QvFileOpenCb* cb,
                                       const Any* openParams) {
    const Any ext = extensionOf(filename);
    if (ext.size() == 0)
        qv_dbg()->info("Cannot determine file extension from filename '%s', will use default decoder.",
                       shownNames(filename).asString());
    const AnyVector modules = qv_registry()->decoders(ext.asString(""));
    if (!modules.empty()) return decodePipeUsing(filename, modules, fourcc, cb, openParams);

    const Any text = Any::sprintf("Cannot find appropriate decoder for extension '%s'.", ext.asString(""));
    logError(text);
    Reporter reporter(filename, cb);
    reporter.started();
    reporter.failed(text);
    return nullptr;
}

QvDecodePipe* QvDecFactory::decodePipeUsing(const Any& filename, const AnyVector& modules, const Any& fourcc,
                                            QvFileOpenCb* cb, const Any* openParams) {
    logOpening(filename);
    Reporter reporter(filename, cb);
    for (const Any& name : modules) {
        const char* moduleName = name.asString("");
        QvModule* module = qv_registry()->module(moduleName);
        if (!module) {
            qv_dbg()->error("Non-existing module '%s' specified", moduleName);
            QV_FAIL_PLAIN();
        }
        reporter.started(moduleName);
        std::unique_ptr<QvDecodePipe> decoder = makeDecoder(*module, reporter);
        if (!decoder) continue;
        setUp(*decoder, filename, fourcc, openParams);
        if (decoder->open() == QvStatus::ok) {
            const Any text = opened(filename, decoder->name());
            qv_dbg()->logs(QvLogMask::info, text.asString());
            reporter.succeeded(text, 100);
            return decoder.release();
        }
        const Any text = failedToOpen(filename, decoder->name());
        logError(text);
        reporter.failed(text, *decoder);
    }
    return nullptr;
}

QvDecodePipe* QvDecFactory::decodePipeWith(const Any& filename, const AnyDict& params, Any* error,
                                           const char* module, QvFileOpenCb* cb) {
    const Any extension = extensionOf(filename);
    const AnyVector modules = module ? AnyVector(Any(module)) : qvDecodersOf(extension);
    Reporter reporter(filename, cb);
    std::string reasons;
    const auto fail = [&](const std::string& reason) {
        logError(Any(reason.c_str()));
        reporter.failed(Any(reason.c_str()));
        reasons += (reasons.empty() ? "" : "; ") + reason;
    };
    logOpening(filename);
    if (modules.empty())
        fail(std::string("Cannot find appropriate decoder for extension '") + extension.asString("") + "'.");
    for (const Any& name : modules) {
        std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(name.asString("")));
        auto* decoder =
            codec ? static_cast<QvDecodePipe*>(codec->getInterface(QvModuleType::decoder)) : nullptr;
        reporter.started(name.asString(""));
        if (!decoder) {
            fail(noInstance(name.asString("")).asString());
            continue;
        }
        std::string reason = setAll(*decoder, params);
        if (reason.empty()) {
            decoder->setParam(filename.isVector() ? "filenames" : "filename", filename);
            if (decoder->open() == QvStatus::ok) {
                const Any text = opened(filename, decoder->name());
                qv_dbg()->logs(QvLogMask::info, text.asString());
                reporter.succeeded(text, 100);
                codec.release();
                return decoder;
            }
            reason = failedToOpen(filename, decoder->name()).asString();
            if (*decoder->errorDesc()) reason += std::string(" ") + decoder->errorDesc();
        }
        fail(reason);
    }
    if (error) *error = Any(reasons.c_str());
    return nullptr;
}

QvDecodePipe* QvDecFactory::decodeSource(std::unique_ptr<QvByteSource> source, const Any& name,
                                         const AnyDict& params, Any* error, const char* module) {
    std::unique_ptr<QvDecodePipe> decoder = qvNewMemoryInput(std::move(source));
    decoder->setParam("filename", name);
    if (module) decoder->setParam("decoder", module);
    std::string reason = setAll(*decoder, params);
    if (reason.empty()) {
        if (decoder->open() == QvStatus::ok) return decoder.release();
        reason = decoder->errorDesc();
    }
    logError(Any(reason.c_str()));
    if (error) *error = Any(reason.c_str());
    return nullptr;
}

QvDecodePipe* QvDecFactory::newMemoryInput() { return qvNewMemoryInput(nullptr).release(); }

QvDecodePipe* QvDecFactory::restoreDecoder(const Any& filename, const AnyDict& state, QvFileOpenCb* cb) {
    QV_ASSERT_MSG(state["name"].isString(),
                  "DecFactory.restoreDecoder: Restore failed, no module name given.");
    const char* name = state["name"].asString();
    Reporter reporter(filename, cb);
    reporter.started(name);
    const auto fail = [&reporter](const Any& text) {
        logError(text);
        reporter.failed(text);
        return nullptr;
    };

    if (state["name"] != "testgen" && !QvFile::isFile(filename)) {
        const Any text = Any::sprintf("Cannot find file '%s'.", shownNames(filename).asString());
        qv_dbg()->error("[DecFactory] %s", text.asString());
        reporter.failed(text);
        return nullptr;
    }
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(name));
    auto* decoder = codec ? static_cast<QvDecodePipe*>(codec->getInterface(QvModuleType::decoder)) : nullptr;
    if (!decoder) return fail(noInstance(name));
    decoder->restore(state);
    decoder->setParam("filename", filename);
    if (decoder->open() != QvStatus::ok) {
        const Any text = failedToOpen(filename, decoder->name());
        logError(text);
        reporter.failed(text, *decoder);
        return nullptr;
    }

    applyOverrides(*decoder, qvVideoStream, state["vidsOverride"]);
    applyOverrides(*decoder, qvAudioStream, state["audsOverride"]);
    applyOverrides(*decoder, qvSubpicStream, state["subsOverride"]);
    const Any text = opened(filename, decoder->name());
    qv_dbg()->logs(QvLogMask::info, text.asString());
    reporter.succeeded(text, 0);
    codec.release();
    return decoder;
}
