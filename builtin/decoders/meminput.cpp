#include "builtin/decoders/meminput.h"

#include <cstring>
#include <utility>

#include "builtin/creators.h"
#include "builtin/modules.h"
#include "core/arch/qvexception.h"
#include "core/decode/memoryinput_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"

namespace {

struct Described {};
constexpr QvParamRow<Described> rows[] = {
    {.name = "filename",
     .flags = qvParamByHand,
     .help = "what the source is called; its extension can say the decoder",
     .type = Any::String},
    {.name = qvSourceParam, .flags = qvParamByHand, .help = "a byte source", .type = Any::Generic},
    {.name = "decoder", .flags = qvParamByHand, .help = "the module that reads it", .type = Any::String},
    {.name = "extension",
     .flags = qvParamByHand,
     .help = "as that of a file, without the dot",
     .type = Any::String},
};

std::string textOf(const Any& name) {
    const Any narrow = name.isWString() ? name.toString() : name;
    return narrow.asString("");
}

}  // namespace

MemInput::~MemInput() { inner_.reset(); }

void MemInput::own(std::unique_ptr<QvByteSource> source) {
    close();
    source_ = source.get();
    owned_ = std::move(source);
}

// --- Parameters.

int MemInput::setOwn(Any& field, const char* name, const Any& value) {
    if (value.isValid() && !value.isText())
        return setError(QvStatus::invalidParam, "Invalid value of parameter '%s'", name);
    if (getState() == stateOpen && !(value == field)) close();
    field = value;
    return QvStatus::ok;
}

int MemInput::setParam(const char* name, const Any& value) {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    if (getState() == stateOpen && !is(qvSourceParam) && !is("decoder") && !is("extension") &&
        !is("filename"))
        return keep(name, value);
    _traceParam(name, value);
    if (is(qvSourceParam)) {
        if (value.isValid() && !qvSourceOf(value))
            return setError(QvStatus::invalidParam, "Invalid value of parameter '%s'", name);
        close();
        source_ = qvSourceOf(value);
        owned_.reset();
        return QvStatus::ok;
    }
    if (is("decoder")) return setOwn(decoder_, name, value);
    if (is("extension")) return setOwn(extension_, name, value);
    if (is("filename")) return setOwn(filename_, name, value);
    return keep(name, value);
}

// An open decoder judges at once, one that is still to come at open.
int MemInput::keep(const char* name, const Any& value) {
    if (getState() == stateOpen)
        if (const int result = passed(inner_->setParam(name, value)); result != QvStatus::ok) return result;
    kept_.set(name, value);
    return QvStatus::ok;
}

void MemInput::getParam(const char* name, Any& value) const {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    if (is("filename"))
        value = shownName();
    else if (is("decoder"))
        value = inner_ ? Any(inner_->name()) : decoder_;
    else if (is("extension"))
        value = extension();
    else if (is(qvSourceParam))
        value = qvSourceValue(source_);
    else if (inner_)
        inner_->getParam(name, value);
    else if (kept_.isSet(name))
        value = kept_.get(name);
    else if (Described none; !qvGetParamRow<Described>(rows, none, name, value))
        QvDecodePipe::getParam(name, value);
}

Any MemInput::extension() const {
    if (extension_.isText()) return extension_;
    return filename_.isText() && filename_.size() > 0 ? QvFile::getExt(filename_, true) : Any("");
}

Any MemInput::shownName() const {
    if (filename_.isText() && filename_.size() > 0) return filename_;
    const Any ext = extension();
    return ext.size() > 0 ? QvFile::joinExt(Any("memory"), ext) : Any("memory");
}

void MemInput::store(AnyDict& state) const {
    state.clear();
    state.set("name", Any(name()));
    state.set("extension", extension());
    state.set("decoder", inner_ ? Any(inner_->name()) : decoder_);
    AnyDict inner = restored_;
    if (inner_) inner_->store(inner);
    state.set("state", inner);
    qv_log()->warning("%s is in memory: what is stored has to get its bytes again",
                      textOf(shownName()).c_str());
}

int MemInput::restore(const AnyDict& state) {
    if (state.isSet("name") && !(state.get("name") == name()))
        return setError(QvStatus::failed, "restore - invalid name");
    close();
    for (const char* own : {"extension", "decoder"})
        if (state.isSet(own))
            if (const int result = setParam(own, state.get(own)); result != QvStatus::ok) return result;
    restored_.clear();
    if (state["state"].isDict()) restored_ = state["state"].asDict();
    return QvStatus::ok;
}

// --- Open and close.

// Why the decoder does not take what it is given; "" if it does.
std::string MemInput::setUp(QvDecodePipe& decoder) const {
    const std::string module = decoder.name();
    for (const Any& row : qvParameters(decoder)) {
        const char* needed = row.asDict().isSet("needed") ? row.asDict().getString("name", "") : "";
        if (*needed && !kept_.isSet(needed) && !restored_.isSet(needed))
            return module + " needs '" + needed + "'";
    }
    if (!restored_.empty()) decoder.restore(restored_);
    if (qvSetOptionalParam(decoder, qvSourceParam, qvSourceValue(source_)) != QvStatus::ok)
        return module + " reads files only, not bytes in memory";
    if (qvSetOptionalParam(decoder, "filename", shownName()) != QvStatus::ok)
        return module + " does not take the name " + textOf(shownName());
    for (const auto [key, value] : kept_) {
        if (qvSetOptionalParam(decoder, key, *value) == QvStatus::ok) continue;
        return module + " does not take the parameter '" + key + "'" +
               (*decoder.errorDesc() ? std::string(": ") + decoder.errorDesc() : "");
    }
    return "";
}

int MemInput::openWith(const char* module, std::string& reason) {
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module));
    auto* decoder = codec ? static_cast<QvDecodePipe*>(codec->getInterface(QvModuleType::decoder)) : nullptr;
    if (!decoder) {
        reason = std::string("there is no decoder ") + module;
        return QvStatus::cannotParse;
    }
    codec.release();
    std::unique_ptr<QvDecodePipe> made(decoder);
    reason = setUp(*made);
    if (!reason.empty()) return QvStatus::invalidParam;
    const int result = made->open();
    if (result != QvStatus::ok) {
        reason = std::string(module) + ": " + made->errorDesc();
        return result;
    }
    inner_ = std::move(made);
    return QvStatus::ok;
}

int MemInput::open() {
    if (getState() == stateOpen) close();
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Codec not inited");
    inner_.reset();
    const std::string shown = textOf(shownName());
    if (!source_)
        return setError(QvStatus::failed, "%s is in memory, and no source of its bytes is set",
                        shown.c_str());
    const AnyVector modules = decoder_.isText() && decoder_.size() > 0 ? AnyVector(decoder_.toString())
                                                                       : qvDecodersOf(extension().toString());
    if (modules.empty())
        return setError(QvStatus::failed, "%s: there is no decoder for the extension '%s'", shown.c_str(),
                        textOf(extension()).c_str());
    std::string reasons;
    int result = QvStatus::cannotParse;
    for (const Any& module : modules) {
        std::string reason;
        result = openWith(module.asString(""), reason);
        if (result == QvStatus::ok) return QvDecodePipe::open();
        reasons += (reasons.empty() ? "" : "; ") + reason;
    }
    return setError(modules.size() == 1 ? result : QvStatus::cannotParse, "%s: %s", shown.c_str(),
                    reasons.c_str());
}

int MemInput::close() {
    if (getState() != stateOpen) return QvStatus::ok;
    const int result = passed(inner_->close());
    QvDecodePipe::close();
    inner_.reset();
    return result;
}

void* MemInput::getInterface(int kind) const {
    if (kind == QvModuleType::decoder || !inner_) return QvDecodePipe::getInterface(kind);
    return inner_->getInterface(kind);
}

// --- What the decoder does.

QvDecodePipe* MemInput::opened() {
    if (getState() == stateOpen) return inner_.get();
    setError(QvStatus::illegalState, "%s is not open", textOf(shownName()).c_str());
    return nullptr;
}

// A failure is the decoder's, with its text.
int MemInput::passed(int result) {
    if (result >= 0 || result == QvStatus::endOfStream || !*inner_->errorDesc()) return result;
    return setError(result, "%s", inner_->errorDesc());
}

template <class Operation>
int MemInput::pass(Operation&& operation) {
    QvDecodePipe* const decoder = opened();
    return decoder ? passed(operation(*decoder)) : QvStatus::illegalState;
}

int MemInput::nrStreams(int type) const { return inner_ ? inner_->nrStreams(type) : 0; }

void MemInput::elementaryStream(int type, int stream, QvElementaryStream* out) const {
    if (inner_) return inner_->elementaryStream(type, stream, out);
    QvDecodePipe::elementaryStream(type, stream, out);
}

void MemInput::getStreamParam(int type, int stream, const char* name, Any& value) const {
    if (inner_) inner_->getStreamParam(type, stream, name, value);
}

void MemInput::getStreamParams(int type, int stream, AnyDict& params) const {
    params.clear();
    if (inner_) inner_->getStreamParams(type, stream, params);
}

int MemInput::setStreamParam(int type, int stream, const char* name, const Any& value) {
    return pass([&](QvDecodePipe& decoder) { return decoder.setStreamParam(type, stream, name, value); });
}

int MemInput::seekToSample(long long sample, int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.seekToSample(sample, stream); });
}

int MemInput::seekToFrame(long long frame, int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.seekToFrame(frame, stream); });
}

int MemInput::readFrame(int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.readFrame(stream); });
}

int MemInput::readSamples(int count, int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.readSamples(count, stream); });
}

int MemInput::nrFrames(int stream) const { return inner_ ? inner_->nrFrames(stream) : 0; }

long long MemInput::nrSamples(int stream) const { return inner_ ? inner_->nrSamples(stream) : 0; }

int MemInput::readMeta(int stream, int kind, AnyDict& out) {
    return pass([&](QvDecodePipe& decoder) { return decoder.readMeta(stream, kind, out); });
}

int MemInput::seek(const MediaTime& time, int type, int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.seek(time, type, stream); });
}

int MemInput::seekAll(const MediaTime& time) {
    return pass([&](QvDecodePipe& decoder) { return decoder.seekAll(time); });
}

MediaTime MemInput::duration(int type, int stream) {
    QvDecodePipe* const decoder = opened();
    return decoder ? decoder->duration(type, stream) : MediaTime();
}

QvFrame* MemInput::getFramePtr(int stream) { return inner_ ? inner_->getFramePtr(stream) : nullptr; }

QvPcm* MemInput::getAudioPtr(int stream) { return inner_ ? inner_->getAudioPtr(stream) : nullptr; }

int MemInput::select(int type, int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.select(type, stream); });
}

int MemInput::deselect(int type, int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.deselect(type, stream); });
}

int MemInput::selected(AnyDict& dict) const {
    if (inner_) return inner_->selected(dict);
    dict.set("video", AnyVector());
    dict.set("audio", AnyVector());
    return QvStatus::ok;
}

bool MemInput::isSelected(int type, int stream) const { return inner_ && inner_->isSelected(type, stream); }

AnyVector MemInput::overridableParams(int type, int stream) {
    return inner_ ? inner_->overridableParams(type, stream) : AnyVector();
}

int MemInput::setOverride(int type, int stream, const char* name, const Any& value) {
    return pass([&](QvDecodePipe& decoder) { return decoder.setOverride(type, stream, name, value); });
}

const Any& MemInput::override(int type, int stream, const char* name) {
    return inner_ ? inner_->override(type, stream, name) : Any::invalid();
}

const AnyVector& MemInput::overrides(int type) const {
    return inner_ ? inner_->overrides(type) : AnyVector::null();
}

int MemInput::encodedFrameSize(int stream) {
    return pass([&](QvDecodePipe& decoder) { return decoder.encodedFrameSize(stream); });
}

int MemInput::readEncodedFrame(int stream, unsigned char* to) {
    return pass([&](QvDecodePipe& decoder) { return decoder.readEncodedFrame(stream, to); });
}

int MemInput::setReadUserData(int type, int stream, bool on) {
    return pass([&](QvDecodePipe& decoder) { return decoder.setReadUserData(type, stream, on); });
}

bool MemInput::readUserData(int type, int stream) const {
    return inner_ && inner_->readUserData(type, stream);
}

QvCodec* newMeminput() { return new MemInput; }

std::unique_ptr<QvDecodePipe> qvNewMemoryInput(std::unique_ptr<QvByteSource> source) {
    static MemInputModule module;
    std::unique_ptr<QvCodec> codec(module.create());
    codec->init();
    auto* input = static_cast<MemInput*>(codec.release());
    input->own(std::move(source));
    return std::unique_ptr<QvDecodePipe>(input);
}
